#!/usr/bin/env bash
# What scripts/install-dependencies says where packages are missing and cannot be installed or apt fails, with stand-ins
# for the system's programs, and that scripts/with-progress shows what a failed command printed. Exits 1 naming each
# fault.
set -u
root=$1
bad=0
fault() { echo "$*"; bad=1; }
stand=$(mktemp -d)
trap 'rm -rf "$stand"' EXIT
export PATH=$stand:$PATH TERM=dumb

standIn() {
  printf '#!/bin/sh\n%s\n' "$2" >"$stand/$1"
  chmod +x "$stand/$1"
}
standIn dpkg-query 'case "$*" in *libfmt-dev | *cppcheck | *slurmd) exit 1 ;; esac; echo "install ok installed"'
standIn node ''
standIn npm ''

# Arguments: user id, exit code, a text that is printed, then those of the script.
expect() {
  standIn id "echo $1"
  local code=$2 text=$3 printed
  shift 3
  printed=$("$root/scripts/install-dependencies" "$@" 2>&1 </dev/null)
  [ $? -eq "$code" ] || fault "install-dependencies $*: the exit code is not $code"
  case "$printed" in
    *"$text"*) ;;
    *) fault "install-dependencies $*: not printed: $text; but: $printed" ;;
  esac
}
standIn sudo 'exit 1'
standIn apt-get 'echo "apt-get was run"; exit 100'
expect 1000 1 "apt-get install --no-install-recommends libfmt-dev cppcheck"
expect 1000 1 "apt-get install --no-install-recommends libfmt-dev" build
expect 1000 1 "apt-get install --no-install-recommends slurmd" slurm
expect 0 100 "apt-get was run" build
standIn apt-get 'echo "apt-get was run"'
expect 0 0 "Installing these and what they need: done" build
standIn dpkg-query 'echo "install ok installed"'
expect 1000 0 "" build

printed=$("$root/scripts/with-progress" Building "$stand/log" sh -c 'echo said; printf unended; exit 7' 2>&1)
[ $? -eq 7 ] || fault "with-progress: the exit code is not 7"
case "$printed" in
  "said"*"unended"*"Building: failed with exit code 7") ;;
  *) fault "with-progress: $printed" ;;
esac
exit $bad
