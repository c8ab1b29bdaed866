"""Calls of the C library that fail: memory, files, syncs, renames, locks, folders, thread starts.

A recording run of each job lists the call stacks. One call of each distinct stack that allocates fails, once over all
jobs, then a seeded sample of the others. Of all other kinds each job has the first, the middle and the last call of
each stack fail, in each way that there is.

Some functions of the codec libraries lose a failure of memory inside them, or do not survive it: they report success,
and options, tags or tables are gone. Nobody who calls them can tell, so that does not count.
"""
import collections
import functools
import os
import pathlib
import re
import subprocess

import kills
from runner import Box, crashed, judged, wording

# How calls of a kind fail, and whether only one does or all from there on.
WAYS = {
    "alloc": [("enomem", False), ("enomem", True)],
    "open": [("eio", False), ("eio", True)],
    "read": [("eio", False), ("eio", True), ("short", False)],
    "write": [("eio", False), ("enospc", False), ("enospc", True), ("short", False)],
    "close": [("eio", False), ("enospc", True)],
    "rename": [("eio", False), ("eio", True)],
    "sync": [("eio", False), ("enospc", True)],
    "thread": [("eagain", False), ("eagain", True)],
    "make": [("enospc", False), ("eio", True)],
    "lock": [("enolck", False), ("enolck", True)],
}

# Functions of the codec libraries that lose a failure of memory on the way up.
LOSING = {"avcodec_alloc_context3", "avcodec_open2", "avformat_write_header", "av_write_trailer"}


@functools.cache
def libraries(sweep):
    """What is preloaded: the sanitizer has to come after the shim, which passes its calls on to it."""
    if not sweep.asan:
        return sweep.shim
    asan = subprocess.run([os.environ.get("CC", "cc"), "-print-file-name=libasan.so"], capture_output=True, text=True)
    return f"{sweep.shim}:{os.path.realpath(asan.stdout.strip())}"


def preload(sweep, box):
    return {"LD_PRELOAD": libraries(sweep), "SWEEP_REPORT": box.root / "report"}


def calls(sweep, job):
    """How often each call stack of a job makes a call: {(kind, site, stack): count}, in the order of the run."""
    with Box(sweep) as box:
        box.lay(sweep.old[job.name])
        sweep.completed(box.run(job.arguments, {**preload(sweep, box), "SWEEP_RECORD": 1}), job)
        return collections.Counter(tuple(line.split()) for line in (box.root / "report").read_text().splitlines())


def attack(sweep, job, call, nth, way, trace=False):
    ended, wrong, outcome = attacked(sweep, job, call, nth, way, trace)
    if wrong and call[0] == "alloc" and not trace and lostInside(attacked(sweep, job, call, nth, way, True)[1]):
        return "lost inside a library", None, outcome
    return ended, None if wrong and trace and lostInside(wrong) else wrong, outcome


def lostInside(wrong):
    """Whether the libraries lost it, before anything of the engine that they call themselves."""
    names = (wrong or "").split()
    own = next((i for i, name in enumerate(names) if "Qv" in name or "TransVLink" in name), len(names))
    return not LOSING.isdisjoint(names[:own])


def attacked(sweep, job, call, nth, way, trace):
    kind, site, stack = call
    how, ever = way
    with Box(sweep) as box:
        box.lay(sweep.old[job.name])
        variables = {"SWEEP_KIND": kind, "SWEEP_SITE": site, "SWEEP_STACK": stack, "SWEEP_NTH": nth, "SWEEP_HOW": how}
        variables |= ({"SWEEP_EVER": 1} if ever else {}) | ({"SWEEP_TRACE": 1} if trace else {})
        outcome = box.run(job.arguments, {**preload(sweep, box), **variables})
        report = pathlib.Path(box.root / "report").read_text()
        if kind == "rename" and ever and crashed(outcome) is None and box.litter():
            # Not even the way back can be taken: as after a kill, nothing is mixed, and the next run completes it.
            wrong = kills.mixed(box.files(), sweep.old[job.name], sweep.new[job.name])
            wrong = wrong or kills.after(box, sweep, job, "again") or wording(outcome)
        else:
            wrong = judged(box, outcome, job)
        if not report and outcome.status == 0:
            return "not met", wrong, outcome
        if trace and wrong:
            wrong += "\n" + called(report)
        return outcome.ended(), wrong, outcome


def called(report):
    names = re.findall(r"\((\w+)\+", report)
    return subprocess.run(["c++filt"], input="\n".join("        " + name for name in names), capture_output=True,
                          text=True).stdout


def cases(sweep, pool, rng):
    seen, more = set(), []
    recorded = list(pool.map(lambda job: calls(sweep, job), sweep.jobs))
    for job, counted in zip(sweep.jobs, recorded):
        for call, count in counted.items():
            kind = call[0]
            if kind == "alloc":
                distinct = call not in seen
                seen.add(call)
                picks = [(1, way, distinct and not way[1]) for way in WAYS[kind]]
                later = {2, (count + 1) // 2, count} - {1} if count > 1 else set()
                picks += [(nth, WAYS[kind][0], False) for nth in sorted(later)]
            else:
                picks = [(nth, way, True) for nth in sorted({1, (count + 1) // 2, count}) for way in WAYS[kind]]
            for nth, way, first in picks:
                name = f"{job.name}/{call[2]}-{nth}-{way[0]}{'-ever' if way[1] else ''}"
                case = (kind, name, lambda a=(sweep, job, call, nth, way, sweep.options.trace): attack(*a))
                if first:
                    yield case
                else:
                    more.append(case)
    every = sweep.options.all or sweep.options.case
    yield from more if every else rng.sample(more, min(len(more), sweep.options.sample))
