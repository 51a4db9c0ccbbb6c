"""tolkatouch.synth: the recording `tolkatouch synth` writes, and its errors."""

import pytest

import tolkatouch
from conftest import DATA, EXAMPLES, cli_error, run_tool


# everyday-session.json is a golden input, frozen as the earlier finger model made its brushes; its
# script is compared with what the command line synthesises today instead.
def test_synth_of_an_example_script_gives_its_checked_in_document():
    script = (EXAMPLES / "reset-during-hold.txt").read_text()
    assert tolkatouch.synth(script, seed=1).to_bytes() == (EXAMPLES / "reset-during-hold.json").read_bytes()


def test_synth_gives_what_the_command_line_synthesises(tool):
    script = EXAMPLES / "everyday-session.txt"
    expected = run_tool(tool, "synth", "--seed", "1", str(script))
    assert expected.returncode == 0, expected.stderr
    assert tolkatouch.synth(script.read_text(), seed=1).to_bytes() == expected.stdout.encode()


def test_another_seed_gives_other_readings():
    script = "tap play-pause 120ms\n"
    assert (tolkatouch.synth(script, 1).readings != tolkatouch.synth(script, 2).readings).any()


def test_a_bad_script_raises_script_error_with_the_command_lines_message(tool):
    path = DATA / "bad-gesture.txt"
    with pytest.raises(tolkatouch.ScriptError) as error:
        tolkatouch.synth(path.read_text())
    assert f"{path}: {error.value}" == cli_error(tool, "synth", str(path))
