"""A settings search on a labelled corpus with Optuna, scored honestly on recordings it never saw.

    result = tolkatouch.tune.tune(["build/release/corpus"], trials=100, space=["HoldTimeoutMilliseconds"])
    result.best.settings, result.best.heldout["Metrics"]["Overall"]["F1"]

The corpus is split by recording, stratified by gesture kind, into a tuning part and a held-out
part (tolkatouch._tune_split). Every trial is a settings point: the defaults first, then what the
sampler (TPE by default, seeded) proposes within the space the settings table allows. A trial
scores the tuning part in growing shares and reports each, so that the pruner stops hopeless
trials early; a finished trial counts only if its false activations per hour on the noise-only
recordings stay at or below the defaults' (or the given limit). Scores are the workbench's own,
the numbers of `tolkatouch eval --json`. The best point and the defaults are then evaluated on the
held-out part, which is the result.

Studies live in Optuna's storages: a SQLite URL (sqlite:///tune.db) or a journal file
(journal:tune.log) lets several processes share one study, a PostgreSQL URL several machines;
running again with the same storage and study resumes it. With a distributed.Client, the trials
run on its Dask workers (each worker reads the corpus from the same path).

    python3 -m tolkatouch.tune CORPUS... [--trials N] [--space KEY=LO:HI[:int|:log]]... [--json] ...
`tolkatouch tune` runs this module.
"""

from __future__ import annotations

import argparse
import json
import math
import os
import sys
import time
from concurrent.futures import ThreadPoolExecutor
from dataclasses import dataclass, field
from typing import Dict, List, Optional, Sequence

from . import Error, Recording
from . import _tolkatouch as _core
from ._tune_space import Dimension, SpaceError, clamp_default, defaults_of, parse_space
from ._tune_split import Split, split_corpus, stratum
from ._tune_storage import DEFAULT_STUDY, CorpusError, TuneError, open_storage

DEFAULT_OBJECTIVE = "macro-f1"
DEFAULT_HELDOUT = 0.3
DEFAULT_TOLERANCE_MS = 100.0
SAMPLERS = ("tpe", "cmaes", "random", "nsga2")
PRUNERS = ("median", "halving", "none")
#: The growing shares of the tuning part a trial scores and reports before the whole.
SHARES = (0.125, 0.25, 0.5, 1.0)
FALSE_ACTIVATIONS = "false-activations-per-hour"
EXIT_FAILURE = 1
EXIT_USAGE = 2


@dataclass(frozen=True)
class Point:
    """A settings point: its settings ({"Algs.KEY": value}, as --set takes them) and its evaluation
    on the held-out part (what `tolkatouch eval --json --set ... HELD-OUT` prints)."""

    settings: Dict[str, object]
    heldout: dict

    def assignments(self) -> List[str]:
        return _assignments(self.settings)


@dataclass(frozen=True)
class TuneResult:
    defaults: Point
    best: Point
    heldout_recordings: tuple
    trials: int
    pruned: int
    failed: int
    objective: str
    best_trial: Optional[int] = None
    front: list = field(default_factory=list)  # with pareto: [{"trial", "settings", objective, FA/h}]
    study: object = field(default=None, compare=False, repr=False)  # the optuna.Study searched

    def to_json(self) -> dict:
        document = {
            "defaults": {"settings": self.defaults.settings, "heldout": self.defaults.heldout},
            "best": {"settings": self.best.settings, "heldout": self.best.heldout},
            "heldout_recordings": list(self.heldout_recordings),
            "trials": self.trials,
            "pruned": self.pruned,
            "failed": self.failed,
        }
        if self.front:
            document["pareto_front"] = self.front
        return document


def _assignments(settings: Dict[str, object]) -> List[str]:
    from . import setting_assignments

    return setting_assignments(settings)


def metric(evaluation_text: str, name: str) -> Optional[float]:
    """A named metric of an evaluation (`eval --json` text), as `sweep --metric` reads it."""
    return _core.metric_value(evaluation_text, name)


def metric_names() -> List[str]:
    return list(_core.metric_names())


# --- the corpus ----------------------------------------------------------------------------------

@dataclass
class Corpus:
    split: Split
    tuning: List[Recording]
    heldout: List[Recording]


def list_documents(paths: Sequence[str]) -> List[str]:
    """The documents of the corpus as eval lists them; TuneError for an empty corpus, a path that
    cannot be listed, or a document without labels."""
    documents, failures = _core.list_corpus([os.fspath(p) for p in paths])
    if failures:
        path, reason = failures[0]
        raise CorpusError(f"{path}: {reason}")
    if not documents:
        raise CorpusError(f"{' '.join(map(str, paths))}: the corpus holds no recordings")
    return documents


def corpus_strata(documents: Sequence[str]) -> List[str]:
    strata = []
    for document in documents:
        try:
            strata.append(stratum(document))
        except FileNotFoundError:
            raise CorpusError(f"{document}: no labels beside it (a corpus to tune on needs DOC.labels.json)") from None
        except (OSError, ValueError, AttributeError) as error:
            raise CorpusError(f"{document}: its labels cannot be read: {error}") from None
    return strata


def load_recordings(documents: Sequence[str], jobs: int) -> List[Recording]:
    """Every document with its labels, read on `jobs` threads; TuneError naming the first that fails."""
    with ThreadPoolExecutor(max_workers=max(1, jobs)) as pool:
        loaded = list(pool.map(_core.load_labelled, documents))
    recordings = []
    for document, (recording, reason) in zip(documents, loaded):
        if recording is None:
            raise CorpusError(f"{document}: {reason}")
        recordings.append(recording)
    return recordings


def load_corpus(paths: Sequence[str], heldout_fraction: float, jobs: int) -> Corpus:
    documents = list_documents(paths)
    split = split_corpus(documents, corpus_strata(documents), heldout_fraction)
    if not split.tuning:
        raise CorpusError(f"{' '.join(map(str, paths))}: no recordings are left to tune on with --heldout {heldout_fraction}")
    recordings = dict(zip(split.tuning + split.heldout, load_recordings(split.tuning + split.heldout, jobs)))
    return Corpus(split, [recordings[d] for d in split.tuning], [recordings[d] for d in split.heldout])


def score(recordings: Sequence[Recording], point: Sequence[str], tolerance_us: int, jobs: int = 1,
          before: Optional[str] = None) -> str:
    """The recordings scored under a settings point and added up (plus an earlier sum), as
    `eval --json` text. The interpreter lock is released while each recording plays."""
    if jobs > 1 and len(recordings) > 1:
        with ThreadPoolExecutor(max_workers=jobs) as pool:
            texts = list(pool.map(lambda r: _core.evaluate_recording(r, list(point), tolerance_us), recordings))
    else:
        texts = [_core.evaluate_recording(r, list(point), tolerance_us) for r in recordings]
    if before is not None:
        texts.insert(0, before)
    return _core.merge_evaluations(texts)


# --- the search ----------------------------------------------------------------------------------

@dataclass(frozen=True)
class Search:
    """What a trial needs, the same in every process that shares the study."""

    space: tuple
    objective: str
    limit: Optional[float]  # false activations per hour a trial may reach; None: no limit
    tolerance_us: int
    pareto: bool
    prune: bool
    trials: int  # the study's trials in all, over every process sharing it


def _settings_of(space: Sequence[Dimension], params: Dict[str, object]) -> Dict[str, object]:
    return {d.key: params[d.key] for d in space if d.key in params}


def objective_function(search: Search, tuning: Sequence[Recording]):
    """The trial's objective: the tuning part scored in growing shares (reported for pruning), then
    the metric on the whole, or (metric, false activations per hour) for a Pareto search."""
    import optuna

    ends = sorted({max(1, math.ceil(share * len(tuning))) for share in SHARES})

    def run(trial):
        if trial.number >= search.trials:
            # Two processes sharing the study started a trial at the same moment past the count:
            # the later one stops at once, marked, and counts nowhere.
            trial.set_user_attr("surplus", True)
            trial.study.stop()
            raise optuna.TrialPruned()
        settings = {d.key: d.suggest(trial) for d in search.space}
        point = _assignments(settings)
        total, done = None, 0
        try:
            for step, end in enumerate(ends):
                total = score(tuning[done:end], point, search.tolerance_us, before=total)
                done = end
                value = metric(total, search.objective)
                if end < len(tuning) and search.prune and value is not None:
                    trial.report(value, step)
                    if trial.should_prune():
                        raise optuna.TrialPruned()
        except (Error, RuntimeError, ValueError) as error:
            trial.set_user_attr("failure", str(error))
            raise
        value = metric(total, search.objective)
        false_activations = metric(total, FALSE_ACTIVATIONS)
        trial.set_user_attr("false_activations_per_hour", false_activations)
        over = 0.0
        if search.limit is not None and false_activations is not None:
            over = false_activations - search.limit
        trial.set_user_attr("constraint", [over])
        if value is None:
            reason = f"{search.objective} has no value on the tuning part"
            trial.set_user_attr("failure", reason)
            raise ValueError(reason)
        if search.pareto:
            return value, (false_activations if false_activations is not None else 0.0)
        return value

    return run


def _constraints(trial) -> Sequence[float]:
    return trial.user_attrs.get("constraint", [0.0])


def make_sampler(name: str, seed: Optional[int], pareto: bool):
    import warnings

    import optuna

    warnings.filterwarnings("ignore", category=optuna.exceptions.ExperimentalWarning)

    if name == "tpe":
        return optuna.samplers.TPESampler(seed=seed, constraints_func=_constraints, warn_independent_sampling=False)
    if name == "cmaes":
        if pareto:
            raise TuneError("--sampler cmaes searches one objective; --pareto needs tpe, random or nsga2")
        return optuna.samplers.CmaEsSampler(seed=seed, warn_independent_sampling=False)
    if name == "random":
        return optuna.samplers.RandomSampler(seed=seed)
    if name == "nsga2":
        return optuna.samplers.NSGAIISampler(seed=seed, constraints_func=_constraints)
    raise TuneError(f'--sampler {name}: unknown sampler ({", ".join(SAMPLERS)})')


def make_pruner(name: str):
    import optuna

    if name == "median":
        return optuna.pruners.MedianPruner(n_startup_trials=5, n_warmup_steps=0)
    if name == "halving":
        return optuna.pruners.SuccessiveHalvingPruner(min_resource=1, reduction_factor=2)
    if name == "none":
        return optuna.pruners.NopPruner()
    raise TuneError(f'--pruner {name}: unknown pruner ({", ".join(PRUNERS)})')


def _study_description(search: Search, heldout_fraction: float) -> dict:
    return {"objective": search.objective, "pareto": search.pareto, "heldout": heldout_fraction,
            "space": [[d.key, d.kind, d.low, d.high, d.log] for d in search.space]}


def open_study(storage, name: str, search: Search, heldout_fraction: float, sampler, pruner):
    """The study in the storage, created or resumed; TuneError when the study there searched
    something else (the study is then left as it was)."""
    import optuna

    description = _study_description(search, heldout_fraction)
    if storage is not None:
        existing = {summary.study_name: summary for summary in optuna.get_all_study_summaries(storage)}
        if name in existing:
            return _resumed_study(optuna.load_study(study_name=name, storage=storage, sampler=sampler,
                                                    pruner=pruner), name, description)
    directions = ["maximize", "minimize"] if search.pareto else [
        "maximize" if _core.higher_is_better(search.objective) else "minimize"]
    try:
        study = optuna.create_study(storage=storage, study_name=name, sampler=sampler, pruner=pruner,
                                    directions=directions)
    except optuna.exceptions.DuplicatedStudyError:
        # Another process sharing the storage made it a moment ago, with the defaults queued.
        return _resumed_study(optuna.load_study(study_name=name, storage=storage, sampler=sampler, pruner=pruner),
                              name, description)
    study.set_user_attr("tolkatouch", description)
    # Only the process that made the study queues the defaults, so that they are its first trial, once.
    study.enqueue_trial(_defaults_params(search.space))
    return study


# How long a process that finds a study without its description waits for the process that is
# making it (creating a study and describing it are two writes to the storage).
_DESCRIPTION_WAIT_SECONDS = 10.0


def _resumed_study(study, name: str, description: dict):
    """The study, once its description matches ours; TuneError when it searched something else."""
    wanted = json.loads(json.dumps(description))
    deadline = time.monotonic() + _DESCRIPTION_WAIT_SECONDS
    made = study.user_attrs.get("tolkatouch")
    while made is None and time.monotonic() < deadline:
        time.sleep(0.05)
        made = study.user_attrs.get("tolkatouch")
    if made != wanted:
        raise TuneError(f"--study {name}: the study in the storage searched another space, objective or "
                        f"split ({json.dumps(made)}); name another study")
    return study


def _defaults_params(space: Sequence[Dimension]) -> Dict[str, object]:
    params = {}
    for dimension in space:
        value = clamp_default(dimension)
        if value is not None:
            params[dimension.key] = value
    return params


def run_trials(study, search: Search, tuning: Sequence[Recording], trials: int, timeout: Optional[float], jobs: int):
    """Runs trials until the study holds `trials` of them (any state, counted over every process
    sharing the study) or the timeout passes."""
    import optuna

    TrialState = optuna.trial.TrialState
    begun = (TrialState.COMPLETE, TrialState.PRUNED, TrialState.FAIL, TrialState.RUNNING)
    remaining = trials - len([t for t in study.get_trials(deepcopy=False, states=begun) if not t.user_attrs.get("surplus")])
    if remaining <= 0:
        return
    callback = optuna.study.MaxTrialsCallback(trials, states=begun)
    study.optimize(objective_function(search, tuning), n_trials=remaining, timeout=timeout, n_jobs=max(1, jobs),
                   catch=(Error, RuntimeError, ValueError), callbacks=[callback], gc_after_trial=False)


# The tuning part as a Dask worker process read it, by its paths: read once per process.
_worker_recordings: Dict[tuple, list] = {}


def worker_trials(storage, study_name: str, search: Search, tuning_paths: tuple, trials: int,
                  timeout: Optional[float], sampler: str, seed: Optional[int], pruner: str) -> int:
    """A Dask worker's share of a study: trials until the study holds `trials`; the study's
    trials in all when done."""
    import optuna

    if tuning_paths not in _worker_recordings:
        _worker_recordings[tuning_paths] = load_recordings(tuning_paths, 1)
    study = optuna.load_study(study_name=study_name, storage=storage,
                              sampler=make_sampler(sampler, seed, search.pareto),
                              pruner=make_pruner("none" if search.pareto else pruner))
    optuna.logging.set_verbosity(optuna.logging.WARNING)
    run_trials(study, search, _worker_recordings[tuning_paths], trials, timeout, 1)
    return len(study.get_trials(deepcopy=False))


def counted_trials(study) -> list:
    """The study's trials but those stopped as surplus."""
    return [t for t in study.get_trials(deepcopy=False) if not t.user_attrs.get("surplus")]


def _feasible(trial) -> bool:
    return all(value <= 0.0 for value in _constraints(trial))


def best_trial(study, search: Search):
    """The best finished trial within the false-activation limit (the lowest number among equals),
    or None."""
    import optuna

    done = [t for t in study.get_trials(deepcopy=False, states=(optuna.trial.TrialState.COMPLETE,)) if _feasible(t)]
    if not done:
        return None
    sign = -1.0 if (search.pareto or _core.higher_is_better(search.objective)) else 1.0
    return min(done, key=lambda t: (sign * t.values[0], t.number))


def pareto_front(study, search: Search) -> list:
    front = []
    for trial in sorted(study.best_trials, key=lambda t: t.number):
        front.append({"trial": trial.number, "settings": _settings_of(search.space, trial.params),
                      search.objective: trial.values[0], FALSE_ACTIVATIONS: trial.values[1]})
    return front


def _defaults_limit(corpus: Corpus, tolerance_us: int, jobs: int) -> Optional[float]:
    return metric(score(corpus.tuning, [], tolerance_us, jobs), FALSE_ACTIVATIONS)


def tune(corpus: Sequence[str], trials: int = 100, space: Sequence[str] = (), objective: str = DEFAULT_OBJECTIVE,
         max_false_activations_per_hour: Optional[float] = None, pareto: bool = False,
         heldout: float = DEFAULT_HELDOUT, seed: Optional[int] = 0, sampler: str = "tpe", pruner: str = "median",
         storage: Optional[str] = None, study: str = DEFAULT_STUDY, jobs: int = 0, timeout: Optional[float] = None,
         tolerance_ms: float = DEFAULT_TOLERANCE_MS, client=None) -> TuneResult:
    """Searches the settings on the corpus's tuning part and scores the defaults and the best point
    on its held-out part. See the module's description; every argument is the command line's
    option of the same name. client: a distributed.Client to run the trials on its workers.
    Raises TuneError (a ValueError) for input it cannot run on, before any study is touched."""
    import optuna

    jobs = jobs or os.cpu_count() or 1
    dimensions = tuple(parse_space(list(space)))
    if objective not in metric_names():
        raise TuneError(f'--objective {objective}: unknown metric ({", ".join(metric_names())})')
    if pareto and objective == FALSE_ACTIVATIONS:
        raise TuneError(f"--objective {objective}: --pareto already searches against it")
    if not 0.0 <= heldout < 1.0:
        raise TuneError(f"--heldout {heldout}: the held-out share must be from 0 to below 1")
    if trials < 1:
        raise TuneError(f"--trials {trials}: at least one trial")
    sampler_object = make_sampler(sampler, seed, pareto)
    pruner_object = make_pruner("none" if pareto else pruner)
    tolerance_us = round(tolerance_ms * 1000.0)

    loaded = load_corpus(corpus, heldout, jobs)
    limit = max_false_activations_per_hour
    if limit is None:
        limit = _defaults_limit(loaded, tolerance_us, jobs)
    search = Search(dimensions, objective, limit, tolerance_us, pareto, prune=not pareto and pruner != "none",
                    trials=trials)

    optuna.logging.set_verbosity(optuna.logging.WARNING)
    opened = open_storage(storage)
    if client is not None:
        from .tune_dask import dask_storage

        opened = dask_storage(client, opened)
    the_study = open_study(opened, study, search, heldout, sampler_object, pruner_object)
    if client is not None:
        from .tune_dask import run_on_workers

        run_on_workers(client, worker_trials, lambda n: (
            the_study._storage, the_study.study_name, search, tuple(loaded.split.tuning), trials, timeout, sampler,
            None if seed is None else seed + n, pruner))
    else:
        run_trials(the_study, search, loaded.tuning, trials, timeout, jobs)

    return _result(the_study, search, loaded, jobs)


def _result(study, search: Search, corpus: Corpus, jobs: int) -> TuneResult:
    import optuna

    all_trials = counted_trials(study)
    states = [t.state for t in all_trials]
    chosen = best_trial(study, search)
    defaults = defaults_of(search.space)
    best = _settings_of(search.space, chosen.params) if chosen is not None else dict(defaults)

    def heldout(settings):
        return json.loads(score(corpus.heldout, _assignments(settings), search.tolerance_us, jobs)) \
            if corpus.heldout else None

    return TuneResult(
        defaults=Point(defaults, heldout(defaults)),
        best=Point(best, heldout(best)),
        heldout_recordings=corpus.split.heldout,
        trials=len(all_trials),
        pruned=states.count(optuna.trial.TrialState.PRUNED),
        failed=states.count(optuna.trial.TrialState.FAIL),
        objective=search.objective,
        best_trial=chosen.number if chosen is not None else None,
        front=pareto_front(study, search) if search.pareto else [],
        study=study,
    )


# --- the result as people and programs read it ---------------------------------------------------

RATE_METRICS = ("f1", "macro-f1", "precision", "recall", "tap-f1", "hold-f1", "slide-f1", "false-reject-rate")


def resolution(evaluation: dict, name: str) -> Optional[float]:
    """The smallest change of a rate metric that the held-out gestures tell from chance: two standard
    errors of a proportion at the defaults' value over the intended gestures, and never below one
    gesture in all. None for a metric that is not a rate, or without gestures."""
    gestures = evaluation["Counts"]["IntendedGestures"] if evaluation else 0
    value = metric(json.dumps(evaluation), name) if evaluation else None
    if not gestures or name not in RATE_METRICS or value is None:
        return None
    return max(1.0 / gestures, 2.0 * math.sqrt(value * (1.0 - value) / gestures))


def summary(result: TuneResult) -> str:
    """The result as the command line prints it: eval's table of the defaults and of the best point
    on the held-out part, and what the gain is worth."""
    lines = [f"{result.trials} trials: {result.trials - result.pruned - result.failed} finished, "
             f"{result.pruned} pruned, {result.failed} failed; "
             f"best: {'the defaults' if result.best.settings == result.defaults.settings else f'trial {result.best_trial}'}"]
    lines.append("best settings: " + (" ".join(f"--set {a}" for a in _changed(result)) or "the defaults"))
    if result.front:
        lines.append("")
        lines.append(f"Pareto front on the tuning part ({result.objective} against {FALSE_ACTIVATIONS}):")
        for point in result.front:
            lines.append(f"  trial {point['trial']:4d}  {point[result.objective]:.4f}  {point[FALSE_ACTIVATIONS]:.2f}  "
                         + " ".join(_assignments(point["settings"])))
    if result.best.heldout is None:
        lines.append("")
        lines.append("no held-out part (--heldout 0): no honest number")
        return "\n".join(lines) + "\n"
    for title, point in (("defaults", result.defaults), ("best", result.best)):
        lines.append("")
        lines.append(f"held out, {title}:")
        lines.append(_core.evaluation_table(json.dumps(point.heldout)).rstrip("\n"))
    before = metric(json.dumps(result.defaults.heldout), result.objective)
    after = metric(json.dumps(result.best.heldout), result.objective)
    lines.append("")
    if before is None or after is None:
        lines.append(f"held out: {result.objective} has no value on the held-out part")
    else:
        step = resolution(result.defaults.heldout, result.objective)
        gestures = result.defaults.heldout["Counts"]["IntendedGestures"]
        line = f"held out: {result.objective} {before:.4f} with the defaults, {after:.4f} with the best ({after - before:+.4f})"
        if step is not None and abs(after - before) < step:
            line += f"; within what {gestures} held-out gestures can resolve (about {step:.4f})"
        elif step is not None:
            line += f"; beyond what {gestures} held-out gestures can resolve (about {step:.4f})"
        lines.append(line)
    return "\n".join(lines) + "\n"


def _changed(result: TuneResult) -> List[str]:
    return [a for a, d in zip(result.best.assignments(), result.defaults.assignments()) if a != d]


def settings_file_text(settings: Dict[str, object]) -> str:
    """The settings as --write-settings writes them: one KEY=VALUE a line, as `--set`, `--settings`
    and `tolkatouch prop set` take them."""
    return "".join(f"{assignment}\n" for assignment in _assignments(settings))


# --- the command line ----------------------------------------------------------------------------

def arguments_parser(prog: Optional[str] = None) -> argparse.ArgumentParser:
    parser = argparse.ArgumentParser(
        prog=prog, description="Search the recognizer's settings on a labelled corpus with Optuna and score the best "
        "point against the defaults on recordings the search never saw.")
    parser.add_argument("corpus", nargs="+", metavar="CORPUS", help="labelled documents and folders of them")
    parser.add_argument("--trials", type=int, default=100, metavar="N",
                        help="trials in the study, the defaults first (default 100; a resumed study counts its own)")
    parser.add_argument("--timeout", type=float, metavar="S", help="stop starting trials after S seconds")
    parser.add_argument("--space", action="append", default=[], metavar="KEY=LO:HI[:int|:log]",
                        help="a setting to search, over LO to HI or its whole accepted range (KEY alone); "
                        "'all' for every setting (the default when none is named); repeatable")
    parser.add_argument("--objective", default=DEFAULT_OBJECTIVE, metavar="NAME",
                        help=f"the metric to optimise (default {DEFAULT_OBJECTIVE}; any of sweep's metrics)")
    parser.add_argument("--max-false-activations-per-hour", type=float, metavar="X",
                        help="the most false activations per hour a point may give on the noise-only recordings "
                        "(default: the defaults' on the tuning part)")
    parser.add_argument("--pareto", action="store_true",
                        help="search the objective against false activations per hour and print the front")
    parser.add_argument("--heldout", type=float, default=DEFAULT_HELDOUT, metavar="FRACTION",
                        help="the share of recordings held out of the search (default 0.3)")
    parser.add_argument("--seed", type=int, default=0, metavar="N", help="the sampler's seed (default 0)")
    parser.add_argument("--sampler", default="tpe", choices=SAMPLERS, help="the search's sampler (default tpe)")
    parser.add_argument("--pruner", default="median", choices=PRUNERS, help="the pruner of hopeless trials (default median)")
    parser.add_argument("--storage", metavar="URL",
                        help="an Optuna storage: sqlite:///FILE, journal:FILE or postgresql://... (default: in memory)")
    parser.add_argument("--study", default=DEFAULT_STUDY, metavar="NAME", help=f"the study's name (default {DEFAULT_STUDY})")
    parser.add_argument("-j", "--jobs", type=int, default=0, metavar="N",
                        help="trials run at once (default: one per core); -j 1 makes a seed give one result")
    parser.add_argument("--tolerance", type=float, default=DEFAULT_TOLERANCE_MS, metavar="MS",
                        help="how far, in ms, a recognised touch may start outside its label (default 100)")
    parser.add_argument("--write-settings", metavar="FILE", help="write the best point's settings, one KEY=VALUE a line")
    parser.add_argument("--plots", metavar="DIR", help="draw the search (history, importances, Pareto front) into DIR")
    parser.add_argument("--json", action="store_true", help="print the result as one JSON object")
    return parser


def main(argv: Optional[Sequence[str]] = None, prog: Optional[str] = None) -> int:
    from .plot import error_lines

    parser = arguments_parser(prog)
    arguments = parser.parse_args(argv)
    try:
        import optuna  # noqa: F401
    except ImportError as error:
        print(f"tolkatouch: tune needs Optuna (Debian python3-optuna): {error}", file=sys.stderr)
        return EXIT_FAILURE
    try:
        result = tune(arguments.corpus, trials=arguments.trials, space=arguments.space, objective=arguments.objective,
                      max_false_activations_per_hour=arguments.max_false_activations_per_hour,
                      pareto=arguments.pareto, heldout=arguments.heldout, seed=arguments.seed,
                      sampler=arguments.sampler, pruner=arguments.pruner, storage=arguments.storage,
                      study=arguments.study, jobs=arguments.jobs, timeout=arguments.timeout,
                      tolerance_ms=arguments.tolerance)
        if arguments.write_settings:
            with open(arguments.write_settings, "w") as out:
                out.write(settings_file_text(result.best.settings))
        if arguments.plots:
            from .plot_tune import draw_search

            draw_search(result.study, arguments.plots)
    except CorpusError as error:
        print(f"tolkatouch: {error_lines(error)}", file=sys.stderr)
        return EXIT_FAILURE
    except (SpaceError, TuneError) as error:
        print(f"tolkatouch: {error_lines(error)}", file=sys.stderr)
        return EXIT_USAGE
    except (Error, ValueError, OSError) as error:
        print(f"tolkatouch: {error_lines(error)}", file=sys.stderr)
        return EXIT_FAILURE
    sys.stdout.write(json.dumps(result.to_json()) + "\n" if arguments.json else summary(result))
    return 0


if __name__ == "__main__":
    sys.exit(main(prog=os.environ.get("TOLKATOUCH_TUNE_PROG")))
