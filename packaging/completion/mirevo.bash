# Completion in bash of Mirevo, mirevo-viewer, mirevo-report and mirevo-import: their files, options, and keywords after --keyword.

# The lines that a program prints for the options in "$2" and onwards; nothing if it does not know them.
_mirevo_answer() {
  command -v "$1" >/dev/null 2>&1 && "$@" 2>/dev/null </dev/null
}

_mirevo() {
  local program=$1 current=${COMP_WORDS[COMP_CWORD]} previous=${COMP_WORDS[COMP_CWORD - 1]} options
  COMPREPLY=()
  options=$(_mirevo_answer "$program" --help | grep -oE '^ +(--[a-z][a-z-]*|//[a-z]+)')
  if [ "$previous" = --keyword ]; then
    # Without this question in the help the program would take it for the name of a setup.
    case "$options" in
      *--keyword*) ;;
      *) return ;;
    esac
    local name names begin=${current,,}
    while IFS= read -r name; do
      while :; do # the keyword, then the sections that it is in
        names+=$name$'\n'
        [[ $current == */* ]] || names+=${name##*/}$'\n'
        [[ $name == */* ]] || break
        name=${name%/*}
      done
    done < <(_mirevo_answer "$program" --keyword)
    [[ $current == */* ]] || names=$(grep -v / <<<"$names")
    while IFS= read -r name; do
      case "${name,,}" in "$begin"*) [ -z "$name" ] || COMPREPLY+=("$name") ;; esac
    done < <(sort -u <<<"$names")
    return
  fi
  case "$current" in
    -* | /*) mapfile -t COMPREPLY < <(compgen -W "${options//$'\n'/ }" -- "$current") ;;
  esac
  local file
  while IFS= read -r file; do
    if [ -d "$file" ]; then
      COMPREPLY+=("$file/")
    else
      case "${program##*/}:$file" in
        mirevo-import:*.[pP][sS][tT] | mirevo-import:*.[tT][xX][tT]) COMPREPLY+=("$file") ;;
        mirevo-import:*) ;;
        *.[kK][dD][xX]) COMPREPLY+=("$file") ;;
      esac
    fi
  done < <(compgen -f -- "$current")
  compopt -o filenames 2>/dev/null
  case "${COMPREPLY[*]}" in */) compopt -o nospace 2>/dev/null ;; esac
}

complete -F _mirevo Mirevo mirevo-viewer mirevo-report mirevo-import
