#!/usr/bin/env python3
"""What ffprobe and mediainfo say of films that the tool writes: one line for each film, and what differs.

    tests/corpus/outsiders.py [build/release/bin/tarsel] [CONTAINER]...

Each container is written with pictures of several rates, orders of fields and shapes, and with sound. Both readers have
to find the codecs, the size, the rate, the shape, the fields, the colours and the length that were asked for, as far as
the container or the stream can say them. The status is 1 if one of them finds anything else.
"""
import fractions
import json
import pathlib
import subprocess
import sys
import tempfile

SECONDS = 2
# container: options of the job. What the streams can't say is left out by LACKS.
CONTAINERS = {
    "mp4": ["--vcodec", "h264:preset=ultrafast"], "mov": ["--vcodec", "prores", "--acodec", "pcm"],
    "mkv": ["--vcodec", "h264:preset=ultrafast"], "webm": ["--vcodec", "av1:preset=8"],
    "mxf": ["--vcodec", "mpeg2", "--acodec", "pcm"], "ts": ["--vcodec", "mpeg2", "--acodec", "mp2"],
    "m2ts": ["--vcodec", "h264:preset=ultrafast", "--acodec", "ac3"],
    "mpg": ["--vcodec", "mpeg2", "--acodec", "mp2"], "avi": ["--vcodec", "mpeg4", "--acodec", "mp3"],
}
# Pictures: name, size, rate, shape (width to height of the whole), fields.
CASES = [("25p", "320x240", "25", "4:3", ""), ("ntsc", "720x480", "29.97i", "16:9", "i"),
         ("pal", "720x576", "25i", "4:3", "i"), ("film", "1280x720", "23.976", "16:9", ""),
         ("hd", "1920x1080", "50", "16:9", "")]
LACKS = {"webm": {"i"}, "avi": {"i", "colour"}}
RATES = {"29.97": "30000/1001", "23.976": "24000/1001"}


def run(*words):
    return subprocess.run([str(word) for word in words], capture_output=True, text=True, timeout=120)


def ffprobe(name):
    said = json.loads(run("ffprobe", "-v", "error", "-of", "json", "-show_streams", "-show_format", name).stdout)
    video = next(s for s in said["streams"] if s["codec_type"] == "video")
    audio = next(s for s in said["streams"] if s["codec_type"] == "audio")
    shape = video.get("display_aspect_ratio", "0:1")
    order = video.get("field_order", "unknown")
    return {"size": (video["width"], video["height"]), "rate": fractions.Fraction(video["r_frame_rate"]),
            "shape": fractions.Fraction(*map(int, shape.split(":"))) if shape != "0:1" else None,
            "fields": {"unknown": None, "progressive": ""}.get(order, "i"), "colour": video.get("color_space"),
            "hertz": int(audio["sample_rate"]), "channels": audio["channels"],
            "seconds": float(said["format"]["duration"])}


def mediainfo(name):
    tracks = json.loads(run("mediainfo", "--Output=JSON", name).stdout)["media"]["track"]
    of = {track["@type"]: track for track in tracks}
    video, audio = of["Video"], of["Audio"]
    scan = video.get("ScanType")
    colours = {"BT.709": "bt709", "BT.601": "smpte170m", "BT.470 System B/G": "bt470bg"}
    return {"size": (int(video["Width"]), int(video["Height"])), "rate": fractions.Fraction(video.get("FrameRate", 0)),
            "shape": fractions.Fraction(video["DisplayAspectRatio"]),
            "fields": None if not scan else "" if scan == "Progressive" else "i",
            "order": video.get("ScanOrder"), "colour": colours.get(video.get("matrix_coefficients")),
            "hertz": int(audio["SamplingRate"]), "channels": int(audio["Channels"]),
            "seconds": float(of["General"]["Duration"])}


def wrong(said, container, size, rate, shape, fields):
    found = []
    lacks = LACKS.get(container, set())
    if said["size"] != tuple(map(int, size.split("x"))):
        found.append(f"size {said['size']}")
    wanted = fractions.Fraction(RATES.get(rate.rstrip("i"), rate.rstrip("i")))
    if abs(said["rate"] / wanted - 1) > 2e-5:
        found.append(f"rate {float(said['rate']):.5f}")
    if not said["shape"] or abs(said["shape"] / fractions.Fraction(*map(int, shape.split(":"))) - 1) > 0.02:
        found.append(f"shape {said['shape'] and float(said['shape']):.3f}")
    if said["fields"] is not None and said["fields"] != fields and not (fields and "i" in lacks):
        found.append("interlaced" if said["fields"] else "progressive")
    if said.get("order") not in (None, "TFF") and fields:
        found.append(f"order {said['order']}")
    if said["colour"] and "colour" not in lacks:
        hd = int(size.split("x")[1]) >= 720
        if (said["colour"] == "bt709") != hd:
            found.append(f"colour {said['colour']}")
    if (said["hertz"], said["channels"]) != (48000, 2):
        found.append(f"sound {said['hertz']} Hz, {said['channels']} channels")
    if abs(said["seconds"] - SECONDS) > 0.15:
        found.append(f"{said['seconds']:.3f} s")
    return found


def main():
    words = sys.argv[1:]
    tool = pathlib.Path(words.pop(0) if words and "/" in words[0] else "build/release/bin/tarsel").resolve()
    faults = 0
    with tempfile.TemporaryDirectory() as folder:
        for container in words or CONTAINERS:
            for name, size, rate, shape, fields in CASES:
                if fields and "i" in LACKS.get(container, set()):
                    continue
                film = f"{folder}/{name}.{container}"
                card = f"testgen:size={size},rate={rate},duration={SECONDS},aspect={shape}"
                made = run(tool, "transcode", card, "--samplerate", "48000", *CONTAINERS[container], "-o", film)
                if made.returncode:
                    faults += 1
                    print(f"{container:5} {name:5} {made.stderr.strip()}")
                    continue
                said = {"ffprobe": ffprobe(film), "mediainfo": mediainfo(film)}
                found = [f"{who}: {', '.join(what)}" for who, of in said.items()
                         if (what := wrong(of, container, size, rate, shape, fields))]
                faults += len(found)
                print(f"{container:5} {name:5} {'; '.join(found) or 'ok'}")
    return 1 if faults else 0


if __name__ == "__main__":
    sys.exit(main())
