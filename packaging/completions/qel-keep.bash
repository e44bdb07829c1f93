# Bash completion for qel-keep.
complete -o default qel-keep
