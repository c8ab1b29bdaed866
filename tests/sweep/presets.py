"""Every preset whose modules are installed, in each container that it allows: two seconds of picture with sound.

The result has to hold what the plan of the job says: codecs, size, rate, fields, and how much. ffprobe says what it
holds; without it only the tool itself does.
"""
import fractions
import json
import re
import shutil
import subprocess

from runner import Box, crashed

CARD = "testgen:size=720x576,rate=25,duration="
EXTENSIONS = {"mp4mux": "mp4", "movmux": "mov", "mkvmux": "mkv", "webmmux": "webm", "mxfmux": "mxf", "mptsmux": "ts",
              "mpegpsmux": "mpg", "dvmux": "dv", "dvavimux": "avi", "flacmux": "flac", "oggmux": "ogg",
              "y4mmux": "y4m", "rawavimux": "avi"}
CODECS = {"h264venc": "h264", "h265venc": "hevc", "av1venc": "av1", "mpegvenc": "mpeg[12]video", "mpeg4venc": "mpeg4|h263",
          "vc3venc": "dnxhd", "dvvenc": "dvvideo", "dv100venc": "dvvideo", "mj2kvenc": "jpeg2000",
          "proresvenc": "prores", "ffv1venc": "ffv1", "rawvenc": "rawvideo", "aacaenc": "aac", "mpegaenc": "mp2",
          "mp3aenc": "mp3", "ddaenc": "ac3", "ddproaenc": "ac3", "ddplusproaenc": "eac3", "flacaenc": "flac",
          "opusaenc": "opus", "mpegpcmenc": "pcm_.*", "dummyaenc": "pcm_.*", "rawaenc": "pcm_.*"}
PLANNED = re.compile(r"encoder (\w+): (\d+)x(\d+) \S+ ([\d./]+)(i|b)?|encoder (\w+): (\d+) Hz, (\d+) ch")
# What the libraries can't write; the refusal says so.
REFUSED = {("DVCPRO100_720p", "dvmux"), ("DVCPRO100_720p_NATIVE", "dvmux")}


def planned(text):
    """The streams that a plan names: (codec, width, height, rate, fields) and (codec, samples a second, channels)."""
    found = []
    for video, width, height, rate, fields, audio, hertz, channels in PLANNED.findall(text):
        if video:
            rate = fractions.Fraction(rate)
            known = [r for r in map(fractions.Fraction, ("24000/1001", "30000/1001", "60000/1001")) if
                     abs(float(r) - float(rate)) < 0.005]
            found.append((video, int(width), int(height), known[0] if known else rate, fields))
        else:
            found.append((audio, int(hertz), int(channels)))
    return found


def held(name, folder):
    """The same by ffprobe, with the seconds of each."""
    said = subprocess.run(["ffprobe", "-v", "error", "-of", "json", "-show_entries", "format=format_name:stream",
                           name], cwd=folder, capture_output=True, text=True, timeout=60)
    return json.loads(said.stdout or "{}").get("streams", []), said.stderr.strip()


def mismatch(wanted, streams, seconds):
    pictures = [s for s in streams if s["codec_type"] == "video"]
    sounds = [s for s in streams if s["codec_type"] == "audio"]
    for stream in wanted:
        of = pictures if len(stream) == 5 else sounds
        if not of:
            return f"there is no {stream[0]}"
        one = of.pop(0)
        if not re.fullmatch(CODECS[stream[0]], one["codec_name"]):
            return f"{one['codec_name']} is not of {stream[0]}"
        if len(stream) == 3:
            if (int(one["sample_rate"]), one["channels"]) != stream[1:]:
                return f"{one['sample_rate']} Hz, {one['channels']} channels are not {stream[1:]}"
            continue
        if (one["width"], one["height"]) != stream[1:3]:
            return f"{one['width']}x{one['height']} is not {stream[1]}x{stream[2]}"
        if abs(fractions.Fraction(one["r_frame_rate"]) / stream[3] - 1) > 1e-4:
            return f"{one['r_frame_rate']} is not {stream[3]} frames a second"
        order, fields = one.get("field_order", "unknown"), {"i": ("tt", "tb"), "b": ("bb", "bt"), "": ("progressive",)}
        if order != "unknown" and order not in fields[stream[4]]:
            return f"the order of fields is {order}, not {stream[4] or 'progressive'}"
    for stream in streams:
        if "duration" in stream and not seconds - 0.2 < float(stream["duration"]) < seconds + 0.2:
            return f"{stream['codec_name']} lasts {stream['duration']} s"
    return None


def attack(sweep, key, muxer):
    with Box(sweep) as box:
        extension = EXTENSIONS.get(muxer, "out")
        # Pictures of digital cinema take a second or more each.
        seconds = 0.2 if key.startswith("DCI_") and key[-1] == "K" else 2
        job = ["transcode", CARD + str(seconds), "--preset", key, "--muxer", muxer, "-o", f"x.{extension}"]
        plan = box.run([*job, "--dry-run"])
        outcome = box.finish(box.start(job), 300)
        wrong = crashed(outcome)
        if not wrong and (key, muxer) in REFUSED:
            wrong = None if outcome.status == 4 else f"is not refused (status {outcome.status})"
        elif not wrong and outcome.status != 0:
            wrong = f"fails (status {outcome.status}): {outcome.text.strip()}"
        elif not wrong and muxer in EXTENSIONS and shutil.which("ffprobe"):
            streams, said = held(f"x.{extension}", box.work)
            wrong = said or mismatch(planned(plan.stdout.decode()), streams, seconds)
        return outcome.ended(), wrong, outcome


def cases(sweep, pool, rng):
    for preset in json.loads(sweep.ask("presets", "list", "--json").stdout):
        key = preset.get("symbol") or preset["name"]
        if key in ("RAW", "AVI_RAW") or preset["own"] or preset["name"] == "Any codecs":
            continue
        for muxer in preset["muxers"]:
            yield "preset", f"{key.replace(' ', '-')}/{muxer}", lambda a=(sweep, key, muxer): attack(*a)
