# Fish completion for qel.

# The command and the source, as far as the words before the cursor say them, a line each.
function __qel_words
    set -l words (commandline -opc)
    set -l takes_next no
    for word in $words[2..-1]
        if test $takes_next = yes
            set takes_next no
        else if string match -qr '^-[df]' -- $word
            set takes_next yes
        else if not string match -q -- '-*' $word
            echo -- $word
        end
    end
end

function __qel_command_is
    set -l words (__qel_words)
    contains -- "$words[1]" $argv
end

# With -i no source is read.
function __qel_wants_source
    test (count (__qel_words)) -eq 1
    and not string match -q -- '-i*' (commandline -opc)
end

# A directory may be a bundle, or hold one. A command of no name completes every path.
function __qel_sources
    set -l typed (commandline -ct)
    complete -C "'' $typed" | string match -ri '.*(?:/|\.plist)$'
    printf '%s\t%s\n' http: 'feed' https: 'feed' pcast: 'feed over http' file: 'feed on this machine'
end

complete -c qel -f

complete -c qel -n 'test (count (__qel_words)) -eq 0' -a createbundle -d 'Fetch all media and posters into one directory'
complete -c qel -n 'test (count (__qel_words)) -eq 0' -a createfeed -d 'Write an RSS 2.0 feed'
complete -c qel -n 'test (count (__qel_words)) -eq 0' -a parsefeed -d 'Write a reference file'

complete -c qel -n __qel_wants_source -a '(__qel_sources)'

complete -c qel -n '__qel_command_is createbundle' -s d -x -a '(__fish_complete_directories)' -d 'Write to this directory'
complete -c qel -n 'not __qel_command_is createbundle' -s d -r -F -d 'Write to this path'
complete -c qel -n '__qel_command_is "" createfeed' -s f -x -a "rss\t'RSS 2.0, the default' atom\t'An empty document'" -d 'Form of the feed'
complete -c qel -s i -d 'Read a reference file from standard input'
