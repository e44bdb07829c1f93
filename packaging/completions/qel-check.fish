# Fish completion for qel-check.
complete -c qel-check
