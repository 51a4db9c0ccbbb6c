# Properties through the control socket: the diagnostic feature reports and the hold duration
# show what the virtual surface answered (one report failing), and a setting written with
# `prop set` changes what the next hold does. Leaves the recording and the daemon's events in
# /tmp/shared for the recording scenario.
. /scenarios/common.sh

SURFACE_OPTIONS="--fail-report 0x10 --feature 0x1f=a00f0000"
start_daemon
tolkatouch uhid "$DOCS/hold-timeout.json" $SURFACE_OPTIONS --wait-signal --linger -1 > "$WORK/uhid.log" 2>&1 &
UHID_PID=$!
wait_until 20 served_at_least 1 || { daemon_log; cat "$WORK/uhid.log"; fail "the daemon did not serve the surface"; }
wait_until 10 grep -q 'waiting for SIGUSR1' "$WORK/uhid.log" || { cat "$WORK/uhid.log"; fail "the surface is not waiting"; }

tolkatouch prop get FirmwareDebugReports > "$WORK/firmware-debug-reports.json" || fail "prop get FirmwareDebugReports failed"
tolkatouch prop get FactoryResetHoldDuration > "$WORK/hold-duration.txt" || fail "prop get FactoryResetHoldDuration failed"
cat "$WORK/firmware-debug-reports.json" "$WORK/hold-duration.txt"
tolka-vm-check props --firmware-debug-reports "$WORK/firmware-debug-reports.json" \
    --hold-duration "$WORK/hold-duration.txt" $SURFACE_OPTIONS || fail "the properties differ from the surface's answers"

tolkatouch prop set Pipeline.Algs.HoldTimeoutMilliseconds 2000 || fail "prop set failed"
start_keys "$WORK/keys.jsonl"
kill -USR1 "$UHID_PID"
wait_until 30 grep -q 'uhid: sent' "$WORK/uhid.log" || { cat "$WORK/uhid.log"; fail "the surface did not play"; }
sleep 0.5
stop_keys
cat "$WORK/uhid.log"
tolka-vm-check keys --document "$DOCS/hold-timeout.json" --keys "$WORK/keys.jsonl" \
    --set Algs.HoldTimeoutMilliseconds=2000 || fail "the keys are not what a 2 s hold timeout gives"
if tolka-vm-check keys --document "$DOCS/hold-timeout.json" --keys "$WORK/keys.jsonl" > "$WORK/default-check.log"; then
    cat "$WORK/default-check.log"
    fail "the keys are what the default hold timeout gives: the setting changed nothing"
fi

mkdir -p /tmp/shared
tolkatouch prop get Recording > /tmp/shared/recording.json || fail "prop get Recording failed"
kill "$UHID_PID"
wait "$UHID_PID"
UHID_PID=""
wait_until 10 grep -q 'stopped serving' "$WORK/daemon.log" || fail "the daemon did not notice the surface leave"
stop_daemon
cp "$WORK/events.jsonl" /tmp/shared/daemon-events.jsonl
daemon_log
echo "PASS"
