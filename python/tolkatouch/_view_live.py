"""The live side of the viewer: the running daemon's frame snapshots, followed through its control
socket ({"live": true}), the last 30 seconds of them kept for the page.

The daemon sends at most 60 snapshots a second and, to a reader that falls behind, only the newest;
a reader thread here takes them as they come, so the page's polls never hold the daemon up.
"""

from __future__ import annotations

import json
import os
import socket
import threading
import time
from collections import deque
from typing import Optional

from . import HOLD_CLOCK_NAMES, REGION_NAMES, TRANSITION_NAMES
from . import _tolkatouch as _core
from ._errors import printable
from ._view_data import HEAT_ROWS, HOLD_TRANSITIONS, surface_layout

#: Seconds of snapshots kept and drawn.
WINDOW_SECONDS = 30.0
#: A line from the daemon longer than this ends the connection (a snapshot is about 1.5 KB).
MAX_LINE = 1 << 20
#: How long connecting and the daemon's first reply may take.
CONNECT_TIMEOUT = 5.0


def default_socket_path() -> str:
    """The control socket `tolkatouch watch` uses by default: tolkatouchd.sock in the service's
    runtime directory ($RUNTIME_DIRECTORY, its first entry), else in /run/tolkatouch."""
    runtime = os.environ.get("RUNTIME_DIRECTORY", "")
    directory = runtime.split(":")[0] if runtime else "/run/tolkatouch"
    return os.path.join(directory, "tolkatouchd.sock")


class LiveError(Exception):
    """The daemon cannot be followed: the message names the socket and the reason."""


def hand_code(values: dict) -> int:
    """As the timeline's hand band: 0 idle, 1 touching, 2 holding, 3 touching with the hold suppressed."""
    if values["transition"] in HOLD_TRANSITIONS:
        return 2
    if values["touching"]:
        return 3 if values["hold_suppressed"] else 1
    return 0


def _named(table, index) -> str:
    return table[index] if isinstance(index, int) and 0 <= index < len(table) else "?"


class LiveData:
    """The snapshots of one connection to the daemon: the newest with every number, and the last
    WINDOW_SECONDS of the timeline's series. Thread-safe: one reader thread adds, the server's
    request threads read."""

    settings: list = []

    def __init__(self, socket_path: str, connection: socket.socket):
        self.socket_path = socket_path
        self.name = f"live: {socket_path}"
        self._connection = connection
        self._lock = threading.Lock()
        self._snapshots: deque = deque()  # (sequence number, values), oldest first
        self._sequence = 0
        self._started = time.monotonic()
        self._gone: Optional[str] = None
        self._reader = threading.Thread(target=self._read, name="tolkatouch-live", daemon=True)

    @classmethod
    def connect(cls, socket_path: str) -> "LiveData":
        """Connects and subscribes; LiveError with one line when the daemon cannot be followed."""
        connection = socket.socket(socket.AF_UNIX, socket.SOCK_STREAM)
        connection.settimeout(CONNECT_TIMEOUT)
        try:
            connection.connect(socket_path)
            connection.sendall(b'{"live":true}\n')
            reply = cls._read_line(connection.makefile("rb"))
        except OSError as error:
            connection.close()
            raise LiveError(f"{printable(socket_path)}: cannot reach tolkatouchd: {error.strerror or error}") from None
        try:
            answer = json.loads(reply) if reply else None
        except ValueError:
            answer = None
        if not isinstance(answer, dict) or answer.get("ok") is not True:
            connection.close()
            reason = answer.get("error") if isinstance(answer, dict) else None
            raise LiveError(f"{printable(socket_path)}: " +
                            (printable(str(reason)) if reason else "tolkatouchd did not take the live request"))
        connection.settimeout(None)
        data = cls(socket_path, connection)
        data._reader.start()
        return data

    @staticmethod
    def _read_line(stream) -> bytes:
        line = stream.readline(MAX_LINE + 1)
        if len(line) > MAX_LINE:
            raise OSError("a line from tolkatouchd is too long")
        return line

    def _read(self) -> None:
        stream = self._connection.makefile("rb")
        reason = "tolkatouchd closed the connection"
        try:
            while True:
                line = self._read_line(stream)
                if not line:
                    break
                try:
                    message = json.loads(line)
                except ValueError:
                    continue
                if isinstance(message, dict) and isinstance(message.get("frame"), dict):
                    self.add(message["frame"], time.monotonic() - self._started)
        except OSError as error:
            reason = f"the connection to tolkatouchd broke: {error.strerror or error}"
        finally:
            with self._lock:
                self._gone = reason
            self._connection.close()

    def add(self, frame: dict, seconds: float) -> None:
        """One snapshot from the daemon, received `seconds` after connecting."""
        values = {key: value for key, value in frame.items() if key != "service"}
        values["service"] = frame.get("service")
        values["seconds"] = round(seconds, 6)
        try:
            values["description"], values["virtual_description"] = _core.description_lines(values)
        except Exception:  # noqa: BLE001 - a snapshot the bindings cannot read is shown without them
            values["description"] = values["virtual_description"] = ""
        values["transition_name"] = _named(TRANSITION_NAMES, values.get("transition"))
        values["hold_clock_name"] = _named(HOLD_CLOCK_NAMES, values.get("hold_clock"))
        values["region_name"] = _named(REGION_NAMES, values.get("region"))
        values["hand"] = hand_code(values)
        with self._lock:
            self._sequence += 1
            self._snapshots.append((self._sequence, values))
            while self._snapshots and self._snapshots[0][1]["seconds"] < seconds - WINDOW_SECONDS:
                self._snapshots.popleft()

    def close(self) -> None:
        try:
            self._connection.shutdown(socket.SHUT_RDWR)
        except OSError:
            pass

    # The server's questions --------------------------------------------------------------------
    def wait_ready(self) -> None:
        pass

    def info(self) -> dict:
        return {
            "live": True,
            "name": self.name,
            "window": WINDOW_SECONDS,
            "settings": [],
            "table": [],
            **surface_layout(),
            "labels": [],
        }

    def live(self, after: int = 0) -> dict:
        """The timeline's series of the snapshots after sequence number `after` (all kept ones when
        it is older), the newest snapshot with every number, and whether the daemon is still there."""
        with self._lock:
            kept = [(n, v) for n, v in self._snapshots if n > after]
            latest = self._snapshots[-1][1] if self._snapshots else None
            gone = self._gone
            sequence = self._sequence
        series = {
            "sequence": [n for n, _ in kept],
            "seconds": [v["seconds"] for _, v in kept],
            "frame": [v.get("frame") for _, v in kept],
            "heat": [[v["readings"][i] for i in HEAT_ROWS] for _, v in kept],
            "on": [[int(v["on"][i]) for i in HEAT_ROWS] for _, v in kept],
            "touch_score": [v["touch_score"] for _, v in kept],
            "svm_score": [v["svm_score"] for _, v in kept],
            "hand": [v["hand"] for _, v in kept],
            "region": [v["region"] for _, v in kept],
        }
        return {"connected": gone is None, "message": gone, "sequence": sequence,
                "now": round(time.monotonic() - self._started, 6), "window": WINDOW_SECONDS,
                "series": series, "latest": latest}
