"""Draws a recording as the recognizer saw it: one figure, one time axis.

    python3 -m tolkatouch.plot RECORDING -o out.png|svg|pdf [--from S] [--to S] [--set KEY=VALUE]...

Rows: a heatmap of the 15 pixel readings grouped by zone with the on flags over it, the touch
score with its hold threshold and limits, the hand state and active region as bands, and every
event as a labelled marker. `tolkatouch plot` runs this module.
"""

from __future__ import annotations

import argparse
import os
import sys
from typing import Optional, Sequence

import matplotlib

matplotlib.use("Agg")

from . import Error, Recording, replay  # noqa: E402
from ._errors import error_lines, printable  # noqa: E402
from ._plot_figure import recording_figure  # noqa: E402

FORMATS = ("png", "svg", "pdf")
EXIT_FAILURE = 1
EXIT_USAGE = 2


def output_format(path: str) -> str:
    """The image format named by the output's extension; ValueError for any other."""
    extension = os.path.splitext(path)[1].lower().lstrip(".")
    if extension not in FORMATS:
        raise ValueError(f'{path}: the output must end in .png, .svg or .pdf, not "{extension or path}"')
    return extension


def plot_recording(recording_path: str, output: str, start: Optional[float] = None, end: Optional[float] = None,
                   settings: Sequence[str] = ()) -> None:
    """Replays the document at recording_path with the settings and writes its figure to output."""
    image_format = output_format(output)
    recording = Recording.load(recording_path)
    result = replay(recording, list(settings))
    title = f"{os.path.basename(recording_path)}: {len(recording)} frames, {len(result.events)} events"
    if settings:
        title += " (" + ", ".join(settings) + ")"
    figure = recording_figure(result, printable(title), start, end)
    figure.savefig(output, format=image_format, dpi=110)


def arguments_parser(prog: Optional[str] = None) -> argparse.ArgumentParser:
    parser = argparse.ArgumentParser(prog=prog, description="Draw a recording as the recognizer saw it.")
    parser.add_argument("recording", metavar="RECORDING", help="recording document (version 0 or 1)")
    parser.add_argument("-o", "--output", required=True, metavar="OUT", help="image to write: .png, .svg or .pdf")
    parser.add_argument("--from", dest="start", type=float, metavar="S", help="first second to draw (from the first frame)")
    parser.add_argument("--to", dest="end", type=float, metavar="S", help="last second to draw")
    parser.add_argument("--set", dest="settings", action="append", default=[], metavar="KEY=VALUE",
                        help="a setting applied before the first frame, as replay --set takes it (repeatable)")
    return parser


def main(argv: Optional[Sequence[str]] = None, prog: Optional[str] = None) -> int:
    parser = arguments_parser(prog)
    arguments = parser.parse_args(argv)
    if arguments.start is not None and arguments.end is not None and arguments.end <= arguments.start:
        parser.error("--to must come after --from")
    try:
        output_format(arguments.output)
    except ValueError as error:
        parser.error(str(error))
    try:
        plot_recording(arguments.recording, arguments.output, arguments.start, arguments.end, arguments.settings)
    except Error as error:
        print(f"tolkatouch: {error_lines(error)}", file=sys.stderr)
        return EXIT_USAGE if error.__class__.__name__ == "SettingError" else EXIT_FAILURE
    except OSError as error:
        print(f"tolkatouch: {error_lines(error)}", file=sys.stderr)
        return EXIT_FAILURE
    return 0


if __name__ == "__main__":
    sys.exit(main(prog=os.environ.get("TOLKATOUCH_PLOT_PROG")))
