"""Timing of processes and the statistics the table shows."""

import os
import random
import statistics
import subprocess
import time


class RunFailed(Exception):
    """A measured command did not do its work; its numbers would mean nothing."""


class Sample:
    """One timed run: wall-clock and CPU milliseconds (the process and every
    descendant it waited for). `parts`, when known: milliseconds by where
    they went, e.g. {"host": 3.1, "tools": 40.0}."""

    def __init__(self, wall_ms, cpu_ms, parts=None):
        self.wall_ms = wall_ms
        self.cpu_ms = cpu_ms
        self.parts = parts or {}


def timed_run(argv, env=None, cwd=None, check=None):
    """Runs argv to its end and returns a Sample. Output is kept only to judge
    success: check(returncode, stdout) must return True, else RunFailed."""
    start = time.perf_counter()
    process = subprocess.Popen(argv, env=env, cwd=cwd, stdin=subprocess.DEVNULL,
                               stdout=subprocess.PIPE, stderr=subprocess.PIPE)
    stdout = process.stdout.read()
    stderr = process.stderr.read()
    _, status, usage = os.wait4(process.pid, 0)
    wall = (time.perf_counter() - start) * 1000.0
    process.returncode = os.waitstatus_to_exitcode(status)
    process.stdout.close()
    process.stderr.close()
    ok = process.returncode == 0 if check is None else check(process.returncode, stdout)
    if not ok:
        raise RunFailed("exit %d: %s\nstderr: %s\ncommand: %s" % (
            process.returncode, stdout.decode(errors="replace").strip()[-300:],
            stderr.decode(errors="replace")[-800:], " ".join(argv)))
    return Sample(wall, (usage.ru_utime + usage.ru_stime) * 1000.0)


class Series:
    """The samples of one measured thing."""

    def __init__(self, label):
        self.label = label
        self.wall = []
        self.cpu = []
        self.parts = {}

    def add(self, sample):
        self.wall.append(sample.wall_ms)
        if sample.cpu_ms is not None:
            self.cpu.append(sample.cpu_ms)
        for name, ms in sample.parts.items():
            self.parts.setdefault(name, []).append(ms)

    def median(self):
        return statistics.median(self.wall)

    def quartiles(self):
        """(first quartile, third quartile) of the wall times."""
        if len(self.wall) < 2:
            return (self.wall[0], self.wall[0])
        q = statistics.quantiles(self.wall, n=4, method="inclusive")
        return (q[0], q[2])

    def cpu_median(self):
        return statistics.median(self.cpu) if self.cpu else None

    def part_mean(self, name):
        """The mean of one part: a mean, not a median, because some parts
        come in whole clock ticks and only their mean is not rounded."""
        values = self.parts.get(name)
        return statistics.mean(values) if values else None


def ratio_interval(numerator, denominator, rounds=2000, seed=9):
    """95% bootstrap interval of median(numerator) / median(denominator),
    each side resampled on its own. Fixed seed: the same samples always give
    the same interval."""
    rng = random.Random(seed)
    ratios = []
    for _ in range(rounds):
        a = statistics.median(rng.choices(numerator, k=len(numerator)))
        b = statistics.median(rng.choices(denominator, k=len(denominator)))
        ratios.append(a / b)
    ratios.sort()
    return ratios[int(0.025 * rounds)], ratios[int(0.975 * rounds) - 1]


def interleaved(runs, steps):
    """Runs every step once per round, for `runs` rounds, rotating the order
    from round to round, so that load on the shared machine falls on every
    step alike. steps: list of (Series, callable returning a Sample)."""
    for round_index in range(runs):
        shift = round_index % len(steps)
        for series, step in steps[shift:] + steps[:shift]:
            series.add(step())
