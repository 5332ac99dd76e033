#!/bin/sh
# The staged example with its engine, EPANET, installed: the calibration finds the coefficients with which the pressures
# were made, within the intervals of a sensitivity analysis; what the program reads of the engine's results is what the
# engine's own package reads; and a network that the engine refuses is a failed model run with the engine's message.
# Usage: net1_runs.sh MIREVO SERIES_STATISTICS STAGED_EXAMPLE
set -eu
test -d "$3/node_modules/epanet-js" || { echo "run $3/install first"; exit 1; }
folder=$(mktemp -d)
trap 'rm -rf "$folder"' EXIT
cp -R "$3/model" "$3/data" "$3/node_modules" "$3/net1.kdx" "$folder"
cd "$folder"
run() { VOLK_PROGRESS=NONE "$1" "$2.kdx" || { cat "$2.log"; exit 1; }; }

cp data/pressures.csv expected.csv
"$3/prepare-data" .
cmp data/pressures.csv expected.csv

sed 's/ Option = 2/ Option = 0/' net1.kdx >once.kdx
run "$1" once
awk -F '\t' '$1 == 1 { printf "one run with the initial values: %.2f %.2f %.2f %.2f\n", $7, $8, $9, $10 }' once.dat |
  tee once.txt
grep -q ' 2\.34 1\.45 1\.65 2\.23$' once.txt

run "$1" net1
# Coefficients within 4 of the true ones, errors those of the gauges; columns 3 to 6 are the parameters, 7 to 10 the measures.
awk -F '\t' '
  function apart(x, y) { return x > y ? x - y : y - x }
  /^[0-9]/ { count++; if ($2 != "OK") bad = 1; if (best == "" || $NF + 0 < best) { best = $NF + 0; row = $0 } }
  END {
    split(row, of, "\t")
    printf "best of %d: C %.1f %.1f %.1f %.1f, RMSE %.4f %.4f %.4f %.4f\n", count, of[3], of[4], of[5], of[6], of[7], of[8], of[9], of[10]
    if (apart(of[3], 128) > 4 || apart(of[4], 112) > 4 || apart(of[5], 95) > 4 || apart(of[6], 74) > 4) bad = 1
    for (i = 7; i <= 10; i++) if (of[i] < 0.2 || of[i] > 0.4) bad = 1
    exit bad
  }' net1_Optimisation.dat >best.txt || { cat best.txt; exit 1; }
cat best.txt

# The last model run was that of the best set; its errors once more, without any reader of the program.
cat >errors.mjs <<'END'
import { readFileSync } from 'node:fs';
import { readBinary } from 'epanet-js';
const { nodes } = readBinary(readFileSync('net1_Process1/net1.out')).results;
const rows = readFileSync('data/pressures.csv', 'utf8').trim().split('\n').slice(1).map((line) => line.split(','));
const errors = ['11', '13', '21', '32'].map((gauge, column) => {
  const simulated = nodes.find((node) => node.id === gauge).pressure;
  const squares = rows.map((row, hour) => (simulated[hour] - row[column + 1]) ** 2);
  return Math.sqrt(squares.reduce((sum, square) => sum + square) / rows.length).toFixed(4);
});
console.log(`RMSE ${errors.join(' ')}`);
END
errors=$(node errors.mjs)
grep -q ", $errors\$" best.txt || { echo "the package reads: $errors"; exit 1; }

# Every item of the results is what the package reads: all results of each node, then of each link.
cat >items.mjs <<'END'
import { readFileSync } from 'node:fs';
import { readBinary } from 'epanet-js';
const { nodes, links } = readBinary(readFileSync('net1_Process1/net1.out')).results;
const nodeResults = ['demand', 'head', 'pressure', 'waterQuality'];
const linkResults = ['flow', 'velocity', 'headloss', 'avgWaterQuality', 'status', 'setting', 'reactionRate', 'friction'];
const items = [...nodes.flatMap((node) => nodeResults.map((result) => node[result])),
  ...links.flatMap((link) => linkResults.map((result) => link[result]))];
console.log(['time', ...items.keys()].join(','));
for (let hour = 0; hour < items[0].length; ++hour) {
  const time = new Date(Date.UTC(2000, 0, 1, hour)).toISOString().slice(0, 16);
  console.log([time, ...items.map((item) => item[hour])].join(','));
}
END
node items.mjs >items.csv
item=0
while [ $item -lt 148 ]; do
  item=$((item + 1))
  fit=$("$2" net1_Process1/net1.out items.csv 2000-01-01 2000-01-02 $item $item)
  case $fit in
    "25 values, "*" RMSE 0.00, "*) ;;
    *) echo "item $item is not what the package reads: $fit"; exit 1 ;;
  esac
done
echo "$item items are what the package reads"

# The true coefficients lie within the intervals that the analysis gives at the best set.
awk -v best="$(sed 's/.*: C //; s/,.*//' best.txt)" '
  BEGIN { split(best, value) }
  / Initial_Value / { sub(/100\.0/, value[++n]) }
  { sub(/ Option = 2/, " Option = 1"); print }' net1.kdx >within.kdx
run "$1" within
awk '
  BEGIN { truth["C_18"] = 128; truth["C_12"] = 112; truth["C_10"] = 95; truth["C_8"] = 74 }
  /95 % lower/ { table = 1 }
  table && ($2 in truth) {
    print $2, "between", $5, "and", $6
    if (truth[$2] < $5 || truth[$2] > $6) bad = 1
    if (++count == 4) exit
  }
  END { exit bad || count != 4 }' within_Sensitivity.dat

# A node that does not exist in the template: the engine refuses the network, exit code 1.
sed 's/^ 31  *31  *32 /&x/' model/net1.tpl >broken.tpl
mv broken.tpl model/net1.tpl
cp once.kdx broken.kdx
if VOLK_PROGRESS=NONE "$1" broken.kdx >broken.txt 2>&1; then echo "a run of nothing but failures ended well"; exit 1; fi
grep -q 'EPANET: ' calSimErr.dat || { cat broken.txt calSimErr.dat; exit 1; }
echo "refused by the engine: $(grep -m 1 'EPANET: ' calSimErr.dat)"
