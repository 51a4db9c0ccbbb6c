"""A browser viewer of one recording, served on 127.0.0.1 with an unguessable token in every path.

    python3 -m tolkatouch.view RECORDING [--labels FILE] [--set KEY=VALUE]... [--port N] [--no-browser]
    python3 -m tolkatouch.view RECORDING --export FILE.html [--from S] [--to S]
    python3 -m tolkatouch.view --live [--socket PATH] [--port N] [--no-browser]

The page's first line on standard output is its URL. The page draws a timeline (pixel readings
by zone, on flags, touch score, hand state, active region, events and labels) from level-of-detail
views the server computes, the surface at one frame with every number of its snapshot, and what a
settings change would have done. With --live it follows the running daemon instead: the surface at
its newest frame and the last 30 s of timeline. `tolkatouch view` runs this module.
"""

from __future__ import annotations

import argparse
import errno
import hmac
import http.server
import json
import math
import os
import secrets
import signal
import sys
import threading
import urllib.parse
import webbrowser
from typing import Optional, Sequence

from . import Error
from ._view_assets import ASSETS, asset_bytes
from ._view_data import MAX_COLUMNS, ViewData
from ._view_live import LiveData, LiveError, default_socket_path
from ._errors import error_lines, printable

EXIT_FAILURE = 1
EXIT_USAGE = 2
#: A query string longer than this is refused (the page never sends one near it).
MAX_QUERY = 16_384


class ViewServer(http.server.ThreadingHTTPServer):
    """The HTTP server of one ViewData; answers only paths under /TOKEN/."""

    daemon_threads = True

    def __init__(self, data: ViewData, port: int = 0, token: Optional[str] = None):
        self.data = data
        self.token = token or secrets.token_urlsafe(24)
        self.lock = threading.Lock()
        super().__init__(("127.0.0.1", port), ViewRequestHandler)

    @property
    def url(self) -> str:
        return f"http://127.0.0.1:{self.server_address[1]}/{self.token}/"

    def handle_error(self, request, client_address) -> None:
        # A request that broke its connection is the client's business; the server goes on.
        pass


class ViewRequestHandler(http.server.BaseHTTPRequestHandler):
    server: ViewServer
    protocol_version = "HTTP/1.1"
    timeout = 60  # seconds a connection may stay silent; each has its own thread
    server_version = "tolkatouch-view"
    sys_version = ""

    def log_message(self, format: str, *args) -> None:  # noqa: A002 - the base class's name
        pass

    # Answers -----------------------------------------------------------------------------------
    def _send(self, status: int, body: bytes, content_type: str, cache: bool = False) -> None:
        self.send_response(status)
        self.send_header("Content-Type", content_type)
        self.send_header("Content-Length", str(len(body)))
        self.send_header("Cache-Control", "private, max-age=3600" if cache else "no-store")
        self.send_header("X-Content-Type-Options", "nosniff")
        self.send_header("Referrer-Policy", "no-referrer")
        self.end_headers()
        if self.command != "HEAD":
            self.wfile.write(body)

    def _json(self, status: int, value) -> None:
        self._send(status, json.dumps(value, separators=(",", ":"), allow_nan=False).encode(), "application/json")

    def _refuse(self, status: int, message: str) -> None:
        self._send(status, (message + "\n").encode(), "text/plain; charset=utf-8")

    # Requests ----------------------------------------------------------------------------------
    def do_GET(self) -> None:  # noqa: N802 - the base class's name
        try:
            self._answer()
        except (BrokenPipeError, ConnectionResetError):
            pass
        except Exception as error:  # noqa: BLE001 - no request may stop the server
            try:
                self._json(500, {"error": printable(f"{type(error).__name__}: {error}")})
            except OSError:
                pass

    do_HEAD = do_GET

    def _not_allowed(self) -> None:
        self.close_connection = True
        self._refuse(405, "only GET is answered")

    do_POST = do_PUT = do_DELETE = do_PATCH = do_OPTIONS = _not_allowed

    def _answer(self) -> None:
        raw_path, _, query = self.path.partition("?")
        segments = raw_path.split("/")
        if len(segments) < 2 or segments[0] != "" or not hmac.compare_digest(segments[1].encode(), self.server.token.encode()):
            self._refuse(403, "forbidden: the URL's token is missing or wrong")
            return
        rest = "/".join(segments[2:])
        # Only the page's own names are answered; anything encoded, dotted or absolute is not one.
        if "%" in rest or "\\" in rest or rest.startswith("/") or ".." in rest.split("/"):
            self._refuse(404, "not found")
            return
        if len(query) > MAX_QUERY:
            self._refuse(414, "query too long")
            return
        if rest in ("", "index.html"):
            page = asset_bytes("index.html")
            if isinstance(self.server.data, LiveData):
                page = page.replace(b"<body>", b'<body class="live">', 1)
            self._send(200, page, ASSETS["index.html"])
        elif rest.startswith("assets/") and rest[len("assets/"):] in ASSETS:
            name = rest[len("assets/"):]
            self._send(200, asset_bytes(name), ASSETS[name], cache=name == "plotly.js")
        elif rest.startswith("api/"):
            self._api(rest[len("api/"):], urllib.parse.parse_qs(query, keep_blank_values=True, max_num_fields=200))
        else:
            self._refuse(404, "not found")

    def _api(self, name: str, query: dict) -> None:
        data = self.server.data

        def number(key: str, default=None, kind=float):
            values = query.get(key)
            if not values:
                if default is None:
                    raise ValueError(f"{key} is missing")
                return default
            value = kind(values[0])
            if not math.isfinite(value):
                raise ValueError(f"{key} must be a finite number, not {values[0]}")
            return value

        # "set=" alone asks for the defaults; no "set" at all, for the opening settings.
        settings = [item for item in query["set"] if item] if "set" in query else data.settings
        data.wait_ready()
        live = isinstance(data, LiveData)
        if live and name not in ("info", "live") or not live and name == "live":
            self._refuse(404, "not found")
            return
        try:
            if name == "info":
                answer = data.info()
            elif name == "live":
                answer = data.live(number("after", 0, int))
            elif name == "timeline":
                start = number("from", float("-inf"))
                end = number("to", float("inf"))
                columns = number("columns", MAX_COLUMNS, int)
                with self.server.lock:
                    answer = data.timeline(settings, start, end, columns)
            elif name == "frame":
                with self.server.lock:
                    if "t" in query:
                        index = data.frame_at(number("t"))
                    elif "step" in query:
                        index = data.event_frame(settings, number("n", kind=int), 1 if query["step"][0] == "next" else -1)
                    else:
                        index = number("n", kind=int)
                    answer = data.frame(settings, index)
            elif name == "whatif":
                with self.server.lock:
                    answer = data.what_if(settings)
            else:
                self._refuse(404, "not found")
                return
        except (Error, ValueError, IndexError, OverflowError) as error:
            self._json(400, {"error": error_lines(error)})
            return
        self._json(200, answer)


def serve(data, port: int = 0, open_browser: bool = True, out=sys.stdout) -> int:
    """Serves the data (a ViewData or a LiveData) until interrupted; a ViewData's prepare() runs
    here once the port is bound."""
    try:
        server = ViewServer(data, port)
    except OSError as error:
        if error.errno == errno.EADDRINUSE:
            print(f"tolkatouch: port {port} on 127.0.0.1 is in use", file=sys.stderr)
        else:
            print(f"tolkatouch: port {port} on 127.0.0.1: {error_lines(error.strerror or error)}", file=sys.stderr)
        return EXIT_FAILURE
    print(server.url, file=out, flush=True)
    # The opening replay runs while the browser loads the page's scripts.
    if isinstance(data, ViewData):
        threading.Thread(target=data.prepare, daemon=True).start()
    signal.signal(signal.SIGTERM, lambda *_: threading.Thread(target=server.shutdown, daemon=True).start())
    if open_browser:
        webbrowser.open(server.url)
    try:
        server.serve_forever(poll_interval=0.2)
    except KeyboardInterrupt:
        pass
    finally:
        server.server_close()
    return 0


def arguments_parser(prog: Optional[str] = None) -> argparse.ArgumentParser:
    parser = argparse.ArgumentParser(
        prog=prog, description="See a recording in the browser: timeline, surface, what if; or, with --live, the running "
                               "service's newest frame and last 30 s.",
        epilog="example: tolkatouch view --live --socket /run/tolkatouch/tolkatouchd.sock")
    parser.add_argument("recording", metavar="RECORDING", nargs="?", help="recording document (version 0 or 1)")
    parser.add_argument("--labels", metavar="FILE", help="labels document (default: RECORDING's .labels.json beside it)")
    parser.add_argument("--set", dest="settings", action="append", default=[], metavar="KEY=VALUE",
                        help="a setting applied before the first frame, as replay --set takes it (repeatable)")
    parser.add_argument("--port", type=int, default=0, metavar="N", help="port on 127.0.0.1 (default: a free one)")
    parser.add_argument("--no-browser", action="store_true", help="print the URL only; open no browser")
    parser.add_argument("--export", metavar="FILE.html", help="write one self-contained page of a range and exit")
    parser.add_argument("--from", dest="start", type=float, metavar="S", help="with --export: first second")
    parser.add_argument("--to", dest="end", type=float, metavar="S", help="with --export: last second")
    parser.add_argument("--live", action="store_true",
                        help="follow the running tolkatouchd instead of a recording: the surface at its newest frame "
                             "and the last 30 s of timeline, at most 60 frames a second")
    parser.add_argument("--socket", metavar="PATH",
                        help=f"with --live: tolkatouchd's control socket (default: {default_socket_path()})")
    return parser


def main(argv: Optional[Sequence[str]] = None, prog: Optional[str] = None) -> int:
    parser = arguments_parser(prog)
    arguments = parser.parse_args(argv)
    if not 0 <= arguments.port <= 65535:
        parser.error(f"--port must be from 0 to 65535, not {arguments.port}")
    if arguments.live:
        if arguments.recording is not None:
            parser.error("--live follows the running daemon: give no RECORDING")
        if arguments.labels or arguments.settings or arguments.export or arguments.start is not None or arguments.end is not None:
            parser.error("--labels, --set, --export, --from and --to go with a RECORDING, not --live")
        try:
            data = LiveData.connect(arguments.socket or default_socket_path())
        except LiveError as error:
            print(f"tolkatouch: {error}", file=sys.stderr)
            return EXIT_FAILURE
        try:
            return serve(data, arguments.port, not arguments.no_browser)
        finally:
            data.close()
    if arguments.socket is not None:
        parser.error("--socket goes with --live")
    if arguments.recording is None:
        parser.error("give a RECORDING, or --live")
    if (arguments.start is not None or arguments.end is not None) and not arguments.export:
        parser.error("--from and --to go with --export")
    if arguments.start is not None and arguments.end is not None and arguments.end <= arguments.start:
        parser.error("--to must come after --from")
    try:
        data = ViewData.open(arguments.recording, arguments.labels, arguments.settings, replay_now=bool(arguments.export))
        if arguments.export:
            from ._view_export import export_page
            export_page(data, arguments.export, arguments.start, arguments.end)
            return 0
    except Error as error:
        print(f"tolkatouch: {error_lines(error)}", file=sys.stderr)
        return EXIT_USAGE if error.__class__.__name__ == "SettingError" else EXIT_FAILURE
    except OSError as error:
        text = f"{error.filename}: {error.strerror}" if error.filename and error.strerror else str(error)
        print(f"tolkatouch: {printable(text)}", file=sys.stderr)
        return EXIT_FAILURE
    except ValueError as error:
        print(f"tolkatouch: {error_lines(error)}", file=sys.stderr)
        return EXIT_FAILURE
    return serve(data, arguments.port, not arguments.no_browser)


if __name__ == "__main__":
    sys.exit(main(prog=os.environ.get("TOLKATOUCH_VIEW_PROG")))
