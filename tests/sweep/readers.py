"""What the jobs write, read by others: ffmpeg, sox, pngcheck, and libpng's pngfix.

The expected bytes come from the inputs, from the raw files of the same pictures, or from another reader; never from
the reader of this library.
"""
import shutil
import struct
import subprocess
import zlib

import jobs
from runner import Box, crashed

TOOLS = "ffmpeg", "ffprobe", "sox", "pngcheck", "pngfix"
# Pixel format of the tool, and what ffmpeg calls the same samples in a raw file.
RAW_FORMATS = {"BGR3": "bgr24", "BGR4": "bgr0", "I420": "yuv420p", "YUYV": "yuyv422", "UYVY": "uyvy422",
               "YV12": None, "v210": None}


def unsound(name, data):
    """How a file contradicts itself, or None."""
    checks = {".wav": sound_wav, ".png": sound_png}
    try:
        return None if checks.get(name[-4:].lower(), bool)(data) else "not a whole file of its format"
    except (struct.error, zlib.error, KeyError):
        return "cut"


def sound_wav(data):
    if data[:4] != b"RIFF" or data[8:12] != b"WAVE" or struct.unpack("<I", data[4:8])[0] != len(data) - 8:
        return False
    at = 12
    while at + 8 <= len(data) and data[at:at + 4] != b"data":
        at += 8 + struct.unpack("<I", data[at + 4:at + 8])[0]
    return at + 8 + struct.unpack("<I", data[at + 4:at + 8])[0] <= len(data) if at + 8 <= len(data) else False


def sound_png(data):
    at, body, size, kind = 8, b"", None, b""
    while data[:8] == b"\x89PNG\r\n\x1a\n" and at + 12 <= len(data) and kind != b"IEND":
        length, kind = struct.unpack(">I4s", data[at:at + 8])
        if struct.unpack(">I", data[at + 8 + length:at + 12 + length])[0] != zlib.crc32(data[at + 4:at + 8 + length]):
            return False
        if kind == b"IHDR":
            size = struct.unpack(">IIBB", data[at + 8:at + 18])
        body += data[at + 8:at + 8 + length] if kind == b"IDAT" else b""
        at += 12 + length
    samples = {0: 1, 2: 3, 4: 2, 6: 4}
    if not size or kind != b"IEND" or at != len(data):
        return False
    return len(zlib.decompress(body)) == size[1] * (1 + size[0] * samples[size[3]] * size[2] // 8)


class Unlike(Exception):
    """A reader does not agree."""


def read(box, *command):
    done = subprocess.run(list(map(str, command)), cwd=box.work, capture_output=True, stdin=subprocess.DEVNULL,
                          timeout=60)
    if done.returncode != 0 or (command[0] == "ffmpeg" and done.stderr):
        raise Unlike(f"{' '.join(map(str, command))}: {(done.stderr or done.stdout).decode(errors='replace').strip()}")
    return done.stdout


def same(what, one, other):
    if one != other:
        at = next((i for i, (a, b) in enumerate(zip(one, other)) if a != b), min(len(one), len(other)))
        raise Unlike(f"{what}: {len(one)} and {len(other)} bytes, different from byte {at} on")


def ffmpeg(box, name, *arguments):
    return read(box, "ffmpeg", "-v", "error", "-nostdin", *arguments[:-1], "-i", name, *arguments[-1], "-")


def sound(box, name, bits=16):
    """The samples, on which ffmpeg and sox agree."""
    shape = {8: "u8", 16: "s16le", 24: "s24le"}[bits]
    ours = ffmpeg(box, name, ["-map", "0:a", "-f", shape])
    if name.endswith(".wav"):
        sign = "unsigned-integer" if bits == 8 else "signed-integer"
        same(f"{name}: ffmpeg and sox", ours, read(box, "sox", name, "-t", "raw", "-e", sign, "-b", bits, "-"))
    return ours


def pictures(box, name, pixel, *before):
    return ffmpeg(box, name, *before, ["-map", "0:v", "-fps_mode", "passthrough", "-f", "rawvideo", "-pix_fmt", pixel])


def check_png(box, name):
    read(box, "pngcheck", "-q", name)
    if b" OK " not in read(box, "pngfix", name):
        raise Unlike(f"pngfix does not find {name} OK")


def made(box, *arguments):
    outcome = box.run(arguments)
    if outcome.status != 0:
        raise Unlike(crashed(outcome) or f"status {outcome.status}: {outcome.text.strip()}")


def check_wav(box):
    for bits, channels in ((8, 1), (16, 1), (16, 2), (16, 6), (24, 1), (24, 2), (24, 8)):
        data = jobs.pattern(bits // 8 * channels * 997)
        (box.work / "s.wav").write_bytes(jobs.wav(data, channels, bits))
        made(box, "transcode", "s.wav", "-o", "out.wav", "-y")
        same(f"{bits} bits, {channels} channels", sound(box, "out.wav", bits), data)


def check_channels(box):
    data = jobs.pattern(6000)
    made(box, "transcode", "in3.wav", "--split-channels", "-o", "ch.wav")
    every = jobs.pattern(9000, 11)
    for channel in range(3):
        one = b"".join(every[at + 2 * channel:at + 2 * channel + 2] for at in range(0, len(every), 6))
        same(f"channel {channel}", sound(box, f"ch#{channel:02}.wav"), one)


def check_raw(box):
    made(box, *jobs.card("--pixel", "I420", "-o", "card.yuv"))
    if len((box.work / "card.yuv").read_bytes()) != 5 * 64 * 48 * 3 // 2:
        raise Unlike("card.yuv is not five frames long")
    if len(sound(box, "card.wav")) != 8820 * 4:
        raise Unlike("card.wav is not 0.2 s long")


def check_avi(box):
    for pixel, named in RAW_FORMATS.items():
        made(box, *jobs.card("--pixel", pixel, "-o", "card.avi"))
        made(box, *jobs.card("--pixel", pixel, "-o", "card.raw"))
        if pixel == "v210":
            before, named = ["-f", "v210", "-s", "64x48"], "yuv422p10le"
        elif pixel == "YV12":  # as I420, with the chroma planes exchanged
            raw = (box.work / "card.raw").read_bytes()
            size, y = 64 * 48 * 3 // 2, 64 * 48
            frames = [raw[at:at + size] for at in range(0, len(raw), size)]
            (box.work / "card.raw").write_bytes(b"".join(f[:y] + f[y * 5 // 4:] + f[y:y * 5 // 4] for f in frames))
            before, named = ["-f", "rawvideo", "-pix_fmt", "yuv420p", "-s", "64x48"], "yuv420p"
        else:
            before = ["-f", "rawvideo", "-pix_fmt", named, "-s", "64x48"]
        out = "bgr24" if pixel == "BGR4" else named
        same(f"pictures of {pixel}", pictures(box, "card.avi", out), pictures(box, "card.raw", out, *before))
        same(f"sound next to {pixel}", sound(box, "card.avi"), sound(box, "card.wav"))


def check_pictures(box):
    made(box, *jobs.card("-o", "card.png"))
    made(box, *jobs.card("--pixel", "BGR3", "-o", "card.raw"))
    raw = pictures(box, "card.raw", "rgb24", "-f", "rawvideo", "-pix_fmt", "bgr24", "-s", "64x48")
    for number in range(5):
        check_png(box, f"card#{number}.png")
        part = raw[number * 9216:(number + 1) * 9216]
        same(f"picture {number}", pictures(box, f"card#{number}.png", "rgb24"), part)
    made(box, "frame", *jobs.CLIP, "--sheet", "3x2", "-o", "sheet.png")
    check_png(box, "sheet.png")
    pictures(box, "sheet.png", "rgb24")


def check_stream(box):
    """What is written to a pipe: raw pictures as in a file, and a WAV that others read without its length."""
    made(box, "transcode", *jobs.CLIP, "-o", "part.yuv")
    wav, sound_ = ["transcode", "in.wav", "--format", "wav"], jobs.pattern(12000)
    video = ["transcode", *jobs.CLIP, "--format", "yuv"]
    for arguments, reader, right in (
            (video, "cat", (box.work / "part.yuv").read_bytes()),
            (wav, "sox -q --ignore-length -t wav - -t raw -", sound_),
            (wav, "ffmpeg -v error -ignore_length 1 -f wav -i - -f s16le -", sound_)):
        outcome = box.run([*arguments, "-o", "-"])
        if outcome.status != 0:
            raise Unlike(f"status {outcome.status}: {outcome.text.strip()}")
        got = subprocess.run(reader.split(), input=outcome.stdout, capture_output=True, timeout=60)
        same(f"{' '.join(arguments)} read by {reader}", got.stdout, right)


def attack(sweep, check):
    with Box(sweep) as box:
        try:
            check(box)
        except Unlike as unlike:
            return "ok", str(unlike), None
        return "ok", None, None


def cases(sweep, pool, rng):
    missing = [tool for tool in TOOLS if not shutil.which(tool)]
    if missing:
        yield "reader", "tools", lambda: ("error", f"not installed: {', '.join(missing)}", None)
        return
    for check in (check_wav, check_channels, check_raw, check_avi, check_pictures, check_stream):
        yield "reader", check.__name__.removeprefix("check_"), lambda check=check: attack(sweep, check)
