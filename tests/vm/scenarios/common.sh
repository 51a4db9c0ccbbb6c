# Shared by the scenarios (sourced). Each scenario runs in its own directory $WORK and fails with
# a message on the first check that does not hold.

DOCS=/docs
KEYBOARD_NAME="TolkaTouch media keys"

fail() {
    echo "FAIL: $*"
    exit 1
}

note() { echo "-- $*"; }

# wait_until SECONDS COMMAND...: runs COMMAND every 0.1 s until it succeeds; false on time-out.
wait_until() {
    local limit=$(($1 * 10))
    shift
    local tries=0
    while ! "$@"; do
        tries=$((tries + 1))
        [ "$tries" -ge "$limit" ] && return 1
        sleep 0.1
    done
    return 0
}

# The hidraw node of the virtual surface (vendor 1209, product 0001), or nothing.
surface_hidraw() {
    for uevent in /sys/class/hidraw/hidraw*/device/uevent; do
        [ -f "$uevent" ] || continue
        if grep -q '^HID_ID=0003:00001209:00000001$' "$uevent"; then
            node=${uevent#/sys/class/hidraw/}
            echo "/dev/${node%%/*}"
            return 0
        fi
    done
    return 1
}

has_surface() { [ -n "$(surface_hidraw)" ]; }
no_surface() { [ -z "$(surface_hidraw)" ]; }

keyboard_present() { grep -q "N: Name=\"$KEYBOARD_NAME\"" /proc/bus/input/devices; }

# start_daemon: tolkatouchd in the background, its events (--print) in $WORK/events.jsonl and its
# log in $WORK/daemon.log; waits until it has its keyboard and its control socket.
start_daemon() {
    tolkatouchd ${TOLKA_PLUGIN:+--plugin "$TOLKA_PLUGIN"} --print "$@" > "$WORK/events.jsonl" 2> "$WORK/daemon.log" &
    DAEMON_PID=$!
    wait_until 20 daemon_ready || { daemon_log; fail "the daemon made no keyboard"; }
    wait_until 20 test -S /run/tolkatouch/tolkatouchd.sock || { daemon_log; fail "no control socket"; }
    note "daemon $DAEMON_PID running"
}

stop_daemon() {
    [ -n "$DAEMON_PID" ] || return 0
    kill "$DAEMON_PID" 2> /dev/null
    wait "$DAEMON_PID" 2> /dev/null
    DAEMON_PID=""
}

daemon_alive() { kill -0 "$DAEMON_PID" 2> /dev/null; }

# True once the daemon's keyboard exists; gives up at once (by failing the scenario) when the
# daemon has died.
daemon_ready() {
    daemon_alive || { daemon_log; fail "the daemon exited"; }
    keyboard_present
}

daemon_serving_count() { grep -c ') as service ' "$WORK/daemon.log"; }
served_at_least() { [ "$(daemon_serving_count)" -ge "$1" ]; }
removed_at_least() { [ "$(grep -c 'stopped serving' "$WORK/daemon.log")" -ge "$1" ]; }

# The daemon's log without the line the service writes for every image.
daemon_log() { grep -v 'Received image frame' "$WORK/daemon.log"; }

# start_keys FILE: a reader of the daemon's keyboard writing JSON lines to FILE; waits until it reads.
start_keys() {
    tolkatouch keys --wait 10 > "$1" 2> "$1.err" &
    KEYS_PID=$!
    wait_until 10 grep -q 'keys: reading' "$1.err" || { cat "$1.err"; fail "the key reader did not start"; }
}

stop_keys() {
    sleep 0.5
    kill "$KEYS_PID" 2> /dev/null
    wait "$KEYS_PID" 2> /dev/null
}

cleanup() {
    [ -n "$UHID_PID" ] && kill "$UHID_PID" 2> /dev/null
    [ -n "$KEYS_PID" ] && kill "$KEYS_PID" 2> /dev/null
    stop_daemon
    wait 2> /dev/null
}
trap cleanup EXIT
