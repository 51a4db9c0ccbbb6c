"""tolkatouch.evaluate: the Dask evaluation equals `tolkatouch eval --json`, point by point, on a
two-worker local cluster; files it cannot read are reported by name and counted; a refused
setting raises before anything runs."""

import json

import pytest

import tolkatouch
from tolkatouch import evaluate as evaluation
from conftest import run_tool

SCRIPTS = {
    "taps": "wait 300ms\ntap play-pause 120ms\nwait 600ms\ntap volume-up 100ms\nwait 600ms\ntap volume-down 140ms\nwait 400ms\n",
    "holds": "wait 300ms\nhold volume-up 900ms\nwait 700ms\nhold play-pause 650ms\nwait 500ms\n",
    "mixed": "wait 200ms\nbrush volume-down 40ms\nwait 600ms\nslide volume-up volume-down 1200ms\nwait 600ms\ntap play-pause 90ms\nwait 500ms\n",
    "noise-only": "wait 20s\n",
}


@pytest.fixture(scope="module")
def corpus(tool, tmp_path_factory):
    folder = tmp_path_factory.mktemp("corpus")
    for name, script in SCRIPTS.items():
        path = folder / f"{name}.txt"
        path.write_text(script)
        result = run_tool(tool, "synth", "--seed", "3", "--labels", str(folder / f"{name}.labels.json"),
                          "-o", str(folder / f"{name}.json"), str(path))
        assert result.returncode == 0, result.stderr
        path.unlink()
    return folder


@pytest.fixture(scope="module")
def client():
    distributed = pytest.importorskip("distributed")
    cluster = distributed.LocalCluster(n_workers=2, threads_per_worker=1, processes=True, dashboard_address=None)
    client = distributed.Client(cluster)
    yield client
    client.close()
    cluster.close()


def cli_evaluation(tool, *arguments):
    result = run_tool(tool, "eval", "--json", "-j", "1", *arguments)
    return result.returncode, json.loads(result.stdout)


def test_a_two_worker_cluster_gives_what_eval_gives_at_every_point(tool, corpus, client):
    results = evaluation.evaluate([str(corpus)], {"HoldTimeoutMilliseconds": [400, 700]}, client=client)
    assert [point.settings for point in results] == [("HoldTimeoutMilliseconds=400",), ("HoldTimeoutMilliseconds=700",)]
    for point in results:
        status, expected = cli_evaluation(tool, "--set", point.settings[0], str(corpus))
        assert status == 0
        assert point.result == expected
    assert results[0].result["Counts"] != results[1].result["Counts"]


def test_the_cluster_gives_what_one_worker_gives(corpus, client):
    distributed = pytest.importorskip("distributed")
    with distributed.LocalCluster(n_workers=1, threads_per_worker=1, processes=False, dashboard_address=None) as one:
        with distributed.Client(one) as serial:
            alone = evaluation.evaluate([str(corpus)], None, client=serial)
    assert evaluation.evaluate([str(corpus)], None, client=client) == alone


def test_an_unreadable_document_is_named_and_counted_as_eval_does(tool, corpus, client, tmp_path):
    broken = tmp_path / "broken.json"
    broken.write_text("{\"Version\": 1, \"Frames\": [")
    (tmp_path / "broken.labels.json").write_text((corpus / "taps.labels.json").read_text())
    paths = [str(corpus / "taps.json"), str(broken)]
    [point] = evaluation.evaluate(paths, None, client=client)
    status, expected = cli_evaluation(tool, *paths)
    assert status == 1
    assert point.result == expected
    assert [failure["File"] for failure in point.result["Failures"]] == [str(broken)]


def _stand_in():
    return "not an evaluation"


def test_tasks_the_client_already_holds_never_stand_in_for_the_evaluations_own(tool, corpus, client):
    # Results of another evaluation on the same client, still held under the names one of its
    # tasks could have, as they are until the client releases them in the background.
    paths = [str(corpus / "taps.json"), str(corpus / "holds.json")]
    held = [client.submit(_stand_in, key=key, pure=False)
            for key in ["score-0-0", "score-0-1", f"load-0-{paths[0]}", f"load-1-{paths[1]}"]]
    client.gather(held)
    [point] = evaluation.evaluate(paths, None, client=client)
    status, expected = cli_evaluation(tool, *paths)
    assert status == 0
    assert point.result == expected
    del held


def test_a_refused_setting_raises_before_anything_runs(client):
    with pytest.raises(tolkatouch.SettingError) as error:
        evaluation.evaluate(["/nonexistent"], {"HoldTimeoutMilliseconds": [0]}, client=client)
    assert str(error.value).startswith('setting "HoldTimeoutMilliseconds" takes a whole number')
