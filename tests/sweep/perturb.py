"""Bytes that nobody wrote: freed and fresh memory is filled, first with one value and then with another, and the
outputs have to be the same. Odd sizes and formats with padded rows are where such bytes come from."""
from runner import Box, crashed

FORMATS = ["GRAY", "I420", "YV12", "I422", "YUYV", "UYVY", "Y216", "v210", "W016", "BGR3", "BGR4", "BGRA",
           "ARGB", "R32C", "b64a", "R555", "R565"]
SIZES = ["34x18", "33x17", "50x2", "7x5"]


def attack(sweep, arguments):
    results = []
    for fill in (85, 170):
        with Box(sweep) as box:
            outcome = box.run(arguments, {"MALLOC_PERTURB_": fill})
            if crashed(outcome) or (outcome.status != 0 and "tarsel: " not in outcome.text):
                return outcome.ended(), crashed(outcome) or "fails without a word", outcome
            results.append(box.files())
    if results[0] == results[1]:
        return outcome.ended(), None, outcome
    names = [name for name in results[0] if results[0][name] != results[1].get(name)]
    return outcome.ended(), f"{', '.join(names)} depends on MALLOC_PERTURB_", outcome


def cases(sweep, pool, rng):
    if sweep.asan:
        return
    for job in sweep.jobs:
        yield "perturb", job.name, lambda job=job: attack(sweep, job.arguments)
    for name in ("x.raw", "x.avi", "x.png"):
        for pixel in FORMATS if name != "x.png" else ["BGR3"]:
            for size in SIZES:
                base = ["transcode", "testgen:size=64x48,duration=0.08", "--size", size, "--pixel", pixel, "-o", name]
                yield "perturb", f"{name}-{pixel}-{size}", lambda base=base: attack(sweep, base)
