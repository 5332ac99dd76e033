#!/usr/bin/env bash
# How busy 8 slots are in a search by PDDS with the built program and a model that sleeps, so that it does not matter how
# many cores the machine has: a second each time, or exponentially distributed with a mean of a second. Prints what the
# logs say, some 50 seconds for each row. Needs the target mpi_job_folder. The figures of docs/algorithms/pdds.md come
# from here.
#
#   bench/search/slots_busy.sh [build folder] [evaluations]
set -euo pipefail
root=$(cd "$(dirname "$0")/../.." && pwd)
build=$(cd "${1:-$root/build/release}" && pwd)
evaluations=${2:-400}
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
"$build/mpi_job_folder" "$work" 1 0
cd "$work"
mv model/run.sh model/model.sh

# The time depends on the parameters alone, so that a search is the same with any number of candidates under way.
write_model() { # kind
  cat > model/run.sh <<SCRIPT
#!/bin/sh
sleep \$(cksum < parameters.txt | awk -v kind=$1 '{ print kind == "equal" ? 1 : -log((\$1 + 0.5) / 4294967296) }')
exec ./model.sh "\$@"
SCRIPT
  chmod +x model/run.sh
}

cp basin.kdx form.kdx
write_setup() { # candidates, whether it waits for all
  sed -E -e "s/(^ *Option) = .*/\1 = 2/; s/(Algorithm_Type) = .*/\1 = 'PDDS'/; s/(Max_No_Evaluations) = .*/\1 = $evaluations/" \
    -e "s/(NoSimultaneousSim) = .*/\1 = 8/; s/^( *)Candidates = .*/\1Candidates = $1\n\1Wait_For_All = $2/" \
    form.kdx > basin.kdx
}

echo "machine: $(nproc) cores, load $(cut -d' ' -f1 /proc/loadavg); $evaluations evaluations"
for case in "equal 8 0" "equal 16 0" "exponential 8 0" "exponential 16 0" "exponential 24 0" "exponential 32 0" \
  "exponential 16 1"; do
  read -r kind candidates waits <<< "$case"
  write_model "$kind"
  write_setup "$candidates" "$waits"
  rm -f basin*.dat basin.log
  "$build/Mirevo" basin.kdx
  echo "$kind run times, Candidates = $candidates, Wait_For_All = $waits: $(grep -oE 'busy for [0-9]+ %' basin.log)"
done
