#!/bin/bash
# Runs the VM tier: builds the scenario documents and the initramfs, boots the distribution's
# kernel under qemu with software emulation, and reads the scenarios' results from the second
# serial port. Exit status: 0 every scenario passed; 1 a scenario failed or the machine did not
# finish; 77 this machine cannot run the tier (the reason is printed; the tier is then skipped,
# never passed).
#
# usage: run-vm.sh --work-dir DIR (--package DEB | --tolkatouch PATH --daemon PATH --plugin PATH)
#                  --check PATH [--examples DIR] [--kernel-version VERSION] [--timeout SECONDS]
#   --package  the tolkatouch Debian package: unpacked at the machine's root, so the daemon runs
#              from the unit's paths and finds its plug-in beside itself, as installed
#   --tolkatouch, --daemon, --plugin  the build tree's programs, run from where they were built
# Environment: TOLKA_VM_QEMU (the emulator, default qemu-system-x86_64), TOLKA_VM_KERNEL_VERSION,
# TOLKA_VM_TIMEOUT (seconds for the whole machine, default 220), TOLKA_VM_SCENARIO_TIMEOUT (90).
set -uo pipefail

here=$(cd "$(dirname "$0")" && pwd)
work=""
tolkatouch=""
daemon=""
plugin=""
package=""
check=""
examples=""
kver="${TOLKA_VM_KERNEL_VERSION:-}"
timeout_s="${TOLKA_VM_TIMEOUT:-220}"
expected_scenarios=$(ls "$here"/scenarios/[0-9]*.sh | wc -l)

while [ $# -gt 0 ]; do
    case "$1" in
        --work-dir) work="$2"; shift 2 ;;
        --tolkatouch) tolkatouch="$2"; shift 2 ;;
        --daemon) daemon="$2"; shift 2 ;;
        --plugin) plugin="$2"; shift 2 ;;
        --package) package="$2"; shift 2 ;;
        --check) check="$2"; shift 2 ;;
        --examples) examples="$2"; shift 2 ;;
        --kernel-version) kver="$2"; shift 2 ;;
        --timeout) timeout_s="$2"; shift 2 ;;
        *) echo "run-vm: unknown argument $1" >&2; exit 2 ;;
    esac
done
if [ -n "$package" ]; then
    [ -f "$package" ] || { echo "run-vm: no package $package" >&2; exit 1; }
    mkdir -p "$work"
    rm -rf "$work/package"
    dpkg-deb -x "$package" "$work/package" || { echo "run-vm: cannot unpack $package" >&2; exit 1; }
    tolkatouch=$work/package/usr/bin/tolkatouch
    daemon=$work/package/usr/sbin/tolkatouchd
    plugin=$(find "$work/package/usr/lib" -path '*/tolkatouch/*hidservice*.so' | head -1)
fi
for required in work tolkatouch daemon plugin check; do
    [ -n "${!required}" ] || { echo "run-vm: --${required/_/-} is required" >&2; exit 2; }
done

skip() { echo "SKIP: VM tier: $*"; exit 77; }
now() { date +%s.%N; }
elapsed() { awk "BEGIN { printf \"%.1f\", $(now) - $1 }"; }
t0=$(now)

# ---- can this machine run the tier? ----
qemu=$(command -v "${TOLKA_VM_QEMU:-qemu-system-x86_64}") || skip "${TOLKA_VM_QEMU:-qemu-system-x86_64} not found (install qemu-system-x86)"
if [ -z "$kver" ]; then
    for kernel in $(ls -v /boot/vmlinuz-* 2>/dev/null | sort -rV); do
        version=${kernel#/boot/vmlinuz-}
        if [ -f "/lib/modules/$version/modules.dep" ]; then kver=$version; break; fi
    done
fi
[ -n "$kver" ] || skip "no kernel with modules in /boot and /lib/modules (install linux-image-amd64)"
kernel=/boot/vmlinuz-$kver
[ -r "$kernel" ] || skip "$kernel is not readable by this user"
for program in "$tolkatouch" "$daemon" "$check"; do
    [ -x "$program" ] || { echo "run-vm: $program is not built" >&2; exit 1; }
done
[ -f "$plugin" ] || { echo "run-vm: $plugin is not built" >&2; exit 1; }

mkdir -p "$work"
rm -rf "$work/docs" "$work/console.log" "$work/results.log"
mkdir -p "$work/docs"

# ---- the documents the scenarios play ----
for script in "$here"/gestures/*.txt; do
    name=$(basename "$script" .txt)
    "$tolkatouch" synth "$script" --seed 7 -o "$work/docs/$name.json" || { echo "run-vm: cannot synthesise $script" >&2; exit 1; }
done
everyday="${examples:+$examples/everyday-session.json}"
if [ -n "$everyday" ] && [ -f "$everyday" ] && grep -q '"InputReport"' "$everyday"; then
    cp "$everyday" "$work/docs/everyday.json"
else
    echo "run-vm: no example everyday session with reports; playing the synthesised one" >&2
    cp "$work/docs/everyday-fallback.json" "$work/docs/everyday.json"
fi

# From the package the daemon finds its plug-in itself; from the build tree it is told where.
cat > "$work/vm.env" <<EOF
TOLKA_PLUGIN=$([ -n "$package" ] || realpath "$plugin")
SCENARIO_TIMEOUT=${TOLKA_VM_SCENARIO_TIMEOUT:-90}
EOF

# ---- the initramfs ----
if [ -n "$package" ]; then
    service=(--tree "$work/package")
else
    service=(--program "$tolkatouch" --program "$daemon" --library "$plugin")
fi
"$here/build-initramfs.sh" --out "$work/initramfs.cpio" --kernel-version "$kver" \
    "${service[@]}" --program "$check" \
    --file "$here/init.sh:/init" --file "$work/vm.env:/etc/vm.env" \
    --dir "$here/scenarios:/scenarios" --dir "$work/docs:/docs"
status=$?
[ $status -eq 77 ] && exit 77
[ $status -eq 0 ] || { echo "run-vm: building the initramfs failed" >&2; exit 1; }
t_built=$(elapsed "$t0")

# ---- boot ----
echo "run-vm: booting $kernel under qemu (tcg), at most ${timeout_s}s"
t_boot=$(now)
: > "$work/results.log"
timeout --foreground -k 5 "$timeout_s" "$qemu" -accel tcg -m 512M -smp 1 -nodefaults -display none -no-reboot \
    -kernel "$kernel" -initrd "$work/initramfs.cpio" \
    -append "console=ttyS0 quiet loglevel=3 panic=-1 rdinit=/init" \
    -serial "file:$work/console.log" -serial "file:$work/results.log" \
    > "$work/qemu.log" 2>&1
qemu_status=$?
t_vm=$(elapsed "$t_boot")

if [ ! -s "$work/console.log" ] && [ ! -s "$work/results.log" ] && [ "$qemu_status" -ne 124 ] && [ "$qemu_status" -ne 0 ]; then
    # qemu refused to start a machine at all (no emulation here): this machine cannot run the tier.
    # A machine that started and then hung or stayed silent is a failure, not a skip.
    cat "$work/qemu.log"
    skip "qemu could not start a machine here (status $qemu_status): $(head -c 300 "$work/qemu.log" | tr '\n' ' ')"
fi

# ---- results ----
grep -v '^LOG ' "$work/results.log" | sed 's/^/vm: /'
passed=$(grep -c '^SCENARIO .* PASS' "$work/results.log")
failed=$(grep -c '^SCENARIO .* FAIL' "$work/results.log")
if ! grep -q '^VM-DONE' "$work/results.log"; then
    echo "run-vm: the machine did not finish (qemu status $qemu_status after ${t_vm}s); console tail:"
    tail -n 60 "$work/console.log"
    exit 1
fi
if [ "$failed" -ne 0 ]; then
    echo "run-vm: failing scenarios' output:"
    grep '^LOG ' "$work/results.log"
fi
echo "run-vm: ${passed} passed, ${failed} failed of ${expected_scenarios}; initramfs ${t_built}s, machine ${t_vm}s, total $(elapsed "$t0")s"
[ "$failed" -eq 0 ] && [ "$passed" -eq "$expected_scenarios" ] || exit 1
exit 0
