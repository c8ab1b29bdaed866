"""The sweep finds what it is for: each fault is planted in a small tool of its own."""
import concurrent.futures
import pathlib
import random
import subprocess
import sys
import tempfile
import types
import unittest

sys.path.insert(0, str(pathlib.Path(__file__).parent))
import faults
import jobs
import kills
import readers
import runner
import sweep

TWO = jobs.Job("two", ["in.wav", "a", "b"], ["in3.wav", "a", "b"])
ONE = jobs.Job("one", ["in.wav", "a"], ["in3.wav", "a"])

# Copies its first argument to the others. {0} comes before the files get their names, {1} between the first and the
# others, {2} after them.
COPIES = """#!/bin/sh
[ "$1" = recover ] && exit 2
source=$1; shift
rm -rf .tarsel-*
mkdir .tarsel-work
for name; do cp $source .tarsel-work/$name; done
{0}
mv .tarsel-work/$1 $1
shift
{1}
for name; do mv .tarsel-work/$name $name; done
{2}
rmdir .tarsel-work
echo "tarsel: wrote" >&2
"""
FAILS = "rm -rf .tarsel-work; echo 'tarsel: no luck' >&2; exit 4"

PROGRAM = r"""
#include <cstdio>
#include <cstdlib>
#include <cstring>
int main(int, char** names) {
    char* block = static_cast<char*>(malloc(20000));
    memset(block, 0, 1);  // whether there is one or not
    FILE* from = fopen(names[1], "rb");
    FILE* to = fopen(names[2], "wb");
    if (!from || !to) { fputs("tarsel: can't open\n", stderr); return 4; }
    const size_t size = fread(block, 1, 20000, from);
    fwrite(block, 1, size, to);
    fclose(to);
}
"""


class Planted(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.folder = tempfile.TemporaryDirectory()
        cls.addClassCleanup(cls.folder.cleanup)
        cls.scratch = pathlib.Path(cls.folder.name)
        cls.helpers = sweep.build_helpers(cls.scratch / "helpers")

    def sweep(self, tool, job):
        jobs.JOBS[:] = [job]
        options = types.SimpleNamespace(job=None, all=False, trace=False, sample=1000, case=None, seed=1)
        made = runner.Sweep(tool, self.scratch, self.helpers, options)
        made.refer()
        return made

    def script(self, *parts):
        file = self.scratch / "tool"
        file.write_text(COPIES.format(*parts))
        file.chmod(0o755)
        return file

    def found(self, job, *parts):
        """What is wrong with a run of a tool that was sound when it wrote the files to compare with."""
        made = self.sweep(self.script("", "", ""), job)
        self.script(*parts)
        with runner.Box(made) as box:
            box.lay(made.old[job.name])
            patience = 1 if "sleep" in parts[0] else runner.PATIENCE
            return runner.judged(box, box.finish(box.start(job.arguments), patience), job)

    def test_how_a_run_ends(self):
        cases = {
            ("", "", ""): None,
            (FAILS, "", ""): None,
            ("kill -SEGV $$", "", ""): "dies of SIGSEGV",
            ("exec sleep 20", "", ""): "hangs",
            ("", "", "touch .tarsel-left"): "leaves",
            ("", "", "truncate -s 5 a"): "status 0, but neither old nor new: a torn, b new",
            ("", FAILS, ""): "a new, b old",
            ("rm b; " + FAILS, "", ""): "a old, b absent",
            ("rm -rf .tarsel-work; exit 4", "", ""): "0 messages",
            ("rm -rf .tarsel-work; echo 'tarsel: std::bad_alloc' >&2; exit 1", "", ""): "shows its inside",
            ("rm -rf .tarsel-work; printf \"tarsel: can't open '%s'\\n\" a b >&2; exit 3", "", ""): None,
            ("rm -rf .tarsel-work; printf \"tarsel: can't open '%s'\\n\" a a >&2; exit 3", "", ""): "2 messages",
            ("rm -rf .tarsel-work; exit 99", "", ""): "crashes (status 99)",
        }
        for parts, wrong in cases.items():
            with self.subTest(parts):
                said = self.found(TWO, *parts)
                self.assertTrue(said is None if wrong is None else wrong in (said or ""), said)

    def run_cases(self, unit, made):
        with concurrent.futures.ThreadPoolExecutor(2) as pool:
            found = [(name, *run()) for _, name, run in unit.cases(made, pool, random.Random(1))]
        return [(name, wrong) for name, _, wrong, _ in found if wrong], len(found)

    def test_kill_between_two_renames(self):
        wrong, count = self.run_cases(kills, self.sweep(self.script("", "", ""), TWO))
        self.assertGreater(count, 8)
        self.assertTrue(any("neither old nor new: a new, b old" in text for _, text in wrong), wrong)
        wrong, _ = self.run_cases(kills, self.sweep(self.script("", "", ""), ONE))
        self.assertEqual(wrong, [])

    def test_calls_that_fail(self):
        source, tool = self.scratch / "program.cpp", self.scratch / "program"
        source.write_text(PROGRAM)
        subprocess.run(["c++", source, "-o", tool], check=True)
        wrong, _ = self.run_cases(faults, self.sweep(tool, ONE))
        self.assertTrue(any("dies of SIGSEGV" in text for _, text in wrong), wrong)
        self.assertTrue(any("-enospc" in name and "status 0, but" in text for name, text in wrong), wrong)

    def test_files_that_contradict_themselves(self):
        for name, data in (("a.wav", jobs.wav(jobs.pattern(40))), ("a.png", jobs.png(3, 2))):
            self.assertIsNone(readers.unsound(name, data))
            for damaged in (data[:-1], data[:20], data[:40] + bytes([data[40] ^ 255]) + data[41:]):
                self.assertIsNotNone(readers.unsound(name, damaged), damaged)


if __name__ == "__main__":
    unittest.main()
