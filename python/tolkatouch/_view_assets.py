"""The viewer page's files: its own (beside this module, in view_assets/) and plotly.js from the
python3-plotly package's install. Nothing comes from the network."""

from __future__ import annotations

import functools
import os

HERE = os.path.join(os.path.dirname(os.path.abspath(__file__)), "view_assets")

#: Every file the page may ask for, with its content type. No other name is ever served.
ASSETS = {
    "index.html": "text/html; charset=utf-8",
    "viewer.js": "text/javascript; charset=utf-8",
    "viewer.css": "text/css; charset=utf-8",
    "plotly.js": "text/javascript; charset=utf-8",
}


@functools.lru_cache(maxsize=None)
def asset_bytes(name: str) -> bytes:
    if name not in ASSETS:
        raise KeyError(name)
    if name == "plotly.js":
        from plotly.offline import get_plotlyjs
        return get_plotlyjs().encode("utf-8")
    with open(os.path.join(HERE, name), "rb") as file:
        return file.read()
