"""tolkatouch.tune's trials on Dask workers: the study lives in a DaskStorage on the client (over
the storage given, or in memory), and each worker runs trials of it with the tuning part read
from the same paths, once per worker process.
"""

from __future__ import annotations

from typing import Dict, Optional, Sequence

_loaded: Dict[tuple, list] = {}


def dask_storage(client, storage):
    from optuna.integration import DaskStorage

    return DaskStorage(storage=storage, client=client)


def _worker_trials(storage, study_name: str, search, tuning_paths: tuple, trials: int, timeout: Optional[float],
                   sampler: str, seed: Optional[int], pruner: str) -> int:
    import optuna

    from . import tune as _tune

    if tuning_paths not in _loaded:
        _loaded[tuning_paths] = _tune.load_recordings(tuning_paths, 1)
    study = optuna.load_study(study_name=study_name, storage=storage,
                              sampler=_tune.make_sampler(sampler, seed, search.pareto),
                              pruner=_tune.make_pruner("none" if search.pareto else pruner))
    optuna.logging.set_verbosity(optuna.logging.WARNING)
    _tune.run_trials(study, search, _loaded[tuning_paths], trials, timeout, 1)
    return len(study.get_trials(deepcopy=False))


def run_on_workers(client, study, search, tuning_paths: Sequence[str], trials: int, timeout: Optional[float],
                   sampler: str, seed: Optional[int], pruner: str) -> None:
    """One task per worker thread, each running trials until the study holds `trials`; each
    worker's sampler is seeded apart (seed + its number)."""
    slots = sum(client.nthreads().values()) or 1
    futures = [client.submit(_worker_trials, study._storage, study.study_name, search, tuple(tuning_paths), trials,
                             timeout, sampler, None if seed is None else seed + n, pruner, pure=False)
               for n in range(slots)]
    client.gather(futures)
