"""Builds the soak's document: one recorded pass repeated every GAP simulated minutes, the surface
silent in between, over SECONDS x SPEED simulated seconds, ending with the pass's last report at
the very end so that the daemon plays for the whole time.

usage: soak_document.py PASS.json OUT.json SECONDS SPEED GAP_MINUTES
"""
import json
import sys

pass_path, out_path = sys.argv[1], sys.argv[2]
seconds, speed, gap_minutes = float(sys.argv[3]), float(sys.argv[4]), float(sys.argv[5])

with open(pass_path) as f:
    document = json.load(f)
frames = document["Frames"]
first = frames[0]["Timestamp"]
length = frames[-1]["Timestamp"] - first
simulated = int(seconds * speed * 1e9)
gap = int(gap_minutes * 60e9)
if gap <= length:
    sys.exit("soak_document.py: the gap must be longer than the pass")

soak = []
passes = 0
for start in range(0, max(simulated - length, 1), gap):
    for frame in frames:
        soak.append(dict(frame, Timestamp=frame["Timestamp"] - first + start + first))
    passes += 1
soak.append(dict(frames[-1], Timestamp=first + simulated))
with open(out_path, "w") as f:
    json.dump({"Version": document["Version"], "Frames": soak}, f, separators=(",", ":"))
reports = sum(1 for frame in soak if frame["Type"] == "InputReport")
print(f"document: {passes} passes of {len(frames)} frames every {gap_minutes:g} simulated minutes, "
      f"{reports} reports over {simulated / 3.6e12:.2f} simulated hours ({seconds:g} s at {speed:g}x)")
