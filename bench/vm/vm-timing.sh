#!/bin/bash
# Times the VM tier: the wall time of the whole ctest run, and from the machine's own clock the
# boot (kernel started -> /init running, then modules loaded and udevd up) and each scenario.
# usage: bench/vm/vm-timing.sh [BUILD_DIR]      (default build/release, already built)
set -euo pipefail
build=${1:-build/release}
start=$(date +%s.%N)
status=0
ctest --test-dir "$build" -L vm --output-on-failure > "$build/vm-timing.log" 2>&1 || status=$?
end=$(date +%s.%N)
results="$build/tests/vm/work/results.log"
echo "ctest -L vm: $(awk "BEGIN { printf \"%.1f\", $end - $start }") s wall (status $status)"
grep -E '^(VM-BOOTED|VM-READY|SCENARIO|VM-SUMMARY)' "$results" || echo "no results in $results"
exit $status
