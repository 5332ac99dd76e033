#!/bin/sh
# The staged example runs as it stands, in a shortened form: two slots, a result that is better than the initial sample, an
# aggregate on the scale that the results name, and final series whose errors are those of the best set at both gauges.
# Usage: sitter_runs.sh MIREVO SERIES_STATISTICS STAGED_EXAMPLE
set -eu
folder=$(mktemp -d)
trap 'rm -rf "$folder"' EXIT
cp -R "$3/model" "$3/data" "$folder"
sed 's/Max_No_Evaluations .*/Max_No_Evaluations = 200/' "$3/sitter.kdx" >"$folder/short.kdx"

sed 's/ Option = 2/ Option = 0/; s/Aggregation_Method = 1/Aggregation_Method = 0/' "$3/sitter.kdx" >"$folder/once.kdx"
VOLK_PROGRESS=NONE "$1" "$folder/once.kdx" || { cat "$folder/once.log"; exit 1; }
awk -F '\t' '$1 == 1 { printf "one run with the initial values: %.2f %.2f\n", $(NF - 2), $(NF - 1) }' "$folder/once.dat" |
  grep '2\.29 6\.84$'

VOLK_PROGRESS=NONE "$1" "$folder/short.kdx" || { cat "$folder/short.log"; exit 1; }

# The row of the best set, its aggregate computed by hand, and the best values of the initial sample on the common
# scale.
best=$(awk -F '\t' '
  /^# Scale of / { scale = $0; gsub(/[^0-9.=]/, "", scale); split(scale, part, "="); n++; sigma[n] = part[2]; mu[n] = part[3] }
  /^[0-9]/ { count++; if ($2 != "OK") exit 1; a[count] = $(NF - 2); s[count] = $(NF - 1); f[count] = $NF }
  function least(x, first, last,   i, m) { m = x[first]; for (i = first; i <= last; i++) if (x[i] < m) m = x[i]; return m }
  function differ(x, y) { return x - y > 1e-9 || y - x > 1e-9 }
  END {
    if (n != 2 || count < 185) { print "scales", n, "rows", count; exit 1 }
    if (differ(least(a, 1, 92) / sigma[1] + mu[1], least(s, 1, 92) / sigma[2] + mu[2])) { print "distances differ"; exit 1 }
    for (i = 1; i <= count; i++)
      if (differ(f[i], a[i] / sigma[1] + mu[1] + s[i] / sigma[2] + mu[2])) { print "aggregate of", i; exit 1 }
    if (f[count] != least(f, 1, count) || f[count] > least(f, 1, 92)) { print "the last is not the best"; exit 1 }
    printf "%.2f %.2f", a[count], s[count]
  }' "$folder/short_Optimisation.dat") || { echo "$best"; exit 1; }
echo "best RMSE at Appenzell and St. Gallen: $best"

fit() { "$2" "$folder/short_Process1/$3" "$folder/data/discharge.csv" 1982-10-01 1992-09-30 1 "$4"; }
for gauge in "upper.csv 1 ${best% *}" "st_gallen.csv 2 ${best#* }"; do
  set -- "$1" "$2" $gauge
  line=$(fit "$1" "$2" "$3" "$4")
  echo "$3: $line"
  case $line in
    "3653 values, "*"RMSE $5,"*) ;;
    *) exit 1 ;;
  esac
done
test -d "$folder/short_Process2"
