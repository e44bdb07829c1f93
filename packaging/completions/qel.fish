# Fish completion for qel.

# What the words before the cursor say: on the first line the command, on others what is read; -i is "-".
function __qel_words
    set -l words (commandline -opc)
    set -l command ''
    set -l sources
    set -l takes_next no
    for word in $words[2..-1]
        if test $takes_next = yes
            set takes_next no
        else if string match -qr '^-[df]' -- $word
            set takes_next yes
        else if string match -q -- '-i*' $word
            set -a sources -
        else if not string match -q -- '-*' $word
            if test -z "$command"
                set command $word
            else
                set -a sources $word
            end
        end
    end
    printf '%s\n' $command $sources
end

function __qel_command_is
    set -l words (__qel_words)
    contains -- "$words[1]" $argv
end

function __qel_wants_source
    set -l words (__qel_words)
    test -n "$words[1]" -a (count $words) -eq 1
end

# A directory may be a bundle, or hold one. A command of no name completes every path.
function __qel_sources
    set -l typed (commandline -ct)
    complete -C "'' $typed" | string match -ri '.*(?:/|\.plist)$'
    printf '%s\t%s\n' http: feed https: feed pcast: feed file: feed
end

complete -c qel -f

complete -c qel -n '__qel_command_is ""' -a createbundle -d 'Fetch all media and posters into one directory'
complete -c qel -n '__qel_command_is ""' -a createfeed -d 'Write an RSS 2.0 feed'
complete -c qel -n '__qel_command_is ""' -a parsefeed -d 'Write a reference file'

complete -c qel -n __qel_wants_source -a '(__qel_sources)'

complete -c qel -n '__qel_command_is createbundle' -s d -x -a '(__fish_complete_directories)' -d 'Write to this directory'
complete -c qel -n 'not __qel_command_is createbundle' -s d -r -F -d 'Write to this path'
complete -c qel -n '__qel_command_is "" createfeed' -s f -x -a "rss\t'RSS 2.0, the default' atom\t'An empty document'" -d 'Form of the feed'
complete -c qel -s i -d 'Read a reference file from standard input'
