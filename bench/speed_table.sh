#!/bin/bash
# Every ratio of the speed-and-memory targets in one run, as one table: the recognizer against an
# earlier commit's (bench/algs/compare.sh, which builds that commit's baseline), the document's
# read and write against simdjson's parse-and-walk and nlohmann's dump(2) (bench_pipeline), replay
# of a long document against a bare parse and hex decode (bench/tools/replay_memory.sh) and the
# daemon at 125 frames/s (bench/daemon/daemon_load.sh). Builds what it runs (release preset).
#
#   bench/speed_table.sh [BASE_COMMIT [REPLAY_FRAMES]]     (defaults: daac62a, 1000000)
set -euo pipefail

base=${1:-daac62a}
replay_frames=${2:-1000000}
root=$(git rev-parse --show-toplevel)
cd "$root"
build=build/release
out=$(mktemp -d)
trap 'rm -rf "$out"' EXIT

launcher=()
if command -v ccache >/dev/null; then
    launcher=(-DCMAKE_CXX_COMPILER_LAUNCHER=ccache -DCMAKE_C_COMPILER_LAUNCHER=ccache)
fi
[[ -f $build/CMakeCache.txt ]] || cmake --preset release "${launcher[@]}" >/dev/null
cmake --build $build --target bench_algs bench_pipeline bench_parse_hex_decode tolkatouch tolkatouchd tolka_plugin >/dev/null

echo "load average at the start: $(cut -d' ' -f1-3 /proc/loadavg)"
bench/algs/compare.sh "$base" 3 | tee "$out/algs"
$build/bench/pipeline/bench_pipeline --benchmark_filter='Document|Anchor' --benchmark_repetitions=3 \
    --benchmark_report_aggregates_only=true --benchmark_format=json > "$out/pipeline.json"
bench/tools/replay_memory.sh $build/tools/tolkatouch $build/bench/tools/bench_parse_hex_decode "$replay_frames" 3 |
    tee "$out/replay"
bench/daemon/daemon_load.sh $build/daemon/tolkatouchd $build/tools/tolkatouch $build/plugin/tolkatouch-hidservice.so |
    tee "$out/daemon"
echo "load average at the end: $(cut -d' ' -f1-3 /proc/loadavg)"

/usr/bin/python3 - "$out" "$base" "$replay_frames" <<'PY'
import json, re, sys
out, base, frames = sys.argv[1], sys.argv[2], int(sys.argv[3])
algs = open(f"{out}/algs").read()
ratio = re.search(r"median ratio BM_HandleImageMixedSequence: ([0-9.]+)", algs).group(1)
quiet = re.findall(r"BM_HandleImageMixedSequence .*-> [0-9.]+ \(([0-9]+), ([0-9]+)\)", algs)
cpu = {b["run_name"]: b["cpu_time"] for b in json.load(open(f"{out}/pipeline.json"))["benchmarks"]
       if b.get("aggregate_name") == "median"}
read = cpu["BM_ReadDocument"]
replay = open(f"{out}/replay").read()
r_wall = re.search(r"replay / ondemand: wall ([0-9.]+)", replay).group(1)
r_dom = re.search(r"replay / dom: wall ([0-9.]+)", replay).group(1)
r_mem = re.search(r"tolkatouch replay --fast --json +[0-9.]+ +[0-9.]+ +([0-9.]+)", replay).group(1)
daemon = open(f"{out}/daemon").read()
d_cpu = re.search(r"CPU: ([0-9.]+)%", daemon).group(1)
d_mem = re.search(r"peak resident memory: ([0-9.]+) MB", daemon).group(1)
rows = [
    (f"recognizer, mixed sequence: median CPU per frame / {base}'s", "<= 0.35", ratio),
    ("recognizer: heap allocations on a frame without an event / with one", "0 / 1",
     " / ".join(sorted(set(q[0] for q in quiet))) + " / " + " / ".join(sorted(set(q[1] for q in quiet)))),
    ("read the full recording's document / simdjson ondemand parse-and-walk", "<= 3",
     f"{read / cpu['BM_AnchorSimdjsonOndemandParseAndWalk']:.2f}"),
    ("read the full recording's document / simdjson DOM parse-and-walk", "<= 3",
     f"{read / cpu['BM_AnchorSimdjsonDomParseAndWalk']:.2f}"),
    ("write it / nlohmann dump(2) of the same content", "<= 1.0",
     f"{cpu['BM_WriteDocument'] / cpu['BM_AnchorNlohmannDump2']:.2f}"),
    (f"replay --fast --json of {frames} frames: wall / simdjson ondemand parse + hex decode", "<= 1.5", r_wall),
    (f"replay --fast --json of {frames} frames: wall / simdjson DOM parse + hex decode", "<= 1.5", r_dom),
    (f"replay --fast --json of {frames} frames: peak resident MiB", "<= 32 MB", r_mem),
    ("tolkatouchd at 125 frames/s for 60 s: % of one core", "<= 0.3", d_cpu),
    ("tolkatouchd at 125 frames/s for 60 s: peak resident MB", "<= 8", d_mem),
]
print("\n| target | goal | figure |\n|---|---|---|")
for name, goal, figure in rows:
    print(f"| {name} | {goal} | {figure} |")
PY
