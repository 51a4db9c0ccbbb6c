#!/bin/bash
# Draws the README's figure of the shipped everyday session with the built tool:
#   python/regenerate-readme-plot.sh [BUILD_DIR]   (default build/release)
set -euo pipefail
cd "$(dirname "$0")/.."
build=${1:-build/release}
"$build/tools/tolkatouch" plot examples/everyday-session.json -o docs/everyday-session-plot.png
echo "wrote docs/everyday-session-plot.png"
