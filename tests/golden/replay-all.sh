#!/usr/bin/env bash
# Replays every golden input (the frozen synthesised documents and the shipped examples) under
# each settings variant and writes, per case, the events with the counters, and the digest of the
# description lines (hundreds of megabytes as text). Prints one "sha256  case/file" line per
# output, sorted: the recognizer's golden digest.
# Usage: replay-all.sh TOLKATOUCH OUTDIR
set -euo pipefail
here="$(cd "$(dirname "$0")" && pwd)"
root="$(cd "$here/../.." && pwd)"
tool="$(realpath "$1")"
out="$2"
rm -rf "$out"
mkdir -p "$out/inputs"
tar -C "$out" -xJf "$here/inputs.tar.xz"
cp "$root"/examples/*.json "$out/inputs/"

variants=(
  "defaults:"
  "hold-350:Algs.HoldTimeoutMilliseconds=350"
  "threshold-160:Algs.ActivationThreshold=160"
  "no-tap-suppression:Algs.EnableTapSuppression=false"
  "factors:Algs.VirtualNormalizationFactors.10=0.6 Algs.VirtualNormalizationFactors.19=0.3"
)

for doc in "$out"/inputs/*.json; do
  name="$(basename "$doc" .json)"
  for variant in "${variants[@]}"; do
    label="${variant%%:*}"
    sets=()
    for assignment in ${variant#*:}; do sets+=(--set "$assignment"); done
    case="$out/cases/$name/$label"
    mkdir -p "$case"
    "$tool" replay "$doc" --fast --json --stats --describe "${sets[@]}" 2>&1 >"$case/events.jsonl" |
      sha256sum | cut -d' ' -f1 >"$case/describe.sha256"
  done
done
(cd "$out/cases" && find . -type f | sort | xargs sha256sum)
