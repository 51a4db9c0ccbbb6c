#!/bin/bash
# How many log lines tolkatouchd writes during a touch session: the daemon plays a synthesised
# 60-second session at 125 frames per second (the everyday example session over and over) with
# a log configuration, its lines going to standard error as they would to the journal (the rate
# guard stands before both). Prints lines per second, and checks that every gesture the daemon
# dispatched (its --print output) and every error is among the lines.
#
#   bench/daemon/journal_lines.sh <tolkatouchd> <tolkatouch> <log.conf> [seconds] [--log-level ...]
set -euo pipefail

usage="usage: $0 <tolkatouchd> <tolkatouch> <log.conf> [seconds] [daemon options...]"
daemon=${1:?$usage}
tolkatouch=${2:?$usage}
configuration=${3:?$usage}
seconds=${4:-60}
shift 4 2>/dev/null || shift $#
frames=$(( seconds * 125 ))
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

source "$(dirname "$0")/../long_session.sh"
synth_long_session "$tolkatouch" "$frames" "$work/long.json"

env -u TOLKATOUCH_LOG -u TOLKATOUCH_DEBUG -u INVOCATION_ID "$daemon" --simulate "$work/long.json" \
  --socket "$work/tolkatouchd.sock" --no-keys --print --log-config "$configuration" "$@" \
  > "$work/events.jsonl" 2> "$work/log.txt"

lines=$(wc -l < "$work/log.txt")
# A journal entry is one line of the log; its text may run over several lines on standard error.
entries=$(grep -c '^\[' "$work/log.txt" || true)
gestures=$(wc -l < "$work/events.jsonl")
dispatched=$(grep -c 'Dispatch event: ' "$work/log.txt" || true)
folded_dispatch=$(grep 'Dispatch event: ' "$work/log.txt" | grep -c 'lines like this' || true)
errors=$(grep -c '^\[error\]' "$work/log.txt" || true)
rate=$(awk -v l="$entries" -v s="$seconds" 'BEGIN { printf "%.2f", l / s }')
echo "session: ${seconds}s, ${frames} frames at 125/s; options: ${*:-none}"
echo "log entries: ${entries} (${rate} a second; ${lines} lines on standard error); events dispatched: ${gestures}; \"Dispatch event\" lines: ${dispatched} (${folded_dispatch} of them summaries); error lines: ${errors}"
echo "lines by format (first words):"
grep '^\[' "$work/log.txt" | sed -E 's/ \([0-9]+ lines like this.*//; s/[0-9]+/N/g' | cut -c1-60 | sort | uniq -c | sort -rn | head -12
