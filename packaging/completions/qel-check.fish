# Fish completion for qel-check.

complete -c qel-check -s a -l all -d 'Tell all findings, not a few of each kind'
complete -c qel-check -s d -l directory -x -d 'The prefix of directory elements'
complete -c qel-check -s h -l help -d 'Print the options'
complete -c qel-check -s p -l for-publishing -d 'Tell as well what readers lack'
complete -c qel-check -s V -l version -d 'Print the version'
