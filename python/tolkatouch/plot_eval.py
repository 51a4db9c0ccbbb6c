"""Draws evaluations: a metric against a setting per gesture kind, a DET-style curve (false
rejects against false activations per hour, log axes) and the confusion matrix.

    python3 -m tolkatouch.plot_eval RESULTS.json -o out.png|svg|pdf
                                    [--kind metric|det|confusion] [--setting KEY] [--metric F1|Precision|Recall]
                                    [--point N]

`tolkatouch plot-eval` runs this module. RESULTS.json is what `tolkatouch eval --json`, `tolkatouch sweep --json` or
`python3 -m tolkatouch.evaluate` writes. --kind metric and det need several settings points;
confusion draws point N (default 0: the first, the best of a sweep).
"""

from __future__ import annotations

import argparse
import json
import os
import sys
from typing import Optional, Sequence

import matplotlib

matplotlib.use("Agg")

from ._eval_figures import confusion_figure, det_figure, evaluations_of, metric_figure, swept_key  # noqa: E402
from .plot import output_format, printable  # noqa: E402


def main(argv: Optional[Sequence[str]] = None, prog: Optional[str] = None) -> int:
    parser = argparse.ArgumentParser(prog=prog, description="Draw evaluations.")
    parser.add_argument("results", metavar="RESULTS.json", help="eval --json, sweep --json or tolkatouch.evaluate output")
    parser.add_argument("-o", "--output", required=True, metavar="OUT", help="image to write: .png, .svg or .pdf")
    parser.add_argument("--kind", choices=("metric", "det", "confusion"), default="confusion",
                        help="what to draw (default confusion)")
    parser.add_argument("--setting", metavar="KEY", help="the setting on the x axis (default: the first that varies)")
    parser.add_argument("--metric", choices=("F1", "Precision", "Recall"), default="F1", help="for --kind metric")
    parser.add_argument("--point", type=int, default=0, metavar="N", help="the point whose confusion matrix to draw")
    arguments = parser.parse_args(argv)
    try:
        image_format = output_format(arguments.output)
    except ValueError as error:
        parser.error(str(error))
    try:
        with open(arguments.results) as source:
            evaluations = evaluations_of(json.load(source))
        if arguments.kind == "confusion":
            if not 0 <= arguments.point < len(evaluations):
                raise ValueError(f"--point {arguments.point}: the results hold {len(evaluations)} points")
            figure = confusion_figure(evaluations[arguments.point])
        else:
            key = arguments.setting or swept_key(evaluations)
            if arguments.kind == "metric":
                if key is None:
                    raise ValueError("no setting varies between the points: name one with --setting")
                figure = metric_figure(evaluations, key, arguments.metric)
            else:
                figure = det_figure(evaluations, key)
        figure.savefig(arguments.output, format=image_format, dpi=110)
    except (OSError, ValueError, KeyError) as error:
        what = f"missing {error}" if isinstance(error, KeyError) else str(error)
        print(f"tolkatouch: {printable(arguments.results)}: {printable(what)}", file=sys.stderr)
        return 1
    return 0


if __name__ == "__main__":
    sys.exit(main(prog=os.environ.get("TOLKATOUCH_PLOT_PROG")))
