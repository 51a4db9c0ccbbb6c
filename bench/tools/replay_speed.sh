#!/bin/bash
# How fast `tolkatouch replay --fast --json` plays a long recording: a synthesised document of
# exactly 100,000 image frames (about 13 minutes of touching: the everyday example session over
# and over), played three times; prints the best wall-clock time and that run's processor time.
#
#   bench/tools/replay_speed.sh <path to a Release build of tolkatouch> [frames]
set -euo pipefail

tolkatouch=${1:?usage: $0 <path to tolkatouch> [frames]}
frames=${2:-100000}
examples=$(cd "$(dirname "$0")/../../examples" && pwd)
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

count_frames() { grep -c '"Type": "InputReport"' "$1"; }

# One pass of the everyday session, then as many passes as fill the frames, then a wait that
# makes the count exact (one frame every 8 ms).
grep -v '^#' "$examples/everyday-session.txt" > "$work/pass.txt"
"$tolkatouch" synth "$work/pass.txt" -o "$work/pass.json"
passes=$(( frames / $(count_frames "$work/pass.json") ))
: > "$work/long.txt"
for _ in $(seq "$passes"); do cat "$work/pass.txt" >> "$work/long.txt"; done
"$tolkatouch" synth "$work/long.txt" -o "$work/long.json"
missing=$(( frames - $(count_frames "$work/long.json") ))
if [ "$missing" -gt 0 ]; then
  echo "wait $(( missing * 8 ))ms" >> "$work/long.txt"
  "$tolkatouch" synth "$work/long.txt" -o "$work/long.json"
fi
actual=$(count_frames "$work/long.json")
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
