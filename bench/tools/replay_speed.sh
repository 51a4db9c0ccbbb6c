#!/bin/bash
# How fast `tolkatouch replay --fast --json` plays a long recording: a synthesised document of
# exactly 100,000 image frames (about 13 minutes of touching: the everyday example session over
# and over), played three times; prints the best wall-clock time and that run's processor time.
#
#   bench/tools/replay_speed.sh <path to a Release build of tolkatouch> [frames]
set -euo pipefail

tolkatouch=${1:?usage: $0 <path to tolkatouch> [frames]}
frames=${2:-100000}
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

source "$(dirname "$0")/../long_session.sh"
synth_long_session "$tolkatouch" "$frames" "$work/long.json"
actual=$(grep -c '"Type": "InputReport"' "$work/long.json")
size=$(stat -c %s "$work/long.json")

# Wall-clock and processor seconds (user + system) of each run; the best wall time counts. On a
# busy machine the wall time waits for a processor and the processor time is the fairer figure.
best=
best_cpu=
TIMEFORMAT='%R %U %S'
for _ in 1 2 3; do
  read -r wall user system < <({ time "$tolkatouch" replay --fast --json "$work/long.json" > "$work/events.jsonl"; } 2>&1)
  wall_ms=$(awk -v t="$wall" 'BEGIN { printf "%d", t * 1000 }')
  cpu_ms=$(awk -v u="$user" -v s="$system" 'BEGIN { printf "%d", (u + s) * 1000 }')
  if [ -z "$best" ] || [ "$wall_ms" -lt "$best" ]; then best=$wall_ms; best_cpu=$cpu_ms; fi
done
events=$(wc -l < "$work/events.jsonl")

printf 'frames %d, document %d bytes, events %d\n' "$actual" "$size" "$events"
printf 'replay --fast --json: best of 3 %d ms wall, %d ms processor time\n' "$best" "$best_cpu"
