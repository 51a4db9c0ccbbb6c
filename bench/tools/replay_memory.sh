#!/bin/bash
# `tolkatouch replay --fast --json` of a long document beside the bare anchor, in one run: wall
# time, processor time and peak resident memory (GNU time's maximum resident set) of the replay
# and of bench_parse_hex_decode (simdjson's parse of the whole file and a hex decode of every
# report; ondemand, then --dom), each run RUNS times alternately; prints the medians and ratios.
# The document: FRAMES image frames, the everyday example session over and over (synthesised once
# for 100,000 frames and repeated past that with bench/make_long_document.py).
#
#   bench/tools/replay_memory.sh TOLKATOUCH BENCH_PARSE_HEX_DECODE [FRAMES [RUNS]]
set -euo pipefail

tolkatouch=${1:?usage: $0 TOLKATOUCH BENCH_PARSE_HEX_DECODE [FRAMES [RUNS]]}
anchor=${2:?usage: $0 TOLKATOUCH BENCH_PARSE_HEX_DECODE [FRAMES [RUNS]]}
frames=${3:-100000}
runs=${4:-3}
here=$(cd "$(dirname "$0")" && pwd)
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

source "$here/../long_session.sh"
base=$(( frames < 100000 ? frames : 100000 ))
synth_long_session "$tolkatouch" "$base" "$work/base.json"
if [ "$frames" -gt "$base" ]; then
  /usr/bin/python3 "$here/../make_long_document.py" "$work/base.json" "$frames" "$work/long.json"
  rm "$work/base.json"
else
  mv "$work/base.json" "$work/long.json"
fi
printf 'document: %d frames, %d bytes; load average %s\n' "$frames" "$(stat -c %s "$work/long.json")" \
  "$(cut -d' ' -f1-3 /proc/loadavg)"

# One line per run: name wall-seconds user-seconds system-seconds max-resident-KiB
measure() {
  local name=$1; shift
  /usr/bin/time -f "$name %e %U %S %M" -o "$work/time" "$@" > /dev/null
  cat "$work/time" >> "$work/runs"
}
: > "$work/runs"
for ((i = 0; i < runs; ++i)); do
  measure replay "$tolkatouch" replay --fast --json "$work/long.json"
  measure ondemand "$anchor" "$work/long.json"
  measure dom "$anchor" --dom "$work/long.json"
done
echo "load average after: $(cut -d' ' -f1-3 /proc/loadavg)"

/usr/bin/python3 - "$work/runs" <<'PY'
import statistics, sys
rows = {}
for line in open(sys.argv[1]):
    name, wall, user, system, rss = line.split()
    rows.setdefault(name, []).append((float(wall), float(user) + float(system), int(rss) / 1024))
med = {n: tuple(statistics.median(r[i] for r in runs) for i in range(3)) for n, runs in rows.items()}
labels = {"replay": "tolkatouch replay --fast --json", "ondemand": "simdjson ondemand parse + hex decode",
          "dom": "simdjson DOM parse + hex decode"}
print(f"{'median of ' + str(len(rows['replay'])) + ' runs':<40} {'wall s':>7} {'cpu s':>7} {'peak MiB':>9}")
for n in ("replay", "ondemand", "dom"):
    print(f"{labels[n]:<40} {med[n][0]:>7.3f} {med[n][1]:>7.3f} {med[n][2]:>9.1f}")
for n in ("ondemand", "dom"):
    r, a = med["replay"], med[n]
    print(f"replay / {n}: wall {r[0] / a[0]:.2f}, processor {r[1] / a[1]:.2f}, memory {r[2] / a[2]:.2f}")
PY
