"""What the methods are held against besides their floors: RSA key generation
inside one process, and easy-rsa making a CA and a server certificate."""

import os
import shlex
import shutil
import subprocess

import floors
from measure import RunFailed, Sample, timed_run

EASYRSA_CANDIDATES = ["/usr/share/easy-rsa/easyrsa", "easyrsa"]


class InProcessKeygen:
    """A running bench_keygen: one key per request, timed inside the process."""

    def __init__(self, program, bits):
        self.process = subprocess.Popen([program, str(bits)], stdin=subprocess.PIPE,
                                        stdout=subprocess.PIPE, text=True, bufsize=1)

    def one_key(self):
        self.process.stdin.write("\n")
        self.process.stdin.flush()
        line = self.process.stdout.readline()
        if not line:
            raise RunFailed("bench_keygen stopped")
        return Sample(float(line), None)

    def close(self):
        self.process.stdin.close()
        if self.process.wait() != 0:
            raise RunFailed("bench_keygen failed")
        self.process.stdout.close()


def tool_keygen(openssl, key_path, bits):
    """The key generator's command line, started directly."""
    argv = [openssl, "genrsa", "-rand", floors.seed_list(), "-out", key_path, str(bits)]
    return lambda: timed_run(argv)


def find_easyrsa():
    for candidate in EASYRSA_CANDIDATES:
        found = shutil.which(candidate) if "/" not in candidate else (
            candidate if os.access(candidate, os.X_OK) else None)
        if found:
            return found
    return None


class EasyRsa:
    """A CA and a server certificate with easy-rsa, with the subjects, key sizes,
    validity and alternative names of CRT create. Each run starts from a new
    PKI folder (made untimed, as `orva-webapi init` is); the timed part is
    build-ca and build-server-full."""

    def __init__(self, program, work, ca_bits, server_bits, days, ca_subject,
                 server_subject, aliases, curve=None):
        """`curve` ("prime256v1"): EC keys on it instead of RSA of the sizes."""
        self.program = program
        self.pki = os.path.join(work, "easyrsa-pki")
        self.work = work
        alt_names = ",".join(("IP:" if name.replace(".", "").isdigit() else "DNS:") + name
                             for name in aliases.split(";") if name)
        common = ["--batch", "--pki-dir=" + self.pki, "--days=%d" % days,
                  "--dn-mode=org", "--req-c=" + ca_subject["ca_country"],
                  "--req-st=" + ca_subject["ca_state"], "--req-city=" + ca_subject["ca_city"],
                  "--req-org=" + ca_subject["ca_organization"],
                  "--req-ou=" + ca_subject["ca_department"]]
        if curve:
            common += ["--use-algo=ec", "--curve=" + curve]
        self.build_ca = [program] + common + [
            "--keysize=%d" % ca_bits, "--req-email=" + ca_subject["ca_email"],
            "--req-cn=" + ca_subject["ca_common_name"], "build-ca", "nopass"]
        self.build_server = [program] + common + [
            "--keysize=%d" % server_bits, "--req-email=" + server_subject["email"],
            "--subject-alt-name=" + alt_names, "build-server-full",
            server_subject["common_name"], "nopass"]
        self.script = os.path.join(work, "easyrsa-set-%s.sh" % (curve or "rsa"))
        with open(self.script, "w") as script:
            script.write("set -e\n%s >/dev/null 2>&1\n%s >/dev/null 2>&1\n" % (
                " ".join(shlex.quote(a) for a in self.build_ca),
                " ".join(shlex.quote(a) for a in self.build_server)))

    def run(self):
        shutil.rmtree(self.pki, ignore_errors=True)
        subprocess.run([self.program, "--batch", "--pki-dir=" + self.pki, "init-pki"],
                       check=True, stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL,
                       cwd=self.work)
        sample = timed_run(["/bin/sh", self.script], cwd=self.work)
        issued = os.path.join(self.pki, "issued")
        if not os.path.isdir(issued) or not os.listdir(issued):
            raise RunFailed("easy-rsa made no server certificate")
        return sample
