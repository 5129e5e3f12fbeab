"""Floors: the openssl and 7z commands that a method runs, started directly by
one shell script in the same order and with the same sizes, validity and
files, without anything of ours around them (no host process, no shell per
command, no directory commands, no copies). The key-matching digests are the
pipelines as the toolkit's contract gives them.

Also the check that a floor and a method run the same tool commands, from
traces of both."""

import os
import re
import shlex
import shutil
import subprocess
import tempfile

SEED_FILES = ["/var/log/messages", "/var/run/dmesg.boot", "/var/log/system.log",
              "/etc/hosts", "/etc/group", "/etc/resolv.conf", "/bin/ls"]

STORE = "usr/orva/etc/ssl"
TOOLS = ("openssl", "7z")


def seed_list():
    """The seed files that exist, joined as the key generator joins them."""
    return ":".join(f for f in SEED_FILES if os.path.exists(f))


class FloorScript:
    """Builds the text of a floor script for the device root `root`."""

    def __init__(self, root):
        self.root = root
        self.lines = ["set -e"]

    def store(self, relative):
        return shlex.quote(os.path.join(self.root, STORE, relative))

    def tool(self, name):
        return shlex.quote(os.path.join(self.root, "usr/orva/bin", name))

    def run(self, text):
        self.lines.append(text + " >/dev/null 2>&1")

    def genrsa(self, key, bits):
        self.run("%s genrsa -rand %s -out %s %d" % (
            self.tool("openssl"), shlex.quote(seed_list()), self.store(key), bits))

    def genec(self, key, curve):
        self.run("%s genpkey -algorithm EC -pkeyopt ec_paramgen_curve:%s"
                 " -pkeyopt ec_param_enc:named_curve -out %s" % (
                     self.tool("openssl"), curve, self.store(key)))

    def genkey(self, key, bits):
        """An RSA key of `bits`, or for "P-256" and "P-384" an EC key."""
        if str(bits).startswith("P-"):
            self.genec(key, bits)
        else:
            self.genrsa(key, bits)

    def req(self, config, key, request):
        self.run("%s req -config %s -new -sha256 -key %s -out %s" % (
            self.tool("openssl"), self.store(config), self.store(key), self.store(request)))

    def self_sign(self, extensions, request, certificate, key, days):
        self.run("%s x509 -extfile %s -days %d -in %s -req -sha256 -out %s -signkey %s" % (
            self.tool("openssl"), self.store(extensions), days, self.store(request),
            self.store(certificate), self.store(key)))

    def ca_sign(self, request_path, certificate, days):
        self.run("%s x509 -extfile %s -days %d -in %s -req -sha256 -out %s"
                 " -CAserial %s -CA %s -CAkey %s" % (
                     self.tool("openssl"), self.store("cfg.d/server.crt.cfg"), days,
                     shlex.quote(request_path), self.store(certificate),
                     self.store(".mkcert.serial"), self.store("ssl.crt/ca.crt"),
                     self.store("ssl.key/ca.key")))

    def match(self, certificate_path, key_path):
        openssl = self.tool("openssl")
        for command, path in (("x509", certificate_path), ("rsa", key_path)):
            self.lines.append("%s %s -noout -modulus -in %s | sed 's/.*=//' | %s md5 >/dev/null" % (
                openssl, command, shlex.quote(path), openssl))

    def archive(self, archive, members):
        self.run("%s a %s %s" % (self.tool("7z"), self.store(archive),
                                 " ".join(self.store(m) for m in members)))

    def text(self):
        return "\n".join(self.lines) + "\n"


def crt_create(root, ca_bits, server_bits):
    """Sizes as bits, or a curve name ("P-256") for EC keys, whose pairs the
    module proves in-process: no tool command for them."""
    f = FloorScript(root)
    s = lambda p: os.path.join(root, STORE, p)
    f.genkey("ssl.key/ca.key", ca_bits)
    f.req("cfg.d/ca.cfg", "ssl.key/ca.key", "ssl.csr/ca.csr")
    f.self_sign("cfg.d/ca.crt.cfg", "ssl.csr/ca.csr", "ssl.crt/ca.crt", "ssl.key/ca.key", 3650)
    if not str(ca_bits).startswith("P-"):
        f.match(s("ssl.crt/ca.crt"), s("ssl.key/ca.key"))
    f.genkey("ssl.key/server.key", server_bits)
    f.req("cfg.d/server.cfg", "ssl.key/server.key", ".gen/.crt-server.csr")
    f.ca_sign(s(".gen/.crt-server.csr"), "ssl.crt/server.crt", 825)  # CRT create's validity
    if not str(server_bits).startswith("P-"):
        f.match(s("ssl.crt/server.crt"), s("ssl.key/server.key"))
    return f.text()


def csr_create(root, bits):
    f = FloorScript(root)
    f.genkey(".gen/server.key", bits)
    f.req("cfg.d/ca.cfg", ".gen/server.key", ".gen/server.csr")
    return f.text()


def sign(root, request_path, days):
    f = FloorScript(root)
    f.ca_sign(request_path, ".gen/server.crt", days)
    return f.text()


def import_set(root, certificate_path, key_path):
    f = FloorScript(root)
    f.match(certificate_path, key_path)
    return f.text()


def export_archive(root, members):
    f = FloorScript(root)
    f.archive(".gen/archive.zip", members)
    return f.text()


def nothing(root):
    return FloorScript(root).text()


# --- Same commands on both sides -------------------------------------------

_EXECVE = re.compile(r'execve\("([^"]*)", \[(.*?)\](?:, 0x[0-9a-f]+| /\*)')
_ARGUMENT = re.compile(r'"((?:[^"\\]|\\.)*)"')


def _signature(argv):
    """A tool command with every path argument written as <path>: what must be
    equal on both sides (tool, subcommand, options, sizes, days, file count)."""
    return " ".join(["<path>" if "/" in a else a for a in
                     [os.path.basename(argv[0])] + argv[1:]])


def traced_tool_commands(argv, env=None):
    """The openssl and 7z commands that argv starts, in order, as signatures;
    None when strace is missing."""
    strace = shutil.which("strace")
    if strace is None:
        return None
    with tempfile.NamedTemporaryFile(prefix="orva-bench-trace-") as trace:
        subprocess.run([strace, "-f", "-qq", "-s", "4096", "-e", "trace=execve",
                        "-o", trace.name] + argv, env=env, stdin=subprocess.DEVNULL,
                       stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL, check=True)
        commands = []
        with open(trace.name, errors="replace") as lines:
            for line in lines:
                match = _EXECVE.search(line)
                if match is None or "= -1" in line:
                    continue
                args = _ARGUMENT.findall(match.group(2))
                if args and os.path.basename(match.group(1)) in TOOLS:
                    commands.append(_signature([match.group(1)] + args[1:]))
        return commands


def traced_waits(argv, runs=3):
    """What a run of argv (a method's or a floor's) starts and waits for:
    {"processes": programs started, "syncs": file syncs (fsync, fdatasync),
    "sync_ms": the time spent in them}, from traces of the run and all its
    children (strace -T times each call itself, which the trace does not
    stretch); the median of `runs` runs, as the disk's time varies with the
    other users of the machine. None when strace is missing."""
    strace = shutil.which("strace")
    if strace is None:
        return None
    seen = []
    for _ in range(runs):
        with tempfile.NamedTemporaryFile(prefix="orva-bench-trace-") as trace:
            subprocess.run([strace, "-f", "-qq", "-T", "-e", "trace=execve,fsync,fdatasync",
                            "-o", trace.name] + argv, stdin=subprocess.DEVNULL,
                           stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL, check=True)
            waits = {"processes": 0, "syncs": 0, "sync_ms": 0.0}
            with open(trace.name, errors="replace") as lines:
                for line in lines:
                    # A call that succeeded, ended on this line (not one left
                    # unfinished to be resumed on a later line).
                    if " = 0 <" not in line:
                        continue
                    if "execve" in line:
                        waits["processes"] += 1
                    elif "sync" in line:
                        waits["syncs"] += 1
                        waits["sync_ms"] += 1000.0 * float(line.rsplit("<", 1)[1].rstrip(">\n"))
            seen.append(waits)
    return sorted(seen, key=lambda waits: waits["sync_ms"])[runs // 2]
