# Fish completion for qel-keep.

# How many operands stand before the cursor.
function __qel_keep_operands
    set -l count 0
    set -l takes_next no
    set -l words (commandline -opc)
    for word in $words[2..-1]
        if test $takes_next = yes
            set takes_next no
        else if string match -qr '^(-[dj]|--(directory|jobs|latest|since|stall))$' -- $word
            set takes_next yes
        else if not string match -qr '^-.' -- $word
            set count (math $count + 1)
        end
    end
    echo $count
end

# A directory may be a bundle, or hold one. A command of no name completes every path.
function __qel_keep_sources
    set -l typed (commandline -ct)
    complete -C "'' $typed" | string match -ri '.*(?:/|\.plist)$'
    printf '%s\t%s\n' http: feed https: feed pcast: feed file: feed
end

complete -c qel-keep -f
complete -c qel-keep -n 'test (__qel_keep_operands) -eq 0' -a '(__qel_keep_sources)'
complete -c qel-keep -n 'test (__qel_keep_operands) -eq 1' -a '(__fish_complete_directories)'

complete -c qel-keep -l allow-local -d 'Let a feed of the network name local files'
complete -c qel-keep -s d -l directory -x -d 'The prefix of directory elements'
complete -c qel-keep -s n -l dry-run -d 'Tell what would be fetched, and make nothing'
complete -c qel-keep -s h -l help -d 'Print the options'
complete -c qel-keep -s j -l jobs -x -d 'Fetch so many files at once'
complete -c qel-keep -l latest -x -d 'Take the latest of the new episodes alone'
complete -c qel-keep -s q -l quiet -d 'Print nothing but failures'
complete -c qel-keep -l since -x -d 'Take the new episodes since a date alone'
complete -c qel-keep -l stall -x -d 'Give up a transfer without a byte for so long'
complete -c qel-keep -s V -l version -d 'Print the version'
