#!/usr/bin/python3
"""http_bench.py BUILD_FOLDER [ROUNDS]: the server with the router's module against nginx and against a constant answer,
with a token in clear, and with a session (cookie and CSRF token) over TLS.

Runs under private_view: server, yardstick and load generator share one network namespace with nothing else in it. Targets are
measured in turn, round after round, so that what disturbs the machine disturbs them alike; the medians are compared.
"""
import glob
import json
import os
import statistics
import subprocess
import sys
import tempfile
import threading
import time

from served import (CONNECTIONS, SECONDS, cpu_seconds, enter, load, post, refuse_elsewhere, run, start_server, stop,
                    wait_for)

BUILD = os.path.abspath(sys.argv[1]) if len(sys.argv) > 1 else ""
ROUNDS = int(sys.argv[2]) if len(sys.argv) > 2 else 5
TOPOLOGY = "/webapi/VORN.Core.Network.Router.Topology/2/get"
CONSTANT = "/webapi/VORN.Bench.Constant/1/get"

LIMITS = {  # what the figures are held against
    "share of nginx's requests at 64 connections": 0.3,
    "times nginx's p99 at 64 connections": 3.0,
    "TLS: share of nginx's requests at 64 connections": 0.2,
    "TLS: times nginx's p99 at 64 connections": 3.0,
    "TLS, session: times the processor time in clear": 1.5,
    "idle private memory, MB": 10.0,
    "start to first answer, ms": 100.0,
    "router.so stripped, kB": 300.0,
}


def make_home():
    """The two interfaces and the file that the topology is read from."""
    run("ip", "link", "add", "eth0", "type", "veth", "peer", "name", "isp0")
    run("ip", "link", "add", "lbr0", "type", "bridge")
    for name in ("eth0", "isp0", "lbr0"):
        run("ip", "link", "set", name, "up")
    run("ip", "addr", "add", "192.168.1.1/24", "dev", "lbr0")
    folder = "/etc/sysconfig/network-scripts"
    os.makedirs(folder, exist_ok=True)
    for name, text in {"eth0": "DEVICE=eth0\nBOOTPROTO=dhcp\nSLAVE=no\n",
                       "lbr0": "DEVICE=lbr0\nTYPE=Bridge\nIPADDR=192.168.1.1\nNETMASK=255.255.255.0\n"}.items():
        with open(f"{folder}/ifcfg-{name}", "w", encoding="ascii") as file:
            file.write(text)


def start_nginx(port, secure_port, body, folder, state):
    """The answer as a file, in clear and over TLS with the server's own key."""
    os.makedirs(f"{folder}/root", exist_ok=True)
    with open(f"{folder}/root/answer.json", "wb") as file:
        file.write(body)
    with open(f"{folder}/nginx.conf", "w", encoding="ascii") as file:
        file.write(f"""worker_processes 2; pid {folder}/pid; error_log {folder}/error.log; daemon off; user root;
events {{ worker_connections 1024; }}
http {{ access_log off; keepalive_requests 1000000000; default_type application/json; sendfile on; tcp_nodelay on;
  client_body_temp_path {folder}/b; proxy_temp_path {folder}/p; fastcgi_temp_path {folder}/f; uwsgi_temp_path {folder}/u;
  scgi_temp_path {folder}/s; open_file_cache max=10;
  server {{ listen 127.0.0.1:{port}; root {folder}/root; }}
  server {{ listen 127.0.0.1:{secure_port} ssl; root {folder}/root; ssl_certificate {state}/tls.crt;
    ssl_certificate_key {state}/tls.key; ssl_protocols TLSv1.2 TLSv1.3; ssl_session_tickets off; }} }}
""")
    yardstick = subprocess.Popen(["/usr/sbin/nginx", "-c", f"{folder}/nginx.conf", "-e", f"{folder}/error.log"])
    wait_for(port)
    return yardstick


def cores_used(server):
    """Seen on which cores, sampled while 8 connections are served."""
    seen = {}
    loading = threading.Thread(target=load, args=(8081, "POST", TOPOLOGY, 8))
    loading.start()
    while loading.is_alive():
        time.sleep(0.015)
        for stat in glob.glob(f"/proc/{server.pid}/task/*/stat"):
            with open(stat, encoding="ascii") as file:
                fields = file.read().rsplit(")", 1)[1].split()
            if fields[0] == "R":
                seen[int(fields[36])] = seen.get(int(fields[36]), 0) + 1
    return seen


def private_megabytes(pid):
    with open(f"/proc/{pid}/smaps_rollup", encoding="ascii") as file:
        return sum(int(line.split()[1]) for line in file if line.startswith("Private_")) / 1024


def first_answer():
    """Milliseconds from the start of the process to the end of its first answer; median of nine."""
    times = []
    for _ in range(9):
        begin = time.monotonic()
        server = start_server(BUILD, 8090, f"{BUILD}/router/router.so")
        post(8090, TOPOLOGY)
        times.append((time.monotonic() - begin) * 1000)
        stop(server)
    return statistics.median(times)


def stripped_size():
    with tempfile.NamedTemporaryFile() as out:
        run("strip", "-o", out.name, f"{BUILD}/router/router.so")
        return os.path.getsize(out.name) / 1000


def cpu_of(process):
    """Of a process and its children: nginx works in those."""
    pids = [process.pid]
    with open(f"/proc/{process.pid}/task/{process.pid}/children", encoding="ascii") as file:
        pids += [int(pid) for pid in file.read().split()]
    return sum(cpu_seconds(pid) for pid in pids)


def measure_one(target, connections):
    """Requests a second, p99 and processor time of the server a request, the times in microseconds."""
    process, port, method, path, *way = target
    before = cpu_of(process)
    rate, p99, requests = load(port, method, path, connections, "", *way)
    return rate, p99, (cpu_of(process) - before) / requests * 1e6


def measure(targets):
    results = {(name, c): [] for name in targets for c in CONNECTIONS}
    for target in targets.values():
        measure_one(target, 8)  # warm
    for _ in range(ROUNDS):
        for connections in CONNECTIONS:
            for name, target in targets.items():
                results[name, connections].append(measure_one(target, connections))
    return {key: tuple(map(statistics.median, zip(*rows))) for key, rows in results.items()}


def main():
    make_home()
    with tempfile.TemporaryDirectory() as folder:
        state = f"{folder}/state"
        os.mkdir(state, 0o700)
        figures = {"start to first answer, ms": first_answer(), "router.so stripped, kB": stripped_size()}
        server = start_server(BUILD, 8081, f"{BUILD}/router/router.so")
        answer = post(8081, TOPOLOGY)
        if json.loads(answer)["data"]["net_topology"] != "router":
            raise SystemExit(f"unexpected answer: {answer}")
        figures["idle private memory, MB"] = private_megabytes(server.pid)
        constant = start_server(BUILD, 8082, f"{BUILD}/bench/bench_constant.so")
        secure = start_server(BUILD, 8084, f"{BUILD}/router/router.so", state, "--tls", "yes")
        session = enter(8084, state)
        nginx = start_nginx(8083, 8085, answer, folder, state)
        medians = measure({"nginx, static file": (nginx, 8083, "GET", "/answer.json"),
                           "vornwebd, constant": (constant, 8082, "POST", CONSTANT),
                           "vornwebd, Topology v2 get": (server, 8081, "POST", TOPOLOGY),
                           "TLS: nginx, static file": (nginx, 8085, "GET", "/answer.json", "https"),
                           "TLS, session: vornwebd": (secure, 8084, "POST", TOPOLOGY, "https", session)})
        cores = cores_used(server)
        stop(server, constant, secure, nginx)
    report(answer, medians, cores, figures)


def held_against(medians, figures):
    """Adds the figures that are ratios."""
    for before, ours, theirs in (("", "vornwebd, Topology v2 get", "nginx, static file"),
                                 ("TLS: ", "TLS, session: vornwebd", "TLS: nginx, static file")):
        (rate, p99, _), (their_rate, their_p99, _) = medians[ours, 64], medians[theirs, 64]
        figures[f"{before}share of nginx's requests at 64 connections"] = rate / their_rate
        figures[f"{before}times nginx's p99 at 64 connections"] = p99 / their_p99
    figures["TLS, session: times the processor time in clear"] = (medians["TLS, session: vornwebd", 64][2]
                                                                  / medians["vornwebd, Topology v2 get", 64][2])


def report(answer, medians, cores, figures):
    print(f"answer of {len(answer)} bytes, medians of {ROUNDS} rounds of {SECONDS} s taken in turn, {os.cpu_count()} cores, "
          f"load {os.getloadavg()[0]:.1f}\n")
    print(f"{'':28}" + "".join(f"{c:>9} conn. req/s, p99, CPU" for c in CONNECTIONS))
    for name in dict.fromkeys(n for n, _ in medians):
        print(f"{name:28}" + "".join("{:>14.0f} {:>6.0f} us {:>5.0f} us".format(*medians[name, c]) for c in CONNECTIONS))
    held_against(medians, figures)
    print()
    failed = False
    for name, limit in LIMITS.items():
        at_least = "share" in name
        wanted = figures[name] >= limit if at_least else figures[name] <= limit
        failed = failed or not wanted
        print(f"{name:50}{figures[name]:>8.2f}   {'at least' if at_least else 'at most'} {limit:g}"
              f"   {'kept' if wanted else 'MISSED'}")
    both = len(cores) >= min(2, os.cpu_count())
    print(f"{'cores seen serving 8 connections (samples)':50}{str(cores):>8}   {'kept' if both else 'MISSED'}")
    sys.exit(1 if failed or not both else 0)


if __name__ == "__main__":
    refuse_elsewhere("http_bench.py BUILD_FOLDER [ROUNDS]")
    main()
