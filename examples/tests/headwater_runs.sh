#!/bin/sh
# The staged example with its engine, r.topmodel of GRASS GIS, installed: the calibration improves the fit, its KGE is that
# of the engine's listing, computed apart, and a listing of NaN, with which the engine ends well, is a failed model run.
# Usage: headwater_runs.sh MIREVO SERIES_STATISTICS STAGED_EXAMPLE
set -eu
test -f "$3/model/discharge.csv" || { echo "run $3/install first"; exit 1; }
folder=$(mktemp -d)
trap 'rm -rf "$folder"' EXIT
cp -R "$3/model" "$3/data" "$3/headwater.kdx" "$folder"
cd "$folder"
run() { VOLK_PROGRESS=NONE "$1" "$2.kdx" || { cat "$2.log"; exit 1; }; }
# KGE in the calibration and the validation of the last evaluation; the parameters of the last, too.
last='/^[0-9]/ { row = $0 } END { split(row, of, "\t"); printf "KGE %.3f, validation %.3f; %.2f %.4f %.3f %.0f\n", of[7], of[10], of[3], of[4], of[5], of[6] }'

sed 's/ Option = 2/ Option = 0/' headwater.kdx >once.kdx
run "$1" once
echo "initial values: $(awk "$last" once.dat)"

run "$1" headwater
best=$(awk "$last" headwater_Optimisation.dat)
echo "best set: $best"
listing=$(awk '
  FNR == 1 { file++ }
  file == 1 { day[FNR] = $1; next }
  file == 2 { if (split($0, cell, ",") == 2) observed[cell[1]] = cell[2]; next }
  $1 == "timestep" { table = 1; next }
  table && day[$1] >= "2013-01-01" && day[$1] <= "2015-12-31" {
    s = sqrt($2 / 86400); o = sqrt(observed[day[$1]])
    n++; ss += s; so += o; sss += s * s; soo += o * o; sso += s * o
  }
  END {
    s = ss / n; o = so / n; sigmaS = sqrt(sss / n - s * s); sigmaO = sqrt(soo / n - o * o)
    r = (sso / n - s * o) / (sigmaS * sigmaO)
    printf "%d days, KGE %.3f", n, 1 - sqrt((r - 1) ^ 2 + (sigmaS / sigmaO - 1) ^ 2 + (s / o - 1) ^ 2)
  }' model/days.txt data/discharge.csv headwater_Process1/topmodel.lst)
echo "the listing: $listing"
case $best in "${listing#1095 days, }"*) ;; *) exit 1 ;; esac
awk "BEGIN { split(\"$best\", of, /[ ,]+/); exit !(of[2] > 0.79 && of[4] > 0.79) }"

sed '/Transformation = .square root/d' headwater.kdx >without.kdx
run "$1" without
echo "without the root: $(awk "$last" without_Optimisation.dat); initial values: $(sed '/^2\t/q' without_Optimisation.dat | sed '$d' | awk "$last")"

sed 's/!m  *!/0/' model/topmodel.tpl >broken.tpl
mv broken.tpl model/topmodel.tpl
cp once.kdx broken.kdx
if VOLK_PROGRESS=NONE "$1" broken.kdx >broken.txt 2>&1; then echo "a run of nothing but failures ended well"; exit 1; fi
grep -q 'topmodel.lst, line [0-9]*: .*nan' calSimErr.dat || { cat broken.txt calSimErr.dat; exit 1; }
echo "refused: $(grep -m 1 'topmodel.lst, line' calSimErr.dat)"
