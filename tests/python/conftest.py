"""Shared fixtures of the Python package's tests: the example documents, the test data and the
built tolkatouch program (the TOLKATOUCH environment variable, set by ctest)."""

import json
import os
import pathlib
import subprocess

import pytest

ROOT = pathlib.Path(__file__).resolve().parents[2]
EXAMPLES = ROOT / "examples"
DATA = ROOT / "tests" / "tools" / "data"
EXAMPLE_DOCUMENTS = sorted(EXAMPLES.glob("*.json"))


@pytest.fixture(scope="session")
def tool() -> str:
    path = os.environ.get("TOLKATOUCH", str(ROOT / "build" / "release" / "tools" / "tolkatouch"))
    assert os.access(path, os.X_OK), f"no tolkatouch program at {path}"
    return path


def run_tool(tool: str, *arguments: str) -> subprocess.CompletedProcess:
    return subprocess.run([tool, *arguments], capture_output=True, text=True, check=False)


def json_events(tool: str, document: pathlib.Path, *settings: str) -> list:
    """The events of `tolkatouch replay --fast --json [--set ...] DOCUMENT`, one dict each."""
    arguments = ["replay", "--fast", "--json"]
    for setting in settings:
        arguments += ["--set", setting]
    result = run_tool(tool, *arguments, str(document))
    assert result.returncode == 0, result.stderr
    return [json.loads(line) for line in result.stdout.splitlines()]


def cli_error(tool: str, *arguments: str) -> str:
    """The command line's error without its "tolkatouch: " prefix: one line, or two where a document's
    reader adds its reason and position."""
    result = run_tool(tool, *arguments)
    assert result.returncode != 0
    line = result.stderr.strip()
    assert line.startswith("tolkatouch: "), line
    return line[len("tolkatouch: "):]
