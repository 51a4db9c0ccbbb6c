"""Draws a settings search (a study of tolkatouch.tune) with Optuna's matplotlib plots: the
optimisation history, the parameters' importances and, for a Pareto search, the front.

    python3 -m tolkatouch.plot_tune --storage URL [--study NAME] -o DIR
    tolkatouch tune ... --plots DIR
"""

from __future__ import annotations

import argparse
import os
import sys
import warnings
from typing import List, Optional, Sequence

import matplotlib

matplotlib.use("Agg")


def importances_available() -> bool:
    """Optuna weighs the parameters with scikit-learn (Debian python3-sklearn)."""
    import importlib.util

    return importlib.util.find_spec("sklearn") is not None


def draw_search(study, directory: str) -> List[str]:
    """Writes history.png, importances.png (with two or more finished trials, a searched setting
    and scikit-learn)
    and, for two objectives, pareto-front.png into directory; returns the files written."""
    import optuna
    from optuna.visualization import matplotlib as optuna_plots

    os.makedirs(directory, exist_ok=True)
    written = []
    finished = [t for t in study.get_trials(deepcopy=False) if t.state == optuna.trial.TrialState.COMPLETE]
    two_objectives = len(study.directions) == 2
    with warnings.catch_warnings():
        warnings.simplefilter("ignore")  # the plots are marked experimental
        figures = []
        if two_objectives:
            figures.append(("pareto-front.png", lambda: optuna_plots.plot_pareto_front(
                study, target_names=["objective", "false activations per hour"])))
            figures.append(("history.png", lambda: optuna_plots.plot_optimization_history(
                study, target=lambda t: t.values[0], target_name="objective")))
        else:
            figures.append(("history.png", lambda: optuna_plots.plot_optimization_history(study)))
        distinct = {tuple(sorted(t.params.items())) for t in finished}
        if importances_available() and len(finished) >= 2 and len(distinct) >= 2:
            target = (lambda t: t.values[0]) if two_objectives else None
            figures.append(("importances.png", lambda: optuna_plots.plot_param_importances(study, target=target)))
        for name, draw in figures:
            axes = draw()
            figure = axes.figure if hasattr(axes, "figure") else axes.flat[0].figure
            figure.set_size_inches(9, 5.5)
            figure.tight_layout()
            path = os.path.join(directory, name)
            figure.savefig(path, dpi=110)
            written.append(path)
            import matplotlib.pyplot as plt

            plt.close(figure)
    return written


def main(argv: Optional[Sequence[str]] = None) -> int:
    import optuna

    from .plot import error_lines
    from ._tune_storage import DEFAULT_STUDY, CorpusError, open_storage

    parser = argparse.ArgumentParser(prog="python3 -m tolkatouch.plot_tune", description="Draw a settings search.")
    parser.add_argument("--storage", required=True, metavar="URL", help="the study's storage, as tune --storage takes it")
    parser.add_argument("--study", default=DEFAULT_STUDY, metavar="NAME", help="the study's name")
    parser.add_argument("-o", "--output", required=True, metavar="DIR", help="the folder to draw into")
    arguments = parser.parse_args(argv)
    try:
        study = optuna.load_study(study_name=arguments.study, storage=open_storage(arguments.storage))
        for path in draw_search(study, arguments.output):
            print(path)
    except (CorpusError, KeyError, OSError) as error:
        print(f"tolkatouch: {error_lines(error)}", file=sys.stderr)
        return 1
    return 0


if __name__ == "__main__":
    sys.exit(main())
