"""What the benchmarks over HTTP share: the server started, and load put on it. Only inside private_view."""
import json
import os
import re
import socket
import ssl
import subprocess
import sys
import tempfile
import time
import urllib.request

SECONDS = 2  # of one run of the load generator
CONNECTIONS = (1, 8, 64)
_headers = {}  # of every call: the token


def refuse_elsewhere(usage):
    """These programs make interfaces and write into /etc, /var and /run: ends the program where those are the machine's."""
    if "VORN_PRIVATE_VIEW" not in os.environ or [name for _, name in socket.if_nameindex()] != ["lo"]:
        sys.exit(f"Run it as: private_view -- {usage}")


def run(*command):
    subprocess.run(command, check=True, stdout=subprocess.DEVNULL)


def wait_for(port):
    for _ in range(2000):
        with socket.socket() as probe:
            if probe.connect_ex(("127.0.0.1", port)) == 0:
                return
        time.sleep(0.001)
    raise SystemExit(f"nothing listens on port {port}")


def _exchange(url, body, fields):
    request = urllib.request.Request(url, data=body, method="POST", headers={"Content-Type": "application/json", **fields})
    # Its own certificate, in a network with nothing else in it: nobody to be told apart.
    return urllib.request.urlopen(request, timeout=5, context=ssl._create_unverified_context())


def post(port, path, body=b""):
    with _exchange(f"http://127.0.0.1:{port}{path}", body, _headers) as answer:
        return answer.read()


def enter(port, state):
    """Over TLS: chooses a password and logs in with it. @return the fields that every call of the session has"""
    def call(name, body, fields):
        with _exchange(f"https://127.0.0.1:{port}/webapi/{name}", json.dumps(body).encode(), fields) as answer:
            cookie = answer.headers.get("Set-Cookie", "").split(";")[0]
            return {"Cookie": cookie, "X-CSRF-Token": json.loads(answer.read())["data"].get("csrf")}

    with open(f"{state}/first-password", encoding="ascii") as file:
        first = file.read().strip()
    fields = call("login", {"user": "admin", "password": first}, {})
    call("password", {"old": first, "new": "correct horse"}, fields)
    return call("login", {"user": "admin", "password": "correct horse"}, {})


def _make_token(build):
    os.environ["VORN_BENCH_STATE"] = tempfile.mkdtemp(prefix="vorn_bench_state.")
    _headers["Authorization"] = "Bearer " + subprocess.run(
        [f"{build}/webapi/vornwebd", "--state", os.environ["VORN_BENCH_STATE"], "--make-token", "bench"],
        check=True, capture_output=True, text=True).stdout.strip()


def start_server(build, port, module, state=None, *options):
    """With a state folder of its own where it is given one; else with the one whose token every call has."""
    if not _headers:
        _make_token(build)
    server = subprocess.Popen([f"{build}/webapi/vornwebd", "--module", module, "--state",
                               state or os.environ["VORN_BENCH_STATE"], "--listen", f"127.0.0.1:{port}",
                               "--connections-per-address", "1024",  # those of the last run may still be there
                               *options])
    wait_for(port)
    return server


def stop(*processes):
    for process in processes:
        process.terminate()
        process.wait()


def load(port, method, path, connections, body="", scheme="http", session=None):
    """One run of wrk: requests per second, p99 in microseconds, and how many requests were answered.

    Calls have the fields of the session, or the token."""
    fields = "".join(f'wrk.headers["{name}"]="{value}"\n' for name, value in (session or _headers).items())
    if body:
        fields += f'wrk.headers["Content-Type"]="application/json"\nwrk.body=[[{body}]]\n'
    script = f"""wrk.method="{method}"
{fields}function done(s, l, r)
  local e = s.errors
  local failed = e.status + e.connect + e.read + e.write + e.timeout
  io.write(string.format("RESULT %f %d %d %d\\n", s.requests / (s.duration / 1e6), l:percentile(99), s.requests, failed))
end
"""
    with tempfile.NamedTemporaryFile("w", suffix=".lua") as lua:
        lua.write(script)
        lua.flush()
        out = subprocess.run(["wrk", "-t1", f"-c{connections}", f"-d{SECONDS}s", "--timeout", "30s", "-s", lua.name,
                              f"{scheme}://127.0.0.1:{port}{path}"], check=True, capture_output=True, text=True).stdout
    rate, p99, requests, errors = re.search(r"RESULT (\S+) (\d+) (\d+) (\d+)", out).groups()
    if int(errors) != 0:
        raise SystemExit(f"{errors} failed requests at {path}")
    return float(rate), int(p99), int(requests)


def cpu_seconds(pid):
    """What a process has used of the processors, once it has nothing left to do."""
    clock = (~pid << 3) | 2  # the process's own, by the number that clock_getcpuclockid(3) gives
    last = -1.0
    while (now := time.clock_gettime(clock)) - last > 0.001:
        last = now
        time.sleep(0.05)
    return now
