# Bash completion for qel-keep. Needs nothing but bash 4.3 itself.

_qel_keep() {
  # COMP_WORDS is split at colons and equals signs, too; these are the words as they were typed.
  local words=() word glued=''
  for word in "${COMP_WORDS[@]:1:COMP_CWORD}"; do
    if [[ ${#words[@]} -gt 0 && ($glued || $word == [:=]) ]]; then
      words[-1]+=$word
    else
      words+=("$word")
    fi
    [[ $word == [:=] ]] && glued=yes || glued=''
  done
  local current=${words[-1]}

  local takes_value='' operands=0
  for word in "${words[@]:0:${#words[@]}-1}"; do
    case $takes_value$word in
      yes*) takes_value='' ;;
      -[dj] | --directory | --jobs | --latest | --since | --stall) takes_value=yes ;;
      -?*) ;;
      *) operands=$((operands + 1)) ;;
    esac
  done

  local path
  COMPREPLY=()
  [[ -n $takes_value || $current == *[:=]* ]] && return
  if [[ $current == -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W '--allow-local --directory --dry-run --help --jobs --latest --quiet
      --since --stall --version' -- "$current")
  elif [[ $operands -eq 0 ]]; then
    # A directory may be a bundle, or hold one.
    mapfile -t COMPREPLY < <(
      compgen -d -- "$current"
      compgen -f -- "$current" | while IFS= read -r path; do
        [[ ${path,,} == *.plist && ! -d $path ]] && printf '%s\n' "$path"
      done
    )
    # A URL goes on behind its scheme, and is not to be quoted as a path is.
    if [[ ${#COMPREPLY[@]} -gt 0 ]]; then
      compopt -o filenames
    else
      compopt -o nospace
    fi
    mapfile -t -O "${#COMPREPLY[@]}" COMPREPLY < <(compgen -W 'http: https: pcast: file:' -- "$current")
  elif [[ $operands -eq 1 ]]; then
    compopt -o filenames
    mapfile -t COMPREPLY < <(compgen -d -- "$current")
  fi
} && complete -F _qel_keep qel-keep
