#!/bin/bash
# Takes the README's screenshot of the viewer on the shipped everyday session, in headless
# Chromium, with the browser test that draws it:
#   python/regenerate-readme-view.sh [BUILD_DIR]   (default build/release)
set -euo pipefail
cd "$(dirname "$0")/.."
build=$(realpath "${1:-build/release}")
TOLKATOUCH_VIEW_SCREENSHOT="$PWD/docs/everyday-session-view.png" PYTHONPATH="$build/python" \
  TOLKATOUCH="$build/tools/tolkatouch" PYTHONDONTWRITEBYTECODE=1 \
  /usr/bin/python3 -m pytest -q -p no:cacheprovider tests/python/test_view_browser.py -k readme_screenshot
echo "wrote docs/everyday-session-view.png"
