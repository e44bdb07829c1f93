# Bash completion for qel-publish.
complete -o default qel-publish
