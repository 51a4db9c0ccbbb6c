#!/bin/bash
# record's ways to end, each leaving a whole recording that replays to the same events as what
# was recorded: the source running dry (as a device that disappears), --max-reports, --duration,
# SIGINT and SIGTERM; with --rotate every numbered file replays on its own; -o - and
# --with-events. The "device" is a byte stream of reports (a file or a pipe), which record cuts
# into reports by their IDs as it cuts a hidraw node's reads.
# Usage: record_check.sh TOLKATOUCH WORKDIR
set -uo pipefail
tool="$1"
work="$2"
rm -rf "$work"
mkdir -p "$work"
fail() { echo "record_check: $*"; exit 1; }
record() { "$tool" record --socket "$work/no-service.sock" "$@"; }

printf 'wait 300ms\ntap volume-up 120ms\nwait 500ms\nhold play-pause 900ms\nwait 400ms\ntap volume-down 100ms\nwait 300ms\n' >"$work/script.txt"
"$tool" synth "$work/script.txt" -o "$work/source.json" || fail "synth failed"
/usr/bin/python3 -c '
import json, sys
document = json.load(open(sys.argv[1]))
with open(sys.argv[2], "wb") as out:
    for frame in document["Frames"]:
        if frame["Type"] == "InputReport":
            out.write(bytes.fromhex(frame["Report"]))
' "$work/source.json" "$work/reports.bin" || fail "cannot extract the reports"
reports=$(( $(stat -c %s "$work/reports.bin") / 73 ))
events() { "$tool" replay --fast "$1" | awk '{print $4, $6}'; }
events "$work/source.json" >"$work/expected.txt"
[ -s "$work/expected.txt" ] || fail "the source gives no events"

# The source runs dry: exit 1, one clear line, and the recording is whole.
record --device "$work/reports.bin" -o "$work/dry.jsonl" 2>"$work/dry.err"
status=$?
[ "$status" = 1 ] || fail "a source that runs dry exits $status, not 1"
grep -qx "tolkatouch: $work/reports.bin: no more reports; the recording ends there and is complete in $work/dry.jsonl" "$work/dry.err" ||
  fail "unexpected message: $(cat "$work/dry.err")"
events "$work/dry.jsonl" | cmp -s - "$work/expected.txt" || fail "the recording replays to other events"
head -1 "$work/dry.jsonl" | grep -q '"Format":"lines"' || fail "no header line"
[ "$(grep -c '"WallTime"' "$work/dry.jsonl")" = "$reports" ] || fail "not every report has its wall-clock time"
grep -q '"Key":"Algs.HoldTimeoutMilliseconds","Value":500' "$work/dry.jsonl" || fail "the default settings are not recorded"

# --max-reports.
record --device "$work/reports.bin" --max-reports 50 -o "$work/max.jsonl" || fail "--max-reports exits non-zero"
[ "$(grep -c '"InputReport"' "$work/max.jsonl")" = 50 ] || fail "--max-reports 50 did not record 50 reports"

# -o - and --with-events: the event lines are the recognizer's on the same reports.
record --device "$work/reports.bin" --with-events -o - >"$work/stdout.jsonl" 2>/dev/null
[ "$(grep -c '"Type":"Event"' "$work/stdout.jsonl")" = "$(wc -l <"$work/expected.txt")" ] || fail "--with-events did not store every event"
events "$work/stdout.jsonl" | cmp -s - "$work/expected.txt" || fail "-o - replays to other events"

# --rotate: numbered files, each a recording of its own.
record --device "$work/reports.bin" --rotate 16K -o "$work/rotated.jsonl" 2>/dev/null
files=("$work"/rotated.*.jsonl)
[ "${#files[@]}" -ge 3 ] || fail "--rotate 16K made ${#files[@]} files"
total=0
for file in "${files[@]}"; do
  "$tool" replay --fast "$file" >/dev/null || fail "$file does not replay"
  [ "$(stat -c %s "$file")" -le $((16384 + 400)) ] || fail "$file is larger than 16K and a report"
  total=$((total + $(grep -c '"InputReport"' "$file")))
done
[ "$total" = "$reports" ] || fail "the rotated files hold $total of $reports reports"

# SIGINT, SIGTERM and --duration while the source is still open: a FIFO the script keeps open.
mkfifo "$work/fifo"
for way in INT TERM duration; do
  exec 3<>"$work/fifo"
  cat "$work/reports.bin" >&3
  if [ "$way" = duration ]; then
    record --device "$work/fifo" --duration 2 -o "$work/$way.jsonl"
    status=$?
  else
    "$tool" record --socket "$work/no-service.sock" --device "$work/fifo" -o "$work/$way.jsonl" 2>"$work/$way.err" &
    pid=$!
    # The signal once every report is on disk (flushed within a second), however loaded the machine.
    for _ in $(seq 100); do
      [ "$(grep -c '"InputReport"' "$work/$way.jsonl" 2>/dev/null)" = "$reports" ] && break
      sleep 0.1
    done
    kill -"$way" "$pid"
    wait "$pid"
    status=$?
  fi
  exec 3>&-
  [ "$status" = 0 ] || fail "recording ended by $way exits $status"
  events "$work/$way.jsonl" | cmp -s - "$work/expected.txt" || fail "recording ended by $way replays to other events"
done

# A recording cut off in the middle of a line (a crash, a power loss) still replays up to its last
# whole line, saying what it left out.
size=$(stat -c %s "$work/dry.jsonl")
head -c $((size / 2)) "$work/dry.jsonl" >"$work/cut.jsonl"
"$tool" replay --fast "$work/cut.jsonl" >"$work/cut.txt" 2>"$work/cut.err" || fail "a cut-off recording does not replay"
grep -q "^tolkatouch: $work/cut.jsonl: warning: the last line (line [0-9]*) is cut off and is left out" "$work/cut.err" ||
  fail "no warning for the cut-off line: $(cat "$work/cut.err")"
[ -s "$work/cut.txt" ] || fail "the cut-off recording replays to nothing"
"$tool" convert --to lines -o "$work/repaired.jsonl" "$work/cut.jsonl" 2>/dev/null || fail "convert does not take a cut-off recording"
"$tool" replay --fast "$work/repaired.jsonl" 2>"$work/repaired.err" | cmp -s - "$work/cut.txt" || fail "the converted recording replays to other events"
[ ! -s "$work/repaired.err" ] || fail "the converted recording is not clean: $(cat "$work/repaired.err")"

# On a terminal, a status line; elsewhere, nothing on standard error.
if command -v script >/dev/null; then
  exec 3<>"$work/fifo"
  cat "$work/reports.bin" >&3
  script -qec "'$tool' record --socket '$work/no-service.sock' --device '$work/fifo' --duration 1.2 -o '$work/tty.jsonl'" /dev/null >"$work/tty.out"
  exec 3>&-
  grep -aq "recording [0-9.]* s, $reports reports, [0-9.]* frames/s, [0-9]* gestures, [0-9.]* MB" "$work/tty.out" ||
    fail "no status line on a terminal: $(cat -v "$work/tty.out")"
fi
[ ! -s "$work/INT.err" ] || fail "record wrote to standard error off a terminal: $(cat "$work/INT.err")"
echo "record: every way to end leaves a whole recording"
