"""What the jobs write, read by others: ffmpeg, sox, pngcheck, and libpng's pngfix.

The expected bytes come from the inputs, or from what another program makes of the same inputs; never from the reader
or a raw output of this library.
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
               "YV12": "yuv420p", "v210": "yuv422p10le"}
WIDTH, HEIGHT, FRAMES = 64, 48, 5

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


def planes(frame):
    """The planes of a frame in I420."""
    y, c = WIDTH * HEIGHT, WIDTH * HEIGHT // 4
    return frame[:y], frame[y:y + c], frame[y + c:]


def cut(data, size):
    return [data[at:at + size] for at in range(0, len(data), size)]


def noise(size):
    """Frames of any bytes."""
    return jobs.pattern(size * FRAMES, 29)


def every(data, *places):
    """Bytes exchanged in each group of so many: `places` says where each comes from, None is 255."""
    size = max(p for p in places if p is not None) + 1
    return b"".join(bytes(255 if p is None else group[p] for p in places) for group in cut(data, size))


# What a raw picture of one format is in another one that holds the same samples: bytes that only change their places.
SAME_SAMPLES = [
    ("I420", "I420", lambda data: data),
    ("I420", "YV12", lambda data: b"".join(y + v + u for y, u, v in map(planes, cut(data, WIDTH * HEIGHT * 3 // 2)))),
    ("YUYV", "UYVY", lambda data: every(data, 1, 0, 3, 2)),
    ("UYVY", "YUYV", lambda data: every(data, 1, 0, 3, 2)),
    ("BGR3", "BGR3", lambda data: data),
    ("BGR3", "BGR4", lambda data: every(data, 0, 1, 2, None)),
    ("BGRA", "ARGB", lambda data: every(data, 3, 2, 1, 0)),
]
BYTES = {"I420": 1.5, "YV12": 1.5, "YUYV": 2, "UYVY": 2, "BGR3": 3, "BGR4": 4, "BGRA": 4, "v210": 8 / 3}


def raw_input(box, pixel, name="noise.raw"):
    """Frames in a pixel format, and the arguments that name them."""
    frame = HEIGHT * 256 if pixel == "v210" else int(BYTES[pixel] * WIDTH * HEIGHT)
    data = noise(frame)
    if pixel == "v210":  # three samples of ten bits in each word, and the two bits above them clear; none is reserved
        words = (4 + i * 37 % 1016 | 4 + i * 53 % 1016 << 10 | 4 + i * 71 % 1016 << 20 for i in range(len(data) // 4))
        data = b"".join(struct.pack("<I", word) for word in words)
    (box.work / name).write_bytes(data)
    return data, ["transcode", name, "--raw", f"size={WIDTH}x{HEIGHT},pixel={pixel},rate=25", "-y"]


def check_raw(box):
    made(box, *jobs.card("-o", "card.yuv"))
    if len(sound(box, "card.wav")) != 8820 * 4:
        raise Unlike("card.wav is not 0.2 s long")
    for given, pixel, expected in SAME_SAMPLES:
        data, job = raw_input(box, given)
        made(box, *job, "--pixel", pixel, "-o", "out.raw")
        same(f"{given} as {pixel}", (box.work / "out.raw").read_bytes(), expected(data))
    data, job = raw_input(box, "I420")
    size = len(data) // FRAMES
    made(box, *job, "--from", "0.04", "--to", "0.16", "-o", "out.raw")
    same("frames 1 to 3", (box.work / "out.raw").read_bytes(), data[size:4 * size])
    made(box, *job, "--flip", "-o", "out.raw")
    mirrored = ffmpeg(box, "noise.raw", "-f", "rawvideo", "-pix_fmt", "yuv420p", "-s", f"{WIDTH}x{HEIGHT}",
                      ["-vf", "vflip", "-f", "rawvideo"])
    same("upside down", (box.work / "out.raw").read_bytes(), mirrored)


def theirs(box, pixel, out):
    """The pictures of the raw input, as ffmpeg itself reads them."""
    if pixel == "v210":
        return pictures(box, "noise.raw", out, "-f", "v210", "-s", f"{WIDTH}x{HEIGHT}")
    data = (box.work / "noise.raw").read_bytes()
    if pixel == "YV12":
        data = b"".join(y + u + v for y, v, u in map(planes, cut(data, WIDTH * HEIGHT * 3 // 2)))
    (box.work / "theirs.raw").write_bytes(data)
    return pictures(box, "theirs.raw", out, "-f", "rawvideo", "-pix_fmt", RAW_FORMATS[pixel], "-s",
                    f"{WIDTH}x{HEIGHT}")


def check_avi(box):
    samples = jobs.pattern(8820 * 4)
    (box.work / "s.wav").write_bytes(jobs.wav(samples))
    for pixel, named in RAW_FORMATS.items():
        _, job = raw_input(box, pixel)
        made(box, *job, "s.wav", "--pixel", pixel, "-o", "noise.avi")
        out = "bgr24" if pixel == "BGR4" else named
        same(f"pictures of {pixel}", pictures(box, "noise.avi", out), theirs(box, pixel, out))
        same(f"sound next to {pixel}", sound(box, "noise.avi"), samples)


def check_pictures(box):
    _, job = raw_input(box, "BGR3")
    made(box, *job, "-o", "noise.png")
    right = theirs(box, "BGR3", "rgb24")
    for number, part in enumerate(cut(right, WIDTH * HEIGHT * 3)):
        check_png(box, f"noise#{number}.png")
        same(f"picture {number}", pictures(box, f"noise#{number}.png", "rgb24"), part)
    made(box, "frame", "noise.raw", *job[2:4], "--at", "0.08", "-o", "shot.png")
    check_png(box, "shot.png")
    same("one picture", pictures(box, "shot.png", "rgb24"), cut(right, WIDTH * HEIGHT * 3)[2])
    # Colours are converted: as ffmpeg does it, except for rounding and for how chroma is sited.
    smooth = bytes([*(60 + x + y for y in range(HEIGHT) for x in range(WIDTH)),
                    *(96 + x for y in range(HEIGHT // 2) for x in range(WIDTH // 2)),
                    *(160 - y for y in range(HEIGHT // 2) for x in range(WIDTH // 2))])
    (box.work / "noise.raw").write_bytes(smooth)
    made(box, "frame", "noise.raw", *jobs.RAW, "-o", "shot.png", "-y")
    far = max(abs(a - b) for a, b in zip(pictures(box, "shot.png", "rgb24"), theirs(box, "I420", "rgb24")))
    if far > 4:
        raise Unlike(f"colours differ by {far}")
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
