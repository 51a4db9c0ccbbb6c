#!/usr/bin/python3
"""The viewer's speed targets, measured on long recordings made by repeating the shipped everyday
session (bench/make_long_document.py, line form):

- open: from starting `tolkatouch view --no-browser` on an hour-long recording (450,000 frames)
  to the page drawn in headless Chromium (the browser already running, as a desktop's is);
- zoom and pan: the server's answer to a timeline request of each range (time and bytes), and the
  page's whole round trip of a zoom (Plotly's relayout to the redrawn timeline);
- what if: the answer to a settings change on a 15-minute recording (112,500 frames).

usage: PYTHONPATH=BUILD/python bench_view.py BUILD [WORKDIR]
"""

import os
import pathlib
import statistics
import subprocess
import sys
import tempfile
import time
import urllib.request

ROOT = pathlib.Path(__file__).resolve().parents[2]
HOUR_FRAMES = 450_000
QUARTER_FRAMES = 112_500


def long_document(frames: int, directory: pathlib.Path) -> pathlib.Path:
    path = directory / f"session-{frames}.json"
    if not path.exists():
        subprocess.run([sys.executable, str(ROOT / "bench" / "make_long_document.py"), str(ROOT / "examples" / "everyday-session.json"),
                        str(frames), str(path), "--lines"], check=True)
    return path


def browser():
    from selenium import webdriver
    from selenium.webdriver.chrome.options import Options
    from selenium.webdriver.chrome.service import Service

    options = Options()
    options.binary_location = "/usr/bin/chromium"
    for argument in ("--headless=new", "--no-sandbox", "--disable-gpu", "--disable-dev-shm-usage", "--window-size=1400,1000"):
        options.add_argument(argument)
    return webdriver.Chrome(service=Service("/usr/bin/chromedriver"), options=options)


def wait_ready(driver, timeout=60.0):
    end = time.monotonic() + timeout
    while time.monotonic() < end:
        if driver.execute_script("return document.body && document.body.dataset.ready || ''"):
            return
        time.sleep(0.01)
    raise TimeoutError("the page did not get ready")


def fetch(url: str):
    start = time.perf_counter()
    with urllib.request.urlopen(url) as response:
        body = response.read()
    return time.perf_counter() - start, len(body)


def main():
    if len(sys.argv) not in (2, 3):
        sys.exit(__doc__)
    build = pathlib.Path(sys.argv[1]).resolve()
    tool = build / "tools" / "tolkatouch"
    work = pathlib.Path(sys.argv[2]) if len(sys.argv) == 3 else pathlib.Path(tempfile.mkdtemp(prefix="bench-view-"))
    hour = long_document(HOUR_FRAMES, work)
    quarter = long_document(QUARTER_FRAMES, work)
    print(f"load average before: {os.getloadavg()[0]:.2f}")

    driver = browser()
    driver.get("about:blank")
    try:
        # Open an hour-long recording, three times.
        opens, servers = [], []
        for _ in range(3):
            start = time.perf_counter()
            process = subprocess.Popen([str(tool), "view", "--no-browser", str(hour)], stdout=subprocess.PIPE, text=True)
            url = process.stdout.readline().strip()
            served = time.perf_counter()
            driver.get(url)
            wait_ready(driver)
            drawn = time.perf_counter()
            opens.append(drawn - start)
            servers.append(served - start)
            if _ < 2:
                process.terminate()
                process.wait()
        print(f"open {HOUR_FRAMES} frames to a drawn page: median {statistics.median(opens):.2f} s "
              f"(server ready after {statistics.median(servers):.2f} s), runs {[round(t, 2) for t in opens]}")

        # Zoom and pan: the server's answers.
        for start_s, end_s in ((0, 3600), (600, 1200), (1800, 1860), (1800, 1810), (1805, 1806)):
            times, size = [], 0
            for _ in range(5):
                elapsed, size = fetch(f"{url}api/timeline?from={start_s}&to={end_s}&columns=1500")
                times.append(elapsed)
            print(f"timeline {start_s}-{end_s} s: median {statistics.median(times) * 1000:.0f} ms, {size / 1000:.0f} KB")
        # Pans of one minute across the hour.
        times = []
        for minute in range(0, 60, 6):
            elapsed, size = fetch(f"{url}api/timeline?from={minute * 60}&to={minute * 60 + 60}&columns=1500")
            times.append(elapsed)
        print(f"pan by one-minute windows: median {statistics.median(times) * 1000:.0f} ms, max {max(times) * 1000:.0f} ms")

        # The page's whole round trip of a zoom (includes the page's 30 ms wait for more wheel turns).
        trips = []
        for start_s, end_s in ((600, 1200), (1800, 1860), (1805, 1806), (0, 3600)):
            trips.append(driver.execute_async_script("""
                const done = arguments[arguments.length - 1];
                const view = document.getElementById('timeline');
                const before = view.dataset.count, t0 = performance.now();
                Plotly.relayout(view, {'xaxis.range': [arguments[0], arguments[1]]});
                (function poll() { if (view.dataset.count !== before) done(performance.now() - t0); else setTimeout(poll, 2); })();
            """, start_s, end_s))
        print(f"zoom in the page (relayout to redrawn timeline, 30 ms debounce included): "
              f"{[round(t) for t in trips]} ms")
        process.terminate()
        process.wait()

        # What if on a quarter of an hour.
        process = subprocess.Popen([str(tool), "view", "--no-browser", str(quarter)], stdout=subprocess.PIPE, text=True)
        url = process.stdout.readline().strip()
        times = []
        for value in (300, 600, 700, 900):
            elapsed, size = fetch(f"{url}api/whatif?set=Algs.HoldTimeoutMilliseconds%3D{value}")
            times.append(elapsed)
        print(f"what if on {QUARTER_FRAMES} frames: median {statistics.median(times):.2f} s, runs {[round(t, 2) for t in times]}")
        process.terminate()
        process.wait()
    finally:
        driver.quit()
    print(f"load average after: {os.getloadavg()[0]:.2f}")


if __name__ == "__main__":
    main()
