"""A build folder that compiles changed sources, links them into the tests' programs and runs these.

A changed source lies in a temporary folder of the build and is compiled with the command of the original. Its object
comes before the library in the link. It defines what the original defines, so the linker leaves that one out.
"""
import contextlib
import itertools
import json
import os
import pathlib
import shlex
import signal
import subprocess
import sys
import tempfile
import threading
import time

HERE = pathlib.Path(__file__).resolve().parent
ROOT = HERE.parents[1]
BUILD_PATIENCE, LEAST_PATIENCE = 600, 30  # seconds
UNCONFINED = 125  # the status of confine.py when it could not do its work


class Failure(Exception):
    """The build or the unchanged tests fail."""


class Processes:
    """Runs programs in sessions of their own, so that those that hang or are left at the end can be stopped."""

    def __init__(self):
        self.lock, self.running, self.stopped = threading.Lock(), set(), False

    def run(self, command, place, scratch, patience):
        """Runs a command in a folder. Returns its exit status, None if it took too long, and its first output."""
        with open(scratch / "output", "w+b") as output:
            with self.lock:
                if self.stopped:
                    raise Failure("stopped")
                process = subprocess.Popen(command, cwd=place, stdin=subprocess.DEVNULL, stdout=output,
                                           stderr=subprocess.STDOUT, start_new_session=True)
                self.running.add(process)
            try:
                status = process.wait(patience)
            except subprocess.TimeoutExpired:
                os.killpg(process.pid, signal.SIGKILL)
                process.wait()
                status = None
            finally:
                with self.lock:
                    self.running.discard(process)
            output.seek(0)
            return status, output.read(1 << 16).decode(errors="replace")

    def stop(self):
        with self.lock:
            self.stopped = True
            for process in self.running:
                with contextlib.suppress(ProcessLookupError):
                    os.killpg(process.pid, signal.SIGKILL)


class Workshop:
    """A build folder, and what it takes to exchange one object of it."""

    def __init__(self, build, jobs, processes):
        self.build, self.jobs, self.processes = build, jobs, processes
        self.compiles, self.links, self.patience = {}, {}, {}

    def prepare(self, programs):
        """Builds the programs and runs them unchanged."""
        if not (self.build / "build.ninja").exists():
            self.call("cmake", "--preset", "release", "-B", self.build)
        self.call("ninja", "-C", self.build, "-j", str(self.jobs), *programs)
        database = json.loads((self.build / "compile_commands.json").read_text(encoding="utf-8"))
        self.compiles = {entry["file"]: shlex.split(entry["command"]) for entry in database}
        for program in programs:
            commands = subprocess.run(["ninja", "-C", self.build, "-t", "commands", program], check=True, text=True,
                                      capture_output=True).stdout.splitlines()
            line = shlex.split(next(line for line in commands if f" -o bin/{program} " in line))
            steps = [list(step) for _, step in itertools.groupby(line, "&&".__ne__)]
            self.links[program] = next(step for step in steps if "-o" in step)
            self.patience[program] = BUILD_PATIENCE
            with self.scratch() as scratch:
                started = time.monotonic()
                status, output = self.test(self.build / "bin" / program, program, scratch)
                self.patience[program] = max(LEAST_PATIENCE, 10 * (time.monotonic() - started))
            if status != 0:
                raise Failure(f"{output}\n{program} fails without any change")

    def call(self, *command):
        if subprocess.run(command, cwd=ROOT, stdout=sys.stderr, check=False).returncode != 0:
            raise Failure(f"failed: {shlex.join(map(str, command))}")

    @contextlib.contextmanager
    def scratch(self):
        with tempfile.TemporaryDirectory(prefix="mutant-", dir=self.build, ignore_cleanup_errors=True) as folder:
            yield pathlib.Path(folder)

    def compiled(self, file, text, scratch):
        """The object of a text in the place of a source; None if it does not compile."""
        if str(ROOT / file) not in self.compiles:
            return None  # a source of another platform
        source, result = scratch / "tree" / file, scratch / "changed.o"
        source.parent.mkdir(parents=True, exist_ok=True)
        source.write_text(text, encoding="utf-8")
        words = list(self.compiles[str(ROOT / file)])
        words[words.index("-o") + 1] = str(result)
        words[words.index("-c") + 1] = str(source)
        # Sources that include themselves, once for each vector target, have to find the changed one.
        words += ["-w", "-iquote", str(scratch / "tree"), f"-fmacro-prefix-map={scratch}/tree/="]
        status, _ = self.processes.run(words, self.build, scratch, BUILD_PATIENCE)
        return result if status == 0 else None

    def linked(self, program, changed, scratch):
        words = list(self.links[program])
        words[words.index("-o") + 1] = str(scratch / program)
        words.insert(1, str(changed))
        status, _ = self.processes.run(words, self.build, scratch, BUILD_PATIENCE)
        return scratch / program if status == 0 else None

    def test(self, path, program, scratch):
        with tempfile.TemporaryDirectory(prefix="tmp-", dir=scratch, ignore_cleanup_errors=True) as folder:
            command = [sys.executable, HERE / "confine.py", folder, path, "--gtest_brief=1", "--gtest_fail_fast"]
            status, output = self.processes.run(command, ROOT, scratch, self.patience[program])
        if status == UNCONFINED:
            raise Failure(output)
        return status, output

    def verdict(self, mutant, programs):
        """What the programs make of a mutant: killed, timed out, survived, equivalent or did not compile."""
        with self.scratch() as scratch:
            changed = self.compiled(mutant.file, mutant.text(), scratch)
            if not changed:
                return "did not compile"
            for program in programs:
                path = self.linked(program, changed, scratch)
                if not path:
                    return "did not compile"
                status, _ = self.test(path, program, scratch)
                if status != 0:
                    return "timed out" if status is None else "killed"
                path.unlink()
            code = changed.read_bytes()
            original = self.compiled(mutant.file, mutant.source, scratch)
            return "equivalent" if original and original.read_bytes() == code else "survived"
