"""tolkatouch.replay: the same events as `tolkatouch replay --json`, and per-frame arrays with the
numbers the description lines print."""

import re
import subprocess

import numpy as np
import pytest

import tolkatouch
from conftest import EXAMPLE_DOCUMENTS, cli_error, json_events


def rows(result):
    names = tolkatouch.KIND_NAMES
    return [{"frame": None if e["frame"] < 0 else int(e["frame"]), "event": names[e["kind"]], "region": int(e["region"]),
             "phase": int(e["phase"]), "timestamp": int(e["time"])} for e in result.events]


@pytest.mark.parametrize("document", EXAMPLE_DOCUMENTS, ids=lambda p: p.name)
def test_events_equal_the_command_lines_json_events(tool, document):
    result = tolkatouch.replay(tolkatouch.Recording.load(str(document)))
    assert rows(result) == json_events(tool, document)


def test_settings_are_applied_as_replay_set_applies_them(tool):
    document = EXAMPLE_DOCUMENTS[[p.name for p in EXAMPLE_DOCUMENTS].index("version0-session.json")]
    recording = tolkatouch.Recording.load(str(document))
    result = tolkatouch.replay(recording, {"Algs.HoldTimeoutMilliseconds": 5000, "EnableTapSuppression": False})
    expected = json_events(tool, document, "Algs.HoldTimeoutMilliseconds=5000", "EnableTapSuppression=false")
    assert rows(result) == expected
    assert rows(result) != rows(tolkatouch.replay(recording))
    assert "hold-start" not in result.event_kinds()
    assert result.settings == ("Algs.HoldTimeoutMilliseconds=5000", "EnableTapSuppression=false")


def test_settings_as_key_value_texts_give_the_same_replay():
    recording = tolkatouch.Recording.load(str(EXAMPLE_DOCUMENTS[0]))
    by_mapping = tolkatouch.replay(recording, {"HoldTimeoutMilliseconds": 1000})
    by_text = tolkatouch.replay(recording, ["HoldTimeoutMilliseconds=1000"])
    np.testing.assert_array_equal(by_mapping.events, by_text.events)
    np.testing.assert_array_equal(by_mapping.frames.touch_score, by_text.frames.touch_score)


@pytest.mark.parametrize("setting", ["HoldTimeoutMiliseconds=700", "HoldTimeoutMilliseconds=0",
                                     "ActivationThreshold=lots", "EnableHoldSuppression=2"])
def test_a_refused_setting_raises_setting_error_with_the_command_lines_message(tool, setting):
    recording = tolkatouch.Recording.load(str(EXAMPLE_DOCUMENTS[0]))
    with pytest.raises(tolkatouch.SettingError) as error:
        tolkatouch.replay(recording, [setting])
    assert str(error.value) == cli_error(tool, "replay", "--fast", "--set", setting, str(EXAMPLE_DOCUMENTS[0]))


def test_replay_takes_only_a_recording():
    with pytest.raises(TypeError):
        tolkatouch.replay("examples/everyday-session.json")


DESCRIPTION = re.compile(r"^\[debug\] Algs: Frame (\d+) @(\d+)ms, \*\*\* (Touch|Virtual) State Description \*\*\*$")
SUMMARY = re.compile(r"^ts=(\S+), sd=(\S+), tsd=(\S+), NonActivePixels=(-?\d+), TimeDurationRatio=(\S+), "
                     r"TapSVMScore=(\S+), \[(.*)\] (.*)$")
CELL = re.compile(r"(\w+)=\s*(-?\d+)(?:\s+(-?\d+))?(<==ON)?")


def descriptions(tool, document):
    """The touch and virtual state description lines of every frame, read from --describe."""
    result = subprocess.run([tool, "replay", "--fast", "--json", "--describe", str(document)], capture_output=True,
                            text=True, check=True)
    lines = result.stderr.splitlines()
    out = []
    for header, body in zip(lines, lines[1:]):
        match = DESCRIPTION.match(header)
        if match:
            out.append((int(match[1]), int(match[2]), match[3], SUMMARY.match(body)))
    return out


def test_frame_arrays_hold_the_numbers_of_the_description_lines(tool):
    document = EXAMPLE_DOCUMENTS[[p.name for p in EXAMPLE_DOCUMENTS].index("everyday-session.json")]
    frames = tolkatouch.replay(tolkatouch.Recording.load(str(document))).frames
    touch = [d for d in descriptions(tool, document) if d[2] == "Touch"]
    virtual = [d for d in descriptions(tool, document) if d[2] == "Virtual"]
    assert len(touch) == len(virtual) == len(frames) > 0
    np.testing.assert_array_equal(frames.frame, [d[0] for d in touch])
    np.testing.assert_array_equal(frames.time, [d[1] for d in touch])
    fmt = np.vectorize(lambda x: f"{x:f}")
    for column, group in (("touch_score", 1), ("strength_rate", 2), ("strength_per_duration", 3),
                          ("duration_ratio", 5), ("tap_score", 6)):
        assert list(fmt(getattr(frames, column).astype(np.float64))) == [d[3][group] for d in touch], column
    np.testing.assert_array_equal(frames.active_pixel_count, [int(d[3][4]) for d in touch])
    cells = [CELL.findall(d[3][7]) for d in touch]
    np.testing.assert_array_equal(frames.readings, [[int(c[1]) for c in row] for row in cells])
    np.testing.assert_array_equal(frames.pixel_values, [[int(c[2]) for c in row] for row in cells])
    np.testing.assert_array_equal(frames.on, [[c[3] != "" for c in row] for row in cells])
    virtual_cells = [CELL.findall(d[3][7]) for d in virtual]
    np.testing.assert_array_equal(frames.virtual_values, [[int(c[1]) for c in row] for row in virtual_cells])
    np.testing.assert_array_equal(frames.virtual_on, [[c[3] != "" for c in row] for row in virtual_cells])
    regions = [int(m[1]) if (m := re.search(r"ActiveRegion=(\d+)", d[3][8])) else None for d in touch]
    shown = [i for i, r in enumerate(regions) if r is not None]
    assert shown, "no frame of the session names its active region"
    np.testing.assert_array_equal(frames.region[shown], [regions[i] for i in shown])


def test_frame_arrays_have_one_row_per_image_with_the_documented_shapes():
    recording = tolkatouch.Recording.load(str(EXAMPLE_DOCUMENTS[0]))
    frames = tolkatouch.replay(recording).frames
    n = len(recording)
    np.testing.assert_array_equal(frames.frame, recording.frame_numbers)
    np.testing.assert_array_equal(frames.readings, recording.readings)
    assert frames.normalized.shape == frames.on.shape == (n, 15)
    assert frames.virtual_normalized.shape == frames.virtual_on.shape == (n, 23)
    assert frames.on.dtype == np.bool_ and frames.touch_score.dtype == np.float32
    assert frames.seconds[0] == 0.0 and np.all(np.diff(frames.seconds) > 0)


def test_the_events_frames_carry_the_verdicts_that_made_them():
    result = tolkatouch.replay(tolkatouch.Recording.load(str(EXAMPLE_DOCUMENTS[0])))
    taps = result.events[result.events["kind"] == tolkatouch.KIND_NAMES.index("tap")]
    by_frame = dict(zip(result.frames.frame.tolist(), result.frames.transition.tolist()))
    accepted = tolkatouch.TRANSITION_NAMES.index("tap accepted")
    assert len(taps) > 0 and all(by_frame[int(f)] == accepted for f in taps["frame"])
