"""The viewer's page in headless Chromium: it loads with no console errors, the surface shows a
frame's numbers as the Python arrays have them, a what-if gives `replay --set`'s events, a URL
reopens its view, an exported page opens from disk with no request out, and the live page follows a
simulated daemon and says so when it goes away."""

import json
import os
import pathlib
import shutil
import subprocess
import sys

import pytest

import tolkatouch

from conftest import EXAMPLES, json_events
from view_fixtures import daemon_program, labelled_recording, running_server, serving, start_daemon  # noqa: F401

SESSION = EXAMPLES / "everyday-session.json"
CHROMIUM = "/usr/bin/chromium"
DRIVER = "/usr/bin/chromedriver"
READY_SECONDS = 30

pytestmark = pytest.mark.skipif(not (os.access(CHROMIUM, os.X_OK) and os.access(DRIVER, os.X_OK)),
                                reason="needs chromium and chromium-driver")


@pytest.fixture(scope="module")
def browser():
    from selenium import webdriver
    from selenium.webdriver.chrome.options import Options
    from selenium.webdriver.chrome.service import Service

    options = Options()
    options.binary_location = CHROMIUM
    for argument in ("--headless=new", "--no-sandbox", "--disable-gpu", "--disable-dev-shm-usage", "--window-size=1400,1000",
                     "--no-first-run", "--disable-extensions", "--disable-background-networking"):
        options.add_argument(argument)
    options.set_capability("goog:loggingPrefs", {"browser": "ALL"})
    # The browser is not ours: under a sanitizer build the runtime preloaded for the interpreter
    # must not reach it.
    environment = {key: value for key, value in os.environ.items() if key not in ("LD_PRELOAD", "ASAN_OPTIONS")}
    driver = webdriver.Chrome(service=Service(DRIVER, env=environment), options=options)
    yield driver
    driver.quit()


@pytest.fixture(scope="module")
def server():
    with running_server(SESSION) as running:
        yield running


def open_page(browser, url):
    from selenium.webdriver.support.ui import WebDriverWait

    browser.get("about:blank")
    browser.get(url)
    WebDriverWait(browser, READY_SECONDS).until(lambda d: d.execute_script("return document.body.dataset.ready || ''") != "")
    assert browser.execute_script("return document.body.dataset.ready") == "1", browser.find_element("id", "status").text


def wait_for(browser, script):
    from selenium.webdriver.support.ui import WebDriverWait

    return WebDriverWait(browser, READY_SECONDS).until(lambda d: d.execute_script(script))


def console_errors(browser):
    return [entry for entry in browser.get_log("browser") if entry["level"] == "SEVERE"]


def pixel_numbers(browser):
    return browser.execute_script("""
        const out = {};
        for (const g of document.querySelectorAll('#surface g.pixel'))
          out[g.dataset.pixel] = [Number(g.dataset.reading), Number(g.dataset.value), Number(g.dataset.normalized), g.dataset.on === '1'];
        return out;""")


def test_the_page_loads_with_no_console_errors(browser, server):
    browser.get_log("browser")
    open_page(browser, server.url)
    assert console_errors(browser) == []
    assert browser.find_element("id", "title").text == "everyday-session.json"
    assert browser.execute_script("return document.querySelectorAll('#timeline .heatmaplayer, #timeline .hm').length") > 0


def test_the_surface_shows_frame_n_as_the_python_arrays_have_it(browser, server):
    frames = tolkatouch.replay(tolkatouch.Recording.load(str(SESSION))).frames
    n = int(frames.touching.nonzero()[0][40])
    open_page(browser, server.url + f"#frame={n}")
    assert browser.find_element("id", "frame-number").text == str(n)
    shown = pixel_numbers(browser)
    for pixel, letter in enumerate(tolkatouch.PIXEL_NAMES):
        assert shown[letter][0] == frames.readings[n, pixel]
        assert shown[letter][1] == frames.pixel_values[n, pixel]
        assert shown[letter][2] == pytest.approx(float(frames.normalized[n, pixel]), abs=1e-4)
        assert shown[letter][3] == bool(frames.on[n, pixel])
    details = browser.execute_script(
        "return Object.fromEntries([...document.querySelectorAll('#details tr')].map(r => [r.dataset.key, r.cells[1].textContent]))")
    assert details["touch_score"] == str(round(float(frames.touch_score[n]), 4)).rstrip("0").rstrip(".") or "0"
    assert details["active_pixel_count"] == str(frames.active_pixel_count[n])
    assert details["region"] == str(frames.region[n])


def test_arrow_keys_step_one_frame_and_shift_arrow_one_event(browser, server):
    from selenium.webdriver.common.action_chains import ActionChains
    from selenium.webdriver.common.keys import Keys

    replay = tolkatouch.replay(tolkatouch.Recording.load(str(SESSION)))
    open_page(browser, server.url + "#frame=100")
    ActionChains(browser).send_keys(Keys.ARROW_RIGHT).perform()
    wait_for(browser, "return document.getElementById('frame-number').textContent === '101'")
    ActionChains(browser).key_down(Keys.SHIFT).send_keys(Keys.ARROW_RIGHT).key_up(Keys.SHIFT).perform()
    first_event = int(replay.frames.seconds.searchsorted(replay.events["seconds"][0]))
    wait_for(browser, f"return document.getElementById('frame-number').textContent === '{first_event}'")


def test_a_what_if_change_gives_exactly_replay_set_events(browser, server, tool):
    open_page(browser, server.url)
    field = browser.find_element("css selector", '#settings input[name="Algs.HoldTimeoutMilliseconds"]')
    field.clear()
    field.send_keys("200")
    browser.find_element("id", "whatif-run").click()
    wait_for(browser, "return document.getElementById('whatif-result').dataset.events !== undefined")
    shown = json.loads(browser.execute_script("return document.getElementById('whatif-result').dataset.events"))
    expected = json_events(tool, SESSION, "Algs.HoldTimeoutMilliseconds=200")
    assert shown == [[e["frame"], e["event"], e["region"]] for e in expected]
    assert "set=Algs.HoldTimeoutMilliseconds%3D200" in browser.current_url


def test_a_bad_setting_is_shown_in_the_page(browser, server, tool):
    open_page(browser, server.url)
    field = browser.find_element("css selector", '#settings input[name="Algs.ActivationThreshold"]')
    field.clear()
    field.send_keys("0")
    browser.find_element("id", "whatif-run").click()
    message = wait_for(browser, "return document.getElementById('whatif-error').textContent")
    cli = subprocess.run([tool, "replay", "--fast", "--set", "Algs.ActivationThreshold=0", str(SESSION)], capture_output=True, text=True)
    assert message == cli.stderr.strip()[len("tolkatouch: "):]


def test_a_url_round_trips_its_view(browser, server):
    view = "#from=10&to=12.5&frame=1500&set=Algs.HoldTimeoutMilliseconds%3D700"
    open_page(browser, server.url + view)
    assert browser.execute_script("return location.hash") == view
    assert browser.execute_script("return document.getElementById('timeline').layout.xaxis.range") == [10, 12.5]
    assert browser.find_element("id", "frame-number").text == "1500"
    assert browser.find_element("css selector", '#settings input[name="Algs.HoldTimeoutMilliseconds"]').get_attribute("value") == "700"


def test_the_exported_page_opens_from_disk_with_no_request_out(browser, tmp_path, tool):
    out = tmp_path / "range.html"
    result = subprocess.run([tool, "view", str(SESSION), "--export", str(out), "--from", "10", "--to", "14"], capture_output=True, text=True)
    assert result.returncode == 0, result.stderr
    browser.get_log("browser")
    open_page(browser, out.as_uri())
    assert browser.execute_script("return performance.getEntriesByType('resource').length") == 0
    assert console_errors(browser) == []
    frames = tolkatouch.replay(tolkatouch.Recording.load(str(SESSION))).frames
    first = int(frames.seconds.searchsorted(10.0))
    open_page(browser, out.as_uri() + f"#frame={first + 5}")
    shown = pixel_numbers(browser)
    assert [shown[letter][0] for letter in tolkatouch.PIXEL_NAMES] == frames.readings[first + 5].tolist()
    details = browser.execute_script(
        "return Object.fromEntries([...document.querySelectorAll('#details tr')].map(r => [r.dataset.key, r.cells[1].textContent]))")
    row = {name: getattr(frames, name)[first + 5] for name in frames.__dataclass_fields__}
    lines = tolkatouch._tolkatouch.description_lines({k: v.tolist() if hasattr(v, "tolist") else v for k, v in row.items()})
    assert (details["description"], details["virtual_description"]) == lines


def test_the_live_page_shows_the_daemons_newest_frame_and_says_when_the_daemon_goes(browser, daemon_program, tmp_path):
    from tolkatouch._view_live import LiveData

    socket_path = tmp_path / "d.sock"
    daemon = start_daemon(daemon_program, socket_path, SESSION)
    server, thread = serving(LiveData.connect(str(socket_path)))
    try:
        browser.get_log("browser")
        open_page(browser, server.url)
        wait_for(browser, "return document.body.dataset.frame !== undefined")
        frame, shown = browser.execute_script("""
            const out = {};
            for (const g of document.querySelectorAll('#surface g.pixel')) out[g.dataset.pixel] = Number(g.dataset.reading);
            return [Number(document.body.dataset.frame), out];""")
        frames = tolkatouch.replay(tolkatouch.Recording.load(str(SESSION))).frames
        (index,) = (frames.frame == frame).nonzero()[0]
        assert [shown[letter] for letter in tolkatouch.PIXEL_NAMES] == frames.readings[index].tolist()
        assert browser.execute_script("return document.querySelectorAll('#timeline .heatmaplayer, #timeline .hm').length") > 0
        assert not browser.find_element("id", "whatif-panel").is_displayed()
        assert not browser.find_element("id", "live-message").is_displayed()
        daemon.terminate()
        daemon.wait(10)
        message = wait_for(browser, "return document.body.dataset.liveGone === '1' && document.getElementById('live-message').textContent")
        assert message == "tolkatouchd went away (tolkatouchd closed the connection): the page shows the last snapshots it sent."
        assert browser.find_element("id", "live-message").is_displayed()
        assert console_errors(browser) == []
    finally:
        if daemon.poll() is None:
            daemon.kill()
        server.shutdown()
        server.server_close()
        thread.join()


def test_the_readme_screenshot_is_taken_from_the_shipped_example(browser, tmp_path):
    """Writes the page's screenshot where TOLKATOUCH_VIEW_SCREENSHOT names (the README's picture,
    regenerated by python/regenerate-readme-view.sh); otherwise into a temporary folder."""
    target = os.environ.get("TOLKATOUCH_VIEW_SCREENSHOT", str(tmp_path / "view.png"))
    with running_server(SESSION) as session:
        open_page(browser, session.url + "#from=9.5&to=15.5&frame=1640&set=Algs.HoldTimeoutMilliseconds%3D900")
        wait_for(browser, "return document.getElementById('whatif-result').dataset.events !== undefined")
        assert browser.save_screenshot(target)
    assert pathlib.Path(target).read_bytes()[:8] == b"\x89PNG\r\n\x1a\n"
