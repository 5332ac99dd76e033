#!/usr/bin/env bash
# What three repetitions of PADDS, side by side, say of the two gauges of examples/sitter, with 500 evaluations each. Prints
# what the log says of the repetitions and of the front of all. The figures in docs/repetitions.md come from here; 1,500 model
# runs.
#
#   bench/repetitions/sitter.sh [build folder]
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
build=$(cd "${1:-$here/../../build/release}" && pwd)
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
cp -R "$build/examples/sitter/"{model,data,two-gauges.kdx} "$work"
cd "$work"
sed -e "s/^ *Algorithm_Type .*/&\nRepetitions = 3\nRepetition_Order = 'side by side'/" \
  -e 's/Max_No_Evaluations .*/Max_No_Evaluations = 500/' two-gauges.kdx >repeated.kdx
"$build/Mirevo" repeated.kdx >/dev/null
sed -n -e '/^The 3 repetitions/,/^$/p' -e '/^Front:/,/^$/p' repeated.log
