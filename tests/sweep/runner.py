"""Runs the tool in a folder of its own and says what is wrong with how a run ended."""
import contextlib
import dataclasses
import os
import pathlib
import re
import shlex
import shutil
import signal
import subprocess
import tempfile

import jobs

PATIENCE = 60  # seconds; a run that takes longer hangs
INTERNAL = re.compile(r"\b[Qq]v[A-Z_]|::|bad_alloc|\.tarsel-|[Aa]ssert")  # names of temporary folders may have "qv"
CRASH = re.compile(r"Sanitizer|runtime error|terminate called|core dumped")
ASIDE = ("tarsel: warning: ", "tarsel: wrote ", "tarsel: stopping; ")
SETTINGS = "settings"  # of the user
# A lock stays, and what a killed run has not finished there goes with the next one.
UNFINISHED = (f"{SETTINGS}/presets.xml.lock", f"{SETTINGS}/presets.xml.new")
STOPPED = {signal.SIGHUP: 129, signal.SIGINT: 130, signal.SIGTERM: 143}


@dataclasses.dataclass
class Outcome:
    status: object  # the exit status, minus a signal, or "hang"
    text: str
    stdout: bytes
    command: str

    def ended(self):
        return "ok" if self.status == 0 else self.status


class Box:
    """A folder with the inputs, in which the tool runs; `w` is the working folder and `tmp` the home. The user's
    settings lie in the working folder: they are a result like others."""

    def __init__(self, sweep):
        self.sweep = sweep

    def __enter__(self):
        self.root = pathlib.Path(tempfile.mkdtemp(dir=self.sweep.scratch))
        self.work, self.temporary = self.root / "w", self.root / "tmp"
        self.work.mkdir()
        self.temporary.mkdir()
        (self.work / SETTINGS).mkdir()
        (self.temporary / ".QVTarselSdk").symlink_to(self.work / SETTINGS)
        for name, data in self.sweep.inputs.items():
            (self.work / name).write_bytes(data)
        return self

    def __exit__(self, *_):
        shutil.rmtree(self.root, ignore_errors=True)

    def lay(self, files):
        for name, data in files.items():
            (self.work / name).parent.mkdir(exist_ok=True)
            (self.work / name).write_bytes(data)

    def start(self, arguments, variables=None, wrap=(), **streams):
        environment = {"PATH": os.environ["PATH"], "HOME": str(self.temporary), "TMPDIR": str(self.temporary),
                       "ASAN_OPTIONS": "verify_asan_link_order=0:allocator_may_return_null=1:detect_leaks=1:alloc_dealloc_mismatch=0",
                       **(variables or {})}
        self.command = [*map(str, wrap), self.sweep.tool, *map(str, arguments)]
        self.shown = " ".join([*(f"{k}={shlex.quote(str(v))}" for k, v in (variables or {}).items()),
                               shlex.join(self.command)])
        return subprocess.Popen(self.command, cwd=self.work, env={k: str(v) for k, v in environment.items()},
                                **{"stdin": subprocess.DEVNULL, "stdout": subprocess.PIPE, "stderr": subprocess.PIPE,
                                   **streams})

    def finish(self, process, patience=PATIENCE):
        try:
            out, text = process.communicate(timeout=patience)
            status = process.returncode
        except subprocess.TimeoutExpired:
            process.kill()
            status, out, text = "hang", b"", b""
            with contextlib.suppress(subprocess.TimeoutExpired):  # a child of it may hold the pipes
                out, text = process.communicate(timeout=2)
        return Outcome(status, (text or b"").decode(errors="replace"), out or b"", self.shown)

    def run(self, arguments, variables=None, wrap=(), **streams):
        return self.finish(self.start(arguments, variables, wrap, **streams))

    def files(self):
        """What is in the working folder besides the inputs and hidden folders: name and content."""
        found = {f"the input {name}": b"gone" for name in self.sweep.inputs if not (self.work / name).exists()}
        for path in sorted(self.work.rglob("*")):
            name = str(path.relative_to(self.work))
            if path.is_file() and not path.is_symlink() and not name.startswith((".tarsel", *UNFINISHED)):
                data = path.read_bytes()
                if self.sweep.inputs.get(name) != data:
                    found[name] = data.replace(str(self.root).encode(), b"BOX")
        return found

    def litter(self):
        return sorted(str(path.relative_to(self.root)) for folder in (self.work, self.temporary)
                      for path in folder.rglob(".tarsel*"))


def crashed(outcome):
    if outcome.status == "hang":
        return "hangs"
    if outcome.status < 0:
        return f"dies of {signal.Signals(-outcome.status).name}: {outcome.text.strip()[-600:]}"
    if outcome.status in (*STOPPED.values(), *range(0, 7)) and not CRASH.search(outcome.text):
        return None
    return f"crashes (status {outcome.status}): {outcome.text.strip()[-2000:]}"


def wording(outcome):
    """What is wrong with the message of a run that failed."""
    lines = [line for line in outcome.text.splitlines() if line.startswith("tarsel: ") and not line.startswith(ASIDE)]
    inputs = {line.split("'")[2] for line in lines if line.startswith("tarsel: can't open '")}
    if len(lines) != max(len(inputs), 1):
        return f"fails with {len(lines)} messages (status {outcome.status}): {outcome.text.strip()!r}"
    if INTERNAL.search(outcome.text):
        return f"shows its inside: {outcome.text.strip()!r}"
    return None


def difference(files, old, new):
    """How files are neither all old nor all new."""
    if files in (old, new):
        return None
    kinds = {name: "new" if name in new and data == new[name] else "old" if name in old and data == old[name] else
             "unknown" if name not in old and name not in new else "torn" for name, data in files.items()}
    kinds |= {name: "absent" for name in {**old, **new} if name not in files}
    return "neither old nor new: " + ", ".join(f"{name} {kind}" for name, kind in sorted(kinds.items()))


def judged(box, outcome, job, litter=True):
    """What is wrong after a run of a job over its old files; None if it failed or succeeded as it should."""
    old, new = box.sweep.old[job.name], box.sweep.new[job.name]
    wrong = crashed(outcome)
    if wrong:
        return wrong
    files = box.files()
    if outcome.status == 0:
        if difference(files, new, new) or (job.stdout and outcome.stdout != box.sweep.stdout[job.name]):
            return "status 0, but " + (difference(files, old, new) or "the result is not the right one")
    else:
        wrong = difference(files, old, new)
        if wrong:
            return f"fails (status {outcome.status}) and leaves what is {wrong}"
    if litter and box.litter():
        return f"leaves {', '.join(box.litter())} (status {outcome.status})"
    if litter and (box.work / UNFINISHED[1]).exists():
        return f"leaves {UNFINISHED[1]} (status {outcome.status})"
    return wording(outcome) if outcome.status != 0 else None


class Sweep:
    """What all attacks share: the tool, the helpers, the inputs, and what each job should write."""

    def __init__(self, tool, scratch, helpers, options):
        self.tool, self.scratch, self.options = str(tool), str(scratch), options
        self.shim, self.killat = helpers
        self.inputs = jobs.inputs()
        self.jobs = [job for job in jobs.JOBS if options.job in (None, job.name)]
        self.old, self.new, self.stdout = {}, {}, {}
        self.recovers = self.ask("recover", "--help").returncode == 0
        self.asan = b"libasan" in subprocess.run(["ldd", tool], capture_output=True).stdout

    def ask(self, *arguments):
        return subprocess.run([self.tool, *arguments], capture_output=True, stdin=subprocess.DEVNULL,
                              timeout=PATIENCE, cwd=self.scratch)

    def job(self, name):
        return next(job for job in jobs.JOBS if job.name == name)

    def refer(self):
        """Runs each job undisturbed; its results are checked by the readers."""
        for job in jobs.JOBS:
            with Box(self) as box:
                if job.earlier:
                    self.completed(box.run(job.earlier), job)
                self.old[job.name] = box.files()
            with Box(self) as box:
                outcome = box.run(job.arguments)
                self.completed(outcome, job)
                self.new[job.name], self.stdout[job.name] = box.files(), outcome.stdout
            same = [n for n, data in self.new[job.name].items() if self.old[job.name].get(n) == data]
            assert not same, f"{job.name}: {same} would not show a mixture"

    @staticmethod
    def completed(outcome, job):
        if outcome.status != 0:
            raise SystemExit(f"sweep: the job {job.name} fails by itself: {outcome.command}\n{outcome.text}")
