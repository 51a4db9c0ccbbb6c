"""tolkatouch.view's server: the token, the paths it answers, the level-of-detail timeline, the
frame's numbers, what-if replays, and bad input that leaves it serving."""

import json
import socket
import subprocess
import sys
import urllib.parse

import numpy as np
import pytest

import tolkatouch
from tolkatouch._view_data import MAX_COLUMNS

from conftest import EXAMPLES, json_events, run_tool
from view_fixtures import api, get, labelled_recording, running_server

SESSION = EXAMPLES / "everyday-session.json"


@pytest.fixture(scope="module")
def server():
    with running_server(SESSION) as running:
        yield running


@pytest.fixture(scope="module")
def session_replay():
    return tolkatouch.replay(tolkatouch.Recording.load(str(SESSION)))


def test_the_server_listens_on_127_0_0_1_only(server):
    assert server.server_address[0] == "127.0.0.1"


@pytest.mark.parametrize("path", ["/", "/index.html", "/api/info", "/assets/viewer.js", "/wrong/api/info", "/{token}x/api/info",
                                  "/{short}/api/info", "/api/{token}/info"])
def test_a_request_without_the_token_is_forbidden(server, path):
    status, _ = get(server, path.format(token=server.token, short=server.token[:-1]))
    assert status == 403


@pytest.mark.parametrize("rest", ["../{token}/api/info", "assets/../api/info", "assets/../../view.py", "assets/%2e%2e/view.py",
                                  "assets%2Fviewer.js", "assets/..%2F..%2Fview.py", "/etc/passwd", "assets//etc/passwd",
                                  "assets/_view_data.py", "assets/", "assets/viewer.js/", "api/../api/info", "api/nothing",
                                  "everyday-session.json", "assets\\..\\view.py"])
def test_path_tricks_are_not_found(server, rest):
    status, _ = get(server, f"/{server.token}/" + rest.format(token=server.token))
    assert status == 404


def test_a_symlink_out_beside_the_recording_is_not_found(tmp_path):
    recording = labelled_recording(tmp_path)
    (tmp_path / "outside").symlink_to("/etc")
    with running_server(recording) as beside:
        for rest in ("outside/passwd", "assets/outside/passwd", "everyday.labels.json", "api/outside"):
            assert get(beside, f"/{beside.token}/{rest}")[0] == 404


def test_the_page_and_its_scripts_are_served(server):
    status, page = get(server, f"/{server.token}/")
    assert status == 200 and b'src="assets/viewer.js"' in page
    status, plotly = get(server, f"/{server.token}/assets/plotly.js")
    assert status == 200 and plotly.startswith(b"/**\n* plotly.js")


def test_info_lists_every_tunable_setting_with_its_default_and_range(server):
    status, info = api(server, "info")
    assert status == 200
    table = {row["key"]: row for row in info["table"]}
    assert len(table) == 27
    hold = table["Algs.HoldTimeoutMilliseconds"]
    assert (hold["default"], hold["minimum"], hold["maximum"]) == ("500", 1, 60000)
    assert hold["accepted"] == "a whole number of milliseconds from 1 to 60000"
    assert "Algs.ResetEventStats" not in table


def test_the_whole_recording_comes_as_min_and_max_per_column(server, session_replay):
    status, timeline = api(server, "timeline")
    frames = session_replay.frames
    assert status == 200 and timeline["bucketed"] and len(timeline["x"]) == MAX_COLUMNS
    assert timeline["count"] == len(frames)
    edges = np.linspace(0, len(frames), MAX_COLUMNS + 1).astype(int)
    column = 700
    span = slice(edges[column], edges[column + 1])
    assert timeline["score_max"][column] == pytest.approx(float(frames.touch_score[span].max()), abs=1e-3)
    assert timeline["score_min"][column] == pytest.approx(float(frames.touch_score[span].min()), abs=1e-3)
    rows = timeline["heat_rows"]
    assert rows == list("ABCDEFKLMNOGHIJ")
    assert timeline["heat"][rows.index("K")][column] == int(frames.readings[span, tolkatouch.PIXEL_NAMES.index("K")].max())


def test_a_short_range_comes_frame_by_frame(server, session_replay):
    seconds = session_replay.frames.seconds
    status, timeline = api(server, "timeline", "from=10&to=11")
    expected = np.flatnonzero((seconds >= 10) & (seconds <= 11))
    assert status == 200 and not timeline["bucketed"]
    assert timeline["first"] == expected[0] and timeline["count"] == len(expected)
    assert timeline["score_max"] == pytest.approx(session_replay.frames.touch_score[expected].tolist(), abs=1e-3)


def test_a_range_with_many_events_sends_their_count_per_column():
    from tolkatouch._view_data import MAX_EVENTS, ViewData
    recording = tolkatouch.synth("tap play-pause 100ms\nwait 200ms\n" * 250, seed=1)
    data = ViewData(recording, "taps")
    everything = data.timeline([], 0, 1e9)
    assert len(data.baseline.events) > MAX_EVENTS
    assert everything["events"] == [] and sum(everything["events_per_column"]) == len(data.baseline.events)
    assert len(everything["events_per_column"]) == len(everything["x"])
    a_few = data.timeline([], 10, 12)
    assert "events_per_column" not in a_few and 0 < len(a_few["events"]) < MAX_EVENTS


def test_a_what_if_timeline_carries_the_opening_events_beside_its_own(server, session_replay):
    status, timeline = api(server, "timeline", "from=10&to=12&set=Algs.HoldTimeoutMilliseconds%3D900")
    seconds = session_replay.events["seconds"]
    assert status == 200
    assert [e["seconds"] for e in timeline["opening_events"]] == pytest.approx(seconds[(seconds >= 10) & (seconds <= 12)].tolist())


def test_step_finds_the_next_and_previous_event(server, session_replay):
    frames = session_replay.frames
    event_frames = np.searchsorted(frames.seconds, session_replay.events["seconds"])
    status, after = api(server, "frame", "n=0&step=next")
    assert status == 200 and after["index"] == event_frames[0]
    status, before = api(server, "frame", f"n={event_frames[2]}&step=previous")
    assert before["index"] == event_frames[1]


def test_a_frame_carries_every_number_of_its_snapshot(server, session_replay):
    status, frame = api(server, "frame", "n=1234")
    values = frame["values"]
    frames = session_replay.frames
    assert status == 200 and frame["index"] == 1234
    assert values["readings"] == frames.readings[1234].tolist()
    assert values["on"] == frames.on[1234].tolist()
    assert values["virtual_values"] == frames.virtual_values[1234].tolist()
    assert set(frames.__dataclass_fields__) <= set(values)


def test_a_frame_carries_its_description_lines_as_the_debug_log_writes_them(server, tool):
    status, frame = api(server, "frame", "n=1234")
    log = run_tool(tool, "replay", "--fast", "--describe", str(SESSION)).stderr.splitlines()
    number = frame["values"]["frame"]
    touch = log.index(next(line for line in log if f"Frame {number} @" in line and "Touch State Description" in line))
    virtual = log.index(next(line for line in log if f"Frame {number} @" in line and "Virtual State Description" in line))
    assert status == 200
    assert frame["values"]["description"] == log[touch + 1]
    assert frame["values"]["virtual_description"] == log[virtual + 1]


def test_a_time_picks_the_nearest_frame(server, session_replay):
    seconds = session_replay.frames.seconds
    status, frame = api(server, "frame", f"t={seconds[500] + 0.001}")
    assert status == 200 and frame["index"] == 500


def test_what_if_gives_replay_set_events(server, tool):
    status, answer = api(server, "whatif", "set=Algs.HoldTimeoutMilliseconds%3D200")
    expected = json_events(tool, SESSION, "Algs.HoldTimeoutMilliseconds=200")
    assert status == 200
    assert [(e["frame"], e["kind"], e["region"], e["phase"]) for e in answer["events"]] == \
        [(e["frame"], e["event"], e["region"], e["phase"]) for e in expected]
    assert answer["changed"] + answer["added"] + answer["lost"] > 0


def test_what_if_counts_changed_added_and_lost_events():
    from tolkatouch._view_data import compare_events
    before = [{"frame": 1, "kind": "tap", "region": 1}, {"frame": 5, "kind": "tap", "region": 2},
              {"frame": 9, "kind": "hold-start", "region": 3}]
    after = [{"frame": 1, "kind": "tap", "region": 1}, {"frame": 5, "kind": "tap", "region": 3},
             {"frame": 12, "kind": "tap", "region": 3}]
    counts = compare_events(before, after)
    assert (counts["changed"], counts["added"], counts["lost"]) == (1, 1, 1)


def test_an_empty_set_asks_for_the_defaults_and_none_for_the_opening_settings(tool):
    with running_server(SESSION, settings=["HoldTimeoutMilliseconds=200"]) as opened:
        _, opening = api(opened, "whatif")
        _, defaults = api(opened, "whatif", "set=")
    assert [(e["frame"], e["kind"]) for e in opening["events"]] == \
        [(e["frame"], e["event"]) for e in json_events(tool, SESSION, "HoldTimeoutMilliseconds=200")]
    assert [(e["frame"], e["kind"]) for e in defaults["events"]] == [(e["frame"], e["event"]) for e in json_events(tool, SESSION)]


def test_a_bad_setting_is_shown_and_the_server_goes_on(server, tool):
    status, answer = api(server, "whatif", "set=Algs.HoldTimeoutMilliseconds%3D0")
    cli = run_tool(tool, "replay", "--fast", "--set", "Algs.HoldTimeoutMilliseconds=0", str(SESSION))
    assert status == 400 and cli.returncode != 0
    assert answer["error"] == cli.stderr.strip()[len("tolkatouch: "):]
    assert api(server, "info")[0] == 200


def test_with_labels_what_if_gives_eval_metrics_before_and_after(tmp_path):
    with running_server(labelled_recording(tmp_path)) as labelled:
        status, answer = api(labelled, "whatif", "set=Algs.HoldTimeoutMilliseconds%3D1000")
    assert status == 200
    assert answer["evaluation_before"]["Settings"] == {}
    assert answer["evaluation_after"]["Settings"] == {"Algs.HoldTimeoutMilliseconds": 1000}
    # The 900 ms hold on volume-down becomes a tap: one false positive, one false negative.
    assert (answer["summary_before"]["overall TP"], answer["summary_before"]["overall F1"]) == (7, 1.0)
    assert (answer["summary_after"]["overall TP"], answer["summary_after"]["overall FP"],
            answer["summary_after"]["overall FN"]) == (6, 1, 1)


def test_with_labels_the_timeline_marks_where_eval_finds_mismatches(tmp_path):
    with running_server(labelled_recording(tmp_path)) as labelled:
        status, opening = api(labelled, "timeline")
        _, changed = api(labelled, "timeline", "set=Algs.HoldTimeoutMilliseconds%3D1000")
    labels = tolkatouch.Recording.load(str(labelled_recording(tmp_path))).labels
    missed_hold = next(l for l in labels if l.kind == "hold" and l.zone == "volume-down")
    assert status == 200 and opening["mismatches"] == []
    # The 900 ms hold on volume-down becomes a tap: its label is missed and the tap is false.
    assert [m["kind"] for m in changed["mismatches"]] == ["missed", "false"]
    assert changed["mismatches"][0]["start"] == pytest.approx(missed_hold.start_us / 1e6)
    assert changed["mismatches"][0]["end"] == pytest.approx(missed_hold.end_us / 1e6)


@pytest.mark.parametrize("query", ["n=abc", "n=-1", "n=99999999", "t=nan", "n=1e400"])
def test_a_bad_frame_request_is_refused_with_a_reason(server, query):
    status, answer = api(server, "frame", query)
    assert status == 400 and answer["error"]


def test_malformed_and_huge_requests_leave_the_server_serving(server):
    port = server.server_address[1]
    for payload in (b"\x00\xff garbage\r\n\r\n", b"GET /" + b"a" * 70_000 + b" HTTP/1.1\r\n\r\n",
                    b"POST /" + server.token.encode() + b"/api/info HTTP/1.1\r\nContent-Length: 5\r\n\r\nhello",
                    b"GET /x HTTP/1.1\r\n" + b"X: y\r\n" * 200 + b"\r\n", b"GET"):
        with socket.create_connection(("127.0.0.1", port), timeout=5) as connection:
            connection.sendall(payload)
            connection.shutdown(socket.SHUT_WR)
            connection.recv(1024)
    status, _ = get(server, f"/{server.token}/api/timeline?set=" + "x" * 20_000)
    assert status == 414
    assert api(server, "info")[0] == 200


def view_command(tool, *arguments):
    return subprocess.Popen([tool, "view", "--no-browser", *arguments], stdout=subprocess.PIPE, stderr=subprocess.PIPE,
                            text=True)


def test_the_command_prints_the_url_with_its_token_first(tool):
    process = view_command(tool, str(SESSION))
    try:
        url = process.stdout.readline().strip()
        parts = urllib.parse.urlsplit(url)
        assert parts.scheme == "http" and parts.hostname == "127.0.0.1" and len(parts.path.strip("/")) >= 32
        with socket.create_connection(("127.0.0.1", parts.port), timeout=5) as connection:
            connection.sendall(f"GET {parts.path}api/info HTTP/1.0\r\n\r\n".encode())
            assert connection.recv(64).startswith(b"HTTP/1.1 200")
    finally:
        process.terminate()
        assert process.wait(timeout=10) == 0


def test_a_port_in_use_is_one_line(tool):
    with socket.socket() as taken:
        taken.bind(("127.0.0.1", 0))
        taken.listen()
        port = taken.getsockname()[1]
        result = run_tool(tool, "view", "--no-browser", "--port", str(port), str(SESSION))
    assert result.returncode == 1
    assert result.stderr == f"tolkatouch: port {port} on 127.0.0.1 is in use\n"


def test_an_unreadable_recording_is_one_line(tool, tmp_path):
    missing = tmp_path / "missing.json"
    result = run_tool(tool, "view", "--no-browser", str(missing))
    assert result.returncode == 1 and result.stdout == ""
    assert result.stderr.startswith(f"tolkatouch: {missing}:") and result.stderr.count("\n") == 1


def test_a_missing_labels_file_and_an_unwritable_export_are_one_line(tool, tmp_path):
    result = run_tool(tool, "view", "--no-browser", "--labels", str(tmp_path / "none.labels.json"), str(SESSION))
    assert (result.returncode, result.stderr) == (1, f"tolkatouch: {tmp_path / 'none.labels.json'}: No such file or directory\n")
    out = tmp_path / "no" / "page.html"
    result = run_tool(tool, "view", str(SESSION), "--export", str(out), "--from", "10", "--to", "11")
    assert (result.returncode, result.stderr) == (1, f"tolkatouch: {out}: No such file or directory\n")


def test_a_control_character_in_a_document_name_is_printed_escaped(tool, tmp_path):
    result = run_tool(tool, "view", "--no-browser", str(tmp_path / "a\x1bb.json"))
    assert result.returncode == 1 and "\x1b" not in result.stderr and "a\\x1bb.json" in result.stderr


def test_a_bad_opening_setting_is_a_usage_error(tool):
    result = run_tool(tool, "view", "--no-browser", "--set", "Nope=1", str(SESSION))
    assert result.returncode == 2 and result.stderr.startswith("tolkatouch: ") and "Nope" in result.stderr


def test_an_export_past_its_size_says_so(tool, tmp_path):
    long_script = "tap play-pause 120ms\nwait 200s\n"
    recording = tolkatouch.synth(long_script, seed=1)
    path = tmp_path / "long.json"
    recording.save(str(path))
    result = run_tool(tool, "view", str(path), "--export", str(tmp_path / "out.html"))
    assert result.returncode == 1
    assert "an exported page carries at most 20000 (choose a shorter range with --from and --to)" in result.stderr
    assert not (tmp_path / "out.html").exists()


def test_an_exported_page_carries_the_description_lines_the_served_page_shows(server, tool, tmp_path):
    from tolkatouch._view_data import ViewData
    from tolkatouch._view_export import export_data

    exported = export_data(ViewData.open(str(SESSION)), 10.0, 14.0)
    columns = exported["columns"]
    touching = [offset for offset, on in enumerate(columns["touching"]) if on]
    assert touching, "the range holds a touch"
    for offset in (0, touching[0], touching[-1], len(columns["frame"]) - 1):
        status, answer = api(server, "frame", f"n={exported['first'] + offset}")
        assert status == 200
        assert columns["description"][offset] == answer["values"]["description"]
        assert columns["virtual_description"][offset] == answer["values"]["virtual_description"]
    out = tmp_path / "range.html"
    result = run_tool(tool, "view", str(SESSION), "--export", str(out), "--from", "10", "--to", "14")
    assert result.returncode == 0, result.stderr
    assert json.dumps(columns["description"][touching[0]])[1:-1] in out.read_text()
