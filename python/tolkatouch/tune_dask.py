"""tolkatouch.tune's trials on Dask workers: the study lives in a DaskStorage on the client (over
the storage given, or in memory), and every worker thread runs a share of it.
"""

from __future__ import annotations

from typing import Callable


def dask_storage(client, storage):
    from optuna.integration import DaskStorage

    return DaskStorage(storage=storage, client=client)


def run_on_workers(client, work: Callable, arguments_of: Callable[[int], tuple]) -> None:
    """`work` once per worker thread, the n-th with `arguments_of(n)` (so that each seeds its
    sampler apart), until all are done."""
    slots = sum(client.nthreads().values()) or 1
    futures = [client.submit(work, *arguments_of(n), pure=False) for n in range(slots)]
    client.gather(futures)
