# Sourced by the benchmark scripts: synth_long_session TOLKATOUCH FRAMES OUT.json writes a
# synthesised document of exactly FRAMES image reports, the everyday example session over and
# over, then a wait that makes the count exact (one frame every 8 ms).
synth_long_session() {
  local tolkatouch=$1 frames=$2 out=$3
  local examples work
  examples=$(cd "$(dirname "${BASH_SOURCE[0]}")/../examples" && pwd)
  work=$(mktemp -d)
  count_frames() { grep -c '"Type": "InputReport"' "$1"; }
  grep -v '^#' "$examples/everyday-session.txt" > "$work/pass.txt"
  "$tolkatouch" synth "$work/pass.txt" -o "$work/pass.json"
  local passes=$(( frames / $(count_frames "$work/pass.json") ))
  : > "$work/long.txt"
  for _ in $(seq "$passes"); do cat "$work/pass.txt" >> "$work/long.txt"; done
  "$tolkatouch" synth "$work/long.txt" -o "$out"
  local missing=$(( frames - $(count_frames "$out") ))
  if [ "$missing" -gt 0 ]; then
    echo "wait $(( missing * 8 ))ms" >> "$work/long.txt"
    "$tolkatouch" synth "$work/long.txt" -o "$out"
  fi
  rm -rf "$work"
}
