"""The seven methods as `orva-webapi call` runs them and as the page sends
them over HTTP, each with its floor, on a device root of their own, then CRT
and CSR create with P-256 keys."""

import json
import os
import shutil
import subprocess

import floors
from measure import timed_run

CA_SUBJECT = {
    "ca_country": "DE", "ca_state": "Berlin", "ca_city": "Berlin",
    "ca_organization": "Orva Bench", "ca_department": "IT",
    "ca_common_name": "Orva Bench CA", "ca_email": "ca@example.com",
}
SERVER_SUBJECT = {
    "country": "DE", "state": "Berlin", "city": "Berlin",
    "organization": "Orva Bench", "department": "IT",
    "common_name": "nas.example.com", "email": "admin@example.com",
}
ALIASES = "nas.example.com;192.0.2.10"
EC_KEYS = {"key_type": "ec", "key_length": 256, "ca_key_type": "ec", "ca_key_length": 256}
DAYS = 3650


def _succeeded(returncode, stdout):
    if returncode != 0:
        return False
    try:
        return json.loads(stdout.decode()).get("success") is True
    except ValueError:
        return False


class Device:
    """A device root made by `orva-webapi init`, and a second one, the floor
    root, that floor scripts work in so both sides start from the same store."""

    def __init__(self, host, work):
        self.host = host
        self.work = work
        self.root = os.path.join(work, "device")
        self.floor_root = os.path.join(work, "floor")
        self.uploads = os.path.join(work, "uploads")
        os.makedirs(self.uploads)
        subprocess.run([host, "init", "--root", self.root], check=True,
                       stdout=subprocess.DEVNULL)

    def store(self, relative):
        return os.path.join(self.root, floors.STORE, relative)

    def call_argv(self, api, method, params=None, uploads=None, output=None):
        argv = [self.host, "call", "--root", self.root, api, method]
        argv += ["%s=%s" % item for item in (params or {}).items()]
        for name, path in (uploads or {}).items():
            argv += ["--upload", "%s=%s" % (name, path)]
        if output:
            argv += ["--output", output]
        return argv

    def call(self, api, method, params=None, uploads=None, output=None):
        argv = self.call_argv(api, method, params, uploads, output)
        if output:
            if os.path.exists(output):
                os.remove(output)
            check = lambda code, _: code == 0 and os.path.getsize(output) > 0
        else:
            check = _succeeded
        return timed_run(argv, check=check)

    def sync_floor_root(self):
        """The floor root becomes a copy of the device root as it is now."""
        shutil.rmtree(self.floor_root, ignore_errors=True)
        shutil.copytree(self.root, self.floor_root, symlinks=True)

    def floor_script(self, name, text):
        path = os.path.join(self.work, "floor-%s.sh" % name)
        with open(path, "w") as script:
            script.write(text)
        return path


class Request:
    """One method call as the page sends it over HTTP: `uploads` (name: path)
    go as files of a multipart form, and stand for their own names among the
    parameters; `download`: the answer is a file, not JSON."""

    def __init__(self, api, method, params, uploads, download):
        self.api = api
        self.method = method
        self.uploads = uploads or {}
        self.params = {k: v for k, v in (params or {}).items() if k not in self.uploads}
        self.download = download


class Method:
    """One row of the method table. `call` and `floor` take no argument and
    return a Sample; `argv` and `floor_argv` start one run of each side;
    `request` is the same call over HTTP."""

    def __init__(self, name, argv, call, floor_argv, floor, request, goal=True, note=""):
        self.name = name
        self.argv = argv
        self.call = call
        self.floor_argv = floor_argv
        self.floor = floor
        self.request = request
        self.process_bound = goal
        self.note = note


def prepare(device, ca_bits, server_bits):
    """Fills the store once (a local CA and server pair, a pending request, a
    signed certificate) and keeps copies of the files the uploads need."""
    device.call("ORVA.Core.Certificate.CRT", "create",
                dict(CA_SUBJECT, **SERVER_SUBJECT, key_length=server_bits,
                     ca_key_length=ca_bits, alias=ALIASES))
    device.call("ORVA.Core.Certificate.CSR", "create",
                dict(SERVER_SUBJECT, key_length=server_bits))
    copies = {
        "request": (".gen/server.csr", "request.csr"),
        "certificate": ("ssl.crt/server.crt", "server.crt"),
        "key": ("ssl.key/server.key", "server.key"),
        "intermediate": ("ssl.crt/ca.crt", "intermediate.crt"),
    }
    files = {}
    for name, (source, target) in copies.items():
        files[name] = os.path.join(device.uploads, target)
        shutil.copyfile(device.store(source), files[name])
    return files


def build(device, files, ca_bits, server_bits):
    """The seven methods in table order, then the P-256 rows."""
    floor_store = lambda p: os.path.join(device.floor_root, floors.STORE, p)
    sh = lambda path: ["/bin/sh", path]

    def floor_runner(name, text, before=None):
        path = device.floor_script(name, text())

        def run():
            if before:
                before()
            device.floor_script(name, text())
            return timed_run(sh(path))
        return sh(path), run

    def method(name, api, method_name, params=None, uploads=None, output=None,
               floor_name=None, floor_text=None, before_floor=None, goal=True, note=""):
        argv = device.call_argv(api, method_name, params, uploads, output)
        call = lambda: device.call(api, method_name, params, uploads, output)
        floor_argv, floor = floor_runner(floor_name, floor_text, before_floor)
        request = Request(api, method_name, params, uploads, output is not None)
        return Method(name, argv, call, floor_argv, floor, request, goal, note)

    archive = os.path.join(device.work, "archive.zip")
    floor_archive = floor_store(".gen/archive.zip")

    def drop_floor_archive():
        if os.path.exists(floor_archive):
            os.remove(floor_archive)

    def export_floor():
        members = [m for m in ("ssl.crt/ca.crt", "ssl.key/ca.key", "ssl.crt/server.crt",
                               "ssl.key/server.key", "ssl.intercrt/server-ca.crt")
                   if os.path.exists(floor_store(m))]
        return floors.export_archive(device.floor_root, members)

    return [
        method("CRT create", "ORVA.Core.Certificate.CRT", "create",
               dict(CA_SUBJECT, **SERVER_SUBJECT, key_length=server_bits,
                    ca_key_length=ca_bits, alias=ALIASES),
               floor_name="crt-create",
               floor_text=lambda: floors.crt_create(device.floor_root, ca_bits, server_bits),
               note="CA %d + server %d bits" % (ca_bits, server_bits)),
        method("CSR create", "ORVA.Core.Certificate.CSR", "create",
               dict(SERVER_SUBJECT, key_length=server_bits),
               floor_name="csr-create",
               floor_text=lambda: floors.csr_create(device.floor_root, server_bits),
               note="%d bits" % server_bits),
        method("renew", "ORVA.Core.Certificate.CSR", "renew",
               floor_name="renew",
               floor_text=lambda: floors.csr_create(device.floor_root, server_bits),
               note="%d bits (installed key)" % server_bits),
        method("sign", "ORVA.Core.Certificate.CSR", "sign",
               {"csr": "request.csr", "days": DAYS, "alias": ALIASES},
               uploads={"csr": files["request"]},
               floor_name="sign",
               floor_text=lambda: floors.sign(device.floor_root, files["request"], DAYS),
               note="%d days, 2 names" % DAYS),
        method("import", "ORVA.Core.Certificate", "import",
               uploads={"cert": files["certificate"], "key": files["key"],
                        "inter_cert": files["intermediate"]},
               floor_name="import",
               floor_text=lambda: floors.import_set(device.floor_root, files["certificate"],
                                                    files["key"]),
               note="with intermediate"),
        method("export", "ORVA.Core.Certificate", "export", {"file": "archive"},
               output=archive, floor_name="export",
               floor_text=export_floor, before_floor=drop_floor_archive,
               note="archive"),
        method("list", "ORVA.Core.Certificate", "list",
               {"additional": '["valid_from","valid_till"]'},
               floor_name="list", floor_text=lambda: floors.nothing(device.floor_root),
               goal=False, note="runs no tool: floor is an empty script"),
        # Last: they leave an EC set installed, which renew would follow.
        method("CRT create P-256", "ORVA.Core.Certificate.CRT", "create",
               dict(CA_SUBJECT, **SERVER_SUBJECT, **EC_KEYS, alias=ALIASES),
               floor_name="crt-create-ec",
               floor_text=lambda: floors.crt_create(device.floor_root, "P-256", "P-256"),
               note="CA + server P-256"),
        method("CSR create P-256", "ORVA.Core.Certificate.CSR", "create",
               dict(SERVER_SUBJECT, key_type="ec", key_length=256),
               floor_name="csr-create-ec",
               floor_text=lambda: floors.csr_create(device.floor_root, "P-256"),
               note="P-256"),
    ]


def check_same_commands(method):
    """'same', 'differ: ...', or 'unchecked' without strace. Runs each side once
    under a trace; the method's run changes the store as any run does."""
    ours = floors.traced_tool_commands(method.argv)
    theirs = floors.traced_tool_commands(method.floor_argv)
    if ours is None or theirs is None:
        return "unchecked", None
    if _in_order(ours) == _in_order(theirs):
        return "same", ours
    return "differ", (ours, theirs)


def _in_order(commands):
    """The commands in an order that does not depend on the scheduler: the
    digest stage of a pipeline may start before or after its first stage, so
    digests are counted, everything else is compared in order."""
    digests = [c for c in commands if c.endswith(" md5")]
    return [c for c in commands if not c.endswith(" md5")], len(digests)
