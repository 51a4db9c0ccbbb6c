# tolkatouch record next to the daemon: it finds the surface through udev, records while the
# daemon serves the same node, stores the daemon's settings (one changed with prop set) and the
# recognizer's events, and when the surface is unplugged ends with one line and a whole
# recording. Its replay gives exactly the events the daemon dispatched (time stamps aside).
. /scenarios/common.sh

start_daemon
tolkatouch uhid "$DOCS/everyday.json" --wait-signal --linger 0.5 > "$WORK/uhid.log" 2>&1 &
UHID_PID=$!
wait_until 20 served_at_least 1 || { daemon_log; cat "$WORK/uhid.log"; fail "the daemon did not serve the surface"; }
wait_until 10 grep -q 'waiting for SIGUSR1' "$WORK/uhid.log" || { cat "$WORK/uhid.log"; fail "the surface is not waiting"; }
tolkatouch prop set Pipeline.Algs.HoldTimeoutMilliseconds 650 || fail "prop set failed"

tolkatouch record --with-events -o "$WORK/recording.jsonl" > "$WORK/record.out" 2> "$WORK/record.err" &
RECORD_PID=$!
wait_until 10 grep -qs '"Format":"lines"' "$WORK/recording.jsonl" || { cat "$WORK/record.err"; fail "record wrote no header"; }
kill -USR1 "$UHID_PID"
wait "$UHID_PID"
UHID_PID=""
cat "$WORK/uhid.log"
wait_until 10 sh -c "! kill -0 $RECORD_PID 2> /dev/null" || fail "record did not end when the surface left"
wait "$RECORD_PID"
status=$?
cat "$WORK/record.err"
[ "$status" -eq 1 ] || fail "record exited $status when the surface left, not 1"
[ "$(wc -l < "$WORK/record.err")" -eq 1 ] || fail "record's message is not one line"
grep -q ': the device is gone; the recording ends there and is complete in '"$WORK/recording.jsonl"'$' "$WORK/record.err" ||
    fail "record's message does not say the device is gone"
wait_until 10 grep -q 'stopped serving' "$WORK/daemon.log" || fail "the daemon did not notice the surface leave"
stop_daemon

head -1 "$WORK/recording.jsonl" | grep -q '"VendorID":4617' || fail "the header lacks the device's identity"
head -1 "$WORK/recording.jsonl" | grep -q '"Algs.HoldTimeoutMilliseconds":650' || fail "the header lacks the service's setting"
echo "recorded $(grep -c '"InputReport"' "$WORK/recording.jsonl") reports"
tolkatouch replay --json --fast "$WORK/recording.jsonl" > "$WORK/replay.jsonl" || fail "the recording does not replay"
sed 's/,"timestamp":[0-9]*//' "$WORK/events.jsonl" > "$WORK/dispatched.txt"
sed 's/,"timestamp":[0-9]*//' "$WORK/replay.jsonl" > "$WORK/replayed.txt"
echo "dispatched $(wc -l < "$WORK/dispatched.txt") events, replayed $(wc -l < "$WORK/replayed.txt")"
[ -s "$WORK/dispatched.txt" ] || fail "the daemon dispatched no events"
diff "$WORK/dispatched.txt" "$WORK/replayed.txt" || fail "the recording replays to other events than the daemon dispatched"
[ "$(grep -c '"Type":"Event"' "$WORK/recording.jsonl")" -eq "$(wc -l < "$WORK/dispatched.txt")" ] ||
    fail "record's live events are not as many as the daemon's"
echo "PASS"
