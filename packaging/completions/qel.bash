# Bash completion for qel. Needs nothing but bash 4.3 itself.

_qel() {
  # COMP_WORDS is also split where the shell would not, as at the colon of a URL. These are the words as
  # the shell takes them; attached is what stands before the last such place in the word at the cursor.
  local line=${COMP_LINE:0:COMP_POINT} words=() attached='' word index
  for ((index = 0; index <= COMP_CWORD; index++)); do
    word=${COMP_WORDS[index]}
    if [[ $index -eq 0 || $line == [[:blank:]]* ]]; then
      line=${line#"${line%%[![:blank:]]*}"}
      words+=('')
    fi
    attached=${words[-1]}
    if [[ $index -eq $COMP_CWORD ]]; then
      word=$line  # only up to the cursor
      [[ $word == [:=] ]] && attached+=$word
    fi
    words[-1]+=$word
    line=${line#"$word"}
  done
  local current=${words[-1]}

  # What the words before the cursor already say.
  local command='' source='' option='' options='-d -f -i'
  for word in "${words[@]:1:${#words[@]}-2}"; do
    if [[ -n $option ]]; then
      option=''
      continue
    fi
    case $word in
      -d* | -f*)
        option=${word:0:2}
        options=${options/$option/}
        ;;
      -i*)
        source=-
        options=${options/-i/}
        ;;
      -*) ;;
      *)
        if [[ -z $command ]]; then
          command=$word
        else
          source=$word
        fi
        ;;
    esac
  done

  local path
  COMPREPLY=()
  if [[ $option == -d ]]; then
    compopt -o filenames
    if [[ $command == createbundle ]]; then
      mapfile -t COMPREPLY < <(compgen -d -- "$current")
    else
      mapfile -t COMPREPLY < <(compgen -f -- "$current")
    fi
  elif [[ $option == -f ]]; then
    mapfile -t COMPREPLY < <(compgen -W 'rss atom' -- "$current")
  elif [[ -z $command && $current != -* ]]; then
    mapfile -t COMPREPLY < <(compgen -W 'createbundle createfeed parsefeed' -- "$current")
  elif [[ -n $source || $current == -* ]]; then
    [[ $command == createbundle || $command == parsefeed ]] && options=${options/-f/}
    mapfile -t COMPREPLY < <(compgen -W "$options" -- "$current")
  else
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
  fi
  COMPREPLY=("${COMPREPLY[@]#"$attached"}")
} && complete -F _qel qel
