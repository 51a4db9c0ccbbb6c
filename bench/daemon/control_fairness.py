"""Control socket fairness: with four clients flooding tolkatouchd's control socket with requests
(each keeps 256 requests in flight, without pause), how long another client waits for the answer to
one request. The same quiet client is measured first with the socket to itself, in the same run.
Target: p99 at most 5 ms with the four flooders.

usage: control_fairness.py TOLKATOUCHD TOLKATOUCH PLUGIN [SECONDS_PER_PHASE]
"""
import multiprocessing
import os
import signal
import socket
import statistics
import subprocess
import sys
import tempfile
import time

FLOODERS = 4
IN_FLIGHT = 256
REQUEST = b'{"get": "Version"}\n'


def connect(path):
    deadline = time.monotonic() + 10
    while True:
        try:
            client = socket.socket(socket.AF_UNIX, socket.SOCK_STREAM)
            client.connect(path)
            return client
        except OSError:
            if time.monotonic() > deadline:
                raise
            time.sleep(0.01)


def flood(path, stop, answered):
    client = connect(path)
    batch = REQUEST * IN_FLIGHT
    pending = b""
    while not stop.is_set():
        client.sendall(batch)
        lines = 0
        while lines < IN_FLIGHT:
            data = client.recv(1 << 16)
            if not data:
                return
            lines += data.count(b"\n")
        with answered.get_lock():
            answered.value += lines


def measure(path, seconds):
    client = connect(path)
    latencies = []
    end = time.monotonic() + seconds
    while time.monotonic() < end:
        start = time.perf_counter()
        client.sendall(REQUEST)
        reply = b""
        while not reply.endswith(b"\n"):
            reply += client.recv(4096)
        latencies.append((time.perf_counter() - start) * 1000)
        time.sleep(0.002)
    return latencies


def describe(name, latencies):
    ordered = sorted(latencies)
    p99 = ordered[int(len(ordered) * 0.99)]
    print(f"{name}: {len(ordered)} requests, median {statistics.median(ordered):.3f} ms, "
          f"p99 {p99:.3f} ms, worst {ordered[-1]:.3f} ms")
    return p99


def main():
    daemon, tolkatouch, plugin = sys.argv[1:4]
    seconds = float(sys.argv[4]) if len(sys.argv) > 4 else 10
    work = tempfile.mkdtemp()
    document = os.path.join(work, "long.json")
    script = os.path.join(work, "long.gestures")
    here = os.path.dirname(os.path.abspath(__file__))
    with open(os.path.join(here, "../../tests/daemon/data/everyday.gestures")) as f:
        passes = f.read() * int(2 * seconds / 8 + 4)
    with open(script, "w") as f:
        f.write(passes)
    subprocess.run([tolkatouch, "synth", script, "-o", document], check=True)
    path = os.path.join(work, "tolkatouchd.sock")
    process = subprocess.Popen([daemon, "--simulate", document, "--plugin", plugin, "--socket", path, "--no-keys"],
                               stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
    try:
        connect(path).close()
        alone = describe("quiet client alone", measure(path, seconds))
        stop = multiprocessing.Event()
        answered = multiprocessing.Value("Q", 0)
        flooders = [multiprocessing.Process(target=flood, args=(path, stop, answered)) for _ in range(FLOODERS)]
        for flooder in flooders:
            flooder.start()
        time.sleep(0.5)
        started, before = time.monotonic(), answered.value
        flooded = describe(f"quiet client beside {FLOODERS} flooders", measure(path, seconds))
        rate = (answered.value - before) / (time.monotonic() - started)
        stop.set()
        for flooder in flooders:
            flooder.join(10)
            if flooder.is_alive():
                flooder.terminate()
        print(f"flooders answered {rate:,.0f} requests/s in all; p99 beside them / alone: {flooded / alone:.1f}x; "
              f"target p99 <= 5 ms: {'met' if flooded <= 5 else 'NOT met'}")
        return 0 if flooded <= 5 else 1
    finally:
        process.send_signal(signal.SIGTERM)
        process.wait(10)
        subprocess.run(["rm", "-rf", work])


if __name__ == "__main__":
    sys.exit(main())
