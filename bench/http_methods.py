"""The methods as the page calls them: POST /webapi on the running server,
through its nginx, with the token; parameters as a form, uploads as a
multipart form. Each call goes on a new connection and is timed from the
connection to the answer's last byte, and charged with the CPU time the
server spent on it, by part:

    host   the host's own threads (HTTP, the form, the module's own work)
    tools  the programs the host started and waited for: shells and tools
    nginx  nginx's master and workers

and with the time the host's and nginx's threads were ready to run but
waited for a core ("waiting"). The host's and nginx's figures are read in
nanoseconds (schedstat); the tools' part in the kernel's clock ticks
(10 ms), so only its mean over many calls is exact."""

import http.client
import json
import os
import time
import urllib.parse
import uuid

from measure import RunFailed, Sample

_TICK_MS = 1000.0 / os.sysconf("SC_CLK_TCK")


def _task_ms(pid):
    """(on a core, runnable but waiting for one): the milliseconds of every
    thread of `pid` so far."""
    run_ns, wait_ns = 0, 0
    for task in os.listdir("/proc/%d/task" % pid):
        try:
            with open("/proc/%d/task/%s/schedstat" % (pid, task)) as stat:
                fields = stat.read().split()
        except OSError:
            continue  # a thread that ended meanwhile
        run_ns += int(fields[0])
        wait_ns += int(fields[1])
    return run_ns / 1e6, wait_ns / 1e6


def _waited_children_ms(pid):
    """CPU milliseconds of the children `pid` has waited for, in whole ticks."""
    with open("/proc/%d/stat" % pid) as stat:
        fields = stat.read().rsplit(")", 1)[1].split()
    return (int(fields[13]) + int(fields[14])) * _TICK_MS  # cutime, cstime


def server_cpu_ms(server, nginx_pids):
    """One reading of the server's counters: (on a core, waiting for one) of
    the host's threads, the CPU of the children it waited for, and (on a
    core, waiting for one) of each nginx process still there, by pid."""
    nginx = {}
    for pid in nginx_pids:
        try:
            nginx[pid] = _task_ms(pid)
        except OSError:
            pass  # a worker that ended
    return {"host": _task_ms(server.process.pid),
            "tools": _waited_children_ms(server.process.pid), "nginx": nginx}


def spent_ms(before, after):
    """The parts (see above) and "waiting" between two readings. An nginx
    process counts only when both readings have it: one that ended between
    them, as an old worker does after a reload, took its counters along."""
    common = [pid for pid in after["nginx"] if pid in before["nginx"]]
    nginx = [after["nginx"][pid][i] - before["nginx"][pid][i] for pid in common for i in (0, 1)]
    return {"host": after["host"][0] - before["host"][0],
            "tools": after["tools"] - before["tools"],
            "nginx": sum(nginx[0::2]),
            "waiting": after["host"][1] - before["host"][1] + sum(nginx[1::2])}


def multipart(fields, uploads):
    """The body and content type of a multipart form: `fields` as text
    parts, `uploads` (name: path) as files under their own names."""
    boundary = uuid.uuid4().hex
    parts = []
    for name, value in fields.items():
        parts.append(b'Content-Disposition: form-data; name="%s"\r\n\r\n%s' % (
            name.encode(), str(value).encode()))
    for name, path in uploads.items():
        with open(path, "rb") as upload:
            content = upload.read()
        parts.append(b'Content-Disposition: form-data; name="%s"; filename="%s"\r\n'
                     b'Content-Type: application/octet-stream\r\n\r\n%s' % (
                         name.encode(), os.path.basename(path).encode(), content))
    dash = b"--" + boundary.encode()
    body = b"".join(dash + b"\r\n" + part + b"\r\n" for part in parts) + dash + b"--\r\n"
    return body, "multipart/form-data; boundary=" + boundary


def post(server, api, method, params=None, uploads=None):
    """One call on a new connection; returns (status, headers, body)."""
    fields = dict(params or {}, api=api, method=method)
    if uploads:
        body, content_type = multipart(fields, uploads)
    else:
        body = urllib.parse.urlencode(fields).encode()
        content_type = "application/x-www-form-urlencoded"
    connection = http.client.HTTPConnection("127.0.0.1", server.port, timeout=120)
    try:
        connection.request("POST", "/webapi", body, {
            "Authorization": "Bearer " + server.token, "Content-Type": content_type})
        answer = connection.getresponse()
        return answer.status, answer.getheaders(), answer.read()
    finally:
        connection.close()


def _succeeded(status, headers, body, download):
    if status != 200:
        return False
    if download:
        content_type = dict((k.lower(), v) for k, v in headers).get("content-type", "")
        return len(body) > 0 and "json" not in content_type
    try:
        return json.loads(body.decode()).get("success") is True
    except ValueError:
        return False


def timed_call(server, request):
    """Calls `request` (a methods.Request) over HTTP and returns its Sample;
    RunFailed when the method did not do its work."""
    # Outside the timed part: finding nginx's processes reads all of /proc.
    nginx_pids = server.nginx_pids()
    before = server_cpu_ms(server, nginx_pids)
    start = time.perf_counter()
    status, headers, body = post(server, request.api, request.method, request.params,
                                 request.uploads)
    wall = (time.perf_counter() - start) * 1000.0
    after = server_cpu_ms(server, nginx_pids)
    if not _succeeded(status, headers, body, request.download):
        raise RunFailed("HTTP %d from %s %s: %s" % (status, request.api, request.method,
                                                   body[:300].decode(errors="replace")))
    parts = spent_ms(before, after)
    return Sample(wall, parts["host"] + parts["tools"] + parts["nginx"], parts)
