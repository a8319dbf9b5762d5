#!/bin/bash
# Times the live reports beside the programs that show the same of this machine, in turn, in one run.
#
# Usage: bench/live/live.sh [TALLY [RUNS [PROCESSES]]]     (build/tally, 51 runs of each)
#
# PROCESSES is how many processes are started in addition, which sleep meanwhile.
# Prints the median time of each in milliseconds, and how many lines it printed.
source "$(dirname "${BASH_SOURCE[0]}")/../../scripts/setup"
no_options "$@"

tally=${1:-build/tally}
runs=${2:-51}
processes=${3:-0}
[[ -x $tally ]] || misused "$tally is no program"

# report options | the other program
pairs=(
  "heap-stats | slabtop -o"
  "group-stats | systemd-cgtop -b -n 1"
  "group-stats | ps -eo pid,comm,vsz,rss"
  "uw-stats | ps -eo pid,comm,vsz,rss"
)

# In a process group of their own, which ends as one.
if ((processes > 0)); then
  setsid bash -c 'for ((i = 0; i < $1; ++i)); do sleep 3600 & done; wait' - "$processes" &
  trap 'kill -- -$!' EXIT
  sleep 2
fi

# Prints the median of the numbers on standard input.
median() { sort -n | awk '{ at[NR] = $1 } END { print at[int((NR + 1) / 2)] }'; }

# Runs a command and prints how long it took, in microseconds.
time_of() {
  local start=${EPOCHREALTIME/./}
  "$@" >/dev/null 2>&1
  echo $((${EPOCHREALTIME/./} - start))
}

milliseconds() { awk -v us="$1" 'BEGIN { printf "%.2f", us / 1000 }'; }

printf '%-36s %10s %8s\n' command 'median/ms' lines
for pair in "${pairs[@]}"; do
  read -ra ours <<<"$tally -r ${pair%%|*}"
  read -ra other <<<"${pair#*|}"
  if ! command -v "${other[0]}" >/dev/null; then
    echo "${other[0]} is not installed: left out" >&2
    continue
  fi
  ours_times=() other_times=()
  for ((i = 0; i < runs; ++i)); do
    ours_times+=("$(time_of "${ours[@]}")")
    other_times+=("$(time_of "${other[@]}")")
  done
  printf '%-36s %10s %8d\n' "tally ${ours[*]:1}" \
    "$(milliseconds "$(printf '%s\n' "${ours_times[@]}" | median)")" \
    "$("${ours[@]}" 2>/dev/null | wc -l)"
  printf '%-36s %10s %8d\n' "${other[*]}" \
    "$(milliseconds "$(printf '%s\n' "${other_times[@]}" | median)")" \
    "$("${other[@]}" 2>/dev/null | wc -l)"
done
