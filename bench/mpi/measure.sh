#!/usr/bin/env bash
# Measures MPI jobs of the built program on this machine, with all ranks sharing its cores; the model sleeps, so that
# many fit. Needs mpirun and the target mpi_job_folder. The figures in docs/clusters.md come from here.
#
#   bench/mpi/measure.sh [build folder] [another Mirevo to compare the start-up with]
#   bench/mpi/measure.sh --scale [build folder] [numbers of workers]
#
# --scale: what a set costs the master, and what memory master and workers take, for each number of workers (8 64 256).
set -euo pipefail
scale=0
[ "${1:-}" != --scale ] || { scale=1; shift; }
root=$(cd "$(dirname "$0")/../.." && pwd)
build=$(cd "${1:-$root/build/release}" && pwd)
other=${2:-}
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
cd "$work"
export OMPI_MCA_btl=self,vader OMPI_MCA_btl_vader_single_copy_mechanism=none

# Makes a folder with as many model runs as the first argument, each sleeping for the milliseconds of the second.
write_setup() { "$build/mpi_job_folder" "$work" "$1" "$2"; }

job() { mpirun --oversubscribe --allow-run-as-root --bind-to none -n "$1" "$build/Mirevo" basin.kdx; }

# Seconds from the first to the last row of the result file, and the number of rows in between, without the start of the
# job. The file is checked every 10 ms.
evaluation_rate() { # ranks
  rm -f basin*.dat
  job "$1" &
  local first='' last='' first_rows=0 last_rows=0 rows=0 seen=0 now
  while kill -0 $! 2>/dev/null; do
    if [ -e basin.dat ]; then
      rows=$(grep -c OK basin.dat || true)
      now=$EPOCHREALTIME
      if [ "$rows" -gt "$seen" ]; then
        [ -n "$first" ] || { first=$now; first_rows=$rows; }
        last=$now last_rows=$rows seen=$rows
      fi
    fi
    sleep 0.01
  done
  wait $!
  awk -v a="$first" -v b="$last" -v n=$((last_rows - first_rows)) 'BEGIN { printf "%.3f", n / (b - a) }'
}

mean_milliseconds() { # command...
  local start=$EPOCHREALTIME
  for _ in {1..100}; do "$@" >/dev/null; done
  awk -v a="$start" -v b="$EPOCHREALTIME" 'BEGIN { printf "%.2f ms", (b - a) * 10 }'
}

# The process of a rank of this job, in one look at all processes. Models do not have the variable.
rank_process() { # rank
  local process
  for process in $(grep -lz "^OMPI_COMM_WORLD_RANK=$1\$" /proc/[0-9]*/environ 2>/dev/null); do
    process=${process//[!0-9]/}
    [ "$(readlink "/proc/$process/cwd")" != "$work" ] || { echo "$process"; return; }
  done
}

own_memory() { awk '/^RssAnon/ { print $2 / 1024 }' "/proc/$1/status" 2>/dev/null || true; } # process

# Processor time of the master for one set, from its 20th row to its end, and memory of master and of a worker, in MB
# (anonymous, as program and libraries are shared). Sampled until the job ends.
cost_of_scale() { # workers, milliseconds of the model, sets
  write_setup "$3" "$2"
  rm -f basin*.dat
  job $(($1 + 1)) >/dev/null 2>&1 &
  local job=$! master='' worker='' first='' last='' rows=0 first_rows=0 last_rows=0 first_time=0 last_time=0 memory=0 theirs=0 now stat
  while kill -0 $job 2>/dev/null; do
    if [ -z "$master" ] && [ -e basin.dat ]; then
      master=$(rank_process 0)
      worker=$(rank_process 1)
    fi
    if [ -n "$master" ] && read -r -a stat 2>/dev/null <"/proc/$master/stat"; then
      rows=$(grep -c OK basin.dat || true)
      if [ "$rows" -ge 20 ]; then
        now=$((stat[13] + stat[14]))
        [ -n "$first" ] || { first=$now first_rows=$rows first_time=$EPOCHREALTIME; }
        if [ "$rows" -gt "$last_rows" ]; then last=$now last_rows=$rows last_time=$EPOCHREALTIME; fi
      fi
      now=$(own_memory "$master")
      memory=${now:-$memory}
      [ -z "$worker" ] || now=$(own_memory "$worker")
      [ -z "$worker" ] || theirs=${now:-$theirs}
    fi
    sleep 0.1
  done
  wait $job
  awk -v w="$1" -v ms="$2" -v a="${first:-0}" -v b="${last:-0}" -v n=$((last_rows - first_rows)) -v m="${memory:-0}" \
    -v v="${theirs:-0}" -v s="$first_time" -v e="$last_time" -v hz="$(getconf CLK_TCK)" 'BEGIN {
      if (n == 0) { print "  1+" w " ranks, " ms " ms: over too soon to be measured"; exit }
      printf "  1+%d ranks, %d ms: %.2f ms of the master and %.1f sets a second; master %.1f MB, a worker %.1f MB\n",
        w, ms, (b - a) / hz * 1000 / n, n / (e - s), m, v }'
}

if [ $scale = 1 ]; then
  shift $(($# > 0 ? 1 : 0))
  echo "machine: $(nproc) cores, load $(cut -d' ' -f1 /proc/loadavg)"
  for workers in ${@:-8 64 256}; do
    cost_of_scale "$workers" 10 $((workers * 10 + 1000))
    cost_of_scale "$workers" 1000 $((workers * 10))
  done
  exit
fi

echo "machine: $(nproc) cores, load $(cut -d' ' -f1 /proc/loadavg)"
echo "start and end of the program (--version, mean of 100): $(mean_milliseconds "$build/Mirevo" --version)"
[ -z "$other" ] || echo "  the same of $other: $(mean_milliseconds "$other" --version)"

write_setup 200 100
rate=$(evaluation_rate 9)
awk -v r="$rate" 'BEGIN { printf "200 runs of 100 ms on 1+8 ranks: %.1f a second, %.3f of the ideal 80\n", r, r / 80 }'

write_setup 1 12000
job 3 &
sleep 3
ticks() { # processor time of the ranks of this job, in order of start
  for process in $(pgrep -x Mirevo); do
    [ "$(readlink "/proc/$process/cwd")" != "$work" ] || awk '{ print $1, $14 + $15 }' "/proc/$process/stat"
  done
}
before=$(ticks)
sleep 8
after=$(ticks)
wait $!
echo "share of a core over 8 s in which one worker's model runs and the other one waits, master first:"
paste <(echo "$before") <(echo "$after") | awk -v hz="$(getconf CLK_TCK)" '{ printf "  %.2f %%\n", ($4 - $2) / hz / 8 * 100 }'

echo "evaluations a second of a 50 ms model, and share of the ideal:"
for workers in 1 2 4 8 16 32 63; do
  write_setup $((workers * 40)) 50
  rate=$(evaluation_rate $((workers + 1)))
  awk -v w=$workers -v r="$rate" 'BEGIN { printf "  1+%d ranks: %.1f, %.2f\n", w, r, r / (w * 20) }'
done
