"""Typed stubs of the tolkatouch package's extension module."""

from typing import Any, Dict, List, Tuple

import numpy as np

class Error(Exception):
    """Base of the package's errors; the message is the command line's."""

class DocumentError(Error, ValueError):
    """A recording document that does not read."""

class SettingError(Error, ValueError):
    """A setting key or value that the settings table refuses."""

class ScriptError(Error, ValueError):
    """A gesture script that does not read."""

class FirmwareEvent:
    """One firmware event report of a recording (event 0 is the firmware's reset)."""
    host_time: int
    event: int
    context: int
    is_reset: bool

class SettingChange:
    """One setting written in a recording."""
    host_time: int
    key: str
    value: Any

class Recording:
    """A recording document: its image frames as numpy arrays, its firmware events and setting changes."""

    @staticmethod
    def load(path: str) -> Recording:
        """Reads a document (version 0 or 1); OSError if unreadable, DocumentError if not a recording."""
    @staticmethod
    def from_bytes(document: bytes, name: str = "<bytes>") -> Recording:
        """Reads a document from its bytes; DocumentError if not a recording."""
    def to_bytes(self) -> bytes:
        """The document, version 1."""
    def save(self, path: str) -> None:
        """Writes the document, version 1; OSError if it cannot."""
    times: np.ndarray  # int64 (N,): firmware milliseconds of each image
    frame_numbers: np.ndarray  # uint32 (N,)
    host_times: np.ndarray  # int64 (N,): host clock nanoseconds of each image
    pixels: np.ndarray  # uint16 (N, 15): raw readings A..O
    readings: np.ndarray  # int16 (N, 15): what the recognizer consumes, A..O
    firmware_events: List[FirmwareEvent]
    setting_changes: List[SettingChange]
    def __len__(self) -> int: ...

def synth(script: str, seed: int = 1) -> Recording:
    """The recording of a gesture script's text, as `tolkatouch synth --seed SEED` makes it; ScriptError."""

def replay_arrays(recording: Recording, settings: List[str]) -> Tuple[np.ndarray, Dict[str, np.ndarray]]:
    """(events, frame columns) of a replay; use tolkatouch.replay."""

def settings_table() -> List[Dict[str, Any]]:
    """Every setting of the settings table: key ('Algs.X'), type, default, minimum, maximum, accepted, meaning, tunable."""
def surface_pads() -> List[Tuple[int, float, float]]:
    """(pixel, x, y) of every pad on the surface, as the image drawing places them."""
def virtual_groups() -> List[str]:
    """The letters of each of the 23 virtual pixels."""
def description_lines(values: Dict[str, Any]) -> Tuple[str, str]:
    """(touch state line, virtual state line) of one frame from its tolkatouch.Frames numbers."""
def attach_labels(recording: Recording, text: str, subject: str) -> None:
    """Gives the recording the labels of a labels document's text; DocumentError naming the subject."""
def evaluate_recording_mismatches(recording: Recording, settings: List[str], tolerance_us: int) -> Tuple[str, List[Tuple[str, int, int]]]:
    """(eval --json text, [(kind, start_us, end_us)]): missed, false, split, merged, wrong zone."""
