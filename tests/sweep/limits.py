"""Limits of the process: address space, open files, and file size; each from far too little up to enough."""
from runner import Box, crashed, judged

BIG = ["transcode", "testgen:size=1920x1080,duration=0.2", "-o", "big.png", "-y"]
MEGABYTES = [30, 35, 40, 45, 50, 55, 60, 65, 70, 80, 90, 100, 120, 150, 200, 300]
FILES = [3, 4, 5, 6, 7, 8, 9, 10, 12, 16]
BYTES = [0, 1, 100, 977, 4096, 10000]


def attack(sweep, job, limit):
    wrap = ["prlimit", limit]
    with Box(sweep) as box:
        if box.run(["--version"], wrap=wrap).status != 0:
            return "not met", None, None  # not even the loader has enough
        box.lay(sweep.old[job.name])
        outcome = box.run(job.arguments, wrap=wrap)
        return outcome.ended(), judged(box, outcome, job), outcome


def big(sweep, limit):
    """A sequence of large pictures, whose frames wait in a queue: all of them, or nothing."""
    with Box(sweep) as box:
        outcome = box.run(BIG, wrap=["prlimit", limit])
        files = box.files()
        wrong = crashed(outcome) or (f"leaves {box.litter()}" if box.litter() else None)
        if not wrong and len(files) != (6 if outcome.status == 0 else 0):
            wrong = f"status {outcome.status} with {sorted(files)}"
        return outcome.ended(), wrong, outcome


def cases(sweep, pool, rng):
    if sweep.asan:
        return
    for number in MEGABYTES:
        yield "limit", f"big/as{number}", lambda number=number: big(sweep, f"--as={number * 1000000}")
    for job in sweep.jobs:
        for name, values in (("as", [n * 1000000 for n in MEGABYTES[::3]]), ("nofile", FILES), ("fsize", BYTES)):
            for value in values:
                yield "limit", f"{job.name}/{name}{value}", lambda a=(sweep, job, f"--{name}={value}"): attack(*a)
