"""Hostile inputs: real files that were cut, extended and changed, and names that mean something elsewhere.

A run ends with an error and the old output, or with an output that is sound.
"""
import os
import pathlib
import subprocess

import jobs
import readers
from runner import Box, crashed, wording

OLD = b"what was there before\n"
MOST = 90  # changes of each seed
MEMORY = "--as=2000000000"

SUB = b"{0}{6}Hello\n{8}{15}again|twice\n"
EXTENSIBLE = (b"RIFF" + (60 + 300).to_bytes(4, "little") + b"WAVEfmt " + (40).to_bytes(4, "little") +
              bytes.fromhex("feff0200 44ac0000 980904000600 1800 1600 1800 03000000 0100000000001000800000aa00389b71") +
              b"data" + (300).to_bytes(4, "little") + jobs.pattern(300))


def font():
    found = subprocess.run(["fc-match", "-f", "%{file}", "DejaVu Sans"], capture_output=True, text=True).stdout
    return pathlib.Path(found).read_bytes() if os.path.isfile(found) else b""


def stored_task():
    return jobs.inputs()["stored.xml"]


def seeds():
    """Name, content, and the arguments that read it."""
    clip = ["frame", *jobs.CLIP]
    shot = ["-o", "shot.png", "-y"]
    return [
        ("h.wav", jobs.wav(jobs.pattern(400)), ["transcode", "h.wav", "-o", "out.wav", "-y"]),
        ("e.wav", EXTENSIBLE, ["transcode", "e.wav", "--accept-partial", "-o", "out.wav", "-y"]),
        ("i.wav", jobs.wav(jobs.pattern(400)), ["info", "i.wav", "--json"]),
        ("h.png", jobs.png(20, 10), [*clip, "--logo", "h.png@2,2", *shot]),
        ("p.png", jobs.png(20, 10), ["frame", "testgen:size=64x48,duration=1,picture=p.png", *shot]),
        ("h.srt", jobs.SRT, [*clip, "--at", "0.2", "--subtitles", "h.srt", *shot]),
        ("h.sub", SUB, [*clip, "--at", "0.2", "--subtitles", "h.sub", *shot]),
        ("h.scc", jobs.SCC, ["captions", "h.scc"]),
        ("h.yuv", jobs.pattern(64 * 48 * 3), ["transcode", "h.yuv", *jobs.RAW, "-o", "part.yuv", "-y"]),
        ("h.xml", stored_task(), ["run", "h.xml", "-o", "part.yuv", "-y"]),
        ("c.xml", stored_task(), ["task", "check", "c.xml"]),
        ("s.xml", stored_task(), ["task", "show", "s.xml", "--json"]),
        ("m.wav", jobs.wav(jobs.pattern(400)), ["loudness", "m.wav", "--json"]),
        ("q.wav", jobs.wav(jobs.pattern(400)), ["transcode", "--join", "q.wav", "in.wav@0-0.01", "-o", "out.wav", "-y"]),
        ("o.yuv", jobs.pattern(64 * 48 * 3), ["compare", "o.yuv", *jobs.CLIP, "--sheet", "shot.png", "-y"]),
        ("h.ttf", font(), [*clip, "--subtitles", "talk.srt", "--subtitle-style", "font=h.ttf", *shot]),
    ]


def changes(data, rng):
    """Names and contents."""
    size = len(data)
    for at in sorted({0, 1, 4, 8, 12, 16, 20, 24, 36, 40, 44, 46, size // 2, size - 1}):
        yield f"cut{at}", data[:at]
    for name, more in (("byte", b"x"), ("zeros", bytes(1000)), ("ones", b"\xff" * 1000), ("itself", data)):
        yield f"with-{name}", data + more
    for name, other in (("zeros", bytes(size)), ("ones", b"\xff" * size), ("text", b"this is no such file\n" * 9),
                        ("long-line", b"1" * 100000), ("carriage-returns", data.replace(b"\n", b"\r")),
                        ("nul", data.replace(b"0", b"\0")), ("digits", data.replace(b"0", b"99999999999999999999")),
                        ("utf16", b"\xff\xfe" + data.decode("latin-1").encode("utf-16-le")),
                        ("not-utf8", data.replace(b"l", b"\xc3\x28")), ("formats", data.replace(b"l", b"%s%n"))):
        yield f"only-{name}" if name in ("zeros", "ones", "text", "long-line") else name, other
    for at in range(0, min(size - 4, 100), 4):
        for name, value in (("0", 0), ("ff", 0xffffffff), ("7f", 0x7fffffff), ("80", 0x80000000)):
            for order in ("little", "big") if name in ("7f", "80") else ("little",):
                yield f"at{at}-{name}-{order}", data[:at] + value.to_bytes(4, order) + data[at + 4:]
    for number in range(60):
        changed = bytearray(data)
        for _ in range(1 + number % 4):
            changed[rng.randrange(size)] ^= 1 << rng.randrange(8)
        yield f"flip{number}", bytes(changed)


def verdict(box, outcome, output):
    """What is wrong: `output` is the file that the run should have replaced, if any."""
    wrong = crashed(outcome) or (wording(outcome) if outcome.status != 0 else None)
    if wrong:
        return wrong
    files = box.files()
    if output and outcome.status != 0 and files != {output: OLD}:
        return f"fails (status {outcome.status}) and leaves {sorted(files)}, not the old file alone"
    if output and outcome.status == 0:
        return (f"status 0, but {output} is " + readers.unsound(output, files[output])
                if output not in files or readers.unsound(output, files[output]) else None)
    return f"leaves {box.litter()}" if box.litter() else None


def attack(sweep, name, data, arguments):
    output = next((a for a in arguments if a in ("out.wav", "shot.png", "part.yuv")), None)
    with Box(sweep) as box:
        (box.work / name).write_bytes(data)
        if output:
            (box.work / output).write_bytes(OLD)
        outcome = box.run(arguments, wrap=[] if sweep.asan else ["prlimit", MEMORY])
        (box.work / name).unlink()
        return outcome.ended(), verdict(box, outcome, output), outcome


NAMES = ["-o.wav", "a\nb.wav", "a'b\".wav", "$(touch x).wav", "a;b&c.wav", "%s%n%d.wav", "\u00e9\u65e5.wav",
         "a@b,c=d.wav", "#1#.wav", " .wav", "a" * 250 + ".wav", b"\xff\xfe.wav", "..wav", "a.wav.wav", "b.WAV",
         "[x]*?.wav"]


def named(sweep, name):
    """The name as that of the input, then as that of the output."""
    raw = name if isinstance(name, bytes) else name.encode()
    raw = b"./" + raw
    with Box(sweep) as box:
        path = os.path.join(os.fsencode(box.work), raw)
        pathlib.Path(os.fsdecode(path)).write_bytes(sweep.inputs["in.wav"])
        ends = []
        for source, target in ((os.fsdecode(raw), "out.wav"), ("in.wav", os.fsdecode(raw))):
            outcome = box.run(["transcode", source, "-o", target, "-y"])
            wrong = crashed(outcome) or (wording(outcome) if outcome.status != 0 else None)
            result = pathlib.Path(box.work / target)
            if not wrong and outcome.status == 0 and result.read_bytes() != sweep.new["wav"]["out.wav"]:
                wrong = f"status 0, but {target!r} has other bytes"
            if not wrong and (box.litter() or os.path.exists(box.work / "x")):
                wrong = f"leaves {box.litter() or 'x'}"
            ends.append((outcome.ended(), wrong, outcome))
        return next((end for end in ends if end[1]), ends[-1])


def cases(sweep, pool, rng):
    for number, name in enumerate(NAMES):
        yield "hostile", f"name/{number}", lambda name=name: named(sweep, name)
    for seed, data, arguments in seeds():
        if not data:
            continue
        found = [(f"{seed}/{name}", changed) for name, changed in changes(data, rng) if changed != data]
        for name, changed in rng.sample(found, min(MOST, len(found))):
            yield "hostile", name, lambda a=(sweep, seed, changed, arguments): attack(*a)
