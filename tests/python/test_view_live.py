"""tolkatouch view --live: the running daemon's frame snapshots through the viewer's data endpoint,
equal to the Python replay's arrays for the same frames, and what the page is told when the
daemon goes away."""

import time

import numpy as np
import pytest

import tolkatouch
from tolkatouch._view_live import LiveData, LiveError, default_socket_path
from tolkatouch.view import ViewServer

from conftest import EXAMPLES, run_tool
from view_fixtures import api, daemon_program, get, serving, start_daemon  # noqa: F401 - a fixture

SESSION = EXAMPLES / "everyday-session.json"
ARRAYS = ("readings", "pixel_values", "normalized", "on", "virtual_values", "virtual_normalized", "virtual_on")
NUMBERS = ("time", "touch_score", "svm_score", "strength_rate", "strength_per_duration", "duration_ratio",
           "active_pixel_count", "tap_score", "touching", "above_noise", "since_touch_start_ms", "touch_length_ms",
           "transition", "hold_suppressed", "hold_clock", "region")


def poll_until(server, condition, after=0, seconds=10.0):
    """Polls the live endpoint until condition(answer) holds; answers every reply."""
    answers = []
    deadline = time.monotonic() + seconds
    while time.monotonic() < deadline:
        status, answer = api(server, "live", f"after={after}")
        assert status == 200
        answers.append(answer)
        after = answer["sequence"]
        if condition(answer):
            break
        time.sleep(0.05)
    return answers


def test_live_snapshots_equal_the_replays_numbers_for_their_frames(daemon_program, tmp_path):
    socket_path = tmp_path / "d.sock"
    daemon = start_daemon(daemon_program, socket_path, SESSION)
    data = LiveData.connect(str(socket_path))
    server, thread = serving(data)
    try:
        latest = {}
        deadline = time.monotonic() + 10
        while len(latest) < 5 and time.monotonic() < deadline:
            status, answer = api(server, "live")
            assert status == 200 and answer["connected"]
            if answer["latest"]:
                latest[answer["latest"]["frame"]] = answer["latest"]
            time.sleep(0.05)
        status, info = api(server, "info")
        assert status == 200 and info["live"] is True
        for name in ("frame", "timeline", "whatif"):
            assert get(server, f"/{server.token}/api/{name}")[0] == 404
    finally:
        daemon.terminate()
        daemon.wait(10)
        server.shutdown()
        server.server_close()
        thread.join()
    assert len(latest) >= 5
    frames = tolkatouch.replay(tolkatouch.Recording.load(str(SESSION))).frames
    for frame, values in latest.items():
        (index,) = np.nonzero(frames.frame == frame)[0]
        for name in ARRAYS:
            assert values[name] == getattr(frames, name)[index].tolist(), (frame, name)
        for name in NUMBERS:
            assert values[name] == getattr(frames, name)[index].item(), (frame, name)
        # The details panel's description lines, as the recognizer's debug log writes them.
        row = {name: getattr(frames, name)[index] for name in frames.__dataclass_fields__}
        row = {k: (v.tolist() if isinstance(v, np.ndarray) else v.item()) for k, v in row.items()}
        assert (values["description"], values["virtual_description"]) == tolkatouch._tolkatouch.description_lines(row)


def test_the_live_series_scroll_in_order_and_the_page_is_told_when_the_daemon_goes(daemon_program, tmp_path):
    socket_path = tmp_path / "d.sock"
    daemon = start_daemon(daemon_program, socket_path, SESSION)
    data = LiveData.connect(str(socket_path))
    server, thread = serving(data)
    try:
        first = poll_until(server, lambda a: len(a["series"]["frame"]) >= 3)
        sequence = first[-1]["sequence"]
        series = first[-1]["series"]
        assert series["frame"] == sorted(series["frame"])
        assert all(len(row) == 15 for row in series["heat"])
        daemon.terminate()
        daemon.wait(10)
        gone = poll_until(server, lambda a: not a["connected"], after=sequence)
        assert gone[-1]["connected"] is False
        assert gone[-1]["message"] == "tolkatouchd closed the connection"
        # Only what came after the sequence number the page already has.
        assert all(n > sequence for a in gone for n in a["series"]["sequence"])
        status, page = get(server, f"/{server.token}/")
        assert status == 200 and b'<body class="live">' in page
    finally:
        if daemon.poll() is None:
            daemon.kill()
        server.shutdown()
        server.server_close()
        thread.join()


def test_no_daemon_on_the_socket_is_one_error_line_naming_it(tool, tmp_path):
    missing = tmp_path / "none.sock"
    with pytest.raises(LiveError, match=f"^{missing}: cannot reach tolkatouchd: No such file or directory$"):
        LiveData.connect(str(missing))
    result = run_tool(tool, "view", "--live", "--socket", str(missing), "--no-browser")
    assert result.returncode == 1
    assert result.stderr == f"tolkatouch: {missing}: cannot reach tolkatouchd: No such file or directory\n"
    assert result.stdout == ""


@pytest.mark.parametrize("arguments, message", [
    (["--live", str(SESSION)], "--live follows the running daemon: give no RECORDING"),
    (["--live", "--export", "x.html"], "--labels, --set, --export, --from and --to go with a RECORDING, not --live"),
    (["--live", "--set", "ActivationThreshold=100"], "--labels, --set, --export, --from and --to go with a RECORDING, not --live"),
    (["--socket", "/tmp/x.sock", str(SESSION)], "--socket requires --live"),
    ([], "DOCUMENT (or --live) is required"),
])
def test_live_with_a_recording_option_is_a_usage_error(tool, arguments, message):
    result = run_tool(tool, "view", *arguments, "--no-browser")
    assert result.returncode == 2, result.stderr
    assert message in result.stderr


def test_the_default_socket_is_the_one_tolkatouch_watch_uses(monkeypatch):
    monkeypatch.delenv("RUNTIME_DIRECTORY", raising=False)
    assert default_socket_path() == "/run/tolkatouch/tolkatouchd.sock"
    monkeypatch.setenv("RUNTIME_DIRECTORY", "/run/elsewhere:/run/other")
    assert default_socket_path() == "/run/elsewhere/tolkatouchd.sock"
