#!/bin/bash
# What `tolkatouch tune` costs on the shipped corpus: 100 trials with two trials at once (the
# target: at most 5 minutes on the 2-core machine), wall and processor time, how many trials the
# pruner stopped, and, in the same run, one `tolkatouch eval -j 2` of the whole corpus, so that the
# search's cost reads as a number of full evaluations whatever else loads the machine.
#
#   bench/tools/tune_speed.sh <path to a Release build of tolkatouch> [corpus folder] [tune options...]
set -euo pipefail

tool=$(realpath "${1:?usage: $0 <path to tolkatouch> [corpus folder] [tune options...]}")
corpus=${2:-}
shift $(($# < 2 ? $# : 2))
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT
if [ -z "$corpus" ]; then
  corpus="$work/corpus"
  bash "$(dirname "$0")/../../examples/corpus/generate" "$tool" "$corpus" >/dev/null
fi

TIMEFORMAT='%R %U %S'
# Prints "<wall ms> <processor ms>" of the command.
timed() {
  local wall user system
  read -r wall user system < <({ time "$@" >/dev/null 2>"$work/stderr"; } 2>&1)
  awk -v w="$wall" -v u="$user" -v s="$system" 'BEGIN { printf "%d %d\n", w * 1000, (u + s) * 1000 }'
}

load_before=$(cut -d' ' -f1 /proc/loadavg)
read -r eval_wall eval_cpu < <(timed "$tool" eval -j 2 "$corpus")
read -r tune_wall tune_cpu < <(timed "$tool" tune "$corpus" --trials 100 -j 2 --json --storage "journal:$work/study.log" "$@")
counts=$(/usr/bin/python3 - "$work/study.log" <<'PYTHON'
import sys
import warnings
import optuna
warnings.simplefilter("ignore")
study = optuna.load_study(study_name="tolkatouch-tune",
                          storage=optuna.storages.JournalStorage(optuna.storages.JournalFileStorage(sys.argv[1])))
states = [t.state.name for t in study.trials]
print(len(states), states.count("PRUNED"), states.count("FAIL"))
PYTHON
)
read -r trials pruned failed <<<"$counts"
load_after=$(cut -d' ' -f1 /proc/loadavg)

echo "load average before/after: $load_before / $load_after"
echo "eval -j 2 of the corpus:   ${eval_wall} ms wall, ${eval_cpu} ms processor"
echo "tune, 100 trials, -j 2:    ${tune_wall} ms wall, ${tune_cpu} ms processor (limit 300000 ms wall)"
echo "trials ${trials}, pruned ${pruned}, failed ${failed}"
awk -v t="$tune_wall" -v e="$eval_wall" 'BEGIN { printf "tune costs %.1f full evaluations of the corpus (wall)\n", t / e }'
