#!/usr/bin/env bash
# Holds the include edges between the folders of src against the table of docs/architecture.md, and third-party
# headers to platform/*.cpp. Exits 1 naming each include that points where it must not.
set -u
root=$1
declare -A allowed=(
  [common]="common"
  [platform]="platform common"
  [parameters]="parameters common platform"
  [measures]="measures common platform"
  [evaluation]="evaluation common platform parameters measures"
  [algorithms]="algorithms common parameters measures evaluation"
  [report]="report common platform parameters measures"
  [viewer]="viewer common platform"
  [run]="run common platform parameters measures evaluation algorithms report viewer"
)
bad=0
checked=0
while IFS=: read -r file line text; do
  folder=${file#"$root"/src/}
  folder=${folder%%/*}
  target=${text#*\"}
  target=${target%%/*}
  checked=$((checked + 1))
  case " ${allowed[$folder]-} " in
    *" $target "*) ;;
    *) echo "$file:$line: $folder/ must not include $target/"; bad=1 ;;
  esac
done < <(grep -rnE '^#include "[^"/]+/' "$root/src" --include='*.h' --include='*.cpp')
while IFS=: read -r file line text; do
  case "$file" in
    "$root"/src/platform/*.cpp) ;;
    *) echo "$file:$line: third-party headers of the platform belong in platform/*.cpp"; bad=1 ;;
  esac
done < <(grep -rnE '^#include <(muParser|netcdf|mpi)' "$root/src")
[ "$checked" -gt 0 ] || { echo "no include was found below $root/src"; exit 1; }
exit $bad
