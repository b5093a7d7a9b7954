# Completion of bvmake for bash.

_bvmake() {
  local cur prev words cword split
  _init_completion -s || return

  case $prev in
    --file | --inspect | --check)
      _filedir helpindex
      return
      ;;
    --anchor | --jobs | --language | --min-term-length | --term) return ;;
  esac
  $split && return

  if [[ $cur == -* ]]; then
    COMPREPLY=($(compgen -W '--create --file --anchors --generate-summaries --min-term-length
      --append-LUX-only --language --jobs --lowered-priority --inspect --term --anchor --pages
      --check --verbose --help --version' -- "$cur"))
    return
  fi
  _filedir -d
} &&
  complete -F _bvmake bvmake
