"""SIGKILL to a run of a batch at random moments, again and again until a run reaches its end; and right before each
system call that can change a file, in the run or in a task of it.

At the end every output has the right bytes, nothing hidden is left, and only tasks that were running when a run was killed
were done more than once: of a task whose end was noted, the files stay as they are.
"""
import json
import random
import signal
import subprocess
import time

from runner import Box

TASKS = 8
KILLS = 12  # of one batch at most; then a run may go to its end
JOBS = (["--bits", "24"], ["--channels", "1"], ["--samplerate", "48000"], ["--from", "0.01"])


def make(box):
    box.run(["batch", "night.xml", "new"])
    outputs = []
    for i in range(TASKS):
        name = f"batch{i}.wav"
        box.run(["batch", "night.xml", "add", "in3.wav", "-o", name, *JOBS[i % len(JOBS)]])
        outputs.append(name)
    box.run(["batch", "night.xml", "add", "batch0.wav", "-o", "chain.wav", "--bits", "16"])
    return [*outputs, "chain.wav"]


def expected(box, outputs):
    """The bytes, by runs of their own."""
    right = {}
    for i, name in enumerate(outputs):
        source, options = ("batch0.wav", ["--bits", "16"]) if name == "chain.wav" else ("in3.wav", JOBS[i % len(JOBS)])
        box.run(["transcode", source, "-o", name, *options])
        right[name] = (box.work / name).read_bytes()
    for name in outputs:
        (box.work / name).unlink()
    return right


def steps(box):
    """How often each task began, and ended well."""
    counts = {}
    for journal in (box.work / "night.xml.journal.d").glob("*"):
        if journal.name == "run":
            continue
        events = []
        for line in journal.read_text(errors="replace").splitlines():
            try:
                events.append(json.loads(line[17:])["event"])
            except (ValueError, KeyError):
                events.append("torn")
        counts[journal.name] = events
    return counts


def attack(sweep, seed):
    rng = random.Random(seed)
    with Box(sweep) as box:
        outputs = make(box)
        right = expected(box, outputs)
        killed = 0
        for _ in range(KILLS):
            process = box.start(["batch", "night.xml", "run", "--jobs", str(rng.choice((1, 2, 3)))])
            time.sleep(rng.uniform(0.01, 0.07))  # most of them while tasks run
            process.send_signal(signal.SIGKILL)
            try:
                process.communicate(timeout=20)
            except subprocess.TimeoutExpired:
                return "hang", "the tasks outlive their run", None
            killed += process.returncode == -signal.SIGKILL
        outcome = box.run(["batch", "night.xml", "run"])
        if outcome.status != 0:
            return outcome.ended(), f"the last run fails: {outcome.text.strip()}", outcome
        for name in outputs:
            if not (box.work / name).is_file() or (box.work / name).read_bytes() != right[name]:
                return "ok", f"{name} is absent or has other bytes", outcome
        for task, events in steps(box).items():
            if events.count("done") != 1 or events[-1] != "done":
                return "ok", f"task {task} was done {events.count('done')} times: {' '.join(events)}", outcome
            if events.count("started") > killed + 1:
                return "ok", f"task {task} began more often than runs were killed", outcome
        if litter := box.litter():
            return "ok", f"leaves {', '.join(litter)}", outcome
        return ("ok" if killed else "not met"), None, outcome


def begin(box):
    """A list of one task whose output is a set of files, and how often the task was done so far."""
    box.run(["batch", "night.xml", "new"])
    box.run(["batch", "night.xml", "add", "testgen:size=32x32,rate=25,duration=0.2", "-o", "set.raw"])


def traced(box, sweep, number):
    return box.run(["batch", "night.xml", "run"], {"ASAN_OPTIONS": "detect_leaks=0"},
                   wrap=[sweep.killat, box.root / "report", number])


def content(box):
    return {path.name: path.read_bytes() for path in box.work.glob("set.*")}


def points(sweep):
    """How many moments there are, and what the task makes."""
    with Box(sweep) as box:
        begin(box)
        if traced(box, sweep, 0).status != 0 or len(content(box)) < 2:
            raise SystemExit("sweep: the batch fails by itself")
        return len((box.root / "report").read_text().splitlines()), content(box)


def attack_at(sweep, number, right):
    """Between "placing" and "done" above all: what was placed is not made again, what was not is."""
    with Box(sweep) as box:
        begin(box)
        outcome = traced(box, sweep, number)
        deadline = time.monotonic() + 20
        before = {}
        while time.monotonic() < deadline:  # its task ends after it
            before = {path.name: path.stat().st_ino for path in box.work.glob("set.*")}
            if "running" not in box.run(["batch", "night.xml", "status"]).text:
                break
        placed = content(box) == right and not box.litter()
        again = box.run(["batch", "night.xml", "run"])
        wrong = None
        if again.status != 0:
            wrong = f"the next run fails: {again.text.strip()}"
        elif content(box) != right:
            wrong = "the files are not those of the task"
        elif placed and before != {path.name: path.stat().st_ino for path in box.work.glob("set.*")}:
            wrong = "what was placed was made again"
        elif box.litter():
            wrong = f"leaves {', '.join(box.litter())}"
        elif any(events[-1] != "done" or events.count("done") != 1 for events in steps(box).values()):
            wrong = f"the journal is {steps(box)}"
        return "killed" if outcome.status == 137 else outcome.ended(), wrong and f"after the kill: {wrong}", again


def cases(sweep, pool, rng):
    count, right = points(sweep)
    for number in range(1, count + 1):
        yield "batchkill", f"{number}", lambda number=number: attack_at(sweep, number, right)
    for number in range(17):
        yield "batch", f"kills/{number}", lambda seed=f"{sweep.options.seed}/{number}": attack(sweep, seed)
