#!/bin/bash
# What `tolkatouch eval` costs on the shipped corpus, against `tolkatouch replay --fast` on the
# same documents: eval of the whole corpus with two threads (wall and processor time), then per
# frame: eval with one thread against one replay process per document, and, without process
# starts in the way, the three long noise-only recordings alone (225,000 frames) both ways.
#
#   bench/tools/eval_speed.sh <path to a Release build of tolkatouch> [corpus folder]
set -euo pipefail

tool=$(realpath "${1:?usage: $0 <path to tolkatouch> [corpus folder]}")
corpus=${2:-}
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
if [ -z "$corpus" ]; then
  corpus="$work/corpus"
  bash "$(dirname "$0")/../../examples/corpus/generate" "$tool" "$corpus" >/dev/null
fi

TIMEFORMAT='%R %U %S'
# Prints "<wall ms> <processor ms>" of the command.
timed() {
  local wall user system
  read -r wall user system < <({ time "$@" >/dev/null 2>&1; } 2>&1)
  awk -v w="$wall" -v u="$user" -v s="$system" 'BEGIN { printf "%d %d\n", w * 1000, (u + s) * 1000 }'
}

frames=$("$tool" eval --json -j 2 "$corpus" | grep -o '"Frames":[0-9]*' | head -1 | cut -d: -f2)
read -r eval2_wall eval2_cpu < <(timed "$tool" eval -j 2 "$corpus")
read -r eval1_wall eval1_cpu < <(timed "$tool" eval -j 1 "$corpus")
replay_all() { for doc in "$corpus"/*.json; do [[ "$doc" == *.labels.json ]] || "$tool" replay --fast "$doc"; done; }
read -r replay_wall replay_cpu < <(timed replay_all)

noise=()
for doc in "$corpus"/noise-only-*.json; do [[ "$doc" == *.labels.json ]] || noise+=("$doc"); done
noise_frames=$("$tool" eval --json -j 1 "${noise[@]}" | grep -o '"Frames":[0-9]*' | head -1 | cut -d: -f2)
read -r _ noise_eval_cpu < <(timed "$tool" eval -j 1 "${noise[@]}")
replay_noise() { for doc in "${noise[@]}"; do "$tool" replay --fast "$doc"; done; }
read -r _ noise_replay_cpu < <(timed replay_noise)

per_frame() { awk -v ms="$1" -v f="$2" 'BEGIN { printf "%.2f", ms * 1000 / f }'; }
printf 'corpus: %d frames; load average %s\n' "$frames" "$(cut -d' ' -f1 /proc/loadavg)"
printf 'eval -j 2 whole corpus: %d ms wall, %d ms processor time\n' "$eval2_wall" "$eval2_cpu"
printf 'eval -j 1 whole corpus: %d ms processor time, %s us per frame\n' "$eval1_cpu" "$(per_frame "$eval1_cpu" "$frames")"
printf 'replay --fast per document: %d ms processor time, %s us per frame (with %d process starts)\n' \
  "$replay_cpu" "$(per_frame "$replay_cpu" "$frames")" "$(ls "$corpus"/*.labels.json | wc -l)"
printf 'noise-only (%d frames): eval -j 1 %s us per frame, replay --fast %s us per frame, ratio %s\n' "$noise_frames" \
  "$(per_frame "$noise_eval_cpu" "$noise_frames")" "$(per_frame "$noise_replay_cpu" "$noise_frames")" \
  "$(awk -v a="$noise_eval_cpu" -v b="$noise_replay_cpu" 'BEGIN { printf "%.2f", a / b }')"
