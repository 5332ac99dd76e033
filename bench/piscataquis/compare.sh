#!/usr/bin/env bash
# What the analyses of examples/piscataquis say of one another. Runs them and searches, and prints from their tables:
# whether Morris' screening and Sobol' indices rank the parameters alike; whether the posterior of DREAM holds the best
# set that a search finds for the same likelihood; how much of the observed discharge lies in the 90 % bands, in the
# years that the analyses used and in ten years that they never saw. The figures in
# docs/examples/piscataquis-analyses.md come from here; its picture is bands.svg in the folder for results. About 55,000
# model runs and 5 GB. Runs that are finished in that folder are not made again.
#
#   bench/piscataquis/compare.sh [build folder] [folder for results]
set -euo pipefail
here=$(cd "$(dirname "$0")" && pwd)
build=$(cd "${1:-$here/../../build/release}" && pwd)
staged=$build/examples/piscataquis
if [ -n "${2:-}" ]; then
  mkdir -p "$2"
  work=$(cd "$2" && pwd)
else
  work=$(mktemp -d)
  trap 'rm -rf "$work"' EXIT
fi
cd "$work"
cp -R "$staged/model" "$staged/data" "$staged"/*.kdx .

# Errors of the form that dream.kdx estimates, and independent normal ones of one size for all discharges, for which the
# least root mean square error is the most likely.
sed -e "s/Likelihood .*=.*/Likelihood = 'normal'/" -e '/Box_Cox_Lambda/d' -e '/Error_Correlation/d' dream.kdx >normal.kdx
# The search for the largest likelihood of the first kind: a model that also writes how unlikely its discharge is.
lambda=$(awk '$1 == "Box_Cox_Lambda" { print $3 }' dream.kdx)
cp data/discharge.csv "$here/likelihood.awk" model
cat >model/likelihood.sh <<RUN
#!/bin/sh
./run.sh && awk -F, -v lambda=$lambda -f likelihood.awk simulated.csv discharge.csv >likelihood.txt
RUN
chmod +x model/likelihood.sh
(cd model && ./likelihood.sh)
# Its setup is the calibration with another measure.
awk '
  /\[VALIDATION_PERIODS\]/, /\[\/VALIDATION_PERIODS\]/ { next }
  /\[MEASURE_2\]/, /\[\/MEASURE_5\]/ { next }
  /\[(SIMULATION|OBSERVATION)_FILE\]|\[SHOWN_ABOVE\]/, /\[\/(SIMULATION_FILE|OBSERVATION_FILE|SHOWN_ABOVE)\]/ { next }
  { sub(/model\/run\.sh/, "model/likelihood.sh") }
  { sub(/Interface_Type = 0/, "Interface_Type = 1"); sub(/Discharge RMSE/, "Minus log-likelihood") }
  /\[OUTPUT_MEASURES\]/ { print; getline; sub(/5/, "1") }
  /\[OUTPUT_MEASURE_FILE\]/ { print; getline; sub(/\047\047/, "\047model/likelihood.txt\047") }
  { print }' piscataquis.kdx >likely.kdx

# The calibration once more from another seed.
sed '/Random_Seed/s/= 1/= 2/' piscataquis.kdx >seed2.kdx

for name in morris piscataquis seed2 likely glue sobol normal dream; do
  tail -n 1 "$name.log" 2>/dev/null | grep -q '^Normal termination' && continue
  begin=$EPOCHREALTIME
  VOLK_PROGRESS=NONE "$build/Mirevo" "$name.kdx" 2>"$name.err" || { cat "$name.err" >&2; exit 1; }
  awk -v n="$name" -v a="$begin" -v b="$EPOCHREALTIME" 'BEGIN { printf "%s.kdx took %.0f s\n", n, b - a }'
done

# Columns of a table by their headings: at["Index"].
heading='/^#/ { next } !hasHeading { for (i = 1; i <= NF; ++i) at[$i] = i; hasHeading = 1; next }'

# Ranks of mu* beside those of ST. Arguments: a title, kind and name of an output in each table.
sensitivities() {
  awk -F '\t' -v title="$1" -v kind="$2" -v first="$3" -v second="$4" '
    FNR == 1 { ++file; hasHeading = 0 }
    /^#/ { next }
    !hasHeading { delete at; for (i = 1; i <= NF; ++i) at[$i] = i; hasHeading = 1; next }
    file == 1 && $1 == kind && $2 == first {
      names[++n] = $at["Parameter"]; mu[n] = $at["MuStar"]; root[n] = $at["Mu"] ^ 2 + $at["Sigma"] ^ 2; rank[n] = $at["Rank"]
      from[n] = $at["RankLower"]; upTo[n] = $at["RankUpper"]
      limits[n] = sprintf("%.3g to %.3g", $at["MuStarLower"], $at["MuStarUpper"])
    }
    file == 2 && $1 == "objective" && $2 == second && $at["Order"] == "total" {
      total[$at["Parameter"]] = $at["Index"]
      range[$at["Parameter"]] = sprintf("%.2g to %.2g", $at["Lower"], $at["Upper"])
      lower[$at["Parameter"]] = $at["Lower"]; upper[$at["Parameter"]] = $at["Upper"]
    }
    END {
      printf "\n%s\n%-10s %9s %18s %5s %9s   %9s %18s %5s %9s\n", title, "", "mu*", "limits", "rank", "may be", "ST",
        "limits", "rank", "may be"
      for (i = 1; i <= n; ++i) {
        place = least = 1; most = n
        for (j = 1; j <= n; ++j) {
          place += total[names[j]] > total[names[i]]
          least += lower[names[j]] > upper[names[i]]
          most -= upper[names[j]] < lower[names[i]]
        }
        squares += (place - rank[i]) ^ 2
        bySquare = 1
        for (j = 1; j <= n; ++j) bySquare += root[j] > root[i]
        ofRoots += (place - bySquare) ^ 2
        common += rank[i] <= 3 && place <= 3
        allowed += from[i] <= most && least <= upTo[i]
        lines[rank[i]] = sprintf("%-10s %9.3g %18s %5d %9s   %9.2g %18s %5d %9s", names[i], mu[i], limits[i], rank[i],
          from[i] " to " upTo[i], total[names[i]], range[names[i]], place, least " to " most)
      }
      for (i = 1; i <= n; ++i) print lines[i]
      printf "Rank correlation of mu* and ST %.2f; %d of the first three are the same; ", 1 - 6 * squares / (n * (n * n - 1)), common
      printf "%d of %d parameters have a rank that the limits of both allow\n", allowed, n
      printf "Rank correlation of mu^2 + sigma^2, the mean squared effect, and ST %.2f\n", 1 - 6 * ofRoots / (n * (n * n - 1))
    }' morris_Morris.dat sobol_Sobol.dat
}
echo
echo "Morris and Sobol'"
sensitivities "Error of discharge (RMSE)" objective Discharge Discharge
sensitivities "Error of volume (bias in %)" measure 'Bias in %' Volume

# The best set of a search: its objective function, then the six parameters.
best() {
  awk -F '\t' "$heading"'
    $at["Status"] == "OK" && (found == "" || $at["Aggregate"] < least) {
      least = $at["Aggregate"]
      found = least " " $at["X1"] " " $at["X2"] " " $at["X3"] " " $at["X4"] " " $at["CTG"] " " $at["Kf"]
    }
    END { print found }' "$1"
}
# Where sets lie in a posterior. Arguments: the setup, and sets, each behind a name and its natural log-likelihood.
posterior() {
  local setup=$1
  shift
  awk -F '\t' "$heading"'
    { if ($at["R-hat"] > largest) largest = $at["R-hat"]
      if (fewest == "" || $at["Effective size"] < fewest) fewest = $at["Effective size"]
      if ($at["Kind"] == "error") printf "%s %.4g (%.4g to %.4g), ", $1, $at["Mean"], $at["5 %"], $at["95 %"] }
    { if ($at["R-hat"] > 1.05) wide = wide sprintf("%s %s", wide == "" ? "; R-hat above 1.05:" : ",", $1) }
    { if ($at["R-hat"] <= 1.05 && (ofOthers == "" || $at["Effective size"] < ofOthers)) ofOthers = $at["Effective size"] }
    END {
      printf "largest R-hat %.3f, least effective sample size %.0f%s", largest, fewest, wide
      if (wide != "") printf "; least effective sample size of the others %.0f", ofOthers
      print ""
    }' "${setup}_Posterior.dat"
  printf '%s\n' "$@" | awk '
    FNR == NR { names[++n] = $1; likely[n] = $2; for (j = 1; j <= 6; ++j) value[n, j] = $(j + 2); next }
    FNR == 1 { FS = "\t"; $0 = $0 }
    /^#/ { next }
    !hasHeading {
      for (i = 1; i <= NF; ++i) at[$i] = i
      p = split("X1 X2 X3 X4 CTG Kf", parameters, " ")
      hasHeading = 1
      next
    }
    $at["Burn_In"] == 0 {
      ++count
      if (top == "" || $at["Log_Likelihood"] > top) top = $at["Log_Likelihood"]
      sum += $at["Log_Likelihood"]
      for (j = 1; j <= p; ++j) for (k = 1; k <= n; ++k) below[k, j] += $at[parameters[j]] < value[k, j]
      for (j = 1; j <= p; ++j) print parameters[j] "\t" $at[parameters[j]] | "LC_ALL=C sort -t \"\t\" -k 1,1 -k 2,2g >sorted.tmp"
    }
    END {
      close("LC_ALL=C sort -t \"\t\" -k 1,1 -k 2,2g >sorted.tmp")
      while ((getline line <"sorted.tmp") > 0) {
        split(line, cells, "\t")
        place = ++seen[cells[1]]
        if (place == int(0.05 * count) + 1) low[cells[1]] = cells[2]
        if (place == int(0.95 * count)) high[cells[1]] = cells[2]
      }
      printf "%-5s %20s", "", "5 to 95 %"
      for (k = 1; k <= n; ++k) printf " %22s", names[k]
      print ""
      for (j = 1; j <= p; ++j) {
        printf "%-5s %9.4g to %8.4g", parameters[j], low[parameters[j]], high[parameters[j]]
        for (k = 1; k <= n; ++k) {
          inside[k] += value[k, j] >= low[parameters[j]] && value[k, j] <= high[parameters[j]]
          printf " %9.4g (at %6.2f %%)", value[k, j], 100 * below[k, j] / count
        }
        print ""
      }
      printf "%d states: log-likelihood %.1f on average, %.1f at most\n", count, sum / count, top
      for (k = 1; k <= n; ++k) {
        printf "%s: %d of 6 parameters are within 5 to 95 %%; log-likelihood %.1f\n", names[k], inside[k], likely[k]
      }
    }' - "${setup}_Chains.dat"
  rm -f sorted.tmp
}
# The largest natural log-likelihood, whatever the size and the correlation of the errors, of a set of parameters.
likelihood() { # six values
  (
    cd model
    sed -e "s/!X1 *!/$1/; s/!X2 *!/$2/; s/!X3 *!/$3/; s/!X4 *!/$4/; s/!CTG *!/$5/; s/!Kf *!/$6/; 1d" \
      parameters.tpl >parameters.txt
    ./likelihood.sh
    awk '{ print -$1 }' likelihood.txt
  )
}
read -r rmse bySquares < <(best piscataquis_Optimisation.dat)
read -r rmse2 bySquares2 < <(best seed2_Optimisation.dat)
read -r minus byLikelihood < <(best likely_Optimisation.dat)
days=$(awk -F '\t' "$heading"'{ print $at["Pairs"]; exit }' piscataquis_Optimisation_Pairs.dat)
normalOf() { awk -v e="$1" -v n="$days" 'BEGIN { print -n / 2 * (log(2 * 3.14159265358979 * e * e) + 1) }'; }
echo
echo "DREAM, dream.kdx: the best set of a search for the same likelihood, and that for the least RMSE ($(printf %.2f "$rmse") m3/s, $days days)"
# shellcheck disable=SC2086
likelyOfSquares=$(likelihood $bySquares)
posterior dream "most-likely $(awk -v x="$minus" 'BEGIN { print -x }') $byLikelihood" "least-RMSE $likelyOfSquares $bySquares"
# CTG has two peaks.
awk -F '\t' "$heading"'
  { isFar = $at["CTG"] > 0.25; if (isFar && $at["Burn_In"] == 0 && first == "") first = $at["Generation"]; last = $at["Generation"] }
  $at["Burn_In"] == 0 {
    far[$at["Chain"]] += isFar; ++n[$at["Chain"]]
    if (!(isFar in top) || $at["Log_Likelihood"] > top[isFar]) top[isFar] = $at["Log_Likelihood"]
  }
  END {
    printf "states with CTG above 0.25, of each chain:"
    for (chain = 1; chain in n; ++chain) printf " %.0f %%", 100 * far[chain] / n[chain]
    printf "; from generation %d of %d on; log-likelihood of the best of them %.1f, of the others %.1f\n", first, last, top[1], top[0]
  }' dream_Chains.dat
echo
echo "DREAM with independent normal errors, for which the least RMSE is the most likely: of seed 1 $(printf %.3f "$rmse"), of seed 2 $(printf %.3f "$rmse2")"
posterior normal "seed-1 $(normalOf "$rmse") $bySquares" "seed-2 $(normalOf "$rmse2") $bySquares2"

# How the observed discharge lies in a band, by period, year and size of the discharge. Arguments: title, file.
band() {
  awk -F, -v title="$1" '
    FNR == NR { if ($1 ~ /^[0-9]/ && $2 > -999) observed[substr($1, 1, 10)] = $2; next }
    $1 !~ /^[0-9]/ { next }
    {
      day = substr($1, 1, 10)
      if (!(day in observed)) next
      y = observed[day]
      isUsed = day >= "1981-10-01" && day <= "1990-09-30"
      isUnseen = day >= "1991-01-01" && day <= "2000-12-31"
      if (!isUsed && !isUnseen) next
      isIn = y >= $3 && y <= $5
      if (isUnseen) { under += y < $3; over += y > $5 }
      ++n[isUsed]; in_[isUsed] += isIn; width[isUsed] += $5 - $3; sum[isUsed] += y; middle[isUsed] += $4; squares[isUsed] += y * y
      if (isUsed) next
      year = substr(day, 1, 4); ++nOf[year]; inOf[year] += isIn
      class = y < 5 ? 1 : y < 20 ? 2 : y < 60 ? 3 : 4
      ++nClass[class]; inClass[class] += isIn
    }
    END {
      printf "%-34s", title
      for (used = 1; used >= 0; --used) {
        mean = sum[used] / n[used]
        printf " %6.1f %% %7.1f %5.2f", 100 * in_[used] / n[used], width[used] / n[used],
          width[used] / n[used] / sqrt(squares[used] / n[used] - mean * mean)
      }
      print ""
      line = "   unseen years:"
      for (year = 1991; year <= 2000; ++year) {
        line = line sprintf(" %d %.0f", year, 100 * inOf[year] / nOf[year])
        met += inOf[year] >= 0.9 * nOf[year]
      }
      print line " %; 90 % or more in " met " of 10"
      printf "   unseen days under the band %.1f %%, over it %.1f %%; volume of its median over that observed %+.0f %%, of used days %+.0f %%\n",
        100 * under / n[0], 100 * over / n[0], 100 * (middle[0] / sum[0] - 1), 100 * (middle[1] / sum[1] - 1)
      printf "   unseen days below 5 m3/s %.1f %%, 5 to 20 %.1f %%, 20 to 60 %.1f %%, above %.1f %%\n",
        100 * inClass[1] / nClass[1], 100 * inClass[2] / nClass[2], 100 * inClass[3] / nClass[3], 100 * inClass[4] / nClass[4]
    }' data/discharge.csv "$2"
}
echo
echo "Observed discharge between the 5 and the 95 % quantile, and how wide that is: mean, m3/s, and in standard deviations"
printf '%-34s %23s %23s\n' '' 'Oct 1981 to Sep 1990' '1991 to 2000, unseen'
band 'GLUE' glue_Band_1.csv
band 'DREAM, parameters alone' dream_Band_1.csv
band 'DREAM, total' dream_TotalBand_1.csv
band 'DREAM, normal errors, total' normal_TotalBand_1.csv
awk -v year=1997 -f "$here/bands_picture.awk" data/discharge.csv dream_TotalBand_1.csv dream_Band_1.csv >bands.svg
