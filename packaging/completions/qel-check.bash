# Bash completion for qel-check. Needs nothing but bash 4.3 itself.

_qel_check() {
  # COMP_WORDS is split at equals signs, too: this is the value of --directory, which nobody can guess.
  local current=${COMP_WORDS[COMP_CWORD]} before=${COMP_WORDS[COMP_CWORD-1]}
  COMPREPLY=()
  [[ $before == -d || $before == --directory || $before == = || $current == = ]] && return
  if [[ $current == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W '--all --directory --for-publishing --help --version' -- "$current")
  else
    compopt -o filenames
    mapfile -t COMPREPLY < <(compgen -f -- "$current")
  fi
} && complete -F _qel_check qel-check
