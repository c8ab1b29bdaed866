"""Signals at random moments of a run: one, a second one right after it, and SIGUSR1, which must not disturb it."""
import random
import signal
import time

from runner import STOPPED, Box, judged, wording

TIMES = 5  # of each signal in each job
VARIANTS = {"INT": [signal.SIGINT], "TERM": [signal.SIGTERM], "HUP": [signal.SIGHUP], "USR1": [signal.SIGUSR1],
            "INT-INT": [signal.SIGINT, signal.SIGINT], "TERM-INT": [signal.SIGTERM, signal.SIGINT]}


def duration(sweep, job):
    started = time.monotonic()
    with Box(sweep) as box:
        box.run(job.arguments)
    return time.monotonic() - started


def untouched(box, job):
    return box.files() == box.sweep.old[job.name] and not box.litter()


def attack(sweep, job, variant, delay):
    sent = VARIANTS[variant]
    with Box(sweep) as box:
        box.lay(sweep.old[job.name])
        process = box.start(job.arguments)
        time.sleep(delay)
        for one in sent:
            process.send_signal(one)
        outcome = box.finish(process)
        outcome.command += f" & sleep {delay:.4f}; kill -{variant.split('-')[0]} $!"
        ended = outcome.ended()
        if outcome.status in [-one for one in sent]:
            if untouched(box, job) and not outcome.text:
                return ended, None, outcome  # it came before the tool listened
            if len(sent) > 1:  # at once: the next run cleans up
                outcome = box.run(job.arguments)
                return ended, judged(box, outcome, job), outcome
        wrong = judged(box, outcome, job)
        if len(sent) > 1 and wrong == wording(outcome):
            wrong = None  # the second one ends it at once, with or without a word
        if not wrong and outcome.status != 0 and outcome.status not in [STOPPED.get(one) for one in sent]:
            wrong = f"stopped by a signal, it ends with {outcome.status}: {outcome.text.strip()}"
        if not wrong and len(sent) == 1 and outcome.status != 0 and not job.stdout and \
                box.files() == box.sweep.new[job.name]:
            wrong = f"the result has its name, but the status is {outcome.status}"
        return ended, wrong, outcome


def cases(sweep, pool, rng):
    for job in sweep.jobs:
        length, own = duration(sweep, job), random.Random(f"{sweep.options.seed} {job.name}")
        for variant in VARIANTS:
            for number in range(TIMES):
                delay = own.uniform(0, 1.2 * length)
                yield "signal", f"{job.name}/{variant}-{number}", lambda a=(sweep, job, variant, delay): attack(*a)
