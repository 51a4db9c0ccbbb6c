"""Where studies live: Optuna's storage for a --storage URL, and the errors of a search that
cannot run, shared by the search and the plots of a search."""

from __future__ import annotations

import os
from typing import Optional

DEFAULT_STUDY = "tolkatouch-tune"


class TuneError(ValueError):
    """An option the search cannot run with, said in one line that names it."""


class CorpusError(TuneError):
    """A corpus or a storage the search cannot run on, said in one line that names it."""


def open_storage(url: Optional[str]):
    """Optuna's storage for a URL: None (in memory), journal:PATH (a journal file several
    processes may share) or a database URL (sqlite:///PATH, postgresql://...). TuneError naming
    the URL when it cannot be opened."""
    import optuna

    if url is None:
        return None
    import warnings

    warnings.filterwarnings("ignore", category=optuna.exceptions.ExperimentalWarning)
    try:
        if url.startswith("journal:"):
            path = url[len("journal:"):]
            if not path:
                raise ValueError("no journal file named")
            directory = os.path.dirname(os.path.abspath(path))
            if not os.path.isdir(directory):
                raise FileNotFoundError(f"no folder {directory}")
            if not os.access(path if os.path.exists(path) else directory, os.W_OK):
                raise PermissionError("not writable")
            return optuna.storages.JournalStorage(optuna.storages.JournalFileStorage(path))
        return optuna.storages.RDBStorage(url)
    except Exception as error:  # Optuna's storages raise their back end's own errors
        reason = str(error).strip().splitlines()[0] if str(error).strip() else type(error).__name__
        raise CorpusError(f"--storage {url}: cannot be opened: {reason}") from None
