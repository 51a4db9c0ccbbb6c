"""tolkatouch.synth: the recording `tolkatouch synth` writes, and its errors."""

import pytest

import tolkatouch
from conftest import DATA, EXAMPLES, cli_error


@pytest.mark.parametrize("example", ["everyday-session", "reset-during-hold"])
def test_synth_of_an_example_script_gives_its_checked_in_document(example):
    script = (EXAMPLES / f"{example}.txt").read_text()
    assert tolkatouch.synth(script, seed=1).to_bytes() == (EXAMPLES / f"{example}.json").read_bytes()


def test_another_seed_gives_other_readings():
    script = "tap play-pause 120ms\n"
    assert (tolkatouch.synth(script, 1).readings != tolkatouch.synth(script, 2).readings).any()


def test_a_bad_script_raises_script_error_with_the_command_lines_message(tool):
    path = DATA / "bad-gesture.txt"
    with pytest.raises(tolkatouch.ScriptError) as error:
        tolkatouch.synth(path.read_text())
    assert f"{path}: {error.value}" == cli_error(tool, "synth", str(path))
