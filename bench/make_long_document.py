#!/usr/bin/python3
"""Writes a long recording by repeating the frames of a base recording (a version-1 document)
until it holds FRAMES frames, each pass shifted in time after the last, in the document's
indented layout or (--lines) in the line form. Written as it goes: the output is never held in
memory, so a million-frame file (about 340 MB) costs this script only the base recording.

usage: make_long_document.py BASE.json FRAMES OUT [--lines]
"""
import json
import sys


def main():
    if len(sys.argv) not in (4, 5) or (len(sys.argv) == 5 and sys.argv[4] != "--lines"):
        sys.exit(__doc__)
    base_path, frames, out_path = sys.argv[1], int(sys.argv[2]), sys.argv[3]
    lines = len(sys.argv) == 5
    with open(base_path) as base_file:
        base = json.load(base_file)["Frames"]
    first, last = base[0]["Timestamp"], base[-1]["Timestamp"]
    period = last - first + 8_000_000
    with open(out_path, "w") as out:
        if lines:
            out.write('{"Version":1,"Format":"lines"}\n')
        else:
            out.write('{\n    "Version": 1,\n    "Frames": [')
        for index in range(frames):
            frame = dict(base[index % len(base)])
            frame["Timestamp"] += (index // len(base)) * period
            if lines:
                out.write(json.dumps(frame, separators=(",", ":")) + "\n")
            else:
                text = json.dumps(frame, indent=4).replace("\n", "\n        ")
                out.write(("," if index else "") + "\n        " + text)
        if not lines:
            out.write("\n    ]\n}\n" if frames else "]\n}\n")


if __name__ == "__main__":
    main()
