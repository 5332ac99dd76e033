#!/usr/bin/env bash
# What one gauge of the Sitter costs the other: runs examples/sitter/two-gauges.kdx as it stands and with two
# seeds of NSGA-II on the same budget, and prints of each the ends of its front, the suggested set, its hypervolume up to 2.5
# and 6 m3/s, and of all of them together what the least error at St. Gallen is for a given error at Appenzell. The
# figures in docs/examples/sitter-two-gauges.md come from here. 4,500 model runs.
#
#   bench/sitter/two_gauges.sh [build folder] [folder for results]
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
build=$(cd "${1:-$here/../../build/release}" && pwd)
staged=$build/examples/sitter
if [ -n "${2:-}" ]; then
  mkdir -p "$2"
  work=$(cd "$2" && pwd)
else
  work=$(mktemp -d)
  trap 'rm -rf "$work"' EXIT
fi
cd "$work"
cp -R "$staged/model" "$staged/data" .
for name in padds-1 nsga-1 nsga-2; do
  seed=${name#*-}
  case $name in
    padds-*) edit=() ;;
    nsga-*)
      edit=(-e "s/'PADDS'/'NSGA-II'/" -e "s/PADDS_CONTROL/NSGAII_CONTROL/"
        -e 's/^ *\[NSGAII_CONTROL_PARAMETERS\]/&\n Population_Size = 40/'
        -e 's/Include_Initial_Parameters = 0.*/Include_Initial_Parameters = 1\n Initial_Sample_Generation = 1/' -e 's/Sim = 1/Sim = 2/')
      ;;
  esac
  sed "${edit[@]}" -e "s/Random_Seed  .*= 1/Random_Seed = $seed/" "$staged/two-gauges.kdx" >"$name.kdx"
  [[ -e ${name}_Pareto.dat ]] || VOLK_PROGRESS=NONE "$build/Mirevo" "$name.kdx"
  awk -F '\t' -v name="$name" '
    /^[0-9]/ && $2 == 1 {
      n++
      if (n == 1) first = sprintf("%.3f %.3f", $7, $8)
      last = sprintf("%.3f %.3f", $7, $8)
      if (n == 1) height = 6
      if ($7 < 2.5 && $8 < height) { volume += (2.5 - $7) * (height - $8); height = $8 }
      if ($5 == 1) chosen = sprintf("%.3f %.3f", $7, $8)
    }
    END {
      printf "%s: %d sets, from (%s) to (%s), suggested (%s), hypervolume %.4f\n", name, n, first, last, chosen, volume
    }' "${name}_Pareto.dat"
done
awk -F '\t' '
  /^[0-9]/ && $2 == 1 { a[++n] = $7; s[n] = $8 }
  END {
    least = 1e30
    for (i = 1; i <= n; i++) if (a[i] < least) least = a[i]
    for (more = 0; more <= 10; more += more < 2 ? 0.5 : more < 4 ? 1 : 2) {
      best = 1e30
      for (i = 1; i <= n; i++) if (a[i] <= least * (1 + more / 100) && s[i] < best) best = s[i]
      printf "| %.1f %% | %.3f | %.3f |\n", more, least * (1 + more / 100), best
    }
  }' nsga-*_Pareto.dat padds-*_Pareto.dat
