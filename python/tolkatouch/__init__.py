"""The touch surface's recordings, replays and syntheses as numpy arrays.

    >>> import tolkatouch
    >>> recording = tolkatouch.Recording.load("examples/everyday-session.json")
    >>> result = tolkatouch.replay(recording, settings={"HoldTimeoutMilliseconds": 700})
    >>> result.events["kind"], result.frames.touch_score

The recognizer runs in C++ (the same pipeline as `tolkatouch replay --fast`); every array is built
there. Errors carry the command line's messages: DocumentError, SettingError and ScriptError (all
ValueError and tolkatouch.Error), OSError for files.
"""

from __future__ import annotations

from dataclasses import dataclass
from typing import Iterable, Mapping, Union

import numpy as np

from ._tolkatouch import (
    DocumentError,
    Error,
    FirmwareEvent,
    Recording,
    ScriptError,
    SettingChange,
    SettingError,
    synth,
)
from ._tolkatouch import replay_arrays as _replay_arrays

__all__ = [
    "Recording", "FirmwareEvent", "SettingChange", "Replay", "Frames", "replay", "synth",
    "Error", "DocumentError", "SettingError", "ScriptError",
    "KIND_NAMES", "TRANSITION_NAMES", "HOLD_CLOCK_NAMES", "REGION_NAMES", "PIXEL_NAMES", "ZONE_PIXELS",
]

#: Event kinds by the code in Replay.events["kind"] (255: an event that is not a gesture).
KIND_NAMES = ("may-begin", "hold-start", "hold-change", "hold-end", "tap", "cancel", "reset")
#: What a frame did to the touch, by the code in Frames.transition.
TRANSITION_NAMES = ("idle", "touch began", "touching", "hold began", "hold recovered", "holding",
                    "hold moved", "hold ended", "tap accepted", "tap rejected", "touch ended")
#: Where the touch stands against the hold timeout, by the code in Frames.hold_clock.
HOLD_CLOCK_NAMES = ("before", "reached", "past", "dropped")
#: The zones by region number (Frames.region, Replay.events["region"]).
REGION_NAMES = ("none", "play/pause", "volume down", "volume up")
#: The sensing pixels, in the column order of every N x 15 array.
PIXEL_NAMES = tuple("ABCDEFGHIJKLMNO")
#: The pixels of each zone, by region number.
ZONE_PIXELS = {1: "ABCDEFK", 2: "LMNO", 3: "GHIJ"}


@dataclass(frozen=True)
class Frames:
    """The recognizer's snapshot of every image frame, one numpy array per number (N frames).

    frame (uint32), time (int64 firmware ms), host_time (uint64 host clock ticks), seconds
    (float64 since the recording's first frame); readings (N x 15 int16, what the recognizer
    consumed), pixel_values (N x 15 int32, gain x reading), normalized (N x 15 float32), on
    (N x 15 bool); virtual_values (N x 23 int32), virtual_normalized (N x 23 float32),
    virtual_on (N x 23 bool); touch_score, svm_score (float32); tap features strength_rate,
    strength_per_duration, duration_ratio (float32), active_pixel_count (int32) and tap_score
    (float32); touching, above_noise (bool); since_touch_start_ms, touch_length_ms (int32); the
    verdict: transition (uint8, TRANSITION_NAMES), hold_suppressed (bool), hold_clock (uint8,
    HOLD_CLOCK_NAMES), region (uint8, the active region, REGION_NAMES).
    """

    frame: np.ndarray
    time: np.ndarray
    host_time: np.ndarray
    seconds: np.ndarray
    readings: np.ndarray
    pixel_values: np.ndarray
    normalized: np.ndarray
    on: np.ndarray
    virtual_values: np.ndarray
    virtual_normalized: np.ndarray
    virtual_on: np.ndarray
    touch_score: np.ndarray
    svm_score: np.ndarray
    strength_rate: np.ndarray
    strength_per_duration: np.ndarray
    duration_ratio: np.ndarray
    active_pixel_count: np.ndarray
    tap_score: np.ndarray
    touching: np.ndarray
    above_noise: np.ndarray
    since_touch_start_ms: np.ndarray
    touch_length_ms: np.ndarray
    transition: np.ndarray
    hold_suppressed: np.ndarray
    hold_clock: np.ndarray
    region: np.ndarray

    def __len__(self) -> int:
        return len(self.frame)


@dataclass(frozen=True)
class Replay:
    """What one replay gave.

    events: numpy structured array, one row per event in the order the pipeline handed them out,
      fields frame (int64, -1 for the firmware reset), time (uint64 host clock ticks: the
      "timestamp" of `tolkatouch replay --json`), seconds (float64 since the first frame), phase
      (uint32), region (uint32) and kind (uint8, an index into KIND_NAMES).
    frames: Frames, the recognizer's snapshot of every image frame.
    settings: the settings applied before the first frame, as checked ("Algs.KEY=VALUE").
    """

    events: np.ndarray
    frames: Frames
    settings: tuple

    def event_kinds(self) -> list:
        """The events' kind names ("tap", "hold-start", ...), in order."""
        return [KIND_NAMES[k] if k < len(KIND_NAMES) else "unknown" for k in self.events["kind"]]


SettingsArgument = Union[None, Mapping[str, object], Iterable[str]]


def _setting_text(value: object) -> str:
    # The command line's text for a value: JSON for booleans and numbers, a string as it stands.
    if isinstance(value, bool):
        return "true" if value else "false"
    if isinstance(value, (int, float, np.integer, np.floating)):
        return repr(value.item() if isinstance(value, np.generic) else value)
    return str(value)


def setting_assignments(settings: SettingsArgument) -> list:
    """Settings as 'KEY=VALUE' texts: from a mapping {key: value} or an iterable of 'KEY=VALUE'."""
    if settings is None:
        return []
    if isinstance(settings, Mapping):
        return [f"{key}={_setting_text(value)}" for key, value in settings.items()]
    if isinstance(settings, str):
        return [settings]
    return [str(item) for item in settings]


def replay(recording: Recording, settings: SettingsArgument = None) -> Replay:
    """Plays the recording through a fresh pipeline, as `tolkatouch replay --fast` does.

    settings: {key: value} or ["KEY=VALUE", ...], applied before the first frame; a key in any of
    its forms ("HoldTimeoutMilliseconds", "Algs.HoldTimeoutMilliseconds", ...). Each is checked
    against the settings table as `replay --set` checks it: SettingError otherwise.

    Returns a Replay: .events (numpy structured array: frame, time, seconds, phase, region, kind)
    and .frames (Frames: numpy arrays of every per-frame number of the recognizer's snapshot).
    The interpreter lock is released while the recording plays.
    """
    if not isinstance(recording, Recording):
        raise TypeError(f"replay() takes a tolkatouch.Recording, not {type(recording).__name__}")
    assignments = setting_assignments(settings)
    events, columns = _replay_arrays(recording, assignments)
    return Replay(events=events, frames=Frames(**columns), settings=tuple(assignments))
