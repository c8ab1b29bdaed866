"""Absurd option values: each is refused in one line before any work, or it is a value after all."""
import hostile
import jobs
from runner import Box

NUMBERS = ["", " ", "x", "-1", "nan", "inf", "1e9", "99999999999999999999", "0x10", "1 2", "%s%n", "-0", "4294967297",
           "1" * 5000, "\u0663", "5\n6"]
INSTANTS = [n for n in NUMBERS if n not in ("-1", "-0")]  # these count from the end
CARD = jobs.card("-o", "card.yuv")
SOUND = ["transcode", "in.wav", "-o", "out.wav", "-y"]
CLIP = ["transcode", *jobs.CLIP, "-o", "part.yuv", "-y"]
COMPARE = ["compare", "clip.yuv", *jobs.CLIP]
FRAME = ["frame", *jobs.CLIP, "-o", "shot.png", "-y"]

# The arguments before the option, the option, and its values. Each ends with status 2.
REFUSED = [
    (CARD, "--from", [*INSTANTS, "1:2:3:4:5", "00:00:61", "12f f"]),
    (CARD, "--to", INSTANTS),
    (SOUND, "--samplerate", [*NUMBERS, "0"]), (SOUND, "--channels", [*NUMBERS, "0", "9"]),
    (SOUND, "--bits", [*NUMBERS, "0", "7", "64"]),
    (SOUND, "--volume", [*INSTANTS, "49", "-121", "+-3", "a:", "a:=3", "a:0=", "a:1=3", "a:-1=3", "3dB"]),
    (SOUND, "--normalize", [*(v for v in INSTANTS if v), "1", "-71", "peak:", ":-3", "loud:-23", "rms:x"]),
    (SOUND, "--delay", [*INSTANTS, "--1", "1:2:3:4:5", "3601", "-999", "3f"]),
    (SOUND, "--map", [*NUMBERS, "0,", ",", "+", "0+", "-+0", "2", "a:0", "a:1.0", "a:0.2", "0," * 16 + "0"]),
    (SOUND, "--dither", [*NUMBERS, "Triangular"]),
    (SOUND, "--shortest", ["3"]), (SOUND, "--longest", ["3"]),
    (CARD, "--size", [*NUMBERS, "0x0", "1x", "x1", "-2x5", "-1x-1", "65536x1", "99999999999x1"]),
    (CARD, "--fit", [*NUMBERS, "0x0", "-1x5", "1x1,", "1x1,x", "1x1,bars,crop", "1x60000,bars"]),
    (CARD, "--duration", [*NUMBERS, "0", "1:2:3:4:5"]), (CARD, "--threads", [*NUMBERS, "0", "257"]),
    (CARD, "--rate", [*NUMBERS, "0", "1/0", "0/0", "1/-1", "1e400", "25ii"]),
    (CARD, "--pixel", [*NUMBERS, "I42", "I4200"]),
    (CARD, "--matrix", [*NUMBERS, "601:", ":709", "601:709:601"]),
    (CARD, "--crop", [*NUMBERS, "0x0", "1:0", "0:0", "9999x9999", "10x10+99999999999+0", "64x48+1+1"]),
    (CARD, "--fade", [v for v in NUMBERS if v] + ["1,2,3"]),
    (CARD, "--deinterlace", [v for v in NUMBERS if v]),
    (CARD, "--timecode", ["start=x", "mode=x", "x=", "size=99999999999"]),
    (CLIP, "--subtitle-style", NUMBERS), (CARD, "--progress", ["", "x", "JSON ", "json:", "json:99999", "log:0", "log:x", "none:1"]),
    (FRAME, "--at", [*INSTANTS, "--1"]), (FRAME, "--sheet", [*NUMBERS, "0x0", "33x33", "1x-1", "65535x65535"]),
    (["transcode", "clip.yuv", "-o", "part.yuv", "-y"], "--raw",
     [*NUMBERS, "size=0x0", "pixel=I420", "size=64x48,pixel=UYVY4", "size=64x48,pixel=BGR3",
      "size=64x48,pixel=none,rate=25", "size=64x48,pixel=I420,rate=0", "size=64x48,rate=50i",
      "size=65535x65535,pixel=I420,rate=25,offset=-1", "size=64x48,size=32x24,pixel=I420,rate=25", "=,=,=", ",,,"]),
    (CARD, "--flip", ["3", "no"]), (CARD, "--nosuch", ["1"]),
]
# Whole command lines, with any status but a crash: what they say is judged as everywhere.
OTHERS = [
    [], [""], ["-o"], ["--"], ["transcode"], ["frame"], ["transcode", "-o", "x.wav"], ["transcode", "in.wav"],
    ["nosuch"],
    ["transcode", "in.wav", "in.wav", "-o", "out.wav"], ["transcode", "in.wav", "-o", "in.wav", "-y"],
    ["transcode", "in.wav", "-o", "./../w/in.wav", "-y"], ["transcode", "in.wav", "-o", "out.nosuch"],
    ["transcode", "in.wav", "-o", ""], ["transcode", "", "-o", "out.wav"], ["transcode", "in.wav", "-o", "."],
    [*CARD, "--timecode=25:00:00:00"], [*CARD, "--timecode=00:00:00:99"],
    [*CARD, "--size", "65535x65535"], [*CARD, "--rate", "119.9"], ["transcode", "testgen:", "-o", "x.yuv"],
    *(["transcode", "testgen:" + value, "-o", "x.yuv"] for value in (
        "size=0x0", "size=64x48,duration=-1", "size=64x48,duration=nan", "size=64x48,duration=0", "views=99", "mode=x",
        "size=64x48,rate=0", "picture=talk.srt", "picture=", "picture=/", "aspect=0:0", "nosuch=1")),
    [*CARD, "--to", "0.1", "--from", "0.2"], [*SOUND, "--from", "999999"], [*FRAME, "--at", "999999"],
    [*CLIP, "--subtitles", "in.wav"], [*CLIP, "--subtitles", "."], [*CLIP, "--logo", "in.wav"], [*CLIP, "--logo", "@"],
    [*CLIP, "--logo", "mark.png@99999999999,0"], [*CLIP, "--logo", "mark.png@0,0,7"], [*CLIP, "--logo", "mark.png@x,y"],
    [*CLIP, "--subtitles", "talk.srt", "--subtitle-style", "font=in.wav"],
    [*CLIP, "--subtitles", "talk.srt", "--subtitle-style", "size=0"],
    [*CLIP, "--subtitles", "talk.srt", "--subtitle-style", "size=100000000"],
    *([*CLIP, "--filter", value] for value in (
        "", ":", "nosuch", "brightness:", "brightness:nosuch=1", "brightness:brightness=x",
        "brightness:brightness=1e308", "brightness:brightness=nan", "cropper:width=-5", "logo", "subtitle",
        "timecode:size=-1", "scaler:outWidth=-1", "scaler:outWidth=99999999", "deinterlace:mode=77",
        "frconvert", "avol", "rawdump:file=.")),
    [*SOUND, "--post", "exit 7"], [*SOUND, "--save-task", "/nosuch/x.xml"], [*SOUND, "--save-task", "in.wav"],
    ["--log", "/nosuch/folder/log", *SOUND], ["--plugins", "/nosuch", *SOUND],
    *(["transcode", "--join", *segments, "-o", "out.wav", "-y"] for segments in (
        ["in.wav@"], ["in.wav@-"], ["in.wav@1-0"], ["in.wav@0-999999999999"], ["in.wav@nan-inf"], ["in.wav+"], ["+"],
        ["@0-1"], ["in.wav+in.wav"], ["in.wav", "out.wav"], ["in.wav"] * 2000, ["clip.yuv"], ["mark.png"], ["."])),
    *([*SOUND, "--cut", value] for value in ("", "-", "0", "0-0", "1-", "0-0.01-0.02", "x-y", "-1--2", "1e300-2e300")),
    *(["run", "stored.xml", "-y", "-o", name] for name in (
        "", ".", "-", "/dev/full", "/dev/null", "in.wav", "clip.yuv", "stored.xml", "nosuch/out.yuv", "%d%d.yuv")),
    ["run", "."], ["run", "in.wav"], ["run", "nosuch.xml"], ["task", "relink", "=", "stored.xml"],
    ["task", "relink", "clip.yuv=in.wav", "."], ["task", "check", "/dev/null"], ["task", "show", "clip.yuv"],
    *([*COMPARE, *more] for more in (
        ["--offset", "99999999999"], ["--offset", "x"], ["--min-psnr", "nan"], ["--min-psnr", "-1"], ["--sheet", "."],
        ["--sheet", "clip.yuv"], ["--sheet", "nosuch/x.png"])),
    ["compare", "in.wav", "in.wav"], ["scope", "in.wav"], ["scope", *jobs.CLIP, "--at", "nan"],
    ["scope", *jobs.CLIP, "-o", "mark.png"], ["loudness", "clip.yuv"], ["loudness", "."], ["loudness", "nosuch.wav"],
    ["info"], ["info", "."], ["info", "/dev/null"], ["captions", "in.wav"], ["formats", "--nosuch"],
    [*SOUND, "--muxer", "nosuch"], ["recover", "/nosuch/folder"],
]


def attack(sweep, arguments, statuses):
    output = next((a for a in arguments if a in ("out.wav", "shot.png", "part.yuv", "card.yuv")), None)
    with Box(sweep) as box:
        if output:
            (box.work / output).write_bytes(hostile.OLD)
        outcome = box.run(arguments, {"LC_ALL": "C.UTF-8"}, wrap=[] if sweep.asan else ["prlimit", hostile.MEMORY])
        if outcome.status == 0:
            wrong = None if 0 in statuses else "status 0"
            return "ok", wrong or (f"leaves {box.litter()}" if box.litter() else None), outcome
        if arguments[-2:] == ["--post", "exit 7"]:
            output = None  # it runs after the job
        wrong = hostile.verdict(box, outcome, output)
        if not wrong and outcome.status not in statuses:
            wrong = f"ends with {outcome.status}, not {statuses}: {outcome.text.strip()}"
        return outcome.ended(), wrong, outcome


def shown(value):
    return repr(value if len(value) < 40 else value[:10] + "...").strip("'")


def cases(sweep, pool, rng):
    for before, option, values in REFUSED:
        for value in values:
            line = [*before, f"{option}={value}"]
            yield "option", f"{option}={shown(value)}", lambda line=line: attack(sweep, line, (2,))
    for number, line in enumerate(OTHERS):
        yield "option", f"line{number}", lambda line=line: attack(sweep, line, range(0, 7))
