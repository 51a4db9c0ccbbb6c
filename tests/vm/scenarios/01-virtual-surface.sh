# The virtual surface alone: the kernel parses its descriptor, offers a hidraw node with the
# surface's IDs, answers feature reports with what the surface answered (one of them failing),
# and hands its input reports through unchanged.
. /scenarios/common.sh

no_surface || fail "a surface exists before the scenario"
tolkatouch uhid "$DOCS/taps.json" --fail-report 0x10 --feature 0x1f=88130000 --linger 2 > "$WORK/uhid.log" 2>&1 &
UHID_PID=$!
wait_until 10 has_surface || { cat "$WORK/uhid.log"; fail "no hidraw node appeared"; }
node=$(surface_hidraw)
note "hidraw node $node"
tolka-vm-check hidraw "$node" --document "$DOCS/taps.json" --fail-report 0x10 --feature 0x1f=88130000 --inputs 5 \
    || fail "the hidraw node does not show the virtual surface"
wait "$UHID_PID" || { cat "$WORK/uhid.log"; fail "tolkatouch uhid failed"; }
UHID_PID=""
cat "$WORK/uhid.log"
wait_until 5 no_surface || fail "the hidraw node stayed after the surface was destroyed"
echo "PASS"
