"""The soak's checks: the daemon printed exactly the replay's events (time stamps aside), and its
resident memory grew by under 1 MB after the first simulated hour (or, in a run of under four
simulated hours, after its first quarter). Memory goes up and down by a few MB for a moment as
whole recordings are copied out for the clients, so levels are medians of the samples: growth is
the median of the run's last quarter over the median of the second half of the first hour (or
quarter), so that a leak shows and the copies in flight do not. The peak is printed too.

usage: soak_check.py EXPECTED.jsonl PRINTED.jsonl RSS.txt SECONDS SPEED
"""
import json
import sys

expected_path, printed_path, rss_path = sys.argv[1:4]
seconds, speed = float(sys.argv[4]), float(sys.argv[5])


def events(path):
    result = []
    with open(path) as f:
        for line in f:
            event = json.loads(line)
            event.pop("timestamp", None)
            result.append(json.dumps(event, sort_keys=True))
    return result


ok = True
expected, printed = events(expected_path), events(printed_path)
same = expected == printed
print(f"events: {len(printed)} printed, {len(expected)} expected from replay: "
      f"{'identical' if same else 'DIFFERENT'}")
if not same:
    first = next((i for i, (a, b) in enumerate(zip(expected, printed)) if a != b), min(len(expected), len(printed)))
    print(f"FAIL: first difference at event {first}")
    ok = False

samples = []
with open(rss_path) as f:
    for line in f:
        at, kb = line.split()
        samples.append((float(at), int(kb)))
baseline_at = min(3600 / speed, seconds / 4)
def median(values):
    ordered = sorted(values)
    return ordered[len(ordered) // 2]


duration = samples[-1][0]
settled = [kb for at, kb in samples if baseline_at / 2 <= at < baseline_at]
final = [kb for at, kb in samples if at >= max(baseline_at, duration * 3 / 4)]
if len(settled) < 3 or len(final) < 3:
    print(f"FAIL: too few memory samples (run at least {baseline_at * 2:.0f} s)")
    sys.exit(1)
baseline, level = median(settled), median(final)
growth = level - baseline
print(f"resident memory: {samples[0][1]} kB at start, median {baseline} kB at {baseline_at / 2:.0f}-{baseline_at:.0f} s, "
      f"median {level} kB over the last quarter, peak {max(kb for _, kb in samples)} kB: growth {growth} kB "
      f"(limit 1024 kB)")
if growth >= 1024:
    print("FAIL: resident memory grew by 1 MB or more")
    ok = False
sys.exit(0 if ok else 1)
