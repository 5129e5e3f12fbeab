"""HTTPS handshakes per second from one running server, with an RSA 2048
certificate and with a P-256 one installed in turn (imported over HTTP, as a
user would): eight `openssl s_time -new` clients side by side. s_time -new
opens a new connection for every handshake and never resumes a session, and
sends no request: what is counted is TCP connection and full TLS handshake."""

import os
import re
import shutil
import subprocess
import time

import http_load
import http_methods
import methods
from measure import RunFailed

CLIENTS = 8
_CONNECTIONS = re.compile(rb"^(\d+) connections in [0-9.]+s;", re.M)
_KEY_BITS = re.compile(rb"Server public key is (\d+) bit")


class Kind:
    """One certificate kind: its files to import and the rates measured."""

    def __init__(self, name, key_bits, files):
        self.name = name
        self.key_bits = key_bits
        self.files = files  # upload name: path, as import takes them
        self.rates = []  # handshakes per second, one per round
        self.server_us = []  # nginx CPU per handshake, one per round
        self.client_us = []  # s_time CPU per handshake, one per round


def _make_sets(device):
    """CRT create once with RSA 2048 and once with P-256 keys; each set's
    files are copied out, for import."""
    kinds = []
    for name, bits, keys in (("RSA 2048", 2048, {"key_length": 2048, "ca_key_length": 2048}),
                             ("P-256", 256, methods.EC_KEYS)):
        device.call("ORVA.Core.Certificate.CRT", "create",
                    dict(methods.CA_SUBJECT, **methods.SERVER_SUBJECT, **keys,
                         alias=methods.ALIASES))
        files = {}
        for upload, stored in (("cert", "ssl.crt/server.crt"), ("key", "ssl.key/server.key"),
                               ("inter_cert", "ssl.crt/ca.crt")):
            files[upload] = os.path.join(device.uploads, "%d-%s" % (bits, os.path.basename(stored)))
            shutil.copyfile(device.store(stored), files[upload])
        kinds.append(Kind(name, bits, files))
    return kinds


def presented_key_bits(port):
    """The size of the key the server presents to a new handshake, or None."""
    out = subprocess.run(["openssl", "s_client", "-connect", "127.0.0.1:%d" % port],
                         stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
                         stderr=subprocess.DEVNULL, timeout=30).stdout
    match = _KEY_BITS.search(out)
    return int(match.group(1)) if match else None


def install(server, kind, seconds=15):
    """Imports the kind's set over HTTP and waits until handshakes present it."""
    status, headers, body = http_methods.post(server, "ORVA.Core.Certificate", "import",
                                              uploads=kind.files)
    if status != 200 or b'"success":true' not in body:
        raise RunFailed("import of the %s set failed: %r" % (kind.name, body[:200]))
    deadline = time.monotonic() + seconds
    while presented_key_bits(server.https_port) != kind.key_bits:
        if time.monotonic() > deadline:
            raise RunFailed("HTTPS did not present the %s set within %d s" % (kind.name, seconds))
        time.sleep(0.1)


def one_round(server, kind, seconds):
    """CLIENTS s_time processes side by side for `seconds` (each stops at the
    first whole second after it, so they stop together)."""
    nginx_pids = server.nginx_pids()
    before = http_methods.server_cpu_ms(server, nginx_pids)
    argv = ["openssl", "s_time", "-connect", "127.0.0.1:%d" % server.https_port, "-new",
            "-time", str(seconds)]
    start = time.perf_counter()
    clients = [subprocess.Popen(argv, stdin=subprocess.DEVNULL, stdout=subprocess.PIPE,
                                stderr=subprocess.STDOUT) for _ in range(CLIENTS)]
    handshakes, client_ms = 0, 0.0
    for client in clients:
        out = client.stdout.read()
        _, status, usage = os.wait4(client.pid, 0)
        client.stdout.close()
        match = _CONNECTIONS.search(out)
        if status != 0 or match is None:
            raise RunFailed("s_time failed:\n" + out.decode(errors="replace")[-500:])
        handshakes += int(match.group(1))
        client_ms += (usage.ru_utime + usage.ru_stime) * 1000.0
    wall = time.perf_counter() - start
    after = http_methods.server_cpu_ms(server, nginx_pids)
    nginx_ms = http_methods.spent_ms(before, after)["nginx"]
    if handshakes == 0:
        raise RunFailed("no handshake with the %s set" % kind.name)
    kind.rates.append(handshakes / wall)
    kind.server_us.append(nginx_ms * 1000.0 / handshakes)
    kind.client_us.append(client_ms * 1000.0 / handshakes)


def measure(host, work, rounds, seconds, say):
    """Both kinds from one server, in alternating rounds; returns the kinds."""
    device = methods.Device(host, os.path.join(work, "https"))
    with open(os.path.join(device.root, "usr/orva/etc/orva.conf"), "w") as conf:
        conf.write('runHTTPS="yes"\n')
    say("handshakes: making an RSA 2048 and a P-256 set")
    kinds = _make_sets(device)
    server = http_load.Server(host, device.root, work)
    try:
        for round_index in range(rounds):
            for kind in kinds if round_index % 2 == 0 else kinds[::-1]:
                say("handshakes: round %d, %s" % (round_index + 1, kind.name))
                install(server, kind)
                one_round(server, kind, seconds)
    finally:
        server.stop()
    return kinds
