#!/bin/bash
# Regenerates the example documents of examples/ from their gesture scripts with the default
# seed. version0-session.json is then rewritten in the older layout (version 0: input reports
# only, "Reports" with "Timestamp" and "ReportData"), which the tool reads but never writes.
#
#   tools/regenerate-examples.sh <path to the built tolkatouch>
#
# After running it, refresh the expected outputs of tests/tools/expected/ and review the diff.
set -euo pipefail

tolkatouch=${1:?usage: $0 <path to tolkatouch>}
examples=$(cd "$(dirname "$0")/../examples" && pwd)

# everyday-session.json is not regenerated: it is a golden input and the built-in sample, frozen as
# the earlier finger model made its brushes (today's brushes are grazes the tap rejection turns down).
for script in reset-during-hold; do
  "$tolkatouch" synth "$examples/$script.txt" -o "$examples/$script.json"
done

"$tolkatouch" synth "$examples/version0-session.txt" |
  jq '{Version: 0, Reports: [.Frames[] | select(.Type == "InputReport") | {Timestamp, ReportData: .Report}]}' \
    > "$examples/version0-session.json"
