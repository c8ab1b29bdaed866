"""SIGKILL to a run of a batch at random moments, again and again until a run reaches its end.

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


def cases(sweep, pool, rng):
    for number in range(17):
        yield "batch", f"kills/{number}", lambda seed=f"{sweep.options.seed}/{number}": attack(sweep, seed)
