"""The one results table, as Markdown (printed and written to a file)."""

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
    table.add("## The server over HTTP, through nginx")
    table.add()
    if http.get("failed"):
        table.add("Not measured: %s" % http["failed"])
        table.add()
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
