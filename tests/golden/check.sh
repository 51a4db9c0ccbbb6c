#!/usr/bin/env bash
# The recognizer's golden outputs: replays every golden case with TOLKATOUCH and compares the
# digests with expected.sha256, which the recognizer as first verified produced. Any difference is
# a change of behaviour; the differing cases are listed.
# Usage: check.sh TOLKATOUCH WORKDIR
set -euo pipefail
here="$(cd "$(dirname "$0")" && pwd)"
mkdir -p "$2"
actual="$2/actual.sha256"
bash "$here/replay-all.sh" "$1" "$2/replay" >"$actual"
if ! diff -u "$here/expected.sha256" "$actual" >"$2/golden.diff"; then
  echo "golden outputs differ in $(grep -c '^+[0-9a-f]' "$2/golden.diff") files:"
  grep '^+[0-9a-f]' "$2/golden.diff" | head -40
  exit 1
fi
echo "golden outputs: $(wc -l <"$actual") files identical"
