"""The search space of tolkatouch.tune, from the settings table: one dimension per setting named by
--space (or every tunable setting for --space all), over the setting's accepted range or a part of
it given as KEY=LO:HI[:int|:log].
"""

from __future__ import annotations

from dataclasses import dataclass
from typing import Dict, List, Optional, Sequence

from . import SettingError
from . import _tolkatouch as _core


class SpaceError(ValueError):
    """A --space text that names no setting or a range the setting does not accept."""


@dataclass(frozen=True)
class Dimension:
    key: str  # "Algs.X"
    kind: str  # "boolean", "int" or "float"
    low: float
    high: float
    log: bool
    default: object  # the default as a value of the dimension's kind

    def suggest(self, trial):
        if self.kind == "boolean":
            return trial.suggest_categorical(self.key, [True, False])
        if self.kind == "int":
            return trial.suggest_int(self.key, int(self.low), int(self.high), log=self.log)
        return trial.suggest_float(self.key, self.low, self.high, log=self.log)


def _default_value(row: dict):
    text = row["default"]
    if row["type"] == "boolean":
        return text == "true"
    if row["type"] == "milliseconds":
        return int(text)
    return float(text)


def tunable_rows() -> List[dict]:
    return [row for row in _core.settings_table() if row["tunable"]]


def _row_for(key: str, text: str) -> dict:
    for row in _core.settings_table():
        if key in (row["key"][len("Algs."):], row["key"], "Pipeline." + row["key"]):
            if not row["tunable"]:
                raise SpaceError(f"--space {text}: {row['key']} is an action, not a setting the search can tune")
            return row
    try:
        _core.check_settings([f"{key}=0"])
    except SettingError as error:
        raise SpaceError(f"--space {text}: {error}") from None
    raise SpaceError(f'--space {text}: unknown setting "{key}"')


def _number(text: str, whole: str, what: str) -> float:
    try:
        return float(text)
    except ValueError:
        raise SpaceError(f'--space {whole}: {what} "{text}" is not a number') from None


def parse_dimension(text: str) -> Dimension:
    """One --space text: KEY (the setting's whole accepted range) or KEY=LO:HI[:int|:log]."""
    key, _, rest = text.partition("=")
    row = _row_for(key.strip(), text)
    kind = {"boolean": "boolean", "milliseconds": "int"}.get(row["type"], "float")
    low, high, log = row["minimum"], row["maximum"], False
    if rest:
        if kind == "boolean":
            raise SpaceError(f"--space {text}: {row['key']} is true or false; name it without a range")
        parts = rest.split(":")
        if len(parts) not in (2, 3) or (len(parts) == 3 and parts[2] not in ("int", "log")):
            raise SpaceError(f"--space {text}: the range must be LO:HI, LO:HI:int or LO:HI:log")
        low, high = _number(parts[0], text, "LO"), _number(parts[1], text, "HI")
        if len(parts) == 3 and parts[2] == "int":
            kind = "int"
        log = len(parts) == 3 and parts[2] == "log"
        if not low < high:
            raise SpaceError(f"--space {text}: LO must be below HI")
        if low < row["minimum"] or high > row["maximum"]:
            raise SpaceError(f"--space {text}: {parts[0]} to {parts[1]} lies outside {row['key']}'s accepted values, "
                             f"{row['accepted']}")
        if kind == "int" and (low != int(low) or high != int(high)):
            raise SpaceError(f"--space {text}: an int range takes whole numbers")
        if log and low <= 0:
            raise SpaceError(f"--space {text}: a log range needs LO above 0")
    return Dimension(row["key"], kind, low, high, log, _default_value(row))


def parse_space(texts: Sequence[str]) -> List[Dimension]:
    """The dimensions of the --space texts, in the settings table's order; 'all' (or no text) is
    every tunable setting over its accepted range. A setting named twice keeps the last range."""
    if not texts or "all" in texts:
        base = {row["key"]: parse_dimension(row["key"]) for row in tunable_rows()}
        texts = [text for text in texts if text != "all"]
    else:
        base = {}
    for text in texts:
        dimension = parse_dimension(text)
        base[dimension.key] = dimension
    order = [row["key"] for row in tunable_rows()]
    return sorted(base.values(), key=lambda d: order.index(d.key))


def defaults_of(space: Sequence[Dimension]) -> Dict[str, object]:
    return {d.key: d.default for d in space}


def clamp_default(dimension: Dimension) -> Optional[object]:
    """The default as the first trial suggests it, or None when the range leaves it out."""
    value = dimension.default
    if dimension.kind == "boolean":
        return value
    if dimension.low <= value <= dimension.high:
        return int(value) if dimension.kind == "int" else float(value)
    return None
