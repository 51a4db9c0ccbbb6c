# The daemon runs before the surface exists; the surface is plugged in (hot-plug) and plays the
# everyday session. The keys read back from the daemon's keyboard are exactly what the session's
# events map to: taps press and release once, volume holds repeat, a play/pause hold is the voice
# key.
. /scenarios/common.sh

start_daemon
no_surface || fail "a surface exists before the scenario"
start_keys "$WORK/keys.jsonl"
tolkatouch uhid "$DOCS/everyday.json" --linger 1 > "$WORK/uhid.log" 2>&1 || { cat "$WORK/uhid.log"; fail "tolkatouch uhid failed"; }
cat "$WORK/uhid.log"
wait_until 10 grep -q 'stopped serving' "$WORK/daemon.log" || fail "the daemon did not notice the surface leave"
stop_keys
daemon_log
[ "$(daemon_serving_count)" -eq 1 ] || fail "the daemon never served the surface"
tolka-vm-check keys --document "$DOCS/everyday.json" --keys "$WORK/keys.jsonl" > "$WORK/check.log" 2>&1
status=$?
cat "$WORK/check.log"
[ $status -eq 0 ] || fail "the keys differ from the session's events"
grep -q '"KEY_VOICECOMMAND"' "$WORK/keys.jsonl" || fail "no voice key for the play/pause hold"
grep -q 'a held volume key repeated' "$WORK/check.log" || fail "no volume hold repeated"
daemon_alive || fail "the daemon stopped"
echo "PASS"
