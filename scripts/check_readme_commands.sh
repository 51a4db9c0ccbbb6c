#!/bin/bash
# Runs the README's shell blocks meant to run after `bash scripts/quickstart demo`: each fenced
# ```sh block right after a line "<!-- runs after quickstart demo -->", as shown, from the top of
# the tree, in its own bash with -e (a command that fails fails the block). Prints each block's
# commands and says which failed.
#
#   scripts/check_readme_commands.sh [README]
set -uo pipefail
top=$(cd "$(dirname "$0")/.." && pwd)
readme=${1:-$top/README.md}
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

# Split the marked blocks into work/block-N.sh.
awk -v dir="$work" '
  /^<!-- runs after quickstart demo -->$/ { marked = 1; next }
  marked && /^```sh$/ { n++; file = dir "/block-" n ".sh"; inside = 1; marked = 0; next }
  inside && /^```$/ { inside = 0; close(file); next }
  inside { print > file; next }
  { marked = 0 }
' "$readme"

blocks=("$work"/block-*.sh)
[ -e "${blocks[0]}" ] || { echo "check_readme_commands: no marked blocks in $readme" >&2; exit 1; }
failures=0
for block in "${blocks[@]}"; do
  echo "== $(basename "$block")"
  sed 's/^/   $ /' "$block"
  if ! (cd "$top" && timeout 120 bash -e "$block" > "$block.out" 2>&1); then
    echo "FAIL: $(basename "$block"):" >&2
    tail -20 "$block.out" >&2
    failures=$((failures + 1))
  fi
done
[ "$failures" -eq 0 ] || exit 1
echo "every marked README block ran"
