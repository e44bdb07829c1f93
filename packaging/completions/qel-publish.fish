# Fish completion for qel-publish.

# How many operands stand before the cursor.
function __qel_publish_operands
    set -l count 0
    set -l takes_next no
    set -l words (commandline -opc)
    for word in $words[2..-1]
        if test $takes_next = yes
            set takes_next no
        else if string match -qr '^(-[bdLls]|--(base|directory|language|link|self))$' -- $word
            set takes_next yes
        else if not string match -qr '^-.' -- $word
            set count (math $count + 1)
        end
    end
    echo $count
end

# A directory may be a bundle, or hold one. A command of no name completes every path.
function __qel_publish_sources
    set -l typed (commandline -ct)
    complete -C "'' $typed" | string match -ri '.*(?:/|\.plist)$'
    printf '%s\t%s\n' http: feed https: feed pcast: feed file: feed
end

complete -c qel-publish -f
complete -c qel-publish -n 'test (__qel_publish_operands) -eq 0' -a '(__qel_publish_sources)'
complete -c qel-publish -n 'test (__qel_publish_operands) -eq 1' -F

complete -c qel-publish -s b -l base -x -d 'Where the directory of the show will lie'
complete -c qel-publish -s d -l directory -x -d 'The prefix and namespace of directory elements'
complete -c qel-publish -s h -l help -d 'Print the options'
complete -c qel-publish -s L -l language -x -d 'The language of the show'
complete -c qel-publish -s l -l link -x -d 'The page of the show'
complete -c qel-publish -s s -l self -x -d 'Where the feed will lie'
complete -c qel-publish -s V -l version -d 'Print the version'
