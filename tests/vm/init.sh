#!/bin/sh
# /init of the VM tier's machine: brings up the kernel's HID and input path and udev, runs every
# scenario under /scenarios in name order, and writes one result line per scenario to the second
# serial port (the host reads it) and to the console:
#   SCENARIO <name> PASS|FAIL <seconds>s
# then "VM-SUMMARY pass=N fail=M" and "VM-DONE", and powers the machine off.
export PATH=/usr/bin:/usr/sbin:/bin:/sbin
export HOME=/root
mount -t proc proc /proc
mount -t sysfs sys /sys
mount -t devtmpfs dev /dev
mount -t tmpfs run /run
# /tmp stays part of the initramfs itself (already in memory): the project's programs sit at their
# build-tree paths, which may lie under /tmp, and a fresh mount there would hide them.
mkdir -p /tmp
mount -t debugfs debugfs /sys/kernel/debug 2>/dev/null
mkdir -p /dev/pts /run/tolkatouch /root
mount -t devpts devpts /dev/pts

results=/dev/ttyS1
[ -c "$results" ] || results=/dev/console
say() { echo "$*" > "$results"; echo "$*"; }

uptime_s() { cut -d' ' -f1 /proc/uptime; }
say "VM-BOOTED $(uptime_s)s"

for module in $(cat /etc/modules); do
    insmod "/lib/modules/$(uname -r)/$module" || say "VM-ERROR insmod $module failed"
done
# udevd re-broadcasts the kernel's device events to programs that listen through libudev, as on
# any full system; with no rules it adds nothing of its own.
/usr/lib/systemd/systemd-udevd --daemon > /tmp/udevd.log 2>&1 || say "VM-ERROR systemd-udevd did not start"
say "VM-READY $(uptime_s)s"

set -a
[ -f /etc/vm.env ] && . /etc/vm.env
set +a
pass=0
fail=0
for scenario in /scenarios/[0-9]*.sh; do
    name=$(basename "$scenario" .sh)
    start=$(uptime_s)
    mkdir -p "/tmp/$name"
    echo "==== scenario $name" > /dev/console
    if WORK="/tmp/$name" timeout "${SCENARIO_TIMEOUT:-60}" sh "$scenario" > "/tmp/$name/output.log" 2>&1; then
        verdict=PASS
        pass=$((pass + 1))
    else
        verdict=FAIL
        fail=$((fail + 1))
    fi
    end=$(uptime_s)
    seconds=$(awk "BEGIN { printf \"%.1f\", $end - $start }")
    cat "/tmp/$name/output.log" > /dev/console
    if [ "$verdict" = FAIL ]; then
        sed "s/^/LOG $name: /" "/tmp/$name/output.log" > "$results"
    fi
    say "SCENARIO $name $verdict ${seconds}s"
done
say "VM-SUMMARY pass=$pass fail=$fail total=$(uptime_s)s"
say "VM-DONE"
sync
reboot -f
