"""What the viewer's page asks for, computed from one recording: a level-of-detail timeline of a
time range, every number of one frame, and what a settings change would have done. Plain data
(dicts of lists) ready for JSON; used by tolkatouch.view and its export."""

from __future__ import annotations

import json
import os
import threading
from collections import OrderedDict
from typing import Optional, Sequence

import numpy as np

from . import (HOLD_CLOCK_NAMES, KIND_NAMES, PIXEL_NAMES, REGION_NAMES, TRANSITION_NAMES, ZONE_PIXELS, Recording,
               Replay, replay, setting_assignments)
from . import _tolkatouch as _core

#: Heatmap rows top to bottom: the pixels grouped by zone, zones in region order.
ZONE_ORDER = (1, 2, 3)
HEAT_ROWS = [PIXEL_NAMES.index(letter) for region in ZONE_ORDER for letter in ZONE_PIXELS[region]]
#: Frame verdicts (TRANSITION_NAMES order) that mean a hold is on.
HOLD_TRANSITIONS = (3, 4, 5, 6)
#: At most this many columns per series: a range of more frames is sent as min/max per column.
MAX_COLUMNS = 1000
#: At most this many events are sent one by one; a range with more sends their count per column.
MAX_EVENTS = 400
#: The what-if answer lists at most this many changed, added and lost events each (all are counted).
MAX_LISTED = 200
#: Replays kept for settings points the page asked about, besides the baseline.
CACHED_REPLAYS = 4
#: The eval tolerance, as `tolkatouch eval` takes it by default.
TOLERANCE_US = 100_000


def surface_layout() -> dict:
    """What the page needs to draw the surface and name its numbers, the same for a recording
    and for the live service."""
    return {
        "pixels": list(PIXEL_NAMES),
        "heat_rows": [PIXEL_NAMES[i] for i in HEAT_ROWS],
        "zones": {str(region): ZONE_PIXELS[region] for region in ZONE_ORDER},
        "region_names": list(REGION_NAMES),
        "transition_names": list(TRANSITION_NAMES),
        "hold_clock_names": list(HOLD_CLOCK_NAMES),
        "pads": [list(pad) for pad in _core.surface_pads()],
        "virtual_groups": list(_core.virtual_groups()),
    }


def _round(values: np.ndarray, digits: int = 3) -> list:
    return np.round(values.astype(np.float64), digits).tolist()


def hand_codes(frames, index=slice(None)) -> np.ndarray:
    """0 idle, 1 touching, 2 holding, 3 touching with the hold suppressed: the hand band's colours."""
    touching = frames.touching[index]
    holding = np.isin(frames.transition[index], HOLD_TRANSITIONS)
    suppressed = frames.hold_suppressed[index] & touching
    codes = touching.astype(np.uint8)
    codes[suppressed] = 3
    codes[holding] = 2
    return codes


def event_rows(result: Replay, start: float = -np.inf, end: float = np.inf) -> list:
    events = result.events
    keep = (events["seconds"] >= start) & (events["seconds"] <= end)
    return [{"frame": int(e["frame"]), "seconds": round(float(e["seconds"]), 6),
             "kind": KIND_NAMES[e["kind"]] if e["kind"] < len(KIND_NAMES) else "unknown",
             "region": int(e["region"]), "phase": int(e["phase"])} for e in events[keep]]


def evaluation_summary(evaluation: Optional[dict]) -> Optional[dict]:
    """The numbers of eval's JSON an engineer compares first: overall and per-kind precision,
    recall and F1, and the counts of what went wrong (split, merged, wrong place, false rejects,
    false activations)."""
    if evaluation is None:
        return None
    metrics = evaluation["Metrics"]
    counts = evaluation["Counts"]
    summary = {f"overall {name}": metrics["Overall"][name] for name in ("TP", "FP", "FN", "Precision", "Recall", "F1")}
    for kind, values in metrics["Kinds"].items():
        summary[f"{kind} F1"] = values["F1"]
    for name in ("Split", "Merged", "WrongPlace", "FalseRejects", "FalseActivations"):
        summary[name] = counts[name]
    return summary


def event_key(event: dict) -> tuple:
    return (event["frame"], event["kind"], event["region"])


def compare_events(before: list, after: list) -> dict:
    """Counts of events lost (only before), added (only after) and changed (same frame and kind,
    another region), matched by frame, kind and region; and the lost and added events themselves."""
    before_keys = {event_key(e) for e in before}
    after_keys = {event_key(e) for e in after}
    lost = [e for e in before if event_key(e) not in after_keys]
    added = [e for e in after if event_key(e) not in before_keys]
    changed_keys = {(e["frame"], e["kind"]) for e in lost} & {(e["frame"], e["kind"]) for e in added}
    changed = [e for e in added if (e["frame"], e["kind"]) in changed_keys]
    lost = [e for e in lost if (e["frame"], e["kind"]) not in changed_keys]
    added = [e for e in added if (e["frame"], e["kind"]) not in changed_keys]
    return {"changed": len(changed), "added": len(added), "lost": len(lost),
            "changed_events": changed, "added_events": added, "lost_events": lost}


class ViewData:
    """One recording, its labels and the settings it was opened with, and replays of it under
    other settings, kept for the page's questions."""

    def __init__(self, recording: Recording, name: str, settings: Sequence[str] = (), replay_now: bool = True):
        self.recording = recording
        self.name = name
        self.settings = setting_assignments(settings)
        _core.check_settings(self.settings)
        self._replays: "OrderedDict[tuple, Replay]" = OrderedDict()
        self._evaluations: dict = {}
        self._ready = threading.Event()
        self._failure: Optional[BaseException] = None
        if replay_now:
            self.prepare()

    def prepare(self) -> None:
        """Replays the recording under the opening settings; the page's questions wait for it, so
        a server may answer its first requests (the page's scripts) meanwhile."""
        try:
            self.baseline = replay(self.recording, self.settings)
            self.seconds = self.baseline.frames.seconds
        except BaseException as error:  # noqa: BLE001 - handed to every question instead
            self._failure = error
            raise
        finally:
            self._ready.set()

    def wait_ready(self) -> None:
        """Waits for the opening replay; raises what it raised, if it failed."""
        self._ready.wait()
        if self._failure is not None:
            raise RuntimeError(f"the replay failed: {self._failure}")

    @classmethod
    def open(cls, path: str, labels: Optional[str] = None, settings: Sequence[str] = (), replay_now: bool = True) -> "ViewData":
        """Reads the recording (OSError, DocumentError) and its labels: the file given, else the
        DOC.labels.json beside it."""
        recording = Recording.load(path)
        if labels is not None:
            with open(labels, encoding="utf-8") as file:
                text = file.read()
            _core.attach_labels(recording, text, labels)
        return cls(recording, os.path.basename(path), settings, replay_now)

    # Settings -----------------------------------------------------------------------------
    def replay_for(self, settings: Sequence[str]) -> Replay:
        """The replay under these settings (checked: SettingError), cached."""
        key = tuple(settings)
        if key == tuple(self.settings):
            return self.baseline
        if key in self._replays:
            self._replays.move_to_end(key)
            return self._replays[key]
        _core.check_settings(list(key))
        result = replay(self.recording, list(key))
        self._replays[key] = result
        while len(self._replays) > CACHED_REPLAYS:
            self._replays.popitem(last=False)
        return result

    def _scored(self, settings: Sequence[str]):
        """(eval's JSON, the mismatches as dicts of kind, start and end seconds) under the
        settings, or None without labels."""
        if self.recording.labels is None:
            return None
        key = tuple(settings)
        if key not in self._evaluations:
            text, stretches = _core.evaluate_recording_mismatches(self.recording, list(key), TOLERANCE_US)
            mismatches = [{"kind": kind, "start": start / 1e6, "end": end / 1e6} for kind, start, end in stretches]
            self._evaluations[key] = (json.loads(text), sorted(mismatches, key=lambda m: m["start"]))
        return self._evaluations[key]

    def evaluation(self, settings: Sequence[str]) -> Optional[dict]:
        """eval's JSON for the recording under the settings, or None without labels."""
        scored = self._scored(settings)
        return scored[0] if scored else None

    def mismatches(self, settings: Sequence[str], start: float = -np.inf, end: float = np.inf) -> list:
        """Where eval finds the gestures and labels disagree (missed, false, split, merged, wrong
        zone), the stretches that reach into start..end; empty without labels."""
        scored = self._scored(settings)
        if not scored:
            return []
        return [m for m in scored[1] if m["end"] >= start and m["start"] <= end]

    # What the page asks ---------------------------------------------------------------------
    def info(self) -> dict:
        table = [row for row in _core.settings_table() if row["tunable"]]
        labels = self.recording.labels or []
        return {
            "name": self.name,
            "frames": len(self.seconds),
            "duration": float(self.seconds[-1]) if len(self.seconds) else 0.0,
            "settings": self.settings,
            "table": table,
            **surface_layout(),
            "has_labels": self.recording.labels is not None,
            "labels": [{"kind": l.kind, "zone": l.zone, "to_zone": l.to_zone, "start": l.start_us / 1e6,
                        "end": l.end_us / 1e6} for l in labels],
            "event_count": len(self.baseline.events),
            "evaluation": evaluation_summary(self.evaluation(self.settings)),
        }

    def timeline(self, settings: Sequence[str], start: float, end: float, columns: int = MAX_COLUMNS,
                 cap: int = MAX_COLUMNS) -> dict:
        """The series of the frames from start to end seconds: every frame when they are at most
        `columns`, otherwise `columns` buckets of consecutive frames, each with its min and max."""
        result = self.replay_for(settings)
        frames = result.frames
        if len(self.seconds):
            start = min(max(start, float(self.seconds[0])), float(self.seconds[-1]))
            end = min(max(end, start), float(self.seconds[-1]))
        else:
            start = end = 0.0
        columns = max(10, min(int(columns), cap))
        first = int(np.searchsorted(self.seconds, start, side="left"))
        last = int(np.searchsorted(self.seconds, end, side="right"))
        count = max(last - first, 0)
        out = {"start": start, "end": end, "first": first, "count": count, "heat_rows": [PIXEL_NAMES[i] for i in HEAT_ROWS]}
        if count == 0:
            out.update(bucketed=False, x=[], heat=[[] for _ in HEAT_ROWS], on=[[] for _ in HEAT_ROWS], score_min=[],
                       score_max=[], svm=[], hand=[], region=[])
            self._add_events(out, result, start, end)
            return out
        span = slice(first, last)
        readings = frames.readings[span][:, HEAT_ROWS]
        on = frames.on[span][:, HEAT_ROWS]
        score = frames.touch_score[span]
        svm = frames.svm_score[span]
        hand = hand_codes(frames, span)
        region = np.where(frames.touching[span], frames.region[span], 0).astype(np.uint8)
        if count <= columns:
            out.update(bucketed=False, x=_round(self.seconds[span], 4), heat=readings.T.tolist(),
                       on=on.T.astype(np.uint8).tolist(), score_min=_round(score), score_max=_round(score),
                       svm=_round(svm), hand=hand.tolist(), region=region.tolist())
            self._add_events(out, result, start, end)
            return out
        edges = np.linspace(0, count, columns + 1).astype(np.int64)[:-1]
        sizes = np.diff(np.append(edges, count))
        out.update(
            bucketed=True,
            x=_round(self.seconds[span][edges], 4),
            heat=np.maximum.reduceat(readings, edges, axis=0).T.tolist(),
            on=_round(np.add.reduceat(on.astype(np.int32), edges, axis=0).T / sizes, 2),
            score_min=_round(np.minimum.reduceat(score, edges)),
            score_max=_round(np.maximum.reduceat(score, edges)),
            svm=_round(np.maximum.reduceat(svm, edges)),
            hand=np.maximum.reduceat(hand, edges).tolist(),
            region=np.maximum.reduceat(region, edges).tolist())
        self._add_events(out, result, start, end)
        return out

    def _add_events(self, out: dict, result: Replay, start: float, end: float) -> None:
        """The range's events one by one, or, past MAX_EVENTS, their count in each column; the
        opening settings' events beside them when the series are another replay's."""
        x = out["x"]
        out["mismatches"] = self.mismatches(result.settings, start, end)[:MAX_EVENTS]
        for name, source in (("events", result), ("opening_events", self.baseline)):
            if name == "opening_events" and source is result:
                continue
            seconds = source.events["seconds"]
            inside = (seconds >= start) & (seconds <= end)
            count = int(inside.sum())
            if count <= MAX_EVENTS or not x:
                out[name] = event_rows(source, start, end)
            else:
                columns = np.searchsorted(np.asarray(x), seconds[inside], side="right") - 1
                out[name] = []
                out[name + "_per_column"] = np.bincount(np.clip(columns, 0, len(x) - 1), minlength=len(x)).tolist()
    def frame_at(self, seconds: float) -> int:
        """The frame nearest to a time in seconds from the first frame."""
        if len(self.seconds) == 0:
            raise IndexError("the recording has no frames")
        index = int(np.searchsorted(self.seconds, seconds))
        if index >= len(self.seconds) or (index > 0 and seconds - self.seconds[index - 1] < self.seconds[index] - seconds):
            index -= 1
        return max(index, 0)

    def event_frame(self, settings: Sequence[str], index: int, direction: int) -> int:
        """The frame of the first event after frame `index` (direction 1) or the last before it
        (-1), under the settings; `index` itself when there is none."""
        events = self.replay_for(settings).events
        seconds = events["seconds"][events["frame"] >= 0]
        now = self.seconds[min(max(index, 0), len(self.seconds) - 1)]
        if direction > 0:
            later = seconds[seconds > now]
            return self.frame_at(float(later[0])) if len(later) else index
        earlier = seconds[seconds < now]
        return self.frame_at(float(earlier[-1])) if len(earlier) else index

    def frame(self, settings: Sequence[str], index: int) -> dict:
        """Every number of frame `index`'s snapshot under the settings (IndexError outside)."""
        result = self.replay_for(settings)
        frames = result.frames
        if not 0 <= index < len(frames):
            raise IndexError(f"no frame {index}: the recording has frames 0 to {len(frames) - 1}")
        values = {}
        for name in frames.__dataclass_fields__:
            value = getattr(frames, name)[index]
            values[name] = value.tolist() if isinstance(value, np.ndarray) else value.item()
        values["description"], values["virtual_description"] = _core.description_lines(values)
        for name in ("normalized", "virtual_normalized"):
            values[name] = [round(v, 4) for v in values[name]]
        for name in ("touch_score", "svm_score", "strength_rate", "strength_per_duration", "duration_ratio", "tap_score"):
            values[name] = round(values[name], 4)
        values["transition_name"] = TRANSITION_NAMES[values["transition"]] if values["transition"] < len(TRANSITION_NAMES) else "?"
        values["hold_clock_name"] = HOLD_CLOCK_NAMES[values["hold_clock"]] if values["hold_clock"] < len(HOLD_CLOCK_NAMES) else "?"
        values["region_name"] = REGION_NAMES[values["region"]] if values["region"] < len(REGION_NAMES) else "?"
        return {"index": index, "values": values}

    def what_if(self, settings: Sequence[str]) -> dict:
        """The events under the settings beside the opening settings' events, with the counts of
        changed, added and lost events and, with labels, eval's metrics before and after."""
        result = self.replay_for(settings)
        before = event_rows(self.baseline)
        after = event_rows(result)
        comparison = compare_events(before, after)
        for name in ("changed_events", "added_events", "lost_events"):
            comparison[name] = comparison[name][:MAX_LISTED]
        return {"settings": list(settings), "events": after, "opening_event_count": len(before), **comparison,
                "evaluation_before": self.evaluation(self.settings), "evaluation_after": self.evaluation(settings),
                "summary_before": evaluation_summary(self.evaluation(self.settings)),
                "summary_after": evaluation_summary(self.evaluation(settings))}
