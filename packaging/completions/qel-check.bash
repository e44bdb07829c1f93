# Bash completion for qel-check.
complete -o default qel-check
