#!/bin/sh
# The staged example runs as it stands: a short calibration in a copy of it gets from the initial parameters' RMSE of
# 21.2 m3/s to below 15, and the simulated series that it leaves is that of the best set. The analyses say what the manual
# says of them.
# Usage: piscataquis_runs.sh MIREVO SERIES_STATISTICS STAGED_EXAMPLE
set -eu
folder=$(mktemp -d)
trap 'rm -rf "$folder"' EXIT
cp -R "$3/model" "$3/data" "$folder"
sed 's/Max_No_Evaluations = .*/Max_No_Evaluations = 100/' "$3/piscataquis.kdx" >"$folder/short.kdx"

VOLK_PROGRESS=NONE "$1" "$folder/short.kdx" || { cat "$folder/short.log"; exit 1; }

# The least value, of the successful evaluations, of a column; or, with -v last=1, the last.
column='
  $1 == "Evaluation" { for (i = 1; i <= NF; ++i) if ($i == name) wanted = i; next }
  /^[0-9]/ && $2 == "OK" && (last || found == "" || $wanted < found) { found = $wanted }
  END { printf "%.2f", found }'
best=$(awk -F '\t' -v name=Aggregate "$column" "$folder/short_Optimisation.dat")
awk -v best="$best" 'BEGIN { exit !(best > 5 && best < 15) }'
# The program and the tool agree on the final model run in both periods.
agree() { # column, tool, pairs, first day, last day
  ours=$(awk -F '\t' -v last=1 -v name="$1" "$column" "$folder/short_Optimisation.dat")
  fit=$("$2" "$folder/short_Process1/simulated.csv" "$folder/data/discharge.csv" "$4" "$5")
  echo "$1 $ours; final series: $fit"
  case $fit in
    "$3 values, "*"RMSE $ours,"*) ;;
    *) exit 1 ;;
  esac
}
agree Aggregate "$2" 3287 1981-10-01 1990-09-30
agree 'Discharge RMSE in 1991 to 2000' "$2" 3653 1991-01-01 2000-12-31

cp "$3"/sensitivity.kdx "$3"/scenarios.kdx "$folder"
sed 's/Trajectories = .*/Trajectories = 10/' "$3/morris.kdx" >"$folder/morris.kdx"
sed 's/Sample_Size      = .*/Sample_Size      = 20/' "$3/uncertainty.kdx" >"$folder/uncertainty.kdx"
sed 's/Sample_Size      = 2048/Sample_Size      = 32/' "$3/glue.kdx" >"$folder/glue.kdx"
for task in sensitivity morris scenarios uncertainty glue; do
  VOLK_PROGRESS=NONE "$1" "$folder/$task.kdx" || { cat "$folder/$task.log"; exit 1; }
done
grep -q '^# *1\. X4 ' "$folder/sensitivity_Sensitivity.dat"
grep -q '^objective	Discharge	X4	' "$folder/morris_Morris.dat"
grep -q '^# Standard error of a residual: 11\.7' "$folder/sensitivity_Sensitivity.dat"
awk -F '\t' '$1 == 2 { found = $9 > 11.7 && $9 < 11.8 } END { exit !found }' "$folder/scenarios.dat"
test "$(wc -l <"$folder/uncertainty_Band_1.csv")" -eq 3289
# A band over the years of calibration and the ten that follow.
test "$(wc -l <"$folder/glue_Band_1.csv")" -eq 7034
grep -q '^# Band of NSE in 1991 to 2000 (validation): [1-9][0-9.]* % of 3653 observations lie ' "$folder/glue.dat"

# A few generations of the chains: the bands reach over the same years, and the errors make the total one the wider.
sed 's/Sample_Size      = 20000/Sample_Size      = 80/' "$3/dream.kdx" >"$folder/dream.kdx"
VOLK_PROGRESS=NONE "$1" "$folder/dream.kdx" || { cat "$folder/dream.log"; exit 1; }
test "$(grep -c '^phi of Discharge RMSE	' "$folder/dream_Posterior.dat")" -eq 1
share() { sed -n "s/^Band of $1 uncertainty of Discharge RMSE in 1991 to 2000 (validation): \([0-9.]*\) % of 3653 .*/\1/p" "$folder/dream.log"; }
awk -v parameters="$(share parameter)" -v all="$(share total)" 'BEGIN { exit !(parameters != "" && parameters + 0 < all + 0) }'
test "$(wc -l <"$folder/dream_TotalBand_1.csv")" -eq 7034

# A few blocks of the Sobol' analysis: 256 model runs.
sed 's/Sample_Size    = .*/Sample_Size    = 32/' "$3/sobol.kdx" >"$folder/sobol.kdx"
VOLK_PROGRESS=NONE "$1" "$folder/sobol.kdx" || { cat "$folder/sobol.log"; exit 1; }
test "$(grep -c '^objective	Discharge	.*	total	' "$folder/sobol_Sobol.dat")" -eq 6
test "$(wc -l <"$folder/sobol_SobolSeries_1.csv")" -eq 3289
