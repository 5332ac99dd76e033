#!/usr/bin/env bash
# Holds every include of src to the rooms of src/CMakeLists.txt: a room includes itself and the rooms that it lists, and
# lists only rooms that stand before it, so that no circle can arise. Third-party headers of the platform stay in
# platform/*.cpp, and the table of docs/architecture.md has the same rooms in the same order. Exits 1 naming each fault.
set -u
root=$1
bad=0
fault() { echo "$*"; bad=1; }

declare -A allowed=()
rooms=()
while read -r room others; do
  for other in $others; do
    [ -n "${allowed[$other]-}" ] || fault "src/CMakeLists.txt: $room lists $other, which does not stand before it"
  done
  rooms+=("$room")
  allowed[$room]="$room $others"
done < <(sed 's/#.*//' "$root/src/CMakeLists.txt" | tr '\n' ' ' | grep -oE 'mirevo_room\([^)]*\)' |
  sed -E 's/mirevo_room\(([^)]*)\)/\1/')

# The innermost room that holds a path below src.
roomOf() {
  local folder=$1
  while [ "$folder" != . ]; do
    [ -n "${allowed[$folder]-}" ] && { echo "$folder"; return; }
    folder=$(dirname "$folder")
  done
}
declare -A roomOfFolder=()
while read -r folder; do
  roomOfFolder[$folder]=$(roomOf "$folder")
done < <(cd "$root/src" && find . -mindepth 1 -type d | sed 's|^\./||')

checked=0
while IFS=: read -r file line text; do
  folder=${file#"$root"/src/}
  folder=${folder%/*}
  target=${text#*\"}
  target=${target%%\"*}
  checked=$((checked + 1))
  case "$target" in
    */*) target=${target%/*} ;;
    *) fault "$file:$line: $target must be included with its folder"; continue ;;
  esac
  room=${roomOfFolder[$folder]-}
  wanted=${roomOfFolder[$target]-}
  case " ${allowed[$room]-} " in
    *" ${wanted:-none} "*) ;;
    *) fault "$file:$line: $folder must not include $target" ;;
  esac
done < <(grep -rnE '^\s*#\s*include\s*"' "$root/src" --include='*.h' --include='*.cpp')
[ "$checked" -gt 0 ] || fault "no include was found below $root/src"

while IFS=: read -r file line _; do
  case "$file" in
    "$root"/src/platform/*.cpp) ;;
    *) fault "$file:$line: third-party headers of the platform belong in platform/*.cpp" ;;
  esac
done < <(grep -rnE '^#include <(muParser|netcdf|pugixml|mpi)' "$root/src")

documented=$(grep -oE '^\| `src/[a-z/]+/`' "$root/docs/architecture.md" | sed -E 's/.*`src\/(.*)\/`/\1/')
[ "$documented" = "$(printf '%s\n' "${rooms[@]}")" ] ||
  fault "docs/architecture.md: its table has other rooms than src/CMakeLists.txt, or in another order"
exit $bad
