"""The one results table, as Markdown (printed and written to a file)."""

import statistics

from measure import ratio_interval

MIB = 1024.0


def _ms(series):
    low, high = series.quartiles()
    return "%.1f (%.1f–%.1f)" % (series.median(), low, high)


def _verdict(low, high, limit, below=True):
    """'yes', 'no' or 'undecided' for a ratio whose 95% interval is low..high
    against `limit` (met when under it if `below`, else over it)."""
    if below:
        return "yes" if high <= limit else ("no" if low > limit else "undecided")
    return "yes" if low >= limit else ("no" if high < limit else "undecided")


def _section(table, title, result):
    """Starts a section; False, after saying why, when `result` failed."""
    table.add("## " + title)
    table.add()
    if result.get("failed"):
        table.add("Not measured: %s" % result["failed"])
        table.add()
        return False
    return True


class Table:
    def __init__(self):
        self.lines = []

    def add(self, line=""):
        self.lines.append(line)

    def text(self):
        return "\n".join(self.lines) + "\n"


def conditions(table, facts):
    table.add("# Benchmark results")
    table.add()
    for name, value in facts:
        table.add("- %s: %s" % (name, value))
    table.add()


def method_rows(table, rows, limit):
    table.add("## Methods through `orva-webapi call`, next to their floors")
    table.add()
    table.add("Wall-clock milliseconds per call: median (first–third quartile). Ratio: "
              "median over median, with a 95%% bootstrap interval; CPU ratio: the "
              "same for CPU time of the process and its children. Goal: within "
              "%.2f of the floor, judged on the interval (\"undecided\" when it "
              "straddles the goal)." % limit)
    table.add()
    table.add("| Method | Sizes | Runs | Ours, ms | Floor, ms | Ratio (95% CI) | CPU ratio | "
              "Over floor, ms | Goal met | Tool commands |")
    table.add("|---|---|---|---|---|---|---|---|---|---|")
    for row in rows:
        if row.get("failed"):
            table.add("| %s | %s | – | not measured: %s | | | | | | |" % (
                row["name"], row["note"], row["failed"]))
            continue
        ours, floor = row["ours"], row["floor"]
        low, high = ratio_interval(ours.wall, floor.wall)
        cpu = (ours.cpu_median() / floor.cpu_median()
               if ours.cpu and floor.cpu and floor.cpu_median() > 0 else None)
        verdict = _verdict(low, high, limit) if row["goal"] else "n/a (no tool)"
        table.add("| %s | %s | %d | %s | %s | %.2f (%.2f–%.2f) | %s | %+.1f | %s | %s |" % (
            row["name"], row["note"], len(ours.wall), _ms(ours), _ms(floor),
            ours.median() / floor.median(), low, high,
            "%.2f" % cpu if cpu is not None else "–",
            ours.median() - floor.median(), verdict, row["commands"]))
    table.add()


def peer_rows(table, keygen, easyrsa):
    table.add("## Lower bound and peer")
    table.add()
    table.add("| Comparison | Runs | Ours, ms | Other, ms | Ratio ours/other (95% CI) | Goal | Met |")
    table.add("|---|---|---|---|---|---|---|")
    if keygen.get("failed"):
        table.add("| RSA key generation | – | not measured: %s | | | | |" % keygen["failed"])
    else:
        tool, inside = keygen["tool"], keygen["inside"]
        low, high = ratio_interval(tool.wall, inside.wall)
        table.add("| RSA %d-bit key: `openssl genrsa` process (ours) vs libcrypto in one "
                  "process | %d | %s | %s | %.2f (%.2f–%.2f) | none (lower bound) | – |" % (
                      keygen["bits"], len(tool.wall), _ms(tool), _ms(inside),
                      tool.median() / inside.median(), low, high))
    for pair in easyrsa:
        if pair.get("failed"):
            table.add("| CRT create vs easy-rsa | – | not measured: %s | | | | |" % pair["failed"])
            continue
        ours, peer = pair["ours"], pair["peer"]
        # With P-256 keys key generation no longer hides the rest: half of
        # easy-rsa's time is the goal there.
        goal = 0.5 if "P-256" in pair["note"] else 1.0
        low, high = ratio_interval(ours.wall, peer.wall)
        table.add("| CRT create vs easy-rsa build-ca + build-server-full (%s) | %d | %s | %s "
                  "| %.2f (%.2f–%.2f) | < %g | %s |" % (
                      pair["note"], len(ours.wall), _ms(ours), _ms(peer),
                      ours.median() / peer.median(), low, high, goal,
                      _verdict(low, high, goal)))
    table.add()


def http_rows(table, http):
    if not _section(table, "The server over HTTP, through nginx", http):
        return
    table.add("wrk over loopback to nginx, one connection per client; each figure is the median "
              "of %d runs of %d s, the three kinds alternating. Floor: the same call without a "
              "token, which the host refuses (its smallest answer through the same nginx). "
              "Static: the list answer's bytes as a file that nginx serves (`--web`)."
              % (http["rounds"], http["seconds"]))
    table.add()
    table.add("| Clients | list req/s | list p50 ms | list p99 ms | floor req/s | floor p99 ms "
              "| static req/s | static p99 ms | list/floor throughput | Goal | Met |")
    table.add("|---|---|---|---|---|---|---|---|---|---|---|")
    for clients, listing, floor, static in http["loads"]:
        share = listing.per_second / floor.per_second
        if clients == 8:
            goal = "≥ 0.50 and p99 < 20 ms"
            met = "yes" if share >= 0.5 and listing.p99_ms < 20.0 else "no"
        else:
            goal, met = "–", "–"
        table.add("| %d | %.0f | %.2f | %.2f | %.0f | %.2f | %.0f | %.2f | %.2f | %s | %s |" % (
            clients, listing.per_second, listing.p50_ms, listing.p99_ms, floor.per_second,
            floor.p99_ms, static.per_second, static.p99_ms, share, goal, met))
    table.add()
    memory = http["memory"]
    idle, first, second = memory["idle"], memory["after_first"], memory["after_second"]
    growth = second - first
    table.add("| Memory (proportional set size) | idle | after %d list requests (8 connections) "
              "| after %d more | growth over the second lot | Goal | Met |"
              % (memory["lot"], memory["lot"]))
    table.add("|---|---|---|---|---|---|---|")
    table.add("| `orva-webapi serve` and its nginx | %.1f MiB | %.1f MiB | %.1f MiB | %+.0f KiB "
              "| idle < 24 MiB, no growth | %s |" % (
                  idle / MIB, first / MIB, second / MIB, growth,
                  "yes" if idle < 24 * MIB and growth <= memory["tolerance_kib"] else "no"))
    table.add()
    table.add("Growth counts as none up to %d KiB (allocator pages)." % memory["tolerance_kib"])
    table.add()


def web_method_rows(table, rows, limit):
    measured = {} if any("web" in row for row in rows) else {"failed": "left out"}
    if not _section(table, "Methods over HTTP through the running server, next to the same "
                    "floors", measured):
        return
    table.add("POST /webapi to one `orva-webapi serve` through its nginx on loopback, with the "
              "token, each call on a new connection; parameters as a form, uploads as a "
              "multipart form; timed in the bench process from connecting to the answer's last "
              "byte. These runs are interleaved with the `call` runs and the floors above, and "
              "the floor column is the same floor series. HTTPS is off, as `init` leaves it, "
              "so no answer waits for nginx to reload. Goal and interval as above. The `call` "
              "column repeats the median of the same method through `orva-webapi call`, "
              "whose process start and module loading the HTTP path does without; the list "
              "row, which starts no tool, is what the HTTP path and the module cost alone.")
    table.add()
    table.add("Where the time over the floor goes, per call, as means over the runs: CPU "
              "counted by the kernel for the host's own threads (HTTP, the form, the module's "
              "own work), for the shells and tools the host waited for less the floor's shell "
              "and tools, and for nginx; then the time the method's file syncs waited for the "
              "disk, less the floor's (median of three traced runs each); the rest is the "
              "time over the floor's that no process of ours spent on a core or in a sync. "
              "Beside it, on our side alone, the time the host's and nginx's threads were "
              "ready to run but waited for a core: the floor's programs wait too, unmeasured, "
              "so it is no part of the rest, but the size of what the load costs the server "
              "per call. The rows that make RSA keys carry key generation's spread from key "
              "to key (see the quartiles) in every mean, in their tools and rest columns "
              "above all.")
    table.add()
    table.add("| Method | Sizes | Runs | Over HTTP, ms | Floor, ms | Ratio (95% CI) | Goal met "
              "| `call`, ms | Over floor (mean) | Host CPU | Tools CPU over floor's | nginx CPU "
              "| File syncs (count) | Rest | Host and nginx waiting for a core "
              "| Programs started, HTTP / floor |")
    table.add("|---|---|---|---|---|---|---|---|---|---|---|---|---|---|---|---|")
    for row in rows:
        if row.get("failed"):
            table.add("| %s | %s | – | not measured: %s |%s" % (
                row["name"], row["note"], row["failed"], " |" * 12))
            continue
        web, floor = row["web"], row["floor"]
        low, high = ratio_interval(web.wall, floor.wall)
        verdict = _verdict(low, high, limit) if row["goal"] else "n/a (no tool)"
        over = statistics.mean(web.wall) - statistics.mean(floor.wall)
        host, nginx = web.part_mean("host"), web.part_mean("nginx")
        tools = web.part_mean("tools") - statistics.mean(floor.cpu)
        ours, theirs = row["waits"]
        if ours is None or theirs is None:
            syncs, rest, started = "unchecked", "–", "unchecked"
        else:
            sync_ms = ours["sync_ms"] - theirs["sync_ms"]
            syncs = "%.1f (%d)" % (sync_ms, ours["syncs"])
            rest = "%+.1f" % (over - host - tools - nginx - sync_ms)
            # The traced method ran through `call`, one program more than over HTTP.
            started = "%d / %d" % (ours["processes"] - 1, theirs["processes"])
        table.add("| %s | %s | %d | %s | %s | %.2f (%.2f–%.2f) | %s | %.1f | %+.1f | %.1f "
                  "| %+.1f | %.1f | %s | %s | %.1f | %s |" % (
                      row["name"], row["note"], len(web.wall), _ms(web), _ms(floor),
                      web.median() / floor.median(), low, high, verdict, row["ours"].median(),
                      over, host, tools, nginx, syncs, rest, web.part_mean("waiting"), started))
    table.add()


def handshake_rows(table, result):
    if not _section(table, "HTTPS handshakes per second", result):
        return
    table.add("One `orva-webapi serve` with HTTPS on (nginx with one worker); the RSA 2048 "
              "set and the P-256 set, each made by CRT create, imported over HTTP in turn, "
              "the order alternating from round to round. A round: %d `openssl s_time -new` "
              "clients side by side for %d s, each handshake on a new TCP connection, full "
              "(s_time -new resumes no session), no request. Rate: every client's handshakes "
              "over the round's wall time. CPU per handshake: nginx's (the server) and the "
              "clients'; both share the machine's cores. Each figure: the median of %d rounds "
              "(first–third quartile)." % (
                  result["clients"], result["seconds"], result["rounds"]))
    table.add()
    table.add("| Certificate | Rounds | Handshakes/s | nginx CPU per handshake, µs "
              "| nginx handshakes per CPU second | client CPU per handshake, µs |")
    table.add("|---|---|---|---|---|---|")
    spread = lambda values: "%.0f (%.0f–%.0f)" % ((statistics.median(values),) + tuple(
        statistics.quantiles(values, n=4, method="inclusive")[0::2]))
    for kind in result["kinds"]:
        table.add("| %s | %d | %s | %s | %.0f | %s |" % (
            kind.name, len(kind.rates), spread(kind.rates), spread(kind.server_us),
            1e6 / statistics.median(kind.server_us), spread(kind.client_us)))
    table.add()
    rsa, ec = result["kinds"]
    rate_low, rate_high = ratio_interval(ec.rates, rsa.rates)
    cpu_low, cpu_high = ratio_interval(rsa.server_us, ec.server_us)
    table.add("P-256/RSA 2048 handshakes per second: %.2f (95%% interval %.2f–%.2f); "
              "nginx CPU per handshake, RSA 2048 over P-256: %.2f (95%% interval %.2f–%.2f)." % (
                  statistics.median(ec.rates) / statistics.median(rsa.rates), rate_low,
                  rate_high, statistics.median(rsa.server_us) / statistics.median(ec.server_us),
                  cpu_low, cpu_high))
    if min(statistics.median(k.client_us) - statistics.median(k.server_us) for k in (rsa, ec)) > 0:
        table.add("Each client handshake costs more CPU than nginx's side of it, and clients "
                  "and server share the cores: the rate is bounded by the clients as much as "
                  "by the server, whose own cost is its CPU per handshake.")
    table.add()
