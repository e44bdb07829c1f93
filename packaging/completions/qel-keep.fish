# Fish completion for qel-keep.
complete -c qel-keep
