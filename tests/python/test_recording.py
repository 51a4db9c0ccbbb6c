"""tolkatouch.Recording: documents read into arrays, written back, and refused with the command
line's messages."""

import json
import struct

import numpy as np
import pytest

import tolkatouch
from conftest import DATA, EXAMPLE_DOCUMENTS, cli_error, run_tool

IMAGE = struct.Struct("<II4B15H15h")


def reports_of(document):
    """(host time, report bytes) of every input report, read with the standard library."""
    container = json.loads(document.read_text())
    if container["Version"] == 0:
        return [(r["Timestamp"], bytes.fromhex(r["ReportData"])) for r in container["Reports"]]
    return [(f["Timestamp"], bytes.fromhex(f["Report"])) for f in container["Frames"] if f["Type"] == "InputReport"]


@pytest.mark.parametrize("document", EXAMPLE_DOCUMENTS, ids=lambda p: p.name)
def test_every_example_document_loads_with_one_row_per_image(document):
    recording = tolkatouch.Recording.load(str(document))
    images = [(t, IMAGE.unpack(r[1:73])) for t, r in reports_of(document) if r[0] == 1 and len(r) >= 73]
    assert len(recording) == len(images) > 0
    assert recording.pixels.shape == (len(images), 15) and recording.pixels.dtype == np.uint16
    assert recording.readings.shape == (len(images), 15) and recording.readings.dtype == np.int16
    assert recording.times.dtype == np.int64 and recording.frame_numbers.dtype == np.uint32
    np.testing.assert_array_equal(recording.frame_numbers, [fields[0] for _, fields in images])
    np.testing.assert_array_equal(recording.times, [fields[1] for _, fields in images])
    np.testing.assert_array_equal(recording.host_times, [t for t, _ in images])
    np.testing.assert_array_equal(recording.pixels, [fields[6:21] for _, fields in images])
    np.testing.assert_array_equal(recording.readings, [fields[21:36] for _, fields in images])


def test_firmware_resets_are_listed_with_their_host_times():
    document = EXAMPLE_DOCUMENTS[[p.name for p in EXAMPLE_DOCUMENTS].index("reset-during-hold.json")]
    recording = tolkatouch.Recording.load(str(document))
    resets = [t for t, r in reports_of(document) if r[0] == 2]
    assert [e.host_time for e in recording.firmware_events] == resets
    assert all(e.is_reset and e.event == 0 for e in recording.firmware_events)


def test_setting_changes_keep_their_keys_and_values():
    recording = tolkatouch.synth("set Algs.HoldTimeoutMilliseconds 700\ntap play-pause 120ms\n")
    changes = recording.setting_changes
    assert [(c.key, c.value) for c in changes] == [("Algs.HoldTimeoutMilliseconds", 700)]


def test_arrays_are_read_only():
    recording = tolkatouch.Recording.load(str(EXAMPLE_DOCUMENTS[0]))
    with pytest.raises(ValueError):
        recording.pixels[0, 0] = 1


def test_saving_writes_what_convert_writes(tool, tmp_path):
    document = EXAMPLE_DOCUMENTS[[p.name for p in EXAMPLE_DOCUMENTS].index("version0-session.json")]
    out = tmp_path / "converted.json"
    tolkatouch.Recording.load(str(document)).save(str(out))
    converted = run_tool(tool, "convert", str(document), "-o", "-")
    assert out.read_text() == converted.stdout


def test_from_bytes_and_pickling_give_the_same_arrays():
    import pickle

    document = EXAMPLE_DOCUMENTS[0]
    recording = tolkatouch.Recording.from_bytes(document.read_bytes())
    again = pickle.loads(pickle.dumps(recording))
    np.testing.assert_array_equal(again.pixels, recording.pixels)
    np.testing.assert_array_equal(again.host_times, recording.host_times)


@pytest.mark.parametrize("name", ["not-json.json", "empty.json", "version-2.json", "no-frames.json", "bad-hex.json",
                                  "lower-case-type.json", "version-0-no-report-data.json"])
def test_a_bad_document_raises_document_error_with_the_command_lines_message(tool, name):
    path = str(DATA / name)
    with pytest.raises(tolkatouch.DocumentError) as error:
        tolkatouch.Recording.load(path)
    assert str(error.value) == cli_error(tool, "replay", "--fast", path)
    assert isinstance(error.value, ValueError) and isinstance(error.value, tolkatouch.Error)


def test_a_missing_file_raises_os_error_with_the_command_lines_message(tool):
    path = str(DATA / "no-such-recording.json")
    with pytest.raises(OSError) as error:
        tolkatouch.Recording.load(path)
    assert str(error.value) == cli_error(tool, "replay", "--fast", path)


def test_from_bytes_names_the_document_in_its_error():
    with pytest.raises(tolkatouch.DocumentError, match="^notes: migrateSerializedContainer failed: invalid container\n  byte 1 \\(line 1, column 2\\): "):
        tolkatouch.Recording.from_bytes(b"not json", name="notes")


def test_saving_into_a_missing_folder_raises_os_error(tmp_path):
    recording = tolkatouch.Recording.load(str(EXAMPLE_DOCUMENTS[0]))
    with pytest.raises(OSError, match="No such file or directory"):
        recording.save(str(tmp_path / "no" / "such.json"))
