#!/usr/bin/env bash
# Synthesises the golden input documents: every script under scripts/ with seeds 1..20, packed
# into inputs.tar.xz. Run once when the golden set is widened; the documents are then frozen, so
# that later changes to the synthesiser cannot move the recognizer's goldens.
# Usage: make-inputs.sh TOLKATOUCH
set -euo pipefail
here="$(cd "$(dirname "$0")" && pwd)"
tool="$(realpath "$1")"
work="$(mktemp -d)"
trap 'rm -rf "$work"' EXIT
mkdir "$work/inputs"
for script in "$here"/scripts/*.txt; do
  name="$(basename "$script" .txt)"
  for seed in $(seq 1 20); do
    "$tool" synth "$script" --seed "$seed" -o "$work/inputs/$name-$seed.json"
  done
done
tar -C "$work" --sort=name --owner=0 --group=0 --numeric-owner --mtime=@0 -cJf "$here/inputs.tar.xz" inputs
