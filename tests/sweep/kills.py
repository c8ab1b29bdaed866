"""SIGKILL between any two system calls that can change a file.

After a kill the files with a name are all old or all new: a set that is being exchanged may be incomplete for that
moment, but it is never mixed and no file is torn. Then the next run of the job, the next run of another one in that
folder, or `tarsel recover` completes it, and nothing hidden is left.
"""
from runner import Box, crashed, difference, judged


def points(sweep, job):
    """How many moments there are."""
    with Box(sweep) as box:
        box.lay(sweep.old[job.name])
        sweep.completed(traced(box, sweep, job, 0), job)
        return len((box.root / "report").read_text().splitlines())


def traced(box, sweep, job, number):
    variables = {"ASAN_OPTIONS": "detect_leaks=0"} | ({"KILLAT_ALL": 1} if sweep.options.all else {})  # not under ptrace
    return box.run(job.arguments, variables,
                   wrap=[sweep.killat, box.root / "report", number])


def mixed(files, old, new):
    """What is wrong with the files right after the kill."""
    parts = [all(side.get(name) == data for name, data in files.items()) for side in (old, new)]
    if not any(parts):
        return difference(files, old, new) or "mixed"
    if len(new) == 1 and not files and old:
        return "absent: there is neither the old nor the new file"
    return None


def after(box, sweep, job, way):
    """What is wrong after the folder was cleaned up in one of the three ways."""
    old, new = sweep.old[job.name], sweep.new[job.name]
    if way == "again":
        outcome = box.run(job.arguments)
        return judged(box, outcome, job) or (f"the next run fails: {outcome.text.strip()}" if outcome.status else None)
    if way == "recover":
        outcome = box.run(["recover", "."])
    else:
        outcome = box.run(["transcode", "in3.wav", "-o", "other.wav"])
        (box.work / "other.wav").unlink(missing_ok=True)
    wrong = crashed(outcome) or (f"`{way}` fails: {outcome.text.strip()}" if outcome.status else None)
    wrong = wrong or difference(box.files(), old, new)
    return wrong or (f"leaves {', '.join(box.litter())}" if box.litter() else None)


def attack(sweep, job, number):
    way = ["again", "recover" if sweep.recovers else "again", "other"][number % 3]
    with Box(sweep) as box:
        box.lay(sweep.old[job.name])
        outcome = traced(box, sweep, job, number)
        wrong = outcome.status not in (137, 0) and (crashed(outcome) or f"ends with {outcome.status}")
        wrong = wrong or mixed(box.files(), sweep.old[job.name], sweep.new[job.name])
        if not wrong:
            wrong = after(box, sweep, job, way)
            wrong = wrong and f"after the kill, then `{way}`: {wrong}"
        return "killed" if outcome.status == 137 else outcome.ended(), wrong, outcome


def cases(sweep, pool, rng):
    writing = [job for job in sweep.jobs if not job.stdout]
    for job, count in zip(writing, pool.map(lambda job: points(sweep, job), writing)):
        for number in range(1, count + 1):
            yield "kill", f"{job.name}/{number}", lambda a=(sweep, job, number): attack(*a)
