# Completion of zeb for fish.

function __zeb_books
    zeb --no-daemon books 2>/dev/null | string split --fields 1 ' '
end

function __zeb_with
    __fish_seen_subcommand_from $argv
end

set -l commands search suggest similar anchor books models status watch index scan add remove \
    publish doctor
set -l none "not __fish_seen_subcommand_from $commands"

complete -c zeb -f
complete -c zeb -l help -d 'Print a summary and exit'
complete -c zeb -n $none -l version -d 'Print the version and exit'
complete -c zeb -l color -x -a 'auto always never' -d 'Use colours'
complete -c zeb -l cache-dir -x -a '(__fish_complete_directories)' -d 'Folder for indexes and books'
complete -c zeb -l no-wait -d 'Do not wait for indexes'
complete -c zeb -l wait -x -d 'Wait for them at most so many seconds'
complete -c zeb -l no-daemon -d 'Search in this process'
complete -c zeb -l verbose -d 'Say more'

complete -c zeb -n $none -a search -d 'Find pages by words'
complete -c zeb -n $none -a suggest -d 'Complete what is half typed'
complete -c zeb -n $none -a similar -d 'Find other searches'
complete -c zeb -n $none -a anchor -d 'Find the pages that carry an anchor'
complete -c zeb -n $none -a books -d 'List the books'
complete -c zeb -n $none -a models -d 'List the language models'
complete -c zeb -n $none -a status -d 'Say how things are'
complete -c zeb -n $none -a watch -d 'Print pages as they are found'
complete -c zeb -n $none -a index -d 'Index folders and make them books'
complete -c zeb -n $none -a scan -d 'Index the books that are installed'
complete -c zeb -n $none -a add -d 'Subscribe to books on a web server'
complete -c zeb -n $none -a remove -d 'Forget books'
complete -c zeb -n $none -a publish -d 'Write books for a web server'
complete -c zeb -n $none -a doctor -d 'Say why a book is missing or has no index'

complete -c zeb -n '__zeb_with search suggest similar anchor watch' -l book -x -a '(__zeb_books)' \
    -d 'Only in this book'
complete -c zeb -n '__zeb_with add' -l book -x -d 'Only this book'
complete -c zeb -n '__zeb_with search suggest similar' -l limit -x -d 'Show at most so many'
complete -c zeb -n '__zeb_with search' -l actions -d 'Pages by meaning alone'
complete -c zeb -n '__zeb_with search suggest similar anchor books models status watch doctor' -l json \
    -d 'Write one JSON object'
complete -c zeb -n '__zeb_with watch' -l once -d 'End when the search has ended'
complete -c zeb -n '__zeb_with index publish' -l book-id -x -d 'Identifier of the book'
complete -c zeb -n '__zeb_with scan' -l root -x -a '(__fish_complete_directories)' \
    -d 'Look for installed books below'
complete -c zeb -n '__zeb_with scan' -l no-system -d 'Do not look for installed books'
complete -c zeb -n '__zeb_with scan' -l force -d 'Index unchanged books, too'
complete -c zeb -n '__zeb_with scan add publish' -l language -x -d 'Language'
complete -c zeb -n '__zeb_with publish' -l site -x -a '(__fish_complete_directories)' \
    -d 'Folder to serve'
complete -c zeb -n '__zeb_with doctor' -l network -d 'Ask the servers of remote books'
complete -c zeb -n '__zeb_with index scan publish' -a '(__fish_complete_directories)'
complete -c zeb -n '__zeb_with remove doctor' -a '(__zeb_books)'
