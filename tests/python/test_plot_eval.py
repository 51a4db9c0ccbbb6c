"""tolkatouch.plot_eval and `tolkatouch plot-eval`: the confusion matrix, a metric against a
setting and the DET-style curve drawn from sweep --json, each a PNG of a sane size; bad results
refused with one line."""

import struct
import subprocess
import sys

import pytest

from conftest import run_tool

SCRIPTS = {
    "taps": "wait 300ms\ntap play-pause 120ms\nwait 600ms\ntap volume-up 100ms\nwait 400ms\n",
    "holds": "wait 300ms\nhold volume-up 800ms\nwait 600ms\nhold play-pause 550ms\nwait 500ms\n",
    "noise-only": "wait 20s\n",
}


@pytest.fixture(scope="module")
def sweep(tool, tmp_path_factory):
    folder = tmp_path_factory.mktemp("sweep")
    for name, script in SCRIPTS.items():
        (folder / f"{name}.txt").write_text(script)
        result = run_tool(tool, "synth", "--labels", str(folder / f"{name}.labels.json"), "-o", str(folder / f"{name}.json"),
                          str(folder / f"{name}.txt"))
        assert result.returncode == 0, result.stderr
        (folder / f"{name}.txt").unlink()
    result = run_tool(tool, "sweep", "--json", "--grid", "HoldTimeoutMilliseconds=300:900:200",
                      "--grid", "ActivationThreshold=150,250", str(folder))
    assert result.returncode == 0, result.stderr
    path = folder.parent / "sweep-results.json"
    path.write_text(result.stdout)
    return path


def png_size(path):
    header = open(path, "rb").read(24)
    assert header[:8] == b"\x89PNG\r\n\x1a\n"
    return struct.unpack(">II", header[16:24])


def plot_eval(*arguments):
    return subprocess.run([sys.executable, "-m", "tolkatouch.plot_eval", *arguments], capture_output=True, text=True)


@pytest.mark.parametrize("kind", ["confusion", "metric", "det"])
def test_each_kind_draws_a_png_of_a_sane_size(sweep, tmp_path, kind):
    out = tmp_path / f"{kind}.png"
    result = plot_eval(str(sweep), "-o", str(out), "--kind", kind, "--setting", "HoldTimeoutMilliseconds")
    assert result.returncode == 0, result.stderr
    width, height = png_size(out)
    assert 600 <= width <= 1200 and 500 <= height <= 1000
    assert out.stat().st_size > 15_000


def test_the_tool_runs_the_module(tool, sweep, tmp_path):
    out = tmp_path / "metric.svg"
    result = run_tool(tool, "plot-eval", str(sweep), "-o", str(out), "--kind", "metric", "--metric", "Recall")
    assert (result.returncode, result.stderr) == (0, "")
    assert out.read_bytes().startswith(b"<?xml")


def test_a_point_past_the_results_is_one_line(tool, sweep, tmp_path):
    result = run_tool(tool, "plot-eval", str(sweep), "-o", str(tmp_path / "x.png"), "--point", "8")
    assert (result.returncode, result.stderr) == (1, f"tolkatouch: {sweep}: --point 8: the results hold 8 points\n")


def test_results_that_are_no_evaluation_are_one_line(tool, tmp_path):
    path = tmp_path / "other.json"
    path.write_text('{"Frames": []}')
    result = run_tool(tool, "plot-eval", str(path), "-o", str(tmp_path / "x.png"))
    assert (result.returncode, result.stderr) == (1, f"tolkatouch: {path}: not an evaluation: no Counts and no Points\n")
    assert not (tmp_path / "x.png").exists()


def test_an_unknown_kind_is_a_usage_error(tool, sweep, tmp_path):
    result = run_tool(tool, "plot-eval", str(sweep), "-o", str(tmp_path / "x.png"), "--kind", "pie")
    assert result.returncode == 2
    assert "--kind: pie not in {confusion,metric,det}" in result.stderr
