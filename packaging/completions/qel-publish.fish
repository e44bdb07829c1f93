# Fish completion for qel-publish.
complete -c qel-publish
