"""The server under load through its nginx: "list" next to the smallest answer
the host gives through the same nginx (a call refused for want of a token) and
to a static file of the same size from nginx itself, with wrk; and the memory
of the host and nginx together."""

import http.client
import os
import re
import shutil
import socket
import statistics
import subprocess
import threading
import time
import urllib.parse
import urllib.request

from measure import RunFailed

LIST_QUERY = "/webapi?" + urllib.parse.urlencode({
    "api": "ORVA.Core.Certificate", "method": "list",
    "additional": '["valid_from","valid_till"]'})
STATIC_NAME = "list.json"
_WRK_LINE = re.compile(r"ORVA_BENCH (.*)")


def host_serves(host):
    """True when this build of the host has the `serve` command."""
    usage = subprocess.run([host], stdout=subprocess.PIPE, stderr=subprocess.STDOUT,
                           stdin=subprocess.DEVNULL).stdout.decode(errors="replace")
    return "serve" in usage


def _free_port():
    with socket.socket() as probe:
        probe.bind(("127.0.0.1", 0))
        return probe.getsockname()[1]


def proportional_kib(pid):
    """The proportional set size of `pid`: pages shared with other processes
    (nginx's master and worker share most) count in part."""
    with open("/proc/%d/smaps_rollup" % pid) as rollup:
        for line in rollup:
            if line.startswith("Pss:"):
                return int(line.split()[1])
    raise RunFailed("no Pss for %d" % pid)


def process_group(pid):
    with open("/proc/%d/stat" % pid) as stat:
        return int(stat.read().rsplit(")", 1)[1].split()[2])


class Server:
    """`orva-webapi serve` on a free loopback port, with a web folder that holds
    one static file: the list answer itself, so both sides send the same bytes."""

    def __init__(self, host, root, work):
        self.root = root
        self.web = os.path.join(work, "web")
        os.makedirs(self.web, exist_ok=True)
        os.chmod(work, 0o755)  # nginx's workers run as nobody under root
        with open(os.path.join(root, "usr/orva/etc/webapi.token")) as token:
            self.token = token.read().strip()
        self.log = open(os.path.join(work, "serve.log"), "wb")
        # Another program may take a chosen port before nginx binds it; serve
        # then ends, and new ports are tried.
        for _ in range(3):
            self.port, self.https_port = _free_port(), _free_port()
            self.base = "http://127.0.0.1:%d" % self.port
            self.process = subprocess.Popen(
                [host, "serve", "--root", root, "--listen", "127.0.0.1:%d" % self.port,
                 "--listen-https", "127.0.0.1:%d" % self.https_port, "--web", self.web],
                stdin=subprocess.DEVNULL, stdout=self.log, stderr=self.log)
            if self._listening():
                return
        with open(self.log.name, "rb") as printed:
            raise RunFailed("serve ended three times; last:\n%s" % printed.read()[-800:].decode(
                errors="replace"))

    def _listening(self, seconds=15):
        """True once serve prints its token line, which it does after nginx has
        bound both ports (a port that merely answers may be another
        program's); False when serve ends first."""
        deadline = time.monotonic() + seconds
        while time.monotonic() < deadline:
            if self.process.poll() is not None:
                return False
            with open(self.log.name, "rb") as printed:
                if b"\ntoken: " in printed.read():
                    return True
            time.sleep(0.05)
        raise RunFailed("serve did not listen within %d s" % seconds)

    def fetch_list(self):
        request = urllib.request.Request(self.base + LIST_QUERY,
                                         headers={"Authorization": "Bearer " + self.token})
        with urllib.request.urlopen(request, timeout=30) as answer:
            body = answer.read()
        if b'"success":true' not in body:
            raise RunFailed("list over HTTP failed: %r" % body[:200])
        return body

    def publish_static(self, body):
        with open(os.path.join(self.web, STATIC_NAME), "wb") as static:
            static.write(body)
        return self.base + "/" + STATIC_NAME

    def nginx_pids(self):
        """nginx's master and workers: the processes in the group of its master."""
        pid_file = os.path.join(self.root, "usr/orva/var/webapi/nginx.pid")
        with open(pid_file) as pid:
            master = int(pid.read())
        pids = []
        for entry in os.listdir("/proc"):
            try:
                if entry.isdigit() and process_group(int(entry)) == master:
                    pids.append(int(entry))
            except (OSError, ValueError):
                pass  # a process that ended meanwhile
        return pids

    def memory_kib(self):
        """The host and every nginx process."""
        kib = proportional_kib(self.process.pid)
        for pid in self.nginx_pids():
            try:
                kib += proportional_kib(pid)
            except OSError:
                pass  # a process that ended meanwhile
        return kib

    def send_requests(self, path, count, clients):
        """Sends exactly `count` GET requests for `path` over `clients` kept-alive
        connections side by side; every answer must be 200."""
        failures = []
        shares = [count // clients + (1 if i < count % clients else 0) for i in range(clients)]

        def client(share):
            connection = http.client.HTTPConnection("127.0.0.1", self.port, timeout=30)
            headers = {"Authorization": "Bearer " + self.token}
            try:
                for _ in range(share):
                    connection.request("GET", path, headers=headers)
                    answer = connection.getresponse()
                    answer.read()
                    if answer.status != 200:
                        failures.append(answer.status)
                        return
            except OSError as error:
                failures.append(str(error))
            finally:
                connection.close()

        threads = [threading.Thread(target=client, args=(share,)) for share in shares]
        for thread in threads:
            thread.start()
        for thread in threads:
            thread.join()
        if failures:
            raise RunFailed("requests failed: %s" % failures[:5])

    def stop(self):
        self.process.terminate()
        try:
            self.process.wait(timeout=10)
        except subprocess.TimeoutExpired:
            self.process.kill()
            self.process.wait()
        self.log.close()


class Load:
    """The figures of one wrk run."""

    def __init__(self, fields, refused):
        self.requests = int(fields["requests"])
        self.seconds = int(fields["duration_us"]) / 1e6
        self.per_second = self.requests / self.seconds if self.seconds else 0.0
        self.p50_ms = int(fields["p50_us"]) / 1000.0
        self.p99_ms = int(fields["p99_us"]) / 1000.0
        # A refused call must be refused every time.
        answers_off = int(fields["status_errors"])
        if refused:
            answers_off = self.requests - answers_off
        self.errors = answers_off + int(fields["socket_errors"])


class MedianLoad:
    """The median of each figure over several wrk runs of the same load."""

    def __init__(self, loads):
        self.runs = len(loads)
        self.per_second = statistics.median(load.per_second for load in loads)
        self.p50_ms = statistics.median(load.p50_ms for load in loads)
        self.p99_ms = statistics.median(load.p99_ms for load in loads)


def wrk(url, token, clients, seconds, script):
    """One wrk run; at most two threads, as the machine has two cores. Without
    `token` every answer must be a refusal."""
    program = shutil.which("wrk")
    threads = min(clients, 2)
    env = dict(os.environ)
    env.pop("ORVA_BENCH_TOKEN", None)
    if token:
        env["ORVA_BENCH_TOKEN"] = token
    out = subprocess.run([program, "-t%d" % threads, "-c%d" % clients, "-d%ds" % seconds,
                          "--timeout", "10s", "-s", script, url],
                         env=env, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
                         stderr=subprocess.STDOUT).stdout.decode(errors="replace")
    match = _WRK_LINE.search(out)
    if match is None:
        raise RunFailed("wrk gave no figures:\n" + out[-800:])
    load = Load(dict(item.split("=") for item in match.group(1).split()), not token)
    if load.errors:
        raise RunFailed("wrk saw %d failed requests on %s:\n%s" % (load.errors, url, out[-800:]))
    return load
