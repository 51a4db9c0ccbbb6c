#!/bin/bash
# Soak: tolkatouchd serves the simulated surface at SPEED times the recorded pace for SECONDS of
# wall time (the default, 4320 s at 20x, is 24 simulated hours), while two clients read properties
# (the whole recording among them) and write a setting through the control socket all the while.
# Passes when
#   - the daemon's resident memory grows by under 1 MB after the first simulated hour (for runs of
#     under four simulated hours: after the first quarter of the run), and
#   - the events it prints are exactly the events `tolkatouch replay` gives for the same document,
#   - and no control request fails while the daemon serves.
#
#   bench/soak/soak.sh <tolkatouchd> <tolkatouch> <plug-in library> [SECONDS] [SPEED] [GAP_MINUTES]
#
# The document is the everyday session (tests/daemon/data/everyday.gestures, 9 s of touches, a
# setting and a firmware reset) once every GAP_MINUTES simulated minutes (default 5), with the
# surface silent in between. Prints the figures; exits 1 when a check fails. Use a Release build.
set -euo pipefail

usage="usage: $0 <tolkatouchd> <tolkatouch> <plug-in library> [SECONDS] [SPEED] [GAP_MINUTES]"
daemon=${1:?$usage}
tolkatouch=${2:?$usage}
plugin=${3:?$usage}
seconds=${4:-4320}
speed=${5:-20}
gap_minutes=${6:-5}
python=/usr/bin/python3
here=$(cd "$(dirname "$0")" && pwd)
work=$(mktemp -d)
pids=()
cleanup() {
  for pid in "${pids[@]}"; do kill "$pid" 2>/dev/null || true; done
  wait 2>/dev/null || true
  rm -rf "$work"
}
trap cleanup EXIT

"$tolkatouch" synth "$here/../../tests/daemon/data/everyday.gestures" -o "$work/pass.json"
"$python" "$here/soak_document.py" "$work/pass.json" "$work/soak.json" "$seconds" "$speed" "$gap_minutes" \
  > "$work/document.txt"
cat "$work/document.txt"
"$tolkatouch" replay --json --fast "$work/soak.json" > "$work/expected.jsonl"

socket="$work/tolkatouchd.sock"
start=$(date +%s.%N)
"$daemon" --simulate "$work/soak.json" --plugin "$plugin" --socket "$socket" --speed "$speed" \
  --key-log "$work/keys.log" --print > "$work/events.jsonl" 2> "$work/daemon.err" &
daemon_pid=$!
pids+=("$daemon_pid")

# Resident memory every second: elapsed seconds and kB.
(
  while kill -0 "$daemon_pid" 2>/dev/null; do
    rss=$(awk '/^VmRSS:/ { print $2 }' "/proc/$daemon_pid/status" 2>/dev/null || true)
    [ -n "$rss" ] && echo "$(awk -v s="$start" -v n="$(date +%s.%N)" 'BEGIN { printf "%.1f", n - s }') $rss"
    sleep 1
  done
) > "$work/rss.txt" &
pids+=($!)

# A long document takes the daemon a while to open on a busy machine: wait for its socket as long
# as it runs.
while [ ! -S "$socket" ]; do
  kill -0 "$daemon_pid" 2>/dev/null || { echo "FAIL: the daemon ended before it served"; cat "$work/daemon.err"; exit 1; }
  sleep 0.1
done
setting=Pipeline.Algs.EnableTapSuppression
value=$("$tolkatouch" prop get "$setting" --socket "$socket")

# A request that fails while the daemon serves is a failure; once the document has been played
# and the daemon is stopping (its socket going), failures are expected and the clients stop.
client() {
  local name=$1; shift
  local ok=0 failed=0
  while kill -0 "$daemon_pid" 2>/dev/null; do
    for request in "$@"; do
      # shellcheck disable=SC2086
      if "$tolkatouch" $request --socket "$socket" > /dev/null 2>> "$work/$name.err"; then
        ok=$((ok + 1))
      elif kill -0 "$daemon_pid" 2>/dev/null && ! grep -q "stopped serving" "$work/daemon.err"; then
        failed=$((failed + 1))
      fi
    done
  done
  echo "$ok $failed" > "$work/$name.count"
}
client reader "prop get Recording" "prop get Version" "devices" "prop list" &
pids+=($!)
client writer "prop set $setting $value" "prop get $setting" &
pids+=($!)

status=0
wait "$daemon_pid" || status=$?
end=$(date +%s.%N)
wait
pids=()
wall=$(awk -v s="$start" -v e="$end" 'BEGIN { printf "%.0f", e - s }')
read -r reader_ok reader_failed < "$work/reader.count"
read -r writer_ok writer_failed < "$work/writer.count"
echo "daemon: exit $status after ${wall}s; control requests answered: $((reader_ok + writer_ok)), failed: $((reader_failed + writer_failed))"

"$python" "$here/soak_check.py" "$work/expected.jsonl" "$work/events.jsonl" "$work/rss.txt" "$seconds" "$speed" \
  || status=1
if [ $((reader_failed + writer_failed)) -ne 0 ]; then
  echo "FAIL: control requests failed while the daemon ran:"; sort "$work/reader.err" "$work/writer.err" | uniq -c | head -5
  status=1
fi
if [ "$status" -ne 0 ]; then tail -5 "$work/daemon.err"; fi
if [ -n "${SOAK_KEEP:-}" ]; then cp "$work/rss.txt" "$work/reader.err" "$work/writer.err" "$SOAK_KEEP"/; fi
exit "$status"
