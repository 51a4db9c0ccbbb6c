"""tolkatouch.plot and `tolkatouch plot`: a figure written in each format, with a sane size, and
bad input refused with one line."""

import os
import struct
import subprocess
import sys

import pytest

from conftest import DATA, EXAMPLES, run_tool

SESSION = str(EXAMPLES / "everyday-session.json")


def png_size(path):
    header = open(path, "rb").read(24)
    assert header[:8] == b"\x89PNG\r\n\x1a\n"
    return struct.unpack(">II", header[16:24])


def plot_module(*arguments):
    return subprocess.run([sys.executable, "-m", "tolkatouch.plot", *arguments], capture_output=True, text=True)


def test_the_module_draws_a_png_of_a_sane_size(tmp_path):
    out = tmp_path / "session.png"
    result = plot_module(SESSION, "-o", str(out), "--from", "10", "--to", "14", "--set", "HoldTimeoutMilliseconds=700")
    assert result.returncode == 0, result.stderr
    width, height = png_size(out)
    assert 1000 <= width <= 3000 and 600 <= height <= 2000
    assert os.path.getsize(out) > 20_000


@pytest.mark.parametrize("extension,magic", [("svg", b"<?xml"), ("pdf", b"%PDF")])
def test_the_module_draws_svg_and_pdf(tmp_path, extension, magic):
    out = tmp_path / f"session.{extension}"
    assert plot_module(SESSION, "-o", str(out)).returncode == 0
    assert out.read_bytes().startswith(magic) and os.path.getsize(out) > 10_000


def test_the_tool_runs_the_module(tool, tmp_path):
    out = tmp_path / "session.png"
    result = run_tool(tool, "plot", SESSION, "-o", str(out))
    assert result.returncode == 0, result.stderr
    assert png_size(out)[0] >= 1000


def test_an_unknown_image_format_is_a_usage_error(tool, tmp_path):
    result = run_tool(tool, "plot", SESSION, "-o", str(tmp_path / "session.gif"))
    assert result.returncode == 2
    assert 'the output must end in .png, .svg or .pdf, not "gif"' in result.stderr
    assert not (tmp_path / "session.gif").exists()


def test_a_bad_document_fails_with_the_readers_line(tool, tmp_path):
    path = str(DATA / "version-2.json")
    result = run_tool(tool, "plot", path, "-o", str(tmp_path / "x.png"))
    assert (result.returncode, result.stderr) == (
        1, f"tolkatouch: {path}: migrateSerializedContainer failed: invalid container version: 2\n"
        "  the versions this program reads are 0 and 1\n")


def test_a_refused_setting_is_a_usage_error(tool, tmp_path):
    result = run_tool(tool, "plot", SESSION, "-o", str(tmp_path / "x.png"), "--set", "HoldTimeoutMilliseconds=0")
    assert result.returncode == 2
    assert result.stderr.startswith('tolkatouch: setting "HoldTimeoutMilliseconds" takes a whole number')
