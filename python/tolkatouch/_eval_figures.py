"""Figures of evaluations (the JSON of `tolkatouch eval --json`, `sweep --json` or
tolkatouch.evaluate): a metric against a setting per gesture kind, a DET-style curve and the
confusion matrix. Used by tolkatouch.plot_eval."""

from __future__ import annotations

from typing import List, Optional

import numpy as np
from matplotlib.figure import Figure

KINDS = ("tap", "hold", "slide")
KIND_COLOURS = {"tap": "tab:green", "hold": "tab:red", "slide": "tab:purple"}
INTENDED = ("tap", "hold", "slide", "brush", "none")
RECOGNISED = ("tap", "hold", "slide", "nothing")


def evaluations_of(document) -> List[dict]:
    """The evaluations in a results document: one (eval --json), or the points of a sweep or of
    tolkatouch.evaluate, in the order given."""
    if isinstance(document, list):
        return document
    if "Points" in document:
        return list(document["Points"])
    if "Counts" in document:
        return [document]
    raise ValueError("not an evaluation: no Counts and no Points")


def setting_value(evaluation: dict, key: str) -> Optional[float]:
    settings = evaluation.get("Settings", {})
    for name in (key, f"Algs.{key}", key.removeprefix("Pipeline.")):
        if name in settings and isinstance(settings[name], (int, float)):
            return float(settings[name])
    return None


def swept_key(evaluations: List[dict]) -> Optional[str]:
    """The first setting whose value differs between the evaluations."""
    keys = []
    for evaluation in evaluations:
        keys += [k for k in evaluation.get("Settings", {}) if k not in keys]
    for key in keys:
        if len({repr(e.get("Settings", {}).get(key)) for e in evaluations}) > 1:
            return key
    return None


def other_settings(evaluation: dict, key: str) -> dict:
    """The evaluation's settings other than `key` (in either of its spellings)."""
    names = {key, f"Algs.{key}", key.removeprefix("Pipeline.")}
    return {k: v for k, v in evaluation.get("Settings", {}).items() if k not in names}


def varies(evaluations: List[dict], key: str) -> bool:
    return len({repr(e.get("Settings", {}).get(key)) for e in evaluations}) > 1


def metric_figure(evaluations: List[dict], key: str, metric: str = "F1") -> Figure:
    """The metric (F1, Precision or Recall) of each gesture kind against the setting `key`. Where
    other settings vary too, the points that share the first point's other settings (a sweep's
    best) are drawn, as the title says."""
    figure = Figure(figsize=(8, 5), layout="constrained")
    ax = figure.subplots()
    with_key = [e for e in evaluations if setting_value(e, key) is not None]
    if not with_key:
        raise ValueError(f'no evaluation sets "{key}"')
    others = other_settings(with_key[0], key)
    points = sorted(((setting_value(e, key), e) for e in with_key if other_settings(e, key) == others),
                    key=lambda point: point[0])
    x = [p[0] for p in points]
    for kind in KINDS:
        y = [p[1]["Metrics"]["Kinds"][kind][metric] for p in points]
        if all(v is None for v in y):
            continue
        ax.plot(x, [np.nan if v is None else v for v in y], marker="o", color=KIND_COLOURS[kind], label=kind)
    overall = [p[1]["Metrics"]["Overall"][metric] for p in points]
    ax.plot(x, [np.nan if v is None else v for v in overall], marker="s", color="black", linestyle="--", label="all")
    ax.set_xlabel(key)
    ax.set_ylabel(metric)
    ax.set_ylim(-0.02, 1.02)
    held = [f"{k.removeprefix('Algs.')}={v}" for k, v in others.items() if varies(with_key, k)]
    ax.set_title(f"{metric} per gesture kind against {key}" + (f"\n({', '.join(held)})" if held else ""))
    ax.grid(alpha=0.3)
    ax.legend(title="gesture kind")
    return figure


def det_figure(evaluations: List[dict], key: Optional[str]) -> Figure:
    """False-reject rate against false activations per hour, one point per settings point, log axes."""
    figure = Figure(figsize=(7, 6), layout="constrained")
    ax = figure.subplots()
    rows = []
    for evaluation in evaluations:
        fah = evaluation["Metrics"].get("FalseActivationsPerHour")
        frr = evaluation["Metrics"].get("FalseRejectRate")
        if fah is None or frr is None:
            continue
        rows.append((fah, frr, setting_value(evaluation, key) if key else None))
    if not rows:
        raise ValueError("no evaluation has both false activations per hour and a false-reject rate "
                         "(the corpus needs noise-only recordings and labelled gestures)")
    rows.sort()
    # Zero has no place on a log axis: it is drawn at the floor, which the axis labels say.
    floor_fah, floor_frr = 0.1, 1e-4
    fah = np.array([max(r[0], floor_fah) for r in rows])
    frr = np.array([max(r[1], floor_frr) for r in rows])
    ax.plot(fah, frr, color="tab:blue", marker="o")
    for (value_fah, value_frr, setting), xf, yf in zip(rows, fah, frr):
        if setting is not None:
            ax.annotate(f"{setting:g}", (xf, yf), xytext=(4, 4), textcoords="offset points", fontsize=8)
    ax.set_xscale("log")
    ax.set_yscale("log")
    ax.set_xlabel(f"false activations per hour (noise-only recordings; 0 drawn at {floor_fah:g})")
    ax.set_ylabel(f"false-reject rate (0 drawn at {floor_frr:g})")
    ax.set_title("DET curve: one point per settings point" + (f", labelled by {key}" if key else ""))
    ax.grid(alpha=0.3, which="both")
    return figure


def confusion_figure(evaluation: dict) -> Figure:
    """Intended gestures (rows) against what the recognizer gave (columns), counts and row shares."""
    confusion = evaluation["Counts"]["Confusion"]
    counts = np.array([[confusion[i][r] for r in RECOGNISED] for i in INTENDED], dtype=float)
    totals = counts.sum(axis=1, keepdims=True)
    shares = np.divide(counts, totals, out=np.zeros_like(counts), where=totals > 0)
    figure = Figure(figsize=(7, 5.5), layout="constrained")
    ax = figure.subplots()
    image = ax.imshow(shares, cmap="Blues", vmin=0.0, vmax=1.0)
    figure.colorbar(image, ax=ax, label="share of the intended row")
    for i in range(len(INTENDED)):
        for j in range(len(RECOGNISED)):
            ax.text(j, i, f"{int(counts[i, j])}", ha="center", va="center",
                    color="white" if shares[i, j] > 0.6 else "black", fontsize=10)
    ax.set_xticks(range(len(RECOGNISED)), RECOGNISED)
    ax.set_yticks(range(len(INTENDED)), INTENDED)
    ax.set_xlabel("recognised")
    ax.set_ylabel("intended (label)")
    settings = ", ".join(f"{k}={v}" for k, v in evaluation.get("Settings", {}).items()) or "default settings"
    ax.set_title(f"Confusion matrix ({settings})")
    return figure
