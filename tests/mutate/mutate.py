#!/usr/bin/env python3
"""Shows whether the tests notice faults: changes a source in one place, builds that and runs the tests of its room.

    tests/mutate/mutate.py [--seed N] [--count N] [--wide] [--verbose] [--list] [--all | FILE...]

FILE is a source of core or builtin, or a folder of them. Without any, and without --all, the sources are those that
differ from origin/main, or from the commit before this one if there is no such branch. A seed always gives the same
changes of the same sources. A change that no test notices is printed as

    file:line: operator: source line -> changed line

It shows a case that the tests lack, or it changes nothing that the program does: then verdicts.txt says why, and it
counts as equivalent, as do changes that leave the same object code.

The working tree is only read (workshop.py), and the programs run confined (confine.py), with a time limit. A source
whose room has no tests is tried with all tests of its floor. --wide runs those of both floors on what the room's
tests do not notice. Tests of the tool are not run.

Exit status: 0 when all changes were tried, 1 when the build or the unchanged tests fail, 2 for wrong use.
"""
import argparse
import collections
import concurrent.futures
import itertools
import os
import pathlib
import random
import signal
import subprocess
import sys
import time

sys.dont_write_bytecode = True
import operators  # noqa: E402
import workshop  # noqa: E402

ROOT = workshop.ROOT
FLOORS = ("core", "builtin")


# --- what is tried --------------------------------------------------------------------------------

def git(*arguments):
    done = subprocess.run(["git", "-C", ROOT, *arguments], capture_output=True, text=True, check=False)
    return done.stdout.splitlines() if done.returncode == 0 else []


def changed_files():
    base = git("merge-base", "origin/main", "HEAD") or git("rev-parse", "--verify", "-q", "HEAD~1") or ["HEAD"]
    names = git("diff", "--name-only", "--diff-filter=d", base[0]) + git("ls-files", "--others", "--exclude-standard")
    return [ROOT / name for name in names]


def sources(places):
    """The sources of core and builtin among files and folders, as names from the root."""
    found = set()
    for place in map(pathlib.Path.resolve, places):
        if not place.exists():
            raise ValueError(f"no such file or folder: {place}")
        found.update(place.rglob("*.cpp") if place.is_dir() else [place])
    names = (path.relative_to(ROOT) for path in found if path.is_relative_to(ROOT) and path.suffix == ".cpp")
    return sorted(str(name) for name in names if name.parts[0] in FLOORS)


def drawn(files, seed):
    """All mutants of the files in random order, but one of each file before the second of any."""
    heaps = []
    for file in files:
        heaps.append(list(operators.mutants_of(file, (ROOT / file).read_text(encoding="utf-8"))))
        random.Random(f"{seed} {file}").shuffle(heaps[-1])
    random.Random(seed).shuffle(heaps)
    return [mutant for row in itertools.zip_longest(*heaps) for mutant in row if mutant]


def programs_of(files, wide):
    """The test programs of each file, in the order in which they run."""
    tests = (path.relative_to(ROOT / "tests") for path in ROOT.glob("tests/*/*/**/*_test.cpp"))
    tests = (path for path in tests if path.parts[0] in FLOORS)
    rooms = {room: "test_" + "_".join(room) for room in sorted(path.parts[:2] for path in tests)}
    programs = {}
    for file in files:
        room = pathlib.Path(file).parts[:2]
        near = [rooms[room]] if room in rooms else [name for key, name in rooms.items() if key[0] == room[0]]
        programs[file] = near + [name for name in rooms.values() if wide and name not in near]
    return programs


def known_verdicts():
    path = workshop.HERE / "verdicts.txt"
    lines = [line for line in path.read_text(encoding="utf-8").splitlines() if line and not line.startswith("#")]
    for line in lines:
        if line.count(" | ") < 3:
            raise ValueError(f"{path}: not 'file | operator | line | reason': {line}")
    return {line.rsplit(" | ", 1)[0] for line in lines}


def is_known(mutant, known):
    _, before, after = mutant.lines()
    key = f"{mutant.file} | {mutant.operator} | {before}"
    return key in known or f"{key} -> {after}" in known


# --- the whole ------------------------------------------------------------------------------------

def verdicts(candidates, count, submit):
    """Pairs of mutants and their verdicts, in the order of the candidates, until `count` of them have compiled."""
    candidates = iter(candidates)
    pending = collections.deque((mutant, submit(mutant)) for mutant in itertools.islice(candidates, count))
    while pending:
        mutant, result = pending.popleft()
        yield mutant, result.result()
        if result.result() == "did not compile":
            pending.extend((mutant, submit(mutant)) for mutant in itertools.islice(candidates, 1))


def judge(options, candidates, known):
    """Tries the mutants, prints those that survive and counts the verdicts."""
    programs = programs_of({mutant.file for mutant in candidates}, options.wide)
    processes, counts, started = workshop.Processes(), collections.Counter(), time.monotonic()
    bench = workshop.Workshop(options.build.resolve(), options.jobs, processes)
    pool = concurrent.futures.ThreadPoolExecutor(options.jobs)
    try:
        bench.prepare(sorted(set(itertools.chain(*programs.values()))))
        started = time.monotonic()
        for mutant, verdict in verdicts(candidates, options.count, lambda mutant: pool.submit(
                bench.verdict, mutant, programs[mutant.file])):
            verdict = "equivalent" if verdict == "survived" and is_known(mutant, known) else verdict
            counts[verdict] += 1
            if verdict == "survived" or options.verbose:
                print(f"{verdict + ': ' if options.verbose else ''}{mutant}", flush=True)
    finally:
        processes.stop()
        pool.shutdown(cancel_futures=True)
        if counts:
            report(counts, time.monotonic() - started, options.wide)


def report(counts, seconds, wide):
    tried = counts.total() - counts["did not compile"]
    killed = counts["killed"] + counts["timed out"]
    score = f"{100 * killed / (killed + counts['survived']):.0f} %" if killed + counts["survived"] else "none"
    print(f"tried {tried}, " + ", ".join(f"{name} {counts[name]}" for name in (
        "killed", "timed out", "survived", "equivalent", "did not compile")) +
        f"; score {score}; {seconds / max(tried, 1):.1f} s each" +
        ("; the other rooms' tests were not run (--wide)" if counts["survived"] and not wide else ""))


def end(number, _frame):
    sys.exit(128 + number)


def main():
    usage, description = __doc__.splitlines()[2].strip(), __doc__.splitlines()[0]
    parser = argparse.ArgumentParser(usage=usage, description=description)
    parser.add_argument("files", nargs="*", metavar="FILE", type=pathlib.Path)
    parser.add_argument("--all", action="store_true", help="all sources of core and builtin")
    parser.add_argument("--seed", type=int, default=1)
    parser.add_argument("--count", type=int, default=40, help="changes to try")
    parser.add_argument("--wide", action="store_true", help="run the other rooms' tests as well")
    parser.add_argument("--list", action="store_true", help="print the changes and build nothing")
    parser.add_argument("--verbose", action="store_true", help="print the verdict of each change")
    parser.add_argument("--build", type=pathlib.Path, default=ROOT / "build" / "mutate", help="build folder")
    parser.add_argument("--jobs", type=int, default=os.cpu_count())
    parser.add_argument("--self-test", action="store_true", help="test the table of operators and nothing else")
    options = parser.parse_args()
    if options.self_test:
        print(*(wrong := operators.self_test()), sep="\n", end="\n" if wrong else "")
        return 1 if wrong else 0
    if options.all and options.files or options.count < 1 or options.jobs < 1:
        parser.error("either --all or FILEs, and numbers above 0")
    try:
        places = [ROOT / floor for floor in FLOORS] if options.all else options.files or changed_files()
        candidates, known = drawn(sources(places), options.seed), known_verdicts()
    except ValueError as wrong:
        parser.error(str(wrong))
    if not candidates:
        print("nothing to change: no source of core or builtin is named or differs")
    elif options.list:
        signal.signal(signal.SIGPIPE, signal.SIG_DFL)
        print(*candidates[:options.count], sep="\n")
    else:
        for number in (signal.SIGINT, signal.SIGTERM):
            signal.signal(number, end)
        os.environ["CCACHE_DISABLE"] = "1"
        try:
            judge(options, candidates, known)
        except workshop.Failure as failure:
            print(f"mutate: {failure}", file=sys.stderr)
            return 1
    return 0


if __name__ == "__main__":
    sys.exit(main())
