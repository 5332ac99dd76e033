#!/usr/bin/env bash
# check_blocks.sh SOURCE PROGRAMS FOLDER PAGE...: runs the code blocks of the pages of the manual in FOLDER, which is
# emptied, with the programs of the folder PROGRAMS. What a block is, the first word behind its fence says:
#   console   commands after "$ ", run in order in one shell, each followed by what it prints; "..." there stands for
#             anything. A command must end well. It is given no terminal and no input.
#   kdx       a part of a setup, below the section that in=SECTION names: the program must be able to read it, and must
#             know its sections and keywords. "[...]" on a line of its own leaves something out.
#   sh        commands that need another machine, or a model of the reader's: bash must be able to parse them
#   text      not to be run: output of long runs, formulas, file listings, data
#   python, r  the blocks of a page are run together, in order, by the readers that READERS names ("python r"), followed
#             by tests/docs/<page>.py or .R, which holds what they must have read. tests/docs/<page>.sh, if there is one,
#             is run before the page. Ends with 77 if all else is well and a reader, or its package, is not installed.
#   any, with file=NAME: the block is written to that file
# Each page runs in a folder of its own. Pages other than the tutorial find what the tutorial leaves there, and
# basin.kdx, a short calibration that has been run.
set -u
source=$1
programs=$(realpath "$2")
work=$3
shift 3
PATH=$programs:$PATH
export LC_ALL=C.UTF-8
unset VOLK_PROGRESS BUILDMODE

rm -rf "$work"
mkdir -p "$work"
work=$(realpath "$work")
reference=$source/docs/setup-reference.md
bad=0
blocks=0
readers=${READERS-}
lacking=''
complain() {
  printf '%s:%s: %s\n' "$page" "$start" "$*"
  bad=1
}

# The commands of a block run in this shell, so that cd and variables hold for the next one.
run_command() {
  local output pattern status
  eval "$1" >"$work/output" 2>&1 </dev/null
  status=$?
  output=$(<"$work/output")
  pattern=$(sed -e 's/[][*?\\]/\\&/g' -e 's/\.\.\./*/g' <<<"$2")
  if [ $status -ne 0 ]; then complain "exit code $status of: $1"$'\n'"$output"; fi
  # shellcheck disable=SC2053
  if [[ "$output" != $pattern ]]; then
    complain "another output of: $1"
    diff <(echo "$2") <(echo "$output")
  fi
}

run_console() {
  local command='' expected='' line
  while IFS= read -r line; do
    case $line in
      '$ '*)
        [ -z "$command" ] || run_command "$command" "${expected%$'\n'}"
        command=${line#\$ }
        expected=''
        ;;
      '> '*) command+=$'\n'${line#> } ;;
      *)
        [ -n "$command" ] || complain "a console block begins with a command"
        expected+=$line$'\n'
        ;;
    esac
  done <<<"$1"
  run_command "$command" "${expected%$'\n'}"
}

# Every section and keyword must be in the reference, in this order of sections; the program must find no fault but
# that the rest of the setup is missing.
check_setup() {
  local path wrapped=$1 message
  # What the fragment is inside of, from the innermost section outwards.
  for path in $(tr / '\n' <<<"$2" | tac); do wrapped="[$path]"$'\n'$wrapped$'\n'"[/$path]"; done
  [[ $wrapped == *'[MIREVO_PARAMETERS]'* ]] || wrapped='[MIREVO_PARAMETERS]'$'\n'$wrapped$'\n''[/MIREVO_PARAMETERS]'
  grep -v '^ *\[\.\.\.\]$' <<<"$wrapped" >"$work/fragment.kdx"
  message=$(cd "$work" && Mirevo fragment.kdx 2>&1)
  # What is refused is that a section, a keyword or the model is missing, not how the block is written.
  if ! grep -Eq 'Unable to (open section|read keyword)|does not exist' <<<"$message" || grep -q 'did you mean' <<<"$message"; then
    complain "this cannot be read: $message"
  fi
  awk -v reference="$reference" '
    BEGIN {
      while ((getline line < reference) > 0) {
        if (line ~ /^## /) { section = substr(line, 4); known[section] = 1 }
        if (match(line, /^\| `[A-Za-z_0-9]+`/)) known[section "/" substr(line, 4, RLENGTH - 4)] = 1
      }
    }
    { sub(/\/\/.*/, "") }
    match($0, /^ *\[\/[^]]*\]/) { sub(/\/?[^\/]*$/, "", path); next }
    match($0, /^ *\[[^]]*\]/) {
      name = $0; gsub(/[][ ]/, "", name); sub(/_[0-9]+$/, "_n", name)
      if (name != "MIREVO_PARAMETERS") { path = path == "" ? name : path "/" name }
      if (path != "" && !(path in known)) { print "no section " path; failed = 1 }
      next
    }
    match($0, /^ *[A-Za-z_0-9]+ *=/) {
      name = $1; sub(/=.*/, "", name)
      if (!(path "/" name in known)) { print "no keyword " name " in " path; failed = 1 }
    }
    END { exit failed }' "$work/fragment.kdx" >"$work/output" || complain "$(<"$work/output")"
}

check_block() {
  local kind=${1%% *} text=$2 file='' inside='' attribute
  for attribute in ${1#"$kind"}; do
    case $attribute in
      file=*) file=${attribute#file=} ;;
      in=*) inside=${attribute#in=} ;;
      *) complain "unknown: $attribute" ;;
    esac
  done
  blocks=$((blocks + 1))
  if [ -n "$file" ]; then
    mkdir -p "$(dirname "$file")"
    printf '%s\n' "$text" >"$file"
    return
  fi
  case $kind in
    console) run_console "$text" ;;
    kdx) check_setup "$text" "$inside" ;;
    sh) bash -n <<<"$text" || complain "no commands that bash can parse" ;;
    text) ;;
    python | r) printf '%s\n' "$text" >>"$work/$name.$kind" ;;
    *) complain "a block of the kind \"$kind\": console, kdx, sh, python, r, text, or a file" ;;
  esac
}

# The python that has pandas: another one may come first.
find_python() {
  local each
  for each in python3 /usr/bin/python3; do
    if "$each" -c 'import pandas' 2>/dev/null; then echo "$each" && return; fi
  done
}

run_reader() {
  local kind=$1 stem=$2 program=''
  [ -s "$work/$name.$kind" ] || return
  case $kind in
    python) program=$(find_python) ;;
    r) if command -v Rscript >/dev/null && Rscript -e 'stopifnot(requireNamespace("jsonlite"))' >/dev/null 2>&1; then program=Rscript; fi ;;
  esac
  if [ -z "$program" ]; then
    case $kind in
      python) lacking+=' python3 with pandas' ;;
      r) lacking+=' R with jsonlite' ;;
    esac
    return
  fi
  case $kind in
    python) cat "$source/tests/docs/$stem.py" ;;
    r) cat "$source/tests/docs/$stem.R" ;;
  esac >>"$work/$name.$kind"
  start=$kind
  "$program" "$work/$name.$kind" >"$work/output" 2>&1 || complain "$(<"$work/output")"
}

for page in "$@"; do
  name=$(tr / - <<<"${page%.md}")
  if [ "$page" = docs/tutorial.md ]; then
    mkdir "$work/$name"
  elif grep -Eq '^ *```(console|python|r)' "$source/$page"; then
    # What the tutorial leaves, and a short calibration under the name that other pages use.
    if [ ! -d "$work/basin" ]; then
      cp -R "$work/docs-tutorial" "$work/basin" || exit 1
      sed 's/Max_No_Evaluations = .*/Max_No_Evaluations = 20/' "$work/basin/calibration.kdx" >"$work/basin/basin.kdx"
      (cd "$work/basin" && Mirevo basin.kdx) || exit 1
    fi
    cp -R "$work/basin" "$work/$name"
  else
    mkdir "$work/$name"
  fi
  cd "$work/$name" || exit 1
  stem=$(basename "$page" .md)
  # shellcheck disable=SC1090
  if [ -n "$readers" ] && [ -f "$source/tests/docs/$stem.sh" ]; then . "$source/tests/docs/$stem.sh"; fi
  fence=''
  number=0
  previous=''
  list=''
  while IFS= read -r line <&3; do
    number=$((number + 1))
    if [[ $line =~ ^(\ *)\`\`\`(.*)$ ]]; then
      if [ -z "$fence" ]; then
        fence=open
        indent=${BASH_REMATCH[1]}
        info=${BASH_REMATCH[2]}
        text=''
        start=$number
      else
        fence=''
        check_block "$info" "${text%$'\n'}"
      fi
    elif [ -n "$fence" ]; then
      text+=${line#"$indent"}$'\n'
    else
      # An indented block says nothing of its kind. (Deeper text is what a list continues with.)
      case $line in [0-9-]*) list=1 ;; [!\ ]*) list='' ;; esac
      start=$number
      if [[ -z $list && -z $previous && $line == '    '* && $page == docs/* ]]; then complain "a code block without its kind"; fi
      if [[ -n $list && -z $previous && $line == '      '* && $page == docs/* ]]; then complain "a code block without its kind"; fi
    fi
    previous=$line
  done 3<"$source/$page"
  [ -z "$fence" ] || complain "a code block without its end"
  for kind in $readers; do run_reader "$kind" "$stem"; done
done
[ "$blocks" -gt 0 ] || { echo "no block was found"; exit 1; }
echo "$blocks blocks"
if [ $bad = 0 ] && [ -n "$lacking" ]; then
  echo "skipped, as not installed:$lacking"
  exit 77
fi
exit $bad
