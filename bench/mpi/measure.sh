#!/usr/bin/env bash
# Measures MPI jobs of the built program on this machine, with all ranks sharing its cores; the model sleeps, so that
# many fit. Needs mpirun and the target mpi_job_folder. The figures in docs/clusters.md come from here.
#
#   bench/mpi/measure.sh [build folder] [another Mirevo to compare the start-up with]
set -euo pipefail
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
