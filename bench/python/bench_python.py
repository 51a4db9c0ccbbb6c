#!/usr/bin/python3
"""The Python package's speed beside the C++ it wraps, measured side by side in one run:

  * tolkatouch.Recording.load of a 100,000-frame document (arrays included) against the C++
    document reader (bench_read_document), target within 1.5 times;
  * Recording.load + tolkatouch.replay (events and every per-frame array) against
    `tolkatouch replay --fast --json` of the same document, target within 1.5 times.

    PYTHONPATH=build/release/python /usr/bin/python3 bench/python/bench_python.py build/release [frames]

Best of several runs each, wall clock; processor times beside them since the machine may be shared.
"""

import os
import pathlib
import resource
import subprocess
import sys
import tempfile
import time

import tolkatouch

ROOT = pathlib.Path(__file__).resolve().parents[2]


def child_cpu() -> float:
    usage = resource.getrusage(resource.RUSAGE_CHILDREN)
    return usage.ru_utime + usage.ru_stime


def best_of(runs: int, run) -> tuple:
    """(best wall seconds, processor seconds of that run)."""
    best = None
    for _ in range(runs):
        wall0, cpu0, child0 = time.perf_counter(), time.process_time(), child_cpu()
        run()
        wall = time.perf_counter() - wall0
        cpu = time.process_time() - cpu0 + child_cpu() - child0
        if best is None or wall < best[0]:
            best = (wall, cpu)
    return best


def main() -> int:
    build = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else "build/release")
    frames = int(sys.argv[2]) if len(sys.argv) > 2 else 100_000
    tool = str(build / "tools" / "tolkatouch")
    reader = str(build / "bench" / "python" / "bench_read_document")
    with tempfile.TemporaryDirectory() as work:
        document = os.path.join(work, "long.json")
        subprocess.run(["bash", "-c", f'source "{ROOT}/bench/long_session.sh"; synth_long_session "$@"', "_",
                        tool, str(frames), document], check=True)
        print(f"document: {len(tolkatouch.Recording.load(document))} images, {os.path.getsize(document)} bytes; "
              f"load average {os.getloadavg()[0]:.1f} on {os.cpu_count()} cores")

        def cpp_read():
            subprocess.run([reader, document, "1"], check=True, stdout=subprocess.DEVNULL)

        def cpp_replay():
            with open(os.devnull, "wb") as sink:
                subprocess.run([tool, "replay", "--fast", "--json", document], check=True, stdout=sink)

        def py_replay():
            result = tolkatouch.replay(tolkatouch.Recording.load(document))
            assert len(result.frames) == frames

        figures = [
            ("C++ document reader (bench_read_document)", best_of(5, cpp_read)),
            ("tolkatouch.Recording.load, arrays included", best_of(5, lambda: tolkatouch.Recording.load(document))),
            ("tolkatouch replay --fast --json", best_of(3, cpp_replay)),
            ("Recording.load + tolkatouch.replay, arrays included", best_of(3, py_replay)),
        ]
    for name, (wall, cpu) in figures:
        print(f"{name:55s} {wall * 1000:8.1f} ms wall {cpu * 1000:8.1f} ms processor")
    load_ratio = figures[1][1][0] / figures[0][1][0]
    replay_ratio = figures[3][1][0] / figures[2][1][0]
    load_cpu = figures[1][1][1] / figures[0][1][1]
    replay_cpu = figures[3][1][1] / figures[2][1][1]
    print(f"load / C++ reader: {load_ratio:.2f} wall, {load_cpu:.2f} processor (target 1.5)")
    print(f"Python replay / replay --fast --json: {replay_ratio:.2f} wall, {replay_cpu:.2f} processor (target 1.5)")
    return 0


if __name__ == "__main__":
    sys.exit(main())
