"""The figure of one replayed recording: pixel readings, on flags, touch score, hand state,
active region and events on one time axis. Used by tolkatouch.plot."""

from __future__ import annotations

from typing import Optional

import numpy as np
from matplotlib.figure import Figure
from matplotlib.patches import Patch

from . import KIND_NAMES, PIXEL_NAMES, REGION_NAMES, ZONE_PIXELS, Replay

#: Heatmap rows top to bottom: the pixels grouped by zone, zones in region order.
ZONE_ORDER = (1, 2, 3)
REGION_COLOURS = {1: "tab:green", 2: "tab:blue", 3: "tab:orange"}
KIND_COLOURS = {"may-begin": "0.45", "hold-start": "tab:red", "hold-change": "tab:purple", "hold-end": "tab:brown",
                "tap": "tab:green", "cancel": "tab:gray", "reset": "black"}
# The touch score is clamped to +-100; a touch at the hold timeout becomes a hold when its score
# is not negative.
SCORE_LIMIT = 100.0
HOLD_THRESHOLD = 0.0
# Frame verdicts (TRANSITION_NAMES order) that mean a hold is on.
HOLD_TRANSITIONS = (3, 4, 5, 6)


def _rows() -> list:
    return [PIXEL_NAMES.index(letter) for region in ZONE_ORDER for letter in ZONE_PIXELS[region]]


def _runs(flags: np.ndarray):
    """(start, stop) index pairs of the runs of True in a 1-D bool array."""
    padded = np.concatenate(([False], flags, [False]))
    edges = np.flatnonzero(padded[1:] != padded[:-1])
    return edges[0::2], edges[1::2]


def _bars(ax, seconds: np.ndarray, flags: np.ndarray, y: float, height: float, **style) -> None:
    starts, stops = _runs(flags)
    if len(starts) == 0:
        return
    step = np.median(np.diff(seconds)) if len(seconds) > 1 else 0.008
    ends = np.append(seconds, seconds[-1] + step)
    ax.broken_barh(list(zip(seconds[starts], ends[stops] - seconds[starts])), (y - height / 2, height), **style)


def recording_figure(replay: Replay, title: str, start: Optional[float] = None, end: Optional[float] = None,
                     size=(14, 9)) -> Figure:
    """One figure of a replay between start and end seconds (from the first frame)."""
    frames = replay.frames
    seconds = frames.seconds
    keep = np.ones(len(seconds), dtype=bool)
    if start is not None:
        keep &= seconds >= start
    if end is not None:
        keep &= seconds <= end
    index = np.flatnonzero(keep)
    t = seconds[index]

    figure = Figure(figsize=size, layout="constrained")
    axes = figure.subplots(4, 1, sharex=True, gridspec_kw={"height_ratios": [5, 2.2, 1.2, 1.2]})
    heat_ax, score_ax, band_ax, event_ax = axes
    figure.suptitle(title)

    # Pixel readings by zone, on flags drawn over them.
    rows = _rows()
    readings = frames.readings[index][:, rows].T.astype(np.float32)
    top = float(np.percentile(readings, 99.5)) if readings.size else 1.0
    if len(t) > 0:
        mesh = heat_ax.pcolormesh(t, np.arange(len(rows)), readings, shading="nearest", cmap="magma",
                                  vmin=0.0, vmax=max(top, 1.0), rasterized=True)
        figure.colorbar(mesh, ax=heat_ax, label="reading (counts)", pad=0.01)
        on = frames.on[index][:, rows]
        for row in range(len(rows)):
            _bars(heat_ax, t, on[:, row], row, 0.28, facecolors="cyan", edgecolors="none")
    heat_ax.set_yticks(np.arange(len(rows)), [PIXEL_NAMES[i] for i in rows])
    heat_ax.set_ylim(len(rows) - 0.5, -0.5)
    first = 0
    for region in ZONE_ORDER:
        count = len(ZONE_PIXELS[region])
        if first:
            heat_ax.axhline(first - 0.5, color="white", linewidth=1.5)
        heat_ax.text(1.0, 1.0 - (first + count / 2) / len(rows), f" {REGION_NAMES[region]}", transform=heat_ax.transAxes,
                     va="center", ha="left", fontsize=9, color=REGION_COLOURS[region], fontweight="bold")
        first += count
    heat_ax.set_ylabel("pixel (by zone)")
    heat_ax.set_title("Pixel readings; cyan bars: pixel on", loc="left", fontsize=10)

    # Touch score against the hold threshold and the clamp.
    score_ax.plot(t, frames.touch_score[index], color="tab:blue", linewidth=1.0, label="touch score")
    score_ax.plot(t, frames.svm_score[index], color="tab:gray", linewidth=0.6, alpha=0.7, label="classifier score (frame)")
    score_ax.axhline(HOLD_THRESHOLD, color="tab:red", linestyle="--", linewidth=0.9, label="hold threshold (0)")
    for limit in (SCORE_LIMIT, -SCORE_LIMIT):
        score_ax.axhline(limit, color="0.3", linestyle=":", linewidth=0.9)
    score_ax.plot([], [], color="0.3", linestyle=":", label="limits (+-100)")
    score_ax.set_ylim(-SCORE_LIMIT * 1.15, SCORE_LIMIT * 1.15)
    score_ax.set_ylabel("score")
    score_ax.legend(loc="lower left", bbox_to_anchor=(0, 1), fontsize=8, ncols=4, frameon=False, borderaxespad=0)

    # Hand state and active region as bands.
    touching = frames.touching[index]
    holding = np.isin(frames.transition[index], HOLD_TRANSITIONS)
    suppressed = frames.hold_suppressed[index] & touching
    region = frames.region[index]
    _bars(band_ax, t, touching & ~holding, 2, 0.7, facecolors="tab:cyan")
    _bars(band_ax, t, holding, 2, 0.7, facecolors="tab:red")
    _bars(band_ax, t, suppressed, 1, 0.7, facecolors="0.5")
    for number, colour in REGION_COLOURS.items():
        _bars(band_ax, t, touching & (region == number), 0, 0.7, facecolors=colour)
    band_ax.set_yticks([0, 1, 2], ["active region", "hold suppressed", "hand"])
    band_ax.set_ylim(-0.6, 2.6)
    handles = [Patch(color="tab:cyan", label="touching"), Patch(color="tab:red", label="holding"),
               Patch(color="0.5", label="hold suppressed")]
    handles += [Patch(color=c, label=REGION_NAMES[n]) for n, c in REGION_COLOURS.items()]
    band_ax.legend(handles=handles, loc="lower left", bbox_to_anchor=(0, 1), fontsize=8, ncols=6, frameon=False,
                   borderaxespad=0)

    # Events as labelled markers, with a faint line through the panels above.
    events = replay.events
    shown = np.ones(len(events), dtype=bool)
    if start is not None:
        shown &= events["seconds"] >= start
    if end is not None:
        shown &= events["seconds"] <= end
    levels = (0.2, 0.5, 0.8)
    for n, event in enumerate(events[shown]):
        kind = KIND_NAMES[event["kind"]] if event["kind"] < len(KIND_NAMES) else "unknown"
        colour = KIND_COLOURS.get(kind, "black")
        x = float(event["seconds"])
        for ax in (heat_ax, score_ax, band_ax):
            ax.axvline(x, color=colour, linewidth=0.6, alpha=0.5)
        y = levels[n % len(levels)]
        event_ax.plot([x], [y], marker="v", color=colour, markersize=6)
        label = kind if event["region"] == 0 else f"{kind} {event['region']}"
        event_ax.annotate(label, (x, y), xytext=(3, 2), textcoords="offset points", fontsize=7, color=colour)
    event_ax.set_ylim(0, 1.1)
    event_ax.set_yticks([])
    event_ax.set_ylabel("events")
    event_ax.set_title("Events: kind and region (1 play/pause, 2 volume down, 3 volume up)", loc="left", fontsize=9)
    event_ax.set_xlabel("time since the first frame (s)")
    if len(t) > 0:
        event_ax.set_xlim(start if start is not None else t[0], end if end is not None else t[-1])
    return figure
