#!/usr/bin/env bash
# What five repetitions of DDS, side by side, say of examples/piscataquis, with a small and with a larger budget. Prints what
# the log says of the repetitions. The figures in docs/repetitions.md come from here; about 3,000 model runs.
#
#   bench/repetitions/piscataquis.sh [build folder [NAME]...]   all names without one
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
build=$(cd "${1:-$here/../../build/release}" && pwd)
wanted=" ${*:2} "
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
cp -R "$build/examples/piscataquis/"{model,data,piscataquis.kdx} "$work"
cd "$work"

# NAME, the lines in place of the one with Algorithm_Type, the budget
repeat() {
  [[ $wanted == "  " || $wanted == *" $1 "* ]] || return 0
  awk -v lines="$2" -v budget="$3" '
    $1 == "Algorithm_Type" { gsub(";", "\n", lines); print lines; next }
    $1 == "Max_No_Evaluations" { print "Max_No_Evaluations =", budget; next }
    $1 == "NoSimultaneousSim" { print "NoSimultaneousSim = 2"; next }
    { print }' piscataquis.kdx >"$1.kdx"
  "$build/Mirevo" "$1.kdx"
  printf '\n%s\n' "$1"
  sed -n '/^The 5 repetitions/,/^$/p' "$1.log"
  grep '^The .* were busy\|^[0-9]* model evaluations' "$1.log"
}
repeated="Repetitions = 5;Repetition_Order = 'side by side'"
repeat DDS_100 "Algorithm_Type = 'DDS';$repeated" 100
repeat DDS_500 "Algorithm_Type = 'DDS';$repeated" 500
