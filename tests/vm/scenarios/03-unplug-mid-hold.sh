# The surface is unplugged in the middle of a volume hold: the held key is released, the daemon
# logs the removal and keeps running, and a surface plugged in again is picked up and works.
. /scenarios/common.sh

start_daemon
start_keys "$WORK/keys-unplug.jsonl"
tolkatouch uhid "$DOCS/hold-unplug.json" --destroy-after 1.8 > "$WORK/uhid-unplug.log" 2>&1 \
    || { cat "$WORK/uhid-unplug.log"; fail "tolkatouch uhid failed"; }
cat "$WORK/uhid-unplug.log"
grep -q 'destroyed after' "$WORK/uhid-unplug.log" || fail "the surface was not unplugged mid-stream"
wait_until 10 grep -q 'stopped serving' "$WORK/daemon.log" || { daemon_log; fail "the daemon logged no removal"; }
stop_keys
grep 'stopped serving' "$WORK/daemon.log"
daemon_alive || { daemon_log; fail "the daemon stopped with the surface"; }
# The expectation unplugs where the surface really did ("destroyed after 1.803 s").
unplugged_at=$(sed -n 's/^uhid: destroyed after \([0-9.]*\) s.*/\1/p' "$WORK/uhid-unplug.log")
tolka-vm-check keys --document "$DOCS/hold-unplug.json" --keys "$WORK/keys-unplug.jsonl" --destroy-after "$unplugged_at" \
    || fail "the keys of the interrupted hold are wrong"
tail -n 1 "$WORK/keys-unplug.jsonl" | grep -q '"key":"KEY_VOLUMEUP","value":0' \
    || fail "the held key was not released last"

start_keys "$WORK/keys-replug.jsonl"
tolkatouch uhid "$DOCS/replug.json" --linger 1 > "$WORK/uhid-replug.log" 2>&1 \
    || { cat "$WORK/uhid-replug.log"; fail "tolkatouch uhid failed the second time"; }
wait_until 10 removed_at_least 2 || fail "the second surface did not leave"
stop_keys
daemon_log
[ "$(daemon_serving_count)" -ge 2 ] || fail "the daemon did not pick up the second surface"
tolka-vm-check keys --document "$DOCS/replug.json" --keys "$WORK/keys-replug.jsonl" \
    || fail "the second surface's keys are wrong"
daemon_alive || fail "the daemon stopped"
echo "PASS"
