#!/bin/bash
# What `tolkatouch record` costs at the surface's rate: a feeder writes image reports into a FIFO
# at 125 a second (the everyday example session over and over) while record reads it as it would
# a hidraw node, runs the recognizer for its status line and --with-events, and writes the line
# form to a file. Record's processor time (user + system, from /proc) is read after a 2 s
# warm-up and again SECONDS later, so its start (the settings query, the header) is left out.
#
#   bench/tools/record_overhead.sh <path to a Release build of tolkatouch> [SECONDS, default 60]
set -euo pipefail

tool=$(realpath "${1:?usage: $0 <path to tolkatouch> [seconds]}")
seconds=${2:-60}
work=$(mktemp -d)
feeder=""
recorder=""
trap '[ -n "$recorder" ] && kill "$recorder" 2>/dev/null; [ -n "$feeder" ] && kill "$feeder" 2>/dev/null; rm -rf "$work"' EXIT
here=$(cd "$(dirname "$0")" && pwd)

/usr/bin/python3 - "$here/../../examples/everyday-session.json" "$work/reports.bin" <<'PY'
import json, sys
frames = json.load(open(sys.argv[1]))["Frames"]
with open(sys.argv[2], "wb") as out:
    for frame in frames:
        if frame["Type"] == "InputReport":
            out.write(bytes.fromhex(frame["Report"]))
PY
mkfifo "$work/fifo"
# Held open here, so that record never sees the FIFO without a writer (an end of file).
exec 3<>"$work/fifo"
# The feeder: one 73-byte report every 8 ms, on a schedule that does not drift.
/usr/bin/python3 - "$work/reports.bin" "$work/fifo" <<'PY' &
import sys, time
data = open(sys.argv[1], "rb").read()
reports = [data[i:i + 73] for i in range(0, len(data), 73)]
with open(sys.argv[2], "wb", buffering=0) as out:
    start = time.monotonic()
    n = 0
    while True:
        out.write(reports[n % len(reports)])
        n += 1
        delay = start + n * 0.008 - time.monotonic()
        if delay > 0:
            time.sleep(delay)
PY
feeder=$!

"$tool" record --with-events --socket "$work/none.sock" --device "$work/fifo" -o "$work/recording.jsonl" 2>/dev/null &
recorder=$!
ticks=$(getconf CLK_TCK)
cpu() { awk '{ print $14 + $15 }' "/proc/$recorder/stat"; }
sleep 2
cpu0=$(cpu)
reports0=$(grep -c '"InputReport"' "$work/recording.jsonl" || true)
sleep "$seconds"
cpu1=$(cpu)
reports1=$(grep -c '"InputReport"' "$work/recording.jsonl" || true)
kill -INT "$recorder"
wait "$recorder" || true
recorder=""

awk -v c0="$cpu0" -v c1="$cpu1" -v hz="$ticks" -v s="$seconds" -v r0="$reports0" -v r1="$reports1" \
    -v load="$(cut -d' ' -f1 /proc/loadavg)" 'BEGIN {
  cpu = (c1 - c0) / hz
  printf "record over %d s: %d reports (%.1f per second), %.2f s of processor time: %.3f %% of one core (load average %s)\n",
         s, r1 - r0, (r1 - r0) / s, cpu, 100 * cpu / s, load
}'
echo "file: $(stat -c %s "$work/recording.jsonl") bytes"
