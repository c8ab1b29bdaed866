#!/usr/bin/env python3
"""Attacks the tool: calls that fail, signals, kills, hostile inputs, absurd options, blocked outputs, rogue plug-ins.

    tests/sweep/sweep.py build/release [--quick | --all] [--kind K]... [--job J] [--case NAME] [--seed N]

Every run has to end as it should: with status 0 and the right bytes, or with an error in one line and the old
outputs unchanged. A crash, a hang, a torn or mixed result, a success with other bytes, a file left over and a
message that shows the inside are faults. Each fault is printed with a command that repeats it. The status is 1 if
there is one. See docs/hacking.md, and the comment of each attack's unit.
"""
import argparse
import collections
import concurrent.futures
import os
import pathlib
import random
import signal
import subprocess
import sys
import tempfile
import time

import batches
import faults
import feeding
import hostile
import jobs
import kills
import limits
import options
import outputs
import perturb
import plugins
import presets
import readers
import signals
from runner import Sweep

HERE = pathlib.Path(__file__).resolve().parent
ATTACKS = {  # kind: the unit that has its cases, and how many of them --quick runs
    "reader": (readers, 1000), "perturb": (perturb, 12),
    "alloc": (faults, 220), "open": (faults, 15), "read": (faults, 20), "write": (faults, 30), "close": (faults, 15),
    "rename": (faults, 20), "sync": (faults, 20), "thread": (faults, 15), "make": (faults, 10), "lock": (faults, 10),
    "kill": (kills, 60), "signal": (signals, 40), "hostile": (hostile, 100), "option": (options, 60),
    "output": (outputs, 1000), "limit": (limits, 20), "plugin": (plugins, 1000), "batch": (batches, 2), "batchkill": (batches, 25),
    "watch": (feeding, 2), "preset": (presets, 10),
}


def build_helpers(to):
    """The library that makes calls fail, and the tracer that kills."""
    to.mkdir(parents=True, exist_ok=True)
    compiler = os.environ.get("CXX", "c++")
    made = to / "shim.so", to / "killat"
    for source, target, flags in (("shim.cpp", made[0], ["-fPIC", "-shared"]), ("killat.cpp", made[1], [])):
        if not target.exists() or target.stat().st_mtime < (HERE / source).stat().st_mtime:
            subprocess.run([compiler, "-std=c++20", "-O1", "-Wall", "-Wextra", *flags, HERE / source, "-o", target,
                            "-ldl"], check=True)
    return tuple(map(str, made))


def chosen_cases(sweep, pool, wanted):
    """The cases of the wanted kinds, in quick runs a seeded part of each kind; one by its name if there is one."""
    chosen = sweep.options
    for unit in dict.fromkeys(ATTACKS[kind][0] for kind in wanted):
        rng = random.Random(chosen.seed)
        found = collections.defaultdict(list)
        for kind, name, run in unit.cases(sweep, pool, rng):
            if kind in wanted and chosen.case in (None, f"{kind}/{name}"):
                found[kind].append((kind, name, run))
        for kind, cases in found.items():
            most = ATTACKS[kind][1] if chosen.quick else len(cases)
            keep = set(rng.sample(range(len(cases)), min(most, len(cases))))
            yield from (case for i, case in enumerate(cases) if i in keep)


def guarded(case):
    try:
        return case[2]()
    except Exception as failure:  # of the attack itself
        return "error", f"the attack failed: {failure!r}", None


class Report:
    def __init__(self, chosen):
        self.chosen = chosen
        self.runs, self.ok, self.failed, self.faults, self.seconds = (collections.Counter() for _ in range(5))

    def add(self, kind, name, ended, wrong, outcome):
        self.runs[kind] += 1
        if wrong:
            self.faults[kind] += 1
            if self.faults[kind] <= self.chosen.show:
                again = f"./dev sweep {'--asan ' if self.chosen.asan else ''}--seed {self.chosen.seed}"
                print(f"FAULT {kind}/{name}: {wrong}\n      {again} --case '{kind}/{name}'", flush=True)
                if outcome:
                    print(f"      {outcome.command}", flush=True)
        elif ended in ("ok", "not met"):
            self.ok[kind] += 1
        else:
            self.failed[kind] += 1
        if self.chosen.case and outcome:
            print(f"status {outcome.status}\n{outcome.text}", end="")

    def table(self):
        lines = [f"{'kind':10}{'runs':>8}{'ok':>8}{'failed as they should':>24}{'faults':>8}"]
        for kind in [*self.runs, "all"]:
            cells = [c.total() if kind == "all" else c[kind] for c in (self.runs, self.ok, self.failed, self.faults)]
            lines.append("{:10}{:8}{:8}{:24}{:8}".format(kind, *cells))
        return "\n".join(lines)


def arguments():
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    parser.add_argument("build", help="folder of the build, or the tool itself")
    parser.add_argument("--quick", action="store_true", help="a seeded part of each kind: about one minute")
    parser.add_argument("--all", action="store_true", help="every call of every stack, and every system call")
    parser.add_argument("--kind", action="append", choices=ATTACKS, help="only this kind; may be repeated")
    parser.add_argument("--job", choices=[job.name for job in jobs.JOBS], help="only this job")
    parser.add_argument("--case", help="only the case of this name, with what the tool says")
    parser.add_argument("--seed", type=int, default=1)
    parser.add_argument("--sample", type=int, default=600, help="calls beyond the first of each stack (600)")
    parser.add_argument("--show", type=int, default=8, help="faults of a kind that are printed one by one (8)")
    parser.add_argument("--trace", action="store_true", help="print as well what called")
    parser.add_argument("--asan", action="store_true", help="the build has the address sanitizer")
    parser.add_argument("--jobs", type=int, default=os.cpu_count(), help="runs at a time")
    chosen = parser.parse_args()
    if chosen.case:
        chosen.kind = [chosen.case.split("/")[0]]
        named = chosen.case.split("/")[1]
        by_job = ATTACKS[chosen.kind[0]][0] in (faults, kills, signals)
        chosen.job = chosen.job or (named if by_job else None)
    return chosen


def main():
    chosen = arguments()
    # A shell in the background ignores the one, nohup the other, and the tool leaves ignored what it finds so.
    signal.signal(signal.SIGINT, signal.default_int_handler)
    signal.signal(signal.SIGHUP, signal.SIG_DFL)
    build, started = pathlib.Path(chosen.build).resolve(), time.monotonic()
    tool, built = (build, None) if build.is_file() else (build / "bin" / "tarsel", build / "sweep")
    memory = "/dev/shm" if os.access("/dev/shm", os.W_OK) else None  # syncs are quick there
    with tempfile.TemporaryDirectory(prefix="tarsel-sweep-", dir=memory) as folder, \
            concurrent.futures.ThreadPoolExecutor(chosen.jobs) as pool:
        sweep = Sweep(tool, folder, build_helpers(built or pathlib.Path(folder) / "helpers"), chosen)
        sweep.refer()
        report = Report(chosen)
        pending = collections.deque()
        for case in chosen_cases(sweep, pool, chosen.kind or list(ATTACKS)):
            pending.append((case, pool.submit(guarded, case)))
            while len(pending) > 4 * chosen.jobs:
                case, result = pending.popleft()
                report.add(*case[:2], *result.result())
        for case, result in pending:
            report.add(*case[:2], *result.result())
    if not report.runs:
        sys.exit("sweep: there is no such case")
    print(report.table())
    print(f"{report.runs.total()} runs in {time.monotonic() - started:.0f} s, seed {chosen.seed}: "
          f"{report.faults.total()} faults")
    return 1 if report.faults else 0


if __name__ == "__main__":
    sys.exit(main())
