"""tolkatouch.tune and `tolkatouch tune`: a seeded search gives one result, the defaults come first,
the held-out split is disjoint, stable and stratified, eval reproduces the held-out numbers, a study
resumes and is shared, and bad input is refused with one line naming it, the study left as it was."""

import json
import os
import subprocess
import threading

import optuna
import pytest

import tolkatouch
from tolkatouch import tune as tuning
from tolkatouch._tune_space import parse_space
from tolkatouch._tune_split import split_corpus, stratum

from conftest import EXAMPLES, run_tool

SCRIPTS = ("taps", "holds", "slides")
SEEDS = (1, 2, 3)
SPACE = ["HoldTimeoutMilliseconds=300:800", "ActivationThreshold=50:800:log"]


@pytest.fixture(scope="session")
def corpus(tool, tmp_path_factory):
    folder = tmp_path_factory.mktemp("corpus")
    for script in SCRIPTS:
        for seed in SEEDS:
            name = folder / f"{script}-s{seed}"
            result = run_tool(tool, "synth", str(EXAMPLES / "corpus" / "scripts" / f"{script}.txt"), "--seed", str(seed),
                              "-o", f"{name}.json", "--labels", f"{name}.labels.json")
            assert result.returncode == 0, result.stderr
    return str(folder)


def small_tune(corpus, **options):
    arguments = dict(trials=6, space=SPACE, jobs=1, seed=3)
    arguments.update(options)
    return tuning.tune([corpus], **arguments)


def study_trials(storage, name=tuning.DEFAULT_STUDY):
    return optuna.load_study(study_name=name, storage=tuning.open_storage(storage)).get_trials(deepcopy=False)


def test_one_seed_gives_one_result_with_one_job(corpus):
    first, second = small_tune(corpus), small_tune(corpus)
    assert first.to_json() == second.to_json()
    assert [t.params for t in first.study.trials] == [t.params for t in second.study.trials]
    assert first.trials == 6


def test_the_defaults_are_the_first_trial(corpus):
    result = small_tune(corpus, trials=2)
    assert result.study.trials[0].params == {"Algs.HoldTimeoutMilliseconds": 500, "Algs.ActivationThreshold": 200.0}
    assert result.defaults.settings == {"Algs.ActivationThreshold": 200.0, "Algs.HoldTimeoutMilliseconds": 500}


def test_the_held_out_split_is_disjoint_stable_and_stratified(corpus):
    documents = sorted(os.path.join(corpus, f) for f in os.listdir(corpus) if not f.endswith(".labels.json"))
    strata = [stratum(d) for d in documents]
    assert sorted(set(strata)) == ["hold", "slide", "tap"]
    split = split_corpus(documents, strata, 0.3)
    assert not set(split.tuning) & set(split.heldout)
    assert sorted(split.tuning + split.heldout) == documents
    assert sorted(stratum(d) for d in split.heldout) == ["hold", "slide", "tap"]
    again = split_corpus(documents[::-1], strata[::-1], 0.3)
    assert set(again.heldout) == set(split.heldout) and again.tuning == split.tuning
    moved = split_corpus(["/elsewhere/" + os.path.basename(d) for d in documents], strata, 0.3)
    assert [os.path.basename(d) for d in moved.heldout] == [os.path.basename(d) for d in split.heldout]


def test_eval_with_the_best_settings_reproduces_the_held_out_result(corpus, tool, tmp_path):
    settings_file = tmp_path / "best.settings"
    result = subprocess.run([tool, "tune", corpus, "--trials", "5", "-j", "1", "--json", "--write-settings",
                             str(settings_file), *sum((["--space", s] for s in SPACE), [])],
                            capture_output=True, text=True)
    assert result.returncode == 0, result.stderr
    document = json.loads(result.stdout)
    assert set(document) == {"defaults", "best", "heldout_recordings", "trials", "pruned", "failed"}
    lines = settings_file.read_text().splitlines()
    assert lines == tolkatouch.setting_assignments(document["best"]["settings"])
    arguments = ["eval", "--json"] + sum((["--set", line] for line in lines), []) + document["heldout_recordings"]
    evaluated = run_tool(tool, *arguments)
    assert evaluated.returncode == 0, evaluated.stderr
    assert json.loads(evaluated.stdout) == document["best"]["heldout"]
    from_file = run_tool(tool, "eval", "--json", "--settings", str(settings_file), *document["heldout_recordings"])
    assert json.loads(from_file.stdout) == document["best"]["heldout"]


def test_a_study_resumed_from_storage_continues(corpus, tmp_path):
    storage = f"sqlite:///{tmp_path}/tune.db"
    small_tune(corpus, trials=3, storage=storage)
    resumed = small_tune(corpus, trials=6, storage=storage)
    assert resumed.trials == 6
    fresh = small_tune(corpus, trials=3)
    assert [t.params for t in study_trials(storage)[:3]] == [t.params for t in fresh.study.trials]


def test_two_processes_sharing_one_journal_run_the_trials_asked_for(corpus, tool, tmp_path):
    storage = f"journal:{tmp_path}/tune.log"
    command = [tool, "tune", corpus, "--trials", "8", "-j", "1", "--json", "--storage", storage,
               *sum((["--space", s] for s in SPACE), [])]
    processes = [subprocess.Popen(command + ["--seed", str(n)], stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True)
                 for n in (1, 2)]
    outputs = [process.communicate(timeout=300) for process in processes]
    assert [process.returncode for process in processes] == [0, 0], outputs
    counted = [t for t in study_trials(storage) if not t.user_attrs.get("surplus")]
    assert [t.number for t in counted] == list(range(8))


def a_search():
    return tuning.Search(tuple(parse_space(SPACE)), "f1", None, 100_000, False, True, 4)


def test_a_study_found_before_its_maker_described_it_is_joined_once_the_description_lands(tmp_path):
    storage = tuning.open_storage(f"journal:{tmp_path}/tune.log")
    made = optuna.create_study(storage=storage, study_name="race")
    description = tuning._study_description(a_search(), 0.25)
    threading.Timer(0.3, made.set_user_attr, ("tolkatouch", description)).start()
    joined = tuning.open_study(storage, "race", a_search(), 0.25, None, None)
    assert joined.user_attrs["tolkatouch"] == json.loads(json.dumps(description))


def test_a_study_never_described_is_refused_after_the_wait(tmp_path, monkeypatch):
    monkeypatch.setattr(tuning, "_DESCRIPTION_WAIT_SECONDS", 0.2)
    storage = tuning.open_storage(f"journal:{tmp_path}/tune.log")
    optuna.create_study(storage=storage, study_name="orphan")
    with pytest.raises(tuning.TuneError, match=r"^--study orphan: the study in the storage searched another space, "
                                               r"objective or split \(null\); name another study$"):
        tuning.open_study(storage, "orphan", a_search(), 0.25, None, None)


def test_pruning_stops_hopeless_trials_on_growing_shares(corpus):
    result = small_tune(corpus, trials=16, sampler="random", space=["ActivationThreshold=1:3000:log"])
    assert result.pruned > 0
    pruned = [t for t in result.study.trials if t.state == optuna.trial.TrialState.PRUNED]
    assert all(max(t.intermediate_values) < 3 for t in pruned)


def test_a_failing_evaluation_is_a_failed_trial_and_the_search_goes_on(corpus, monkeypatch):
    real_score = tuning.score

    def score(recordings, point, *rest, **options):
        if any(p.startswith("Algs.HoldTimeoutMilliseconds=") and int(p.split("=")[1]) > 600 for p in point):
            raise tolkatouch.Error("the recording cannot be played")
        return real_score(recordings, point, *rest, **options)

    monkeypatch.setattr(tuning, "score", score)
    result = small_tune(corpus, trials=8, sampler="random", space=["HoldTimeoutMilliseconds=300:800"])
    failed = [t for t in result.study.trials if t.state == optuna.trial.TrialState.FAIL]
    assert result.trials == 8 and result.failed == len(failed) > 0
    assert {t.user_attrs["failure"] for t in failed} == {"the recording cannot be played"}


class SimulatedClock:
    """Optuna's clock for its timeout, moved on by the test instead of by the wall."""

    def __init__(self):
        import datetime

        self.start = datetime.datetime(2026, 1, 1)
        self.seconds = 0.0
        clock = self

        class Datetime(datetime.datetime):
            @classmethod
            def now(cls, tz=None):
                return clock.start + datetime.timedelta(seconds=clock.seconds)

        self.module = type("datetime", (), {"datetime": Datetime, "timedelta": datetime.timedelta})


def test_the_search_stops_when_the_timeout_passes_and_counts_the_trials_it_ran(corpus, monkeypatch):
    clock = SimulatedClock()
    monkeypatch.setattr(optuna.study._optimize, "datetime", clock.module)
    real_objective = tuning.objective_function
    started = []

    def objective_function(search, recordings):
        run = real_objective(search, recordings)

        def timed(trial):
            started.append(trial.number)
            try:
                return run(trial)
            finally:
                clock.seconds += 10.0  # every trial takes ten seconds of the simulated clock

        return timed

    monkeypatch.setattr(tuning, "objective_function", objective_function)
    # Trials begin at 0, 10 and 20 s; at 30 s the 25 s have passed and no fourth begins.
    result = small_tune(corpus, trials=100, timeout=25.0)
    assert started == [0, 1, 2]
    assert result.trials == 3 == len(result.study.trials)
    finished = [t for t in result.study.trials if t.state == optuna.trial.TrialState.COMPLETE]
    assert result.pruned + result.failed + len(finished) == 3
    report = json.loads(json.dumps(result.to_json()))
    assert (report["trials"], report["pruned"], report["failed"]) == (3, result.pruned, result.failed)


def test_a_pareto_search_prints_its_front(corpus):
    result = small_tune(corpus, trials=4, pareto=True, sampler="nsga2")
    assert result.front and all(set(p) == {"trial", "settings", "macro-f1", "false-activations-per-hour"} for p in result.front)
    assert "pareto_front" in result.to_json()


def importances_available():
    from tolkatouch.plot_tune import importances_available as available

    return available()


def test_the_search_is_drawn_with_optunas_plots(corpus, tmp_path):
    from tolkatouch.plot_tune import draw_search

    result = small_tune(corpus, trials=4)
    written = draw_search(result.study, str(tmp_path))
    expected = ["history.png", "importances.png"] if importances_available() else ["history.png"]
    assert [os.path.basename(p) for p in written] == expected
    assert all(open(p, "rb").read(4) == b"\x89PNG" for p in written)


def test_trials_run_on_dask_workers(corpus):
    from distributed import Client, LocalCluster

    with LocalCluster(n_workers=1, threads_per_worker=2, processes=False, dashboard_address=None) as cluster, \
            Client(cluster) as client:
        result = small_tune(corpus, trials=5, client=client)
        assert result.trials == 5 and result.study.trials[0].params["Algs.HoldTimeoutMilliseconds"] == 500


def tune_error(tool, *arguments):
    result = run_tool(tool, "tune", *arguments)
    assert result.returncode != 0 and result.stderr.count("\n") == 1, result.stderr
    return result.returncode, result.stderr.strip()


@pytest.mark.parametrize("space,message", [
    ("HoldTimeout=1:2", '--space HoldTimeout=1:2: unknown setting "HoldTimeout" (did you mean "HoldTimeoutMilliseconds"?)'),
    ("HoldTimeoutMilliseconds=10:70000", "--space HoldTimeoutMilliseconds=10:70000: 10 to 70000 lies outside "
     "Algs.HoldTimeoutMilliseconds's accepted values, a whole number of milliseconds from 1 to 60000"),
    ("ResetEventStats", "--space ResetEventStats: Algs.ResetEventStats is an action, not a setting the search can tune"),
])
def test_a_bad_space_is_refused_and_the_study_left_as_it_was(corpus, tool, tmp_path, space, message):
    storage = f"sqlite:///{tmp_path}/tune.db"
    small_tune(corpus, trials=2, storage=storage)
    before = [(t.number, t.state, t.params) for t in study_trials(storage)]
    code, line = tune_error(tool, corpus, "--storage", storage, "--space", space)
    assert (code, line) == (2, "tolkatouch: " + message)
    assert [(t.number, t.state, t.params) for t in study_trials(storage)] == before


def test_an_empty_corpus_is_refused(tool, tmp_path):
    assert tune_error(tool, str(tmp_path)) == (1, f"tolkatouch: {tmp_path}: the corpus holds no recordings")


def test_a_corpus_without_labels_is_refused(tool, tmp_path):
    document = tmp_path / "session.json"
    document.write_bytes((EXAMPLES / "everyday-session.json").read_bytes())
    assert tune_error(tool, str(tmp_path)) == (
        1, f"tolkatouch: {document}: no labels beside it (a corpus to tune on needs DOC.labels.json)")


def test_a_storage_that_cannot_be_opened_is_refused(corpus, tool, tmp_path):
    code, line = tune_error(tool, corpus, "--storage", f"sqlite:///{tmp_path}/no/such/folder/tune.db")
    assert code == 1 and line.startswith(f"tolkatouch: --storage sqlite:///{tmp_path}/no/such/folder/tune.db: cannot be opened")
    code, line = tune_error(tool, corpus, "--storage", f"journal:{tmp_path}/no/such/tune.log")
    assert code == 1 and line == f"tolkatouch: --storage journal:{tmp_path}/no/such/tune.log: cannot be opened: no folder {tmp_path}/no/such"


def test_an_unknown_objective_is_refused(corpus, tool):
    code, line = tune_error(tool, corpus, "--objective", "speed")
    assert code == 2 and line.startswith("tolkatouch: --objective speed: unknown metric (f1, macro-f1, ")


def test_the_tool_shows_the_modules_help(tool):
    result = run_tool(tool, "tune", "--help")
    assert result.returncode == 0 and result.stdout.startswith("usage: tolkatouch tune ")
    assert "--write-settings FILE" in result.stdout
