# shellcheck shell=bash
# Sourced by scripts that try the built program in the root of the tree, build/release being built.

# makeBasin FOLDER [PLACEHOLDER=VALUE]...: the model and the setup of the integration tests, basin.kdx, in a new or
# earlier folder. Without further arguments a DDS of 30 evaluations on one slot.
makeBasin() {
  local folder=$1 name edits=()
  shift
  local -A values=([option]=2 [restart]=0 [batchFile]=model/test_model [modelArguments]='--sleep-ms 0' [aggregation]=0
    [savedCount]=0 [savedFiles]='' [surrogate]='' [scenarioType]=0 [scenarioCount]=0 [scenarios]='' [algorithm]=2
    [includesInitial:d]=1 [slots]=1 [processFolder]='' [maxEvaluations]=30)
  for setting in "$@"; do values[${setting%%=*}]=${setting#*=}; done
  for name in "${!values[@]}"; do edits+=(-e "s|{$name}|${values[$name]}|"); done
  mkdir -p "$folder/model"
  cp build/release/test_model "$folder/model/"
  printf 'a = 5\nb = 2\nc = 1\n' >"$folder/model/parameters.txt"
  printf '!\na = !a              !\nb = !b              !\nc = !c              !\n' >"$folder/model/parameters.tpl"
  [[ -e $folder/observed.csv ]] || (cd "$folder/model" && ./test_model && cp simulated.csv ../observed.csv)
  sed "${edits[@]}" tests/integration/basin.kdx >"$folder/basin.kdx"
}
