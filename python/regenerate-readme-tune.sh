#!/bin/bash
# Draws the README's pictures of a settings search: the four-setting search of the README's
# tuning example on the shipped corpus, 40 trials, one job, seed 0 (so one build draws one
# picture), through Optuna's matplotlib plots (tolkatouch.plot_tune):
#   python/regenerate-readme-tune.sh [BUILD_DIR]   (default build/release)
set -euo pipefail
cd "$(dirname "$0")/.."
build=$(realpath "${1:-build/release}")
cmake --build "$build" --target corpus tolkatouch _tolkatouch
out=$(mktemp -d)
trap 'rm -rf "$out"' EXIT
PYTHONPATH="$build/python" "$build/tools/tolkatouch" tune "$build/corpus" --trials 40 -j 1 --seed 0 \
  --space HoldTimeoutMilliseconds=200:900 --space ActivationThreshold=50:800:log \
  --space EnableTapSuppression --space EnableHoldSuppression --plots "$out" --json > "$out/result.json"
cp "$out/history.png" docs/tune-search-history.png
echo "wrote docs/tune-search-history.png"
if [[ -f "$out/importances.png" ]]; then
  cp "$out/importances.png" docs/tune-search-importances.png
  echo "wrote docs/tune-search-importances.png"
fi
/usr/bin/python3 -c 'import json, sys
r = json.load(open(sys.argv[1]))
print("trials", r["trials"], "pruned", r["pruned"], "failed", r["failed"], "best", r["best"]["settings"])' "$out/result.json"
