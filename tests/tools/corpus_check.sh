#!/bin/bash
# Generates the shipped labelled corpus and evaluates it as a user would: every recording is
# evaluated, the result is the same for one thread and for two, and two shards merged give
# exactly the whole.
# Usage: corpus_check.sh TOLKATOUCH WORKDIR
set -euo pipefail
tool="$1"
work="$2"
here="$(cd "$(dirname "$0")" && pwd)"
bash "$here/../../examples/corpus/generate" "$tool" "$work/corpus" >/dev/null

"$tool" eval --json -j 1 "$work/corpus" >"$work/one.json"
"$tool" eval --json -j 2 "$work/corpus" >"$work/two.json"
cmp "$work/one.json" "$work/two.json" || { echo "eval -j 1 and -j 2 differ"; exit 1; }

"$tool" eval --json --shard 1/2 "$work/corpus" >"$work/shard1.json"
"$tool" eval --json --shard 2/2 "$work/corpus" >"$work/shard2.json"
"$tool" eval --json --merge "$work/shard1.json" "$work/shard2.json" >"$work/merged.json"
cmp "$work/one.json" "$work/merged.json" || { echo "merged shards differ from the whole"; exit 1; }

recordings=$(grep -o '"Recordings":[0-9]*' "$work/one.json")
[ "$recordings" = '"Recordings":531' ] || { echo "expected 531 recordings, got $recordings"; exit 1; }
grep -q '"Failures":\[\]' "$work/one.json" || { echo "some recordings were not evaluated"; exit 1; }
echo "corpus: 531 recordings; -j 1 = -j 2; shards merged = whole"
