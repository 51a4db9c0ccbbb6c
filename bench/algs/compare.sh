#!/usr/bin/env bash
# The recognizer's per-frame cost side by side with an earlier commit's, in one run.
#
# usage: bench/algs/compare.sh [BASE_COMMIT [RUNS]]     (defaults: daac62a, 3)
#
# Builds BASE_COMMIT's recognizer in a git worktree of its own (release preset, ccache when
# installed) with this tree's bench/algs/BenchAlgs.cpp, so both programs run the same benchmark;
# builds this tree's bench_algs (release preset); then runs the two alternately RUNS times and
# prints, per run and as the median over the runs, the median CPU time per frame of each, their
# ratio and the heap allocations per frame (all frames, frames without an event, frames with one).
# The load average is printed before and after: the ratio is what to read on a busy machine.
set -euo pipefail

base=${1:-daac62a}
runs=${2:-3}
root=$(git rev-parse --show-toplevel)
basedir=${TOLKA_BENCH_BASE_DIR:-/tmp/tolka-algs-base-$base}

launcher=()
if command -v ccache >/dev/null; then
    launcher=(-DCMAKE_CXX_COMPILER_LAUNCHER=ccache -DCMAKE_C_COMPILER_LAUNCHER=ccache)
fi

if [[ ! -d $basedir ]]; then
    git -C "$root" worktree add --detach "$basedir" "$base" >/dev/null
fi
cp "$root/bench/algs/BenchAlgs.cpp" "$basedir/bench/algs/BenchAlgs.cpp"
(cd "$basedir" && cmake --preset release -DTOLKA_BUILD_TESTS=OFF "${launcher[@]}" >/dev/null &&
    cmake --build build/release --target bench_algs >/dev/null)
(cd "$root" && { [[ -f build/release/CMakeCache.txt ]] || cmake --preset release "${launcher[@]}" >/dev/null; } &&
    cmake --build build/release --target bench_algs >/dev/null)

out=$(mktemp -d)
trap 'rm -rf "$out"' EXIT
echo "load average before: $(cut -d' ' -f1-3 /proc/loadavg)"
for ((i = 1; i <= runs; ++i)); do
    "$basedir/build/release/bench/algs/bench_algs" --benchmark_format=json >"$out/base-$i.json"
    "$root/build/release/bench/algs/bench_algs" --benchmark_format=json >"$out/now-$i.json"
done
echo "load average after:  $(cut -d' ' -f1-3 /proc/loadavg)"

/usr/bin/python3 - "$out" "$runs" "$base" <<'PY'
import json, statistics, sys

out, runs, base = sys.argv[1], int(sys.argv[2]), sys.argv[3]

def medians(path):
    rows = {}
    for b in json.load(open(path))["benchmarks"]:
        if b.get("aggregate_name") == "median":
            rows[b["run_name"].split("/")[0]] = b
    return rows

names = ["BM_HandleImageMixedSequence", "BM_HandleImageIdle"]
ratios = {n: [] for n in names}
print(f"{'run':>3}  {'benchmark':<28} {base + ' ns':>12} {'now ns':>8} {'ratio':>6}  allocs/frame base -> now  (quiet, event)")
for i in range(1, runs + 1):
    b, n = medians(f"{out}/base-{i}.json"), medians(f"{out}/now-{i}.json")
    for name in names:
        ratio = n[name]["cpu_time"] / b[name]["cpu_time"]
        ratios[name].append(ratio)
        def allocs(r):
            text = f"{r.get('allocs/frame', 0):.3f}"
            if "allocs/quiet" in r:
                text += f" ({r['allocs/quiet']:.0f}, {r['allocs/event']:.0f})"
            return text
        print(f"{i:>3}  {name:<28} {b[name]['cpu_time']:>12.0f} {n[name]['cpu_time']:>8.0f} {ratio:>6.2f}  "
              f"{allocs(b[name])} -> {allocs(n[name])}")
for name in names:
    print(f"median ratio {name}: {statistics.median(ratios[name]):.2f}  (runs: {', '.join(f'{r:.2f}' for r in ratios[name])})")
PY
