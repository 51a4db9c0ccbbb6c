#!/bin/bash
# What tolkatouchd costs while a surface streams: the daemon runs the plug-in against the
# simulated device fed at 125 frames per second for 60 seconds (7,500 image reports: the everyday
# example session over and over, paced at its recorded times), writing its keys to a key log,
# with the packaged log configuration (packaging/log.conf: its rate guard folds the per-frame
# line), under /usr/bin/time -v. Prints the CPU share of one core and the peak resident memory.
#
#   bench/daemon/daemon_load.sh <tolkatouchd> <tolkatouch> <plug-in library> [seconds]
#
# Use a Release build of all three. The log's lines go to standard error, which the script sends
# to /dev/null, as the journal would take them from a service.
set -euo pipefail

daemon=${1:?usage: $0 <tolkatouchd> <tolkatouch> <plug-in library> [seconds]}
tolkatouch=${2:?usage: $0 <tolkatouchd> <tolkatouch> <plug-in library> [seconds]}
plugin=${3:?usage: $0 <tolkatouchd> <tolkatouch> <plug-in library> [seconds]}
seconds=${4:-60}
frames=$(( seconds * 125 ))
work=$(mktemp -d)
trap 'rm -rf "$work"' EXIT

source "$(dirname "$0")/../long_session.sh"
synth_long_session "$tolkatouch" "$frames" "$work/long.json"
actual=$(grep -c '"Type": "InputReport"' "$work/long.json")

/usr/bin/time -v -o "$work/time.txt" \
  "$daemon" --simulate "$work/long.json" --plugin "$plugin" --socket "$work/tolkatouchd.sock" \
  --key-log "$work/keys.log" --log-config "$(dirname "$0")/../../packaging/log.conf" > /dev/null 2> /dev/null

field() { grep -F "$1" "$work/time.txt" | sed 's/.*: //'; }
user=$(field "User time (seconds)")
system=$(field "System time (seconds)")
wall=$(field "Elapsed (wall clock) time")
rss=$(field "Maximum resident set size (kbytes)")
# m:ss.ss or h:mm:ss to seconds
wall_seconds=$(echo "$wall" | awk -F: '{ s = 0; for (i = 1; i <= NF; i++) s = s * 60 + $i; print s }')
cpu=$(awk -v u="$user" -v s="$system" -v w="$wall_seconds" 'BEGIN { printf "%.2f", (u + s) / w * 100 }')
keys=$(wc -l < "$work/keys.log")

echo "frames: $actual at 125/s; wall ${wall_seconds}s; user ${user}s; system ${system}s"
echo "CPU: ${cpu}% of one core; peak resident memory: $(( rss / 1024 )).$(( (rss % 1024) * 10 / 1024 )) MB (${rss} kB); key writes: ${keys}"
