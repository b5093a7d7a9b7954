# Completion of zeb for bash.

_zeb_books() {
  zeb --no-daemon books 2>/dev/null | cut -d ' ' -f 1
}

_zeb() {
  local cur prev words cword split
  _init_completion -s || return

  local commands='search suggest similar anchor books models status watch index scan add remove
    publish doctor'
  local common='--help --color --cache-dir --no-wait --no-daemon --wait --verbose'
  local command='' i
  for ((i = 1; i < cword; i++)); do
    case ${words[i]} in
      --color | --cache-dir | --wait) ((i++)) ;;
      -*) ;;
      *)
        command=${words[i]}
        break
        ;;
    esac
  done

  case $prev in
    --book)
      [[ $command == add ]] || COMPREPLY=($(compgen -W "$(_zeb_books)" -- "$cur"))
      return
      ;;
    --color)
      COMPREPLY=($(compgen -W 'auto always never' -- "$cur"))
      return
      ;;
    --cache-dir | --root | --site)
      _filedir -d
      return
      ;;
    --book-id | --language | --limit | --wait) return ;;
  esac
  $split && return

  local options=''
  case $command in
    '') options='--version' ;;
    search) options='--book --limit --actions --json' ;;
    suggest | similar) options='--book --limit --json' ;;
    anchor) options='--book --json' ;;
    books | models | status) options='--json' ;;
    watch) options='--book --once --json' ;;
    index) options='--book-id' ;;
    scan) options='--root --no-system --language --force' ;;
    add) options='--book --language' ;;
    publish) options='--site --book-id --language' ;;
    doctor) options='--network --json' ;;
  esac

  if [[ $cur == -* ]]; then
    COMPREPLY=($(compgen -W "$options $common" -- "$cur"))
    return
  fi
  case $command in
    '') COMPREPLY=($(compgen -W "$commands" -- "$cur")) ;;
    index | scan | publish) _filedir -d ;;
    remove | doctor) COMPREPLY=($(compgen -W "$(_zeb_books)" -- "$cur")) ;;
  esac
} &&
  complete -F _zeb zeb
