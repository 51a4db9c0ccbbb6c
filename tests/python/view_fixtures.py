"""A viewer server on a free port for the viewer's tests, the labelled recording it shows, and a
simulated tolkatouchd for the live viewer."""

import contextlib
import http.client
import json
import os
import pathlib
import subprocess
import threading
import time

import pytest

import tolkatouch
from tolkatouch._view_data import ViewData
from tolkatouch.view import ViewServer

from conftest import EXAMPLES, ROOT

SCRIPT = (EXAMPLES / "corpus" / "scripts" / "everyday.txt").read_text()


def labelled_recording(directory: pathlib.Path) -> pathlib.Path:
    """everyday.txt synthesised with seed 1, its labels beside it."""
    path = directory / "everyday.json"
    if not path.exists():
        recording = tolkatouch.synth(SCRIPT, seed=1)
        recording.save(str(path))
        recording.save_labels(str(directory / "everyday.labels.json"))
    return path


@contextlib.contextmanager
def running_server(path, settings=()):
    server = ViewServer(ViewData.open(str(path), settings=settings))
    thread = threading.Thread(target=server.serve_forever, kwargs={"poll_interval": 0.05}, daemon=True)
    thread.start()
    try:
        yield server
    finally:
        server.shutdown()
        server.server_close()
        thread.join()


def get(server, path: str):
    """(status, body bytes) of a GET of the path exactly as written, no normalisation."""
    connection = http.client.HTTPConnection("127.0.0.1", server.server_address[1], timeout=10)
    try:
        connection.putrequest("GET", path, skip_accept_encoding=True)
        connection.endheaders()
        response = connection.getresponse()
        return response.status, response.read()
    finally:
        connection.close()


def api(server, name: str, query: str = ""):
    status, body = get(server, f"/{server.token}/api/{name}" + (f"?{query}" if query else ""))
    return status, json.loads(body)


@pytest.fixture(scope="module")
def daemon_program() -> str:
    path = os.environ.get("TOLKATOUCHD", str(ROOT / "build" / "release" / "daemon" / "tolkatouchd"))
    assert os.access(path, os.X_OK), f"no tolkatouchd program at {path}"
    return path


def start_daemon(program: str, socket_path: pathlib.Path, document: pathlib.Path) -> subprocess.Popen:
    """tolkatouchd playing the document as its surface, once its control socket is there."""
    daemon = subprocess.Popen([program, "--simulate", str(document), "--no-keys", "--socket", str(socket_path)],
                              stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
    deadline = time.monotonic() + 10
    while not socket_path.exists() and time.monotonic() < deadline:
        time.sleep(0.01)
    return daemon


def serving(data):
    """A viewer server of the data on a thread of its own: (server, thread)."""
    server = ViewServer(data)
    thread = threading.Thread(target=server.serve_forever, kwargs={"poll_interval": 0.05}, daemon=True)
    thread.start()
    return server, thread
