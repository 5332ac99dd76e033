#!/usr/bin/env bash
# Measures how long the process folders of a large model take to make, beside a copy with `cp -r` for each slot in the
# same run: a base folder of 264 MB (four files of 52 MB, 8000 of 8 kB), 8 slots, one run of a shell script in each. The
# figures in docs/performance.md come from here.
#
#   bench/folders/measure.sh [build folder] [folder on the disk to be measured]
set -euo pipefail
root=$(cd "$(dirname "$0")/../.." && pwd)
build=$(cd "${1:-$root/build/release}" && pwd)
slots=8
work=$(mktemp -d -p "${2:-${TMPDIR:-/tmp}}")
trap 'rm -rf "$work"' EXIT
cd "$work"

mkdir -p model/grid
for i in 1 2 3 4; do head -c 50M /dev/urandom >"model/forcing_$i.bin"; done
for folder in {00..79}; do
  mkdir "model/grid/$folder"
  head -c 800000 /dev/urandom | split -b 8000 -a 3 -d - "model/grid/$folder/cell_"
done
chmod a-w model/forcing_*.bin
cat >model/run.sh <<'END'
#!/bin/sh
read -r value <parameters.txt
{ echo time,flow; for day in 1 2 3 4 5; do echo "2001-01-0$day,$value"; done; } >simulated.csv
END
chmod +x model/run.sh
echo 1 >model/parameters.txt
printf '#\n#a        #\n' >model/parameters.tpl
(cd model && ./run.sh)
cp model/simulated.csv observed.csv

# Writes the setup; the argument is a line for its section SimultaneousSimulations.
write_setup() {
  {
    cat <<'END'
[MIREVO_PARAMETERS]
  [MIREVO_SIMULATION_OPTION]
    Option = 0
    [SIMBATCH]
      TqSEKdxListItemCount = 1
      [SIMBATCHITEM_1]
        BatchFileName = 'model/run.sh'
      [/SIMBATCHITEM_1]
    [/SIMBATCH]
    [SIMPARAM]
      TqSEKdxListItemCount = 1
      [SIMPARAMITEM_1]
        FileType = 'delimiter'
        ParamFileName = 'model/parameters.txt'
        TemplateFileName = 'model/parameters.tpl'
      [/SIMPARAMITEM_1]
    [/SIMPARAM]
  [/MIREVO_SIMULATION_OPTION]
  [MODEL_PARAMETERS]
    TqSEKdxListItemCount = 1
    [PARAMETER_1]
      Initial_Value = 4.0
      Lower_Bound = 0.0
      Upper_Bound = 10.0
      Parameter_Name = 'a'
    [/PARAMETER_1]
    [INTERNAL_CONSTRAINTS]
    [/INTERNAL_CONSTRAINTS]
  [/MODEL_PARAMETERS]
  [ObjectiveFunctions]
    Start_Date = 2001-01-01
    End_Date = 2001-01-05
    [OUTPUT_MEASURES]
      TqSEKdxListItemCount = 1
      [MEASURE_1]
        Name = 'rms'
        Statistic_Type = 1
        Function_Name = 'flow'
        [SIMULATION_FILE]
          File_Name = 'model/simulated.csv'
          Item_No = 1
        [/SIMULATION_FILE]
        [OBSERVATION_FILE]
          File_Name = 'observed.csv'
          Item_No = 1
        [/OBSERVATION_FILE]
      [/MEASURE_1]
      [OUTPUT_MEASURE_FILE]
      [/OUTPUT_MEASURE_FILE]
    [/OUTPUT_MEASURES]
    [OBJECTIVE_FUNCTIONS]
      TqSEKdxListItemCount = 1
      [OBJECTIVE_1]
        Name = 'flow'
        Function_Type = 0
      [/OBJECTIVE_1]
    [/OBJECTIVE_FUNCTIONS]
  [/ObjectiveFunctions]
  [SimultaneousSimulations]
    NoSimultaneousSim = 8
END
    echo "    $1"
    cat <<'END'
  [/SimultaneousSimulations]
  [SAVE_OUTPUT_FILES]
  [/SAVE_OUTPUT_FILES]
  [SCENARIOS]
    Scenario_Type = 1
    [SCENARIO_RUNS]
      TqSEKdxListItemCount = 8
END
    for i in $(seq $slots); do
      printf '      [SCENARIO_%s]\n        Parameters = %s\n      [/SCENARIO_%s]\n' "$i" "$i" "$i"
    done
    cat <<'END'
    [/SCENARIO_RUNS]
  [/SCENARIOS]
[/MIREVO_PARAMETERS]
END
  } >basin.kdx
}

# What the command takes, beside how long writing the copies to the disk goes on afterwards.
measure() { # text, command...
  local text=$1 begin end written
  shift
  sync
  begin=$EPOCHREALTIME
  "$@"
  end=$EPOCHREALTIME
  sync
  written=$EPOCHREALTIME
  awk -v t="$text" -v a="$begin" -v b="$end" -v c="$written" 'BEGIN { printf "%-52s %6.1f s, to disk %5.1f s\n", t, b - a, c - a }'
}
run() { "$build/Mirevo" basin.kdx; }
copy_each() { for i in $(seq $slots); do cp -r model "copy_$i"; done; }

echo "machine: $(nproc) cores, load $(cut -d' ' -f1 /proc/loadavg), file system $(stat -f -c %T .)," \
  "$(du -sm model | cut -f1) MB, $(find model -type f | wc -l) files, $slots slots"
write_setup ''
measure "cp -r once for each slot" copy_each
measure "  removing these copies" rm -rf copy_*
measure "first run" run
measure "second run" run
measure "third run" run
cp -p model/grid/00/cell_000 model/grid/00/cell_001
measure "a run after one file has changed" run
rm -rf basin_Process*
write_setup 'Link_Read_Only_Files = 1'
measure "first run with Link_Read_Only_Files = 1" run
