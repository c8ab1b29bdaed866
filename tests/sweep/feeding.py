"""A watched folder that is fed by writers of all sorts, while the watching process is killed now and then.

At the end each complete file has been made once, or once more where a kill fell into its making, with all its samples;
it is in the folder for what was done, unchanged; what can't be made is in the one for failures, with a text; what is no
complete file is where it was. In the middle of it the disk of the outputs is full, where this user may mount one.
"""
import contextlib
import os
import random
import re
import signal
import struct
import subprocess
import threading
import time

from runner import Box, crashed

SETTLE = 0.3
# Files, seconds of feeding, kills.
FORMS = {"quick": (33, 3, 1), "normal": (99, 15, 4), "all": (500, 600, 20)}


def sound(rng):
    """A WAV file."""
    data = rng.randbytes(4 * rng.randint(200, 60000))
    return b"RIFF" + struct.pack("<I", 36 + len(data)) + b"WAVEfmt " + struct.pack(
        "<IHHIIHH", 16, 1, 2, 44100, 176400, 4, 16) + b"data" + struct.pack("<I", len(data)) + data


def samples_of(data):
    at = data.find(b"data")
    return data[at + 8:] if at >= 0 else b""


def in_pieces(path, file, count, pause):
    with path.open("wb", buffering=0) as to:
        step = len(file) // count + 1
        for at in range(0, len(file), step):
            to.write(file[at:at + step])
            time.sleep(pause)


def copy(path, file, rng, aside):
    path.write_bytes(file)


def move(path, file, rng, aside):
    (aside / path.name).write_bytes(file)
    (aside / path.name).rename(path)


def slow(path, file, rng, aside):
    in_pieces(path, file, 8, rng.uniform(0.02, SETTLE))


def stall(path, file, rng, aside):
    in_pieces(path, file, 2, rng.uniform(2, 6) * SETTLE)


def part(path, file, rng, aside):
    other = path.with_name(path.name + rng.choice((".part", ".tmp", ".filepart", ".crdownload", "~")))
    in_pieces(other, file, 2, 2 * SETTLE)
    other.rename(path)


def rsync(path, file, rng, aside):
    other = path.with_name(f".{path.name}.aB3xYz")
    in_pieces(other, file, 2, 2 * SETTLE)
    os.utime(other, (1e9, 1e9))
    other.rename(path)


def zero(path, file, rng, aside):
    path.touch()


def folder(path, file, rng, aside):
    path.mkdir()


def link(path, file, rng, aside):
    (aside / path.name).write_bytes(file)
    path.symlink_to(aside / path.name)


def gone(path, file, rng, aside):
    path.write_bytes(file)
    time.sleep(SETTLE * rng.uniform(0.8, 1.6))
    path.unlink(missing_ok=True)


def damaged(path, file, rng, aside):
    path.write_bytes(file[:30])


WRITERS = (copy, move, slow, stall, part, rsync, zero, folder, link, gone, damaged)
STAY = (zero, folder, link)


class Feed:
    """Writers at work; `files` has what each of them has to give: its writer and the file."""

    def __init__(self, work, form, seed):
        self.count, self.seconds, _ = form
        self.work, self.seed, self.files = work, seed, {}
        (work / "in").mkdir()
        (work / "aside").mkdir()

    def give(self, number):
        rng = random.Random(f"{self.seed} {number}")
        writer, name, file = WRITERS[number % len(WRITERS)], f"{number}.wav", sound(rng)
        time.sleep(rng.uniform(0, self.seconds))
        writer(self.work / "in" / name, file, rng, self.work / "aside")
        self.files[name] = writer, file

    def run(self):
        # Each writer sleeps until its moment.
        threads = [threading.Thread(target=self.give, args=(n,)) for n in range(self.count)]
        for thread in threads:
            thread.start()
        return threads


class Disk:
    """A disk of its own for the outputs, in a name space of its own, that a process holds while this lives. Where that
    can't be made, `wrap` is empty and `out` is the plain folder."""

    SIZE = 96 << 20

    def __init__(self, work):
        self.wrap, self.out = [], work / "out"
        self.out.mkdir()
        self.holder = subprocess.Popen(
            ["unshare", "-rm", "sh", "-c", f'mount -t tmpfs -o size={self.SIZE} none "$1" && echo made && exec sleep 3600',
             "sh", self.out], stdout=subprocess.PIPE, stderr=subprocess.DEVNULL, text=True)
        if self.holder.stdout.readline():
            self.wrap = ["nsenter", "-t", self.holder.pid, "-U", "-m", "--preserve-credentials", f"--wd={work}"]
            self.out = type(work)(f"/proc/{self.holder.pid}/root{self.out}")

    def full(self, seconds):
        """Leaves a few blocks for so long."""
        with (self.out / ".filler").open("wb", buffering=0) as filler, contextlib.suppress(OSError):
            while True:
                filler.write(bytes(1 << 16))
        os.truncate(self.out / ".filler", (self.out / ".filler").stat().st_size - (1 << 14))
        time.sleep(seconds)
        (self.out / ".filler").unlink()

    def close(self):
        self.holder.kill()
        self.holder.wait()
        self.holder.stdout.close()


def wrong_with(box, out, files, lines, kills):
    """What is wrong at the end, or None."""
    work = box.work

    def read(name):
        path = out / name[4:] if name.startswith("out/") else work / name
        return path.read_bytes() if path.is_file() else None

    for name, (writer, file) in files.items():
        there, made = os.path.lexists(work / "in" / name), read(f"out/{name}")
        times = len(re.findall(rf"made of '{re.escape(name)}'", lines))
        if writer in STAY:
            if not there or made is not None:
                return f"{writer.__name__} {name} was taken"
        elif writer is damaged:
            if there or made is not None or read(f"bad/{name}") != file[:30] or not read(f"bad/{name}.txt"):
                return f"the damaged {name} is not where it belongs"
        elif writer is gone:
            if made is not None and samples_of(made) != samples_of(file):
                return f"{name}, which was removed, is made of a part"
        elif made is None or samples_of(made) != samples_of(file):
            return f"{writer.__name__} {name} is " + ("not made" if made is None else "made of a part")
        elif there or read(f"done/{name}") != file:
            return f"the input of {writer.__name__} {name} is lost or changed"
        elif times > 1 + kills or (kills == 0 and times != 1):
            return f"{name} was made {times} times"
    inputs = [name for name, (writer, _) in files.items() if writer not in STAY and writer is not damaged]
    odd = [path.name for path in out.iterdir() if path.name not in inputs]
    return f"leaves {', '.join(odd)} among the outputs" if odd else None


def attack(sweep, form, seed):
    _, seconds, kills = form
    with Box(sweep) as box, contextlib.closing(Disk(box.work)) as disk:
        feed = Feed(box.work, form, seed)
        arguments = ["watch", "in", "--preset", "RAW:out", "--move", "done", "--failed", "bad", "--settle", SETTLE]
        threads, rng, said = feed.run(), random.Random(seed), box.root / "said"
        if disk.wrap:
            threads.append(threading.Timer(seconds / 3, disk.full, [min(seconds / 5, 60)]))
            threads[-1].start()
        for turn in range(kills + 1):
            with said.open("ab") as to:  # more than a pipe holds
                process = box.start(arguments, wrap=disk.wrap, stderr=to)
            if turn < kills:
                time.sleep(seconds / (kills + 1) * rng.uniform(0.6, 1.4))
                process.send_signal(signal.SIGKILL)
            else:
                for thread in threads:
                    thread.join()
                process.send_signal(signal.SIGTERM)
            outcome = box.finish(process)
            if turn == kills and outcome.status != 143:
                return outcome.ended(), f"ends with {outcome.status}: {said.read_text(errors='replace')[-500:]}", outcome
        outcome = box.run([*arguments, "--once"], wrap=disk.wrap)
        lines = said.read_text(errors="replace") + outcome.text
        wrong = crashed(outcome) or wrong_with(box, disk.out, feed.files, lines, kills)
        if not wrong and outcome.status not in (0, 1):
            wrong = f"ends with {outcome.status}: {outcome.text[-500:]}"
        litter = box.litter() + [path.name for path in disk.out.rglob(".tarsel*")]
        if not wrong and litter:
            wrong = f"leaves {', '.join(litter)}"
        return outcome.ended(), wrong, outcome


def cases(sweep, pool, rng):
    form = FORMS["quick" if sweep.options.quick else "all" if sweep.options.all else "normal"]
    calm = (*form[:2], 0)
    for name, chosen in (("calm", calm), ("killed", form)):
        seed = rng.random()
        yield "watch", name, lambda chosen=chosen, seed=seed: attack(sweep, chosen, seed)
