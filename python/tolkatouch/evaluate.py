"""The recognizer scored on a labelled corpus over a grid of settings, spread over Dask.

    results = tolkatouch.evaluate.evaluate(["build/release/corpus"], {"HoldTimeoutMilliseconds": [400, 500, 600]})

One Dask task reads each document with its labels (DOC.labels.json beside DOC.json), and one
task scores each (recording, settings point) with the workbench's own code, the code behind
`tolkatouch eval`; the scores of a point are added up exactly as `eval --merge` adds shards, so
every point's result is the one `tolkatouch eval --json --set ...` prints for it, on any cluster.

With a `distributed.Client` the tasks run on its cluster: every worker needs the tolkatouch
package (python3-tolkatouch, or PYTHONPATH to a build tree) and, for documents named by path,
the corpus at the same path. Without one, a local cluster of one single-threaded worker per core
runs them and is closed afterwards.

    python3 -m tolkatouch.evaluate CORPUS... [--grid KEY=VALUES]... [--set KEY=VALUE]...
                                   [--tolerance MS] [--scheduler ADDRESS] [-o RESULTS.json]
"""

from __future__ import annotations

import argparse
import itertools
import json
import os
import sys
import uuid
from dataclasses import dataclass
from typing import Iterable, List, Mapping, Optional, Sequence, Union

from . import Error, Recording, setting_assignments
from . import _tolkatouch as _core

DEFAULT_TOLERANCE_MS = 100.0


@dataclass(frozen=True)
class PointResult:
    """One settings point's evaluation.

    settings: the 'KEY=VALUE' assignments of the point, in order.
    result: the evaluation as `tolkatouch eval --json` prints it (a dict: Version, ToleranceMs,
      Settings, Counts, Failures, Metrics).
    """

    settings: tuple
    result: dict

    @property
    def metrics(self) -> dict:
        return self.result["Metrics"]


Grid = Union[None, Mapping[str, Iterable], Sequence]


def settings_points(grid: Grid, base: Sequence[str] = ()) -> List[List[str]]:
    """The settings points of a grid, each a list of 'KEY=VALUE' (base first).

    grid: None (one point: the defaults); {key: [values]} (every combination, the first key
    changing slowest, as `sweep` orders them); a list of 'KEY=LO:HI:STEP' / 'KEY=A,B,C' axis texts
    (as `sweep --grid` takes them); or a list of points, each a {key: value} mapping or a list of
    'KEY=VALUE'.
    """
    base = list(base)
    if grid is None:
        return [base]
    if isinstance(grid, Mapping):
        axes = [[setting_assignments({key: value})[0] for value in values] for key, values in grid.items()]
        return [base + list(point) for point in itertools.product(*axes)]
    grid = list(grid)
    if grid and all(isinstance(item, str) for item in grid):
        axes = []
        for text in grid:
            key, texts = _core.grid_axis(text)
            axes.append([f"{key}={value}" for value in texts])
        return [base + list(point) for point in itertools.product(*axes)]
    return [base + setting_assignments(point) for point in grid]


# Dask tasks: module-level functions, so that workers import them from the installed package.
def _load(path: str):
    return path, _core.load_labelled(path)


def _score(loaded, settings: List[str], tolerance_us: int) -> str:
    path, (recording, reason) = loaded
    if recording is None:
        return _core.failed_evaluation(path, reason, settings, tolerance_us)
    return _core.evaluate_recording(recording, settings, tolerance_us)


def _score_recording(recording: Recording, settings: List[str], tolerance_us: int) -> str:
    return _core.evaluate_recording(recording, settings, tolerance_us)


def _corpus_items(corpus) -> tuple:
    """(paths to documents, recordings given as objects, listing failures)."""
    if isinstance(corpus, (str, os.PathLike, Recording)):
        corpus = [corpus]
    paths, recordings = [], []
    for item in corpus:
        if isinstance(item, Recording):
            if item.labels is None:
                raise ValueError("a recording in the corpus has no labels")
            recordings.append(item)
        else:
            paths.append(os.fspath(item))
    documents, failures = _core.list_corpus(paths) if paths else ([], [])
    return documents, recordings, failures


def local_client():
    """A local cluster of one single-threaded worker per core, and its client."""
    from distributed import Client, LocalCluster

    cluster = LocalCluster(n_workers=os.cpu_count() or 1, threads_per_worker=1, processes=True,
                           dashboard_address=None)
    return Client(cluster)


def evaluate(corpus, settings_grid: Grid = None, client=None, tolerance_ms: float = DEFAULT_TOLERANCE_MS,
             base_settings: Sequence[str] = ()) -> List[PointResult]:
    """Evaluates the recognizer on a labelled corpus at every point of a settings grid, on Dask.

    corpus: documents and folders of documents (as `tolkatouch eval` takes them; each document
      with DOC.labels.json beside it), and/or Recording objects with labels (from synth()).
    settings_grid: see settings_points(); base_settings come first in every point (like --set).
    client: a distributed.Client; None starts a local cluster sized to the cores.
    tolerance_ms: how far a recognised touch may start outside its label (eval --tolerance).

    Returns one PointResult per point, in grid order; each result equals what
    `tolkatouch eval --json --tolerance MS --set ... CORPUS` prints for that point. Raises
    SettingError for a refused setting before anything runs.
    """
    points = settings_points(settings_grid, list(base_settings))
    for point in points:
        _core.check_settings(point)
    tolerance_us = round(tolerance_ms * 1000.0)
    documents, recordings, failures = _corpus_items(corpus)

    own = client is None
    if own:
        client = local_client()
    try:
        # Keys name this call's tasks: a client keeps a finished task under its key until every
        # future of it is released, which happens in the background, so a key reused by the next
        # call on the same client could hand back the last call's result.
        run = uuid.uuid4().hex
        loaded = [client.submit(_load, path, key=f"load-{run}-{n}") for n, path in enumerate(documents)]
        shipped = client.scatter(recordings) if recordings else []
        results = []
        for number, point in enumerate(points):
            parts = [client.submit(_score, item, point, tolerance_us, key=f"score-{run}-{number}-{n}")
                     for n, item in enumerate(loaded)]
            parts += [client.submit(_score_recording, item, point, tolerance_us, key=f"score-{run}-{number}-r{n}")
                      for n, item in enumerate(shipped)]
            texts = client.gather(parts)
            texts += [_core.failed_evaluation(path, reason, point, tolerance_us) for path, reason in failures]
            if not texts:
                raise ValueError("the corpus holds no documents")
            results.append(PointResult(settings=tuple(point), result=json.loads(_core.merge_evaluations(texts))))
        return results
    finally:
        if own:
            cluster = client.cluster
            client.close()
            cluster.close()


def results_document(results: Sequence[PointResult]) -> dict:
    """The results as one JSON document: {"Version": 1, "Points": [evaluation, ...]} in grid order,
    the shape of `tolkatouch sweep --json`'s points, which tolkatouch.plot_eval draws."""
    return {"Version": 1, "Points": [point.result for point in results]}


def main(argv: Optional[Sequence[str]] = None) -> int:
    parser = argparse.ArgumentParser(prog="python3 -m tolkatouch.evaluate",
                                     description="Evaluate a labelled corpus over a grid of settings on Dask.")
    parser.add_argument("corpus", nargs="+", metavar="CORPUS", help="documents and folders of documents")
    parser.add_argument("--grid", action="append", default=[], metavar="KEY=VALUES",
                        help="a setting's values, KEY=LO:HI:STEP or KEY=A,B,C (repeatable: every combination)")
    parser.add_argument("--set", dest="settings", action="append", default=[], metavar="KEY=VALUE",
                        help="a setting applied at every point (repeatable)")
    parser.add_argument("--tolerance", type=float, default=DEFAULT_TOLERANCE_MS, metavar="MS",
                        help="how far, in ms, a recognised touch may start outside its label (default 100)")
    parser.add_argument("--scheduler", metavar="ADDRESS",
                        help="a Dask scheduler, e.g. tcp://10.0.0.5:8786 (default: a local cluster)")
    parser.add_argument("-o", "--output", default="-", metavar="RESULTS.json", help="where to write the results")
    arguments = parser.parse_args(argv)
    client = None
    try:
        if arguments.scheduler:
            from distributed import Client

            client = Client(arguments.scheduler)
        results = evaluate(arguments.corpus, arguments.grid or None, client, arguments.tolerance, arguments.settings)
    except (Error, ValueError, OSError) as error:
        from ._errors import error_lines

        print(f"tolkatouch: {error_lines(error)}", file=sys.stderr)
        return 2 if error.__class__.__name__ == "SettingError" else 1
    finally:
        if client is not None:
            client.close()
    text = json.dumps(results_document(results)) + "\n"
    if arguments.output == "-":
        sys.stdout.write(text)
    else:
        with open(arguments.output, "w") as out:
            out.write(text)
    return 0


if __name__ == "__main__":
    sys.exit(main())
