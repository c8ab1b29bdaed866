#!/usr/bin/env python3
"""Fails every n-th allocation and file operation of small jobs of the tool, one run each.

    tests/sweep/sweep.py build/release [--job NAME] [--kind NAME] [--from N] [--every N] [--jobs N]

Each run is an error that is told, with the old outputs as they were, or a success with the right bytes. A crash, a
hang, a file that is left over, a success with other bytes and an output that is neither old nor right are faults.
A kind has been swept when a run passes without meeting the call that would have failed.

A build with the address sanitizer tells of stray accesses and of leaks as well; it is slow, so give it --every 20.
"""
import argparse
import collections
import concurrent.futures
import os
import pathlib
import re
import struct
import subprocess
import sys
import tempfile
import time

HERE = pathlib.Path(__file__).resolve().parent
OLD = b"what was there before\n"
PATIENCE = 60  # seconds

# How calls of a kind fail, and whether only one does or all from there on.
WAYS = {
    "alloc": [("enomem", False), ("enomem", True)],
    "open": [("eio", False), ("eio", True)],
    "read": [("eio", False), ("eio", True), ("short", False)],
    "write": [("eio", False), ("enospc", False), ("enospc", True), ("short", False)],
    "close": [("eio", False), ("enospc", True)],
    "rename": [("eio", False), ("eio", True)],
}

RAW = ["--raw", "size=64x48,pixel=I420,rate=25"]
JOBS = {  # arguments, outputs
    "sound": (["transcode", "in.wav", "-o", "out.wav", "-y"], ["out.wav"]),
    "cut": (["transcode", "clip.yuv", *RAW, "--from", "0.2", "--to", "0.6", "-o", "part.yuv", "-y"], ["part.yuv"]),
    "card": (["transcode", "testgen:size=64x64,duration=0.4", "-o", "card.raw", "-y"], ["card.raw", "card.wav"]),
    "picture": (["frame", "clip.yuv", *RAW, "--at", "0.2", "-o", "shot.png", "-y"], ["shot.png"]),
}

Outcome = collections.namedtuple("Outcome", "status text counted outputs extra")


def pattern(count):
    return bytes((i * 7 + i // 251) & 255 for i in range(count))


def make_inputs():
    data = pattern(12000)
    head = b"fmt " + struct.pack("<IHHIIHH", 16, 1, 2, 44100, 176400, 4, 16) + b"data" + struct.pack("<I", len(data))
    return {"in.wav": b"RIFF" + struct.pack("<I", 4 + len(head) + len(data)) + b"WAVE" + head + data,
            "clip.yuv": pattern(64 * 48 * 3 // 2 * 20)}


def content(name):
    try:
        with open(name, "rb") as file:
            return file.read()
    except OSError:
        return None


class Runner:
    """Runs jobs in a folder of its own; one in each process of the pool."""

    def __init__(self, tool, shim, scratch):
        self.tool, self.inputs = tool, make_inputs()
        self.preload = shim
        if "libasan" in subprocess.run(["ldd", tool], capture_output=True, text=True, check=True).stdout:
            asan = subprocess.run([os.environ.get("CC", "cc"), "-print-file-name=libasan.so"], capture_output=True,
                                  text=True, check=True).stdout.strip()
            self.preload = f"{shim}:{os.path.realpath(asan)}"
        folder = tempfile.mkdtemp(dir=scratch)
        self.temporary, self.report = folder + ".tmp", folder + ".report"
        os.mkdir(self.temporary)
        os.chdir(folder)
        for name, data in self.inputs.items():
            pathlib.Path(name).write_bytes(data)

    def run(self, job, old, sweep):
        """One run; `sweep` are the variables of the shim."""
        arguments, outputs = JOBS[job]
        for name in outputs if old else []:
            pathlib.Path(name).write_bytes(OLD)
        environment = {"PATH": os.environ["PATH"], "HOME": self.temporary, "TMPDIR": self.temporary,
                       "LD_PRELOAD": self.preload, "SWEEP_REPORT": self.report,
                       "ASAN_OPTIONS": "verify_asan_link_order=0:allocator_may_return_null=1"}
        environment.update({"SWEEP_" + key.upper(): str(value) for key, value in sweep.items()})
        try:
            done = subprocess.run([self.tool, *arguments], env=environment, timeout=PATIENCE, close_fds=False,
                                  stdin=subprocess.DEVNULL, stdout=subprocess.DEVNULL, stderr=subprocess.PIPE)
            status, text = done.returncode, done.stderr.decode(errors="replace")
        except subprocess.TimeoutExpired:
            status, text = "hang", ""
        counted = (content(self.report) or b"").decode()
        found = {name: content(name) for name in outputs}
        extra = sorted(set(os.listdir()) - set(self.inputs) - set(outputs))
        extra += [name for name in os.listdir(self.temporary) if name.startswith(".tarsel")]
        for name in outputs + extra + [self.report]:
            subprocess.run(["rm", "-rf", name]) if os.path.isdir(name) else pathlib.Path(name).unlink(missing_ok=True)
        return Outcome(status, text, counted, found, extra)


runner = None


def start_runner(*arguments):
    global runner
    runner = Runner(*arguments)


def run(job, old=False, **sweep):
    return runner.run(job, old, sweep)


def fault(outcome, right):
    if outcome.status == "hang":
        return "hangs"
    if outcome.status < 0 or outcome.status >= 126 or "Sanitizer" in outcome.text or "runtime error" in outcome.text:
        return f"crashes ({outcome.status}): {outcome.text.strip()}"
    if outcome.extra:
        return f"leaves {outcome.extra}"
    for name, data in outcome.outputs.items():
        if outcome.status == 0 and data != right[name]:
            return f"says it is done, but {name} is " + ("absent" if data is None else "wrong")
        if outcome.status != 0 and data not in (OLD, right[name]):
            return f"fails and leaves {name} " + ("absent" if data is None else "partial")
    if outcome.status != 0 and "tarsel: " not in outcome.text:
        return f"fails without a word (status {outcome.status})"
    return None


def one(job, right, n, sweep):
    """How the run ended that had the n-th call fail, and what was wrong; None when it passed untouched."""
    outcome = run(job, True, n=n, **sweep)
    return ("ok" if outcome.status == 0 else outcome.status, fault(outcome, right)) if outcome.counted else None


def sweep_kind(pool, job, right, numbers, sweep):
    """Pairs of each call that failed and what `one` says, until a run passes untouched."""
    pending = collections.deque()
    for n in numbers:
        pending.append((n, pool.submit(one, job, right, n, sweep)))
        if len(pending) < 40:
            continue
        n, result = pending.popleft()
        if result.result() is None:
            break
        yield n, result.result()
    for n, result in pending:
        if result.result() is not None:
            yield n, result.result()


def demangled(trace):
    functions = re.findall(r"\((\w+)\+", trace)
    return subprocess.run(["c++filt"], input="\n".join("        " + name for name in functions), capture_output=True,
                          text=True, check=True).stdout


def build_shim(scratch):
    shim = scratch / "shim.so"
    subprocess.run([os.environ.get("CXX", "c++"), "-O1", "-fPIC", "-shared", "-Wall", "-Wextra",
                    HERE / "shim.cpp", "-o", shim, "-ldl"], check=True)
    return shim


def main():
    parser = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    parser.add_argument("build")
    parser.add_argument("--job", choices=JOBS)
    parser.add_argument("--kind", choices=WAYS)
    parser.add_argument("--from", type=int, default=1, dest="first", help="the first call that fails")
    parser.add_argument("--every", type=int, default=1, help="only each N-th call of those beyond the first 100")
    parser.add_argument("--show", type=int, default=5, help="faults of a kind that are told one by one")
    parser.add_argument("--trace", action="store_true", help="tell as well what called")
    parser.add_argument("--jobs", type=int, default=os.cpu_count())
    options = parser.parse_args()
    total, faults, started = 0, 0, time.monotonic()
    with tempfile.TemporaryDirectory(prefix="tarsel-sweep-") as folder:
        scratch = pathlib.Path(folder)
        tool = str((pathlib.Path(options.build) / "bin" / "tarsel").resolve())
        with concurrent.futures.ProcessPoolExecutor(
                options.jobs, initializer=start_runner, initargs=(tool, str(build_shim(scratch)), folder)) as pool:
            for job in [options.job] if options.job else JOBS:
                reference = pool.submit(run, job).result()
                if reference.status != 0:
                    sys.exit(f"the job {job} fails by itself: {reference.text}")
                for kind in [options.kind] if options.kind else WAYS:
                    for how, ever in WAYS[kind]:
                        numbers = (n for n in range(options.first, 1_000_000)
                                   if n <= 100 or (n - options.first) % options.every == 0)
                        sweep = {"kind": kind, "how": how} | ({"ever": 1} if ever else {})
                        ended, bad = collections.Counter(), []
                        for n, (status, wrong) in sweep_kind(pool, job, reference.outputs, numbers, sweep):
                            ended[status] += 1
                            bad += [(n, wrong)] if wrong else []
                        total += ended.total()
                        faults += len(bad)
                        shown = ", ".join(f"{count} with {status}" for status, count in sorted(ended.items(), key=str))
                        print(f"{job:8} {kind:7} {how:7}{'ever' if ever else 'once':5} {ended.total():6} failed: "
                              f"{shown}; {len(bad)} faults", flush=True)
                        for n, wrong in bad[:options.show]:
                            print(f"    n={n}: {wrong}", flush=True)
                            if options.trace:
                                traced = pool.submit(run, job, True, n=n, trace=1, **sweep).result()
                                print(demangled(traced.counted), flush=True)
    print(f"{total} runs in {time.monotonic() - started:.0f} s, {faults} faults")
    return 1 if faults else 0


if __name__ == "__main__":
    sys.exit(main())
