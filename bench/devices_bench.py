#!/usr/bin/python3
"""devices_bench.py BUILD_FOLDER [ROUNDS]: listing and counting client devices through the server.

Runs under private_view. What a request takes of the processors - store, mapping, filter, answer and HTTP - is held against
the yardstick: building the same list once as a Json::Value and writing it with JsonCpp's own writer. The two are measured in
turn, round after round; the medians are compared.
"""
import json
import os
import statistics
import subprocess
import sys
import tempfile

from served import CONNECTIONS, SECONDS, cpu_seconds, load, post, refuse_elsewhere, run, start_server, stop

BUILD = os.path.abspath(sys.argv[1]) if len(sys.argv) > 1 else ""
ROUNDS = int(sys.argv[2]) if len(sys.argv) > 2 else 5
PORT = 8084
SIZES = (50, 250, 2000)
LIST, COUNT = (f"/webapi/VORN.Core.Network.Router.ConnectionList/1/{method}" for method in ("get", "getcount"))
BODIES = {LIST: '{"scannertype": "all"}', COUNT: "{}"}

LIMITS = {  # what the figures are held against
    "times the yardstick, 50 devices": 1.0,
    "us a listing of 250 devices": 600.0,
    "times the cost a device of 50, at 2,000 devices": 1.0,
}


def device_home(*arguments):
    return subprocess.run([f"{BUILD}/bench/device_home", *map(str, arguments)], check=True, capture_output=True,
                          text=True).stdout


def check_answers(count):
    """The whole list, and how many of it are there."""
    answer = post(PORT, LIST, BODIES[LIST].encode())
    stations = json.loads(answer)["data"]["stations"]
    counted = json.loads(post(PORT, COUNT, b"{}"))["data"]["devicecount"]
    if len(stations) != count or counted != sum(record["status"] for record in stations) or counted != count * 4 // 5:
        raise SystemExit(f"unexpected answers: {len(stations)} listed, {counted} counted")
    return answer


def measure_size(server, count, results):
    """One round: both methods at every number of connections, and the yardstick."""
    device_home("fill", count)
    with tempfile.NamedTemporaryFile() as answer:
        answer.write(check_answers(count))
        answer.flush()
        results.setdefault((count, "yardstick"), []).append(float(device_home("plain", answer.name).split()[1]))
    for path in (COUNT, LIST):
        for connections in CONNECTIONS:
            device_home("seen", count)
            before = cpu_seconds(server.pid)
            rate, p99, requests = load(PORT, "POST", path, connections, BODIES[path])
            used = cpu_seconds(server.pid) - before
            requests += connections  # each has one under way at the end, which the server does all the same
            results.setdefault((count, path, connections), []).append((rate, p99, used * 1e6 / requests))


def report(results):
    medians = {key: statistics.median(rows) if key[1] == "yardstick" else
               tuple(statistics.median(column) for column in zip(*rows)) for key, rows in results.items()}
    print(f"client devices over HTTP, medians of {ROUNDS} rounds of {SECONDS} s taken in turn, {os.cpu_count()} cores\n")
    print(f"{'':10}{'':10}" + "".join(f"{c:>8} conn. req/s, p99, CPU" for c in CONNECTIONS) + "     yardstick")
    for count in SIZES:
        for path in (COUNT, LIST):
            row = "".join("{:>13.0f} {:>6.0f} us {:>5.0f} us".format(*medians[count, path, c]) for c in CONNECTIONS)
            print(f"{path.rsplit('/', 1)[1]:10}{count:>6}    {row}" +
                  (f"{medians[count, 'yardstick']:>11.0f} us" if path == LIST else ""))
    cost = {count: statistics.median(medians[count, LIST, c][2] for c in CONNECTIONS) for count in SIZES}
    figures = {"times the yardstick, 50 devices": cost[50] / medians[50, "yardstick"],
               "us a listing of 250 devices": cost[250],
               "times the cost a device of 50, at 2,000 devices": (cost[2000] / 2000) / (cost[50] / 50)}
    print()
    for name, limit in LIMITS.items():
        print(f"{name:48}{figures[name]:>10.2f}   at most {limit:g}   {'kept' if figures[name] <= limit else 'MISSED'}")
    return all(figures[name] <= limit for name, limit in LIMITS.items())


def main():
    for bridge, address in (("lbr0", "192.168.1.1/20"), ("gbr0", "172.16.5.1/24")):
        run("ip", "link", "add", bridge, "type", "bridge")
        run("ip", "link", "set", bridge, "up")
        run("ip", "addr", "add", address, "dev", bridge)
    device_home("fill", 50)
    server = start_server(BUILD, PORT, f"{BUILD}/router/router.so")
    results = {}
    for path in (COUNT, LIST):
        load(PORT, "POST", path, 8, BODIES[path])  # warm
    for _ in range(ROUNDS):
        for count in SIZES:
            measure_size(server, count, results)
    stop(server)
    sys.exit(0 if report(results) else 1)


if __name__ == "__main__":
    refuse_elsewhere("devices_bench.py BUILD_FOLDER [ROUNDS]")
    main()
