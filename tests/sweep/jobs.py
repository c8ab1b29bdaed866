"""The jobs that are attacked, one for each form of output, and the inputs that they read.

A job overwrites what an earlier run of it wrote. The earlier run has other arguments, so that each of its files
differs from the new one of that name, and where the output is a set of files it has written more of them.
"""
import dataclasses
import pathlib
import struct
import zlib


@dataclasses.dataclass(frozen=True)
class Job:
    name: str
    arguments: list
    earlier: list = dataclasses.field(default_factory=list)
    stdout: bool = False  # the result is what is printed


def card(*arguments, length=0.2, size="64x48"):
    return ["transcode", f"testgen:size={size},duration={length}", *arguments, "-y"]


RAW = ["--raw", "size=64x48,pixel=I420,rate=25"]
CLIP = ["clip.yuv", *RAW]
EFFECTS = ["--subtitles", "talk.srt", "--logo", "mark.png@4,4", "--timecode", "--fade", "0.1", "--crop", "60x40",
           "--flip"]
# Matroska has a random number of its own otherwise.
BITEXACT = ["--muxer", "mkvmux:avOptions=fflags=+bitexact"]

# Where the result names the decoder, no other one may take a file that the first could not read.
JOBS = [
    Job("wav", ["transcode", "in.wav", "-o", "out.wav", "-y"], ["transcode", "in3.wav", "-o", "out.wav", "-y"]),
    Job("raw", card("--pixel", "I420", "-o", "card.yuv"), card("--pixel", "I420", "-o", "card.yuv", length=0.28)),
    Job("cut", ["transcode", *CLIP, "--from", "0.2", "--to", "0.6", "-o", "part.yuv", "-y"],
        ["transcode", *CLIP, "--to", "0.2", "-o", "part.yuv", "-y"]),
    Job("avi", card("--pixel", "I420", "-o", "card.avi"), card("--pixel", "YUYV", "-o", "card.avi")),
    Job("preset", card("--preset", "Uncompressed AVI", "--match", "--pixel", "I420", "-o", "made.avi"),
        card("--pixel", "YUYV", "-o", "made.avi")),
    Job("presets", ["presets", "save", "Web", "--size", "64x48", "--overwrite"],
        ["presets", "save", "Web", "--size", "320x240", "--overwrite"]),
    Job("pictures", card("-o", "card.png"), card("-o", "card.png", length=0.28, size="48x64")),
    Job("channels", ["transcode", "in.wav", "--split-channels", "-o", "ch.wav", "-y"],
        ["transcode", "in3.wav", "--split-channels", "-o", "ch.wav", "-y"]),
    Job("mixed", ["transcode", "in.wav", "--map", "1,0+1", "--normalize=-20", "--delay", "0.01", "-o", "mix.wav", "-y"],
        ["transcode", "in3.wav", "--map", "2,1,-", "--volume", "-6", "--samplerate", "48000", "-o", "mix.wav", "-y"]),
    Job("joined", ["transcode", "in.wav", "in3.wav", "--map", "a:1.2,a:0.0", "-o", "one.wav", "-y"],
        ["transcode", "in.wav", "--map", "1", "-o", "one.wav", "-y"]),
    Job("mix", ["mix", "--ch", "L=in.wav:0", "--ch", "R=in3.wav:1*0.5", "-o", "x.mmf", "-y"],
        ["mix", "--ch", "M=in3.wav:1", "-o", "x.mmf", "-y"]),
    Job("loudness", ["loudness", "in3.wav", "--json"], stdout=True),
    Job("frame", ["frame", *CLIP, "--at", "0.2", "-o", "shot.png", "-y"], ["frame", *CLIP, "-o", "shot.png", "-y"]),
    Job("sheet", ["frame", *CLIP, "--sheet", "12x1", "-o", "sheet.png", "-y"],
        ["frame", *CLIP, "--sheet", "16x1", "-o", "sheet.png", "-y"]),
    Job("effects", ["transcode", *CLIP, *EFFECTS, "-o", "burnt.yuv", "-y"],
        ["transcode", *CLIP, "-o", "burnt.yuv", "-y"]),
    Job("task", ["--no-plugins", "transcode", "in.wav", "-o", "out.wav", "--save-task", "task.xml", "--relative", "-y"],
        ["transcode", "in3.wav", "-o", "out.wav", "--save-task", "task.xml", "--relative", "-y"]),
    Job("dump", card("--pixel", "I420", "--filter", "rawdump:filename=dump", "-o", "dumped.yuv"),
        card("--pixel", "I420", "--filter", "rawdump:filename=dump", "-o", "dumped.yuv", length=0.28)),
    Job("logo", card("--logo", "shown#9.png@4,4", "--save-task", "shown.xml", "--relative", "-o", "shown.png"),
        card("--logo", "shown#9.png@0,0", "--save-task", "shown.xml", "--relative", "-o", "shown.png", length=0.28, size="48x64")),
    Job("beside", ["transcode", *CLIP, "in.wav", "--to", "0.06", "-o", "pair.yuv", "-y"],
        ["transcode", *CLIP, "in3.wav", "--from", "0.1", "-o", "pair.yuv", "-y"]),
    Job("join", ["--no-plugins", "transcode", "--join", "clip.yuv@0-0.2", "in.wav", "clip.yuv+in.wav@0.2-0.4", *RAW, "--fade", "2f",
                 "--subtitles", "talk.srt", "--save-task", "joined.xml", "--relative", "-o", "joined.yuv", "-y"],
        ["transcode", *CLIP, "--cut", "0-0.2", "--cut", "0.4-0.5", "--save-task", "joined.xml", "--relative",
         "-o", "joined.yuv", "-y"]),
    Job("run", ["run", "stored.xml", "-y"], ["transcode", *CLIP, "in3.wav", "-o", "out2.yuv", "-y"]),
    Job("compare", ["compare", "clip.yuv", *CLIP, "--offset", "1", "--sheet", "worst.png", "-y"],
        ["compare", "clip.yuv", *CLIP, "--sheet", "worst.png", "-y"]),
    Job("scope", ["scope", *CLIP, "-o", "levels.png", "-y"],
        ["scope", *CLIP, "--at", "0.4", "-o", "levels.png", "-y"]),
    Job("film", ["transcode", "film.y4m", "-o", "film.yuv", "-y"], ["transcode", *CLIP, "-o", "film.yuv", "-y"]),
    Job("mp4", card("--vcodec", "h264:preset=ultrafast", "--threads", "1", "-o", "card.mp4"),
        card("--vcodec", "h264:preset=ultrafast", "--threads", "1", "-o", "card.mp4", length=0.28)),
    Job("mkv", card(*BITEXACT, "--vcodec", "ffv1", "--acodec", "flac", "--threads", "1", "-o", "card.mkv"),
        card(*BITEXACT, "--vcodec", "ffv1", "--acodec", "flac", "--threads", "1", "-o", "card.mkv", length=0.28)),
    Job("captions", ["captions", "one.scc", "--json"], stdout=True),
    Job("info", ["--no-plugins", "info", "in.wav", "talk.srt", "--json"], stdout=True),
]


def pattern(count, step=7):
    return bytes((i * step + i // 251) & 255 for i in range(count))


def wav(data, channels=2, bits=16, rate=44100):
    frame = channels * bits // 8
    head = b"fmt " + struct.pack("<IHHIIHH", 16, 1, channels, rate, rate * frame, frame, bits)
    head += b"data" + struct.pack("<I", len(data))
    return b"RIFF" + struct.pack("<I", 4 + len(head) + len(data)) + b"WAVE" + head + data


def png(width, height):
    """A picture of 8-bit RGB."""
    def chunk(kind, data):
        return struct.pack(">I", len(data)) + kind + data + struct.pack(">I", zlib.crc32(kind + data))
    rows = b"".join(b"\0" + pattern(width * 3, row + 1) for row in range(height))
    return (b"\x89PNG\r\n\x1a\n" + chunk(b"IHDR", struct.pack(">IIBBBBB", width, height, 8, 2, 0, 0, 0)) +
            chunk(b"IDAT", zlib.compress(rows)) + chunk(b"IEND", b""))


SRT = b"1\n00:00:00,000 --> 00:00:00,300\nHello\n\n2\n00:00:00,400 --> 00:00:00,800\n<i>again</i>\n"
SCC = (b"Scenarist_SCC V1.0\n\n"
       b"00:00:01:00\t9420 9420 94ae 94ae 9470 9470 c8e5 ecec ef80 942f 942f\n\n00:00:03:00\t942c 942c\n")


def film(frames):
    picture = 64 * 48 * 3 // 2
    return b"YUV4MPEG2 W64 H48 F25:1 Ip A1:1 C420jpeg\n" + b"".join(
        b"FRAME\n" + pattern(picture, 3 + i) for i in range(frames))


def inputs():
    return {"in.wav": wav(pattern(12000)), "in3.wav": wav(pattern(9000, 11), channels=3),
            "clip.yuv": pattern(64 * 48 * 3 // 2 * 20), "film.y4m": film(8), "mark.png": png(20, 10),
            "shown#9.png": png(12, 12), "talk.srt": SRT, "one.scc": SCC,
            "stored.xml": (pathlib.Path(__file__).parent / "stored.xml").read_bytes()}
