# The recording the service kept (prop get Recording, saved by the properties scenario) replays
# with `tolkatouch replay --json --fast` to the same events the daemon dispatched (time stamps
# aside: a replay runs on its own clock).
. /scenarios/common.sh

[ -s /tmp/shared/recording.json ] || fail "no recording from the properties scenario"
[ -s /tmp/shared/daemon-events.jsonl ] || fail "no events from the properties scenario's daemon"
grep -q '"Algs.HoldTimeoutMilliseconds"' /tmp/shared/recording.json || fail "the recording lacks the setting"
tolkatouch replay --json --fast /tmp/shared/recording.json > "$WORK/replay.jsonl" || fail "replay failed"
sed 's/,"timestamp":[0-9]*//' /tmp/shared/daemon-events.jsonl > "$WORK/dispatched.txt"
sed 's/,"timestamp":[0-9]*//' "$WORK/replay.jsonl" > "$WORK/replayed.txt"
echo "dispatched $(wc -l < "$WORK/dispatched.txt") events, replayed $(wc -l < "$WORK/replayed.txt")"
[ -s "$WORK/dispatched.txt" ] || fail "the daemon dispatched no events"
diff "$WORK/dispatched.txt" "$WORK/replayed.txt" || fail "the replayed events differ from the dispatched ones"
cat "$WORK/replayed.txt"
echo "PASS"
