"""Outputs that block, break, fill up or vanish, and standard streams that are closed."""
import contextlib
import os
import re
import shutil
import signal
import subprocess
import threading
import time

import jobs
from runner import Box, crashed, judged, wording

LONG = ["transcode", "testgen:size=320x240,duration=20,audio=0", "--pixel", "I420"]
FULL = re.compile(r"space|free|full")
PATIENCE = 15  # seconds for a run that was asked to stop


def said(outcome, *statuses):
    """What is wrong with a run that had to end with one of these."""
    wrong = crashed(outcome) or (wording(outcome) if outcome.status != 0 else None)
    return wrong or (None if outcome.status in statuses else f"ends with {outcome.status}: {outcome.text.strip()!r}")


@contextlib.contextmanager
def reader(path, takes):
    """Reads so many bytes of a FIFO and leaves; with None it never reads, with -1 all."""
    def read():
        with open(path, "rb", buffering=0) as file:
            done.wait(30) if takes is None else file.read() if takes < 0 else file.read(takes)
    done = threading.Event()
    thread = threading.Thread(target=read, daemon=True)
    thread.start()
    yield
    done.set()
    thread.join(5)


def fifo_alone(box, number):
    os.mkfifo(box.work / "f.yuv")
    return stopped(box, [*LONG, "-o", "f.yuv", "-y"], number)


def fifo_unread(box, number):
    os.mkfifo(box.work / "f.yuv")
    with reader(box.work / "f.yuv", None):
        return stopped(box, [*LONG, "-o", "f.yuv", "-y"], number)


def pipe_unread(box, number):
    """The standard output, which nobody reads."""
    out, end = os.pipe()
    try:
        return stopped(box, [*LONG, "-o", "/dev/stdout"], number, stdout=end)
    finally:
        os.close(out)
        os.close(end)


def stopped(box, arguments, number, **streams):
    process = box.start(arguments, **streams)
    time.sleep(0.4)  # by then it waits for the other side; if not, the signal comes earlier, which is as good
    process.send_signal(number)
    outcome = box.finish(process, PATIENCE)
    return said(outcome, 128 + number), outcome


def state_line(box):
    """SIGUSR1 prints a line, and the job continues."""
    os.mkfifo(box.work / "f.yuv")
    with reader(box.work / "f.yuv", None):
        process = box.start([*LONG, "-o", "f.yuv", "-y"])
        time.sleep(0.4)
        process.send_signal(signal.SIGUSR1)
        time.sleep(0.4)
        process.send_signal(signal.SIGTERM)
        outcome = box.finish(process, PATIENCE)
    lines = [line for line in outcome.text.splitlines() if line.startswith("tarsel: ")]
    return crashed(outcome) or (None if len(lines) > 1 and outcome.status == 143 else f"no state: {lines}"), outcome


def post_stopped(box):
    """A signal while the command of --post runs ends that as well."""
    post = "echo $$ > pid.part; mv pid.part pid; exec sleep 60"
    process = box.start(["transcode", "in.wav", "-o", "out.wav", "--post", post])
    pid = box.work / "pid"
    while process.poll() is None and not pid.exists():
        time.sleep(0.01)
    process.send_signal(signal.SIGTERM)
    outcome = box.finish(process, PATIENCE)
    with contextlib.suppress(OSError, ValueError):
        os.kill(int(pid.read_text()), signal.SIGKILL)
        return "the command is left running", outcome
    return crashed(outcome), outcome


def reader_leaves(box):
    os.mkfifo(box.work / "f.yuv")
    with reader(box.work / "f.yuv", 1000):
        outcome = box.run([*LONG, "-o", "f.yuv", "-y"])
    return said(outcome, 4), outcome


def pipe_closed(box):
    out, end = os.pipe()
    os.close(out)
    outcome = box.run([*LONG, "-o", "/dev/stdout"], stdout=end)
    os.close(end)
    return said(outcome, 4), outcome


def full(box):
    outcome = box.run([*LONG, "-o", "/dev/full"])
    wrong = said(outcome, 4)
    return wrong or (None if FULL.search(outcome.text) else f"no reason: {outcome.text.strip()}"), outcome


def full_disc(box, job, size):
    """A file system of a few pages, which the job fills."""
    place = box.root / "small"
    place.mkdir()
    if subprocess.run(["mount", "-t", "tmpfs", "-o", f"size={size}", "none", place], capture_output=True).returncode:
        return None, None  # not permitted here; the limits of the file size are the other way
    try:
        arguments = [str(place / a) if a == job.arguments[job.arguments.index("-o") + 1] else a for a in job.arguments]
        outcome = box.run(arguments)
        left = sorted(os.listdir(place))
        wrong = said(outcome, 0, 4)
        if not wrong and outcome.status:
            wrong = f"leaves {left}" if left else None
            wrong = wrong or (None if FULL.search(outcome.text) else f"no reason: {outcome.text.strip()}")
        return wrong, outcome
    finally:
        subprocess.run(["umount", "-l", place], capture_output=True)


def folder_vanishes(box, hidden, delay):
    """The folder of the output, or only the hidden one in it, is removed under way."""
    (box.work / "d").mkdir()
    process = box.start([*LONG, "-o", "d/f.yuv"])
    time.sleep(delay)
    for path in list((box.work / "d").glob(".tarsel*")) if hidden else [box.work / "d"]:
        shutil.rmtree(path, ignore_errors=True)
    ended = process.poll() is not None  # before, or while its folder went
    outcome = box.finish(process)
    wrong = said(outcome, 0, 4)
    if not wrong and outcome.status == 0 and not ended and not (box.work / "d/f.yuv").exists():
        wrong = "status 0, but there is no output"
    return wrong, outcome


def no_folder(box):
    (box.work / "a-file").write_bytes(b"x")
    for name in ("no/such/out.wav", "in.wav/out.wav", "a-file/", ".", "/proc/out.wav", "/sys/out.wav"):
        outcome = box.run(["transcode", "in.wav", "-o", name, "-y"])
        wrong = said(outcome, 2, 4)
        if wrong:
            return f"{name}: {wrong}", outcome
    return None, outcome


def no_temporary(box):
    outcome = box.run([*jobs.card("-o", "/dev/null")], {"TMPDIR": "/no/such/folder"})
    return said(outcome, 0, 4), outcome


def streams_closed(box, closed):
    """A closed standard stream has its number given to the next file that is opened."""
    job = box.sweep.job("raw")
    box.lay(box.sweep.old["raw"])
    outcome = box.run(job.arguments, wrap=["sh", "-c", 'exec "$@" ' + closed, "sh"])
    if outcome.status == 0 or "2>&-" not in closed:
        return judged(box, outcome, job), outcome
    return crashed(outcome), outcome


def same_stream(box, arguments, right):
    outcome = box.run(arguments)
    return said(outcome, 0) or (None if outcome.stdout == right else "other bytes than in the file"), outcome


def to_stdout(box):
    arguments = ["transcode", *jobs.CLIP, "--to", "0.2", "-o", "/dev/stdout"]
    return same_stream(box, arguments, box.sweep.old["cut"]["part.yuv"])


def to_dash(box):
    arguments = ["transcode", *jobs.CLIP, "--to", "0.2", "-o", "-", "--format", "yuv"]
    return same_stream(box, arguments, box.sweep.old["cut"]["part.yuv"])


def to_redirected(box):
    with open(box.work / "got", "wb") as file:
        outcome = box.run(["transcode", *jobs.CLIP, "--to", "0.2", "-o", "/dev/stdout"], stdout=file)
    right = (box.work / "got").read_bytes() == box.sweep.old["cut"]["part.yuv"]
    return said(outcome, 0) or (None if right else "other bytes than in the file"), outcome


def wav_to_pipe(box):
    outcome = box.run(["transcode", "in.wav", "--format", "wav", "-o", "-"])
    right = outcome.stdout.endswith(jobs.pattern(12000))
    return said(outcome, 0) or (None if right else "not all samples came"), outcome


def to_null(box):
    for arguments in (["transcode", "in.wav"], jobs.card()[:-1], ["transcode", *jobs.CLIP]):
        outcome = box.run([*arguments, "-o", "/dev/null"])
        if said(outcome, 0):
            return said(outcome, 0), outcome
    return None, outcome


def listed(sweep):
    """Name and attack."""
    for kind in (fifo_alone, fifo_unread, pipe_unread):
        for number in (signal.SIGINT, signal.SIGTERM, signal.SIGHUP):
            yield f"{kind.__name__}-{number.name}", lambda box, kind=kind, number=number: kind(box, number)
    for name in ("raw", "avi", "pictures", "channels", "wav", "frame"):
        for size in ("4k", "12k", "28k"):
            yield f"full_disc-{name}-{size}", lambda box, a=(sweep.job(name), size): full_disc(box, *a)
    for hidden in (True, False):
        for delay in (0.02, 0.06, 0.15):
            yield f"folder_vanishes-{hidden}-{delay}", lambda box, a=(hidden, delay): folder_vanishes(box, *a)
    for closed in ("<&-", ">&-", "2>&-", "<&- >&-", "<&- >&- 2>&-"):
        yield f"streams_closed{closed.replace(' ', '')}", lambda box, closed=closed: streams_closed(box, closed)
    for attack in (state_line, post_stopped, reader_leaves, pipe_closed, full, no_folder, no_temporary, to_stdout,
                   to_dash, to_redirected, wav_to_pipe, to_null):
        yield attack.__name__, attack


def attack(sweep, one):
    with Box(sweep) as box:
        wrong, outcome = one(box)
        if outcome is None:
            return "not met", None, None
        return outcome.ended(), wrong or (f"leaves {', '.join(box.litter())}" if box.litter() else None), outcome


def cases(sweep, pool, rng):
    for name, one in listed(sweep):
        yield "output", name, lambda one=one: attack(sweep, one)
