"""One self-contained page of a recording's range: the viewer's page with its data, styles and
scripts inlined, to attach to a bug report. It opens from disk and asks nothing of any server."""

from __future__ import annotations

import json
import math
from typing import Optional

import numpy as np

from . import _tolkatouch as _core
from ._view_assets import asset_bytes
from ._view_data import ViewData, event_rows

#: The most frames an exported page carries (about 2.7 minutes at 125 frames a second, some 40 MB).
EXPORT_MAX_FRAMES = 20_000


class ExportTooLarge(ValueError):
    """A range with more frames than an exported page carries."""


def _script_text(text: str) -> str:
    # Inside <script>, only "</" could end the element early; "<\/" means the same to the script.
    return text.replace("</", "<\\/")


def export_data(data: ViewData, start: Optional[float], end: Optional[float]) -> dict:
    """The page's data for the frames from start to end seconds: every frame's numbers."""
    seconds = data.seconds
    start = float(seconds[0]) if start is None and len(seconds) else (start or 0.0)
    end = float(seconds[-1]) if end is None and len(seconds) else (end or 0.0)
    first = int(np.searchsorted(seconds, start, side="left"))
    last = int(np.searchsorted(seconds, end, side="right"))
    count = last - first
    if count > EXPORT_MAX_FRAMES:
        raise ExportTooLarge(f"the range from {start:g} s to {end:g} s holds {count} frames; an exported page carries at "
                             f"most {EXPORT_MAX_FRAMES} (choose a shorter range with --from and --to)")
    if count <= 0:
        raise ExportTooLarge(f"the range from {start:g} s to {end:g} s holds no frames")
    info = data.info()
    info["event_count"] = len(event_rows(data.baseline, start, end))
    info["labels"] = [label for label in info["labels"] if label["end"] >= start and label["start"] <= end]
    info["duration"] = float(seconds[last - 1])
    timeline = data.timeline(data.settings, start, end, columns=count, cap=count)
    if "events_per_column" in timeline:
        timeline.pop("events_per_column")
        timeline["events"] = event_rows(data.baseline, start, end)
    frames = data.baseline.frames
    columns = {}
    exact = {}
    for name in frames.__dataclass_fields__:
        values = getattr(frames, name)[first:last]
        exact[name] = values.tolist()
        columns[name] = np.round(values.astype(np.float64), 4).tolist() if values.dtype.kind == "f" else exact[name]
    # The description lines, as the served page's details panel shows them: from the exact floats.
    lines = [_core.description_lines({name: column[i] for name, column in exact.items()}) for i in range(count)]
    columns["description"] = [touch for touch, _ in lines]
    columns["virtual_description"] = [virtual for _, virtual in lines]
    from . import HOLD_CLOCK_NAMES, REGION_NAMES, TRANSITION_NAMES
    columns["transition_name"] = [TRANSITION_NAMES[c] if c < len(TRANSITION_NAMES) else "?" for c in frames.transition[first:last]]
    columns["hold_clock_name"] = [HOLD_CLOCK_NAMES[c] if c < len(HOLD_CLOCK_NAMES) else "?" for c in frames.hold_clock[first:last]]
    columns["region_name"] = [REGION_NAMES[c] if c < len(REGION_NAMES) else "?" for c in frames.region[first:last]]
    return {"info": info, "timeline": timeline, "first": first, "columns": columns}


def export_page(data: ViewData, path: str, start: Optional[float] = None, end: Optional[float] = None) -> None:
    """Writes the page of the range to path (ExportTooLarge past EXPORT_MAX_FRAMES, OSError)."""
    for value in (start, end):
        if value is not None and not math.isfinite(value):
            raise ValueError("--from and --to take finite seconds")
    payload = json.dumps(export_data(data, start, end), separators=(",", ":"), allow_nan=False)
    page = asset_bytes("index.html").decode("utf-8")
    page = page.replace('<link rel="stylesheet" href="assets/viewer.css">',
                        "<style>\n" + asset_bytes("viewer.css").decode("utf-8") + "</style>")
    page = page.replace('<script src="assets/plotly.js"></script>',
                        "<script>window.TOLKA_EXPORT = " + _script_text(payload) + ";</script>\n<script>" +
                        _script_text(asset_bytes("plotly.js").decode("utf-8")) + "</script>")
    page = page.replace('<script src="assets/viewer.js"></script>',
                        "<script>" + _script_text(asset_bytes("viewer.js").decode("utf-8")) + "</script>")
    with open(path, "w", encoding="utf-8") as file:
        file.write(page)
