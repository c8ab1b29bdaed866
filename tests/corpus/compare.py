#!/usr/bin/env python3
"""Compares how the engine reads films with how ffmpeg does: pictures, samples, and both after seeks.

usage: compare.py [--program FILMDUMP] [--seeks N] FOLDER|FILM...

A line for each film that differs, with where and how. Build "filmdump" first. Pictures that only a conversion
brings into a form of the engine are counted, and compared with themselves after seeks, no more; those of
variable rate likewise. Sound may start and end elsewhere, as the film's first picture decides: what both have
is compared.
"""
import argparse
import array
import os
import pathlib
import subprocess
import sys
import tempfile
import zlib

# Of the engine's forms: what ffmpeg is asked for, and how far its samples are shifted up.
LAYOUTS = {
    ("I420", "yuv420p"): ("yuv420p", 0),
    ("YUYV", "yuv422p"): ("yuyv422", 0),
    ("YUYV", "yuyv422"): ("yuyv422", 0),
    ("W016", "yuv420p10le"): ("yuv420p10le", 6),
    ("W016", "yuv420p12le"): ("yuv420p12le", 4),
}
KILL = 60  # seconds


def run(words):
    return subprocess.run(words, stdin=subprocess.DEVNULL, capture_output=True, timeout=KILL, check=False)


def probe(film, kind):
    """Pixel format and range of each stream of the kind."""
    out = run(["ffprobe", "-v", "quiet", "-select_streams", kind, "-show_entries",
               "stream=index,pix_fmt,sample_fmt,color_range,codec_name:stream_disposition=attached_pic", "-of", "compact=nk=0", film])
    rows = []
    for line in out.stdout.decode(errors="replace").splitlines():
        fields = dict(part.split("=", 1) for part in line.split("|")[1:] if "=" in part)
        if line.startswith("stream|") and fields.get("disposition:attached_pic") != "1":
            rows.append(fields)
    return rows


def frame_sums(film, index, layout, shift, size):
    process = subprocess.Popen(["ffmpeg", "-nostdin", "-v", "quiet", "-noautorotate", "-i", film, "-map", f"0:{index}",
                                "-f", "rawvideo", "-pix_fmt", layout, "-fps_mode", "passthrough", "-"], stdout=subprocess.PIPE)
    sums = array.array("I")
    while len(data := process.stdout.read(size)) == size:
        if shift:
            data = (int.from_bytes(data, "little") << shift).to_bytes(size, "little")
        sums.append(zlib.crc32(data))
    process.stdout.close()
    process.wait()
    return sums


def compare_video(film, words, row, folder):
    number, fourcc, width, height, count, _, variable, concealed = words
    form = int(fourcc).to_bytes(4, "little").decode(errors="replace")
    if form[::-1] in [key[0] for key in LAYOUTS]:
        form = form[::-1]
    known = LAYOUTS.get((form, row["pix_fmt"]))
    if not known or row.get("color_range") == "pc":
        yield "note", f"pictures of {row['pix_fmt']} as {form}: not compared"
        return
    layout, shift = known
    width, height = int(width), int(height)
    chroma = ((width + 1) // 2) * ((height + 1) // 2)
    size = width * height + 2 * chroma if form in ("I420", "W016") else (width + 1) // 2 * 4 * height
    theirs = frame_sums(film, row["index"], layout, shift, size * (2 if shift else 1))
    ours = array.array("I", pathlib.Path(folder, f"v{number}").read_bytes())
    if variable == "1":
        if [x for i, x in enumerate(ours) if i == 0 or x != ours[i - 1]] != \
           [x for i, x in enumerate(theirs) if i == 0 or x != theirs[i - 1]]:
            yield "note", f"variable rate: {count} frames of {len(theirs)} pictures"
        return
    if ours == theirs:
        return
    same = sum(a == b for a, b in zip(ours, theirs))
    yield "differs", f"{len(ours)} frames, ffmpeg {len(theirs)}, {same} equal at their place, {concealed} concealed"


def rounded(samples):
    """Of 32 bits of floating point: as 24-bit integers."""
    most = 1 << 23
    whole = array.array("i", (min(max(round(x * most), -most), most - 1) for x in array.array("f", samples)))
    data = bytearray(len(whole) * 3)
    for i in range(3):
        data[i::3] = whole.tobytes()[i::4]
    return bytes(data)


def compare_audio(film, words, row, folder):
    number, rate, channels, bits, count, _ = words
    real = bits == "24" and row.get("sample_fmt", "").startswith("flt")
    raw = "f32le" if real else {"8": "u8", "16": "s16le", "24": "s24le"}[bits]
    size = int(channels) * int(bits) // 8
    theirs = run(["ffmpeg", "-nostdin", "-v", "quiet", "-i", film, "-map", f"0:{row['index']}", "-f", raw, "-c:a",
                  "pcm_" + raw, "-ar", rate, "-ac", channels, "-"]).stdout
    if real:
        theirs = rounded(theirs)
    ours = pathlib.Path(folder, f"a{number}").read_bytes()
    if ours == theirs:
        return
    if not any(ours) and not any(theirs):
        yield "note", f"{count} samples of silence, ffmpeg {len(theirs) // size}"
        return
    # Where a piece of ours is in theirs, or the other way round.
    step = max(len(ours) // size // 16, 1) * size
    for at in range(0, max(len(ours) - 64 * size, 1), step):
        piece = ours[at:at + 64 * size]
        if len(set(piece)) > 8 and (found := theirs.find(piece)) >= 0:
            offset = found - at
            break
    else:
        yield "differs", f"none of its {count} samples are those of ffmpeg ({len(theirs) // size})"
        return
    start, end = max(0, -offset), min(len(ours), len(theirs) - offset)
    if ours[start:end] != theirs[start + offset:end + offset]:
        mine, other = memoryview(ours)[start:end], memoryview(theirs)[start + offset:end + offset]
        wrong = sum(mine[i:i + size] != other[i:i + size] for i in range(0, end - start, size))
        first = next(i for i in range(0, end - start, size) if mine[i:i + size] != other[i:i + size])
        yield "differs", (f"{wrong} of {(end - start) // size} samples, from {(start + first) // size} on"
                          f" (offset {offset // size})")
    elif len(ours) - start - (end - start) or start or offset:
        yield "note", (f"{count} samples, ffmpeg {len(theirs) // size}: starts {offset // size} later,"
                       f" ends {(len(theirs) - offset - len(ours)) // size} earlier, the rest is equal")


def compare(program, film, seeks):
    with tempfile.TemporaryDirectory() as folder:
        out = run([program, film, folder, str(seeks)])
        if out.returncode not in (0, 3):
            yield "differs", f"filmdump ended with {out.returncode}"
        rows = {"video": probe(film, "v"), "audio": probe(film, "a")}
        seen = {"video": 0, "audio": 0}
        lost = []
        for line in out.stdout.decode(errors="replace").splitlines():
            word, *rest = line.split(" ")
            if word == "error":
                yield ("refused" if out.returncode == 3 else "differs"), " ".join(rest)
            elif word == "seek":
                lost.append(" ".join(rest))
            elif word in rows and seen[word] < len(rows[word]):
                usable = [row for row in rows[word] if row.get("codec_name", "unknown") != "unknown"]
                row = usable[min(seen[word], len(usable) - 1)]
                seen[word] += 1
                # The number of the output file stays that of the engine's stream.
                check = compare_video if word == "video" else compare_audio
                for kind, text in check(film, rest, row, folder):
                    yield kind, f"{word} {rest[0]}: {text}"
        if lost:
            yield "differs", f"after {len(lost)} seeks, first: {lost[0]}"


def main():
    options = argparse.ArgumentParser(description=__doc__.splitlines()[0])
    here = pathlib.Path(__file__).resolve().parents[2]
    options.add_argument("--program", default=str(here / "build/release/bin/filmdump"))
    options.add_argument("--seeks", type=int, default=10)
    options.add_argument("films", nargs="+")
    words = options.parse_args()
    films = []
    for name in words.films:
        path = pathlib.Path(name)
        films += sorted(path.iterdir()) if path.is_dir() else [path]
    counts = {"equal": 0, "note": 0, "differs": 0, "refused": 0}
    for film in films:
        if film.suffix in (".md", ".tsv") or not film.is_file():
            continue
        try:
            found = list(compare(words.program, os.fspath(film), words.seeks))
        except subprocess.TimeoutExpired:
            found = [("differs", f"takes more than {KILL} s")]
        worst = next((kind for kind in ("differs", "refused", "note") if any(f[0] == kind for f in found)), "equal")
        counts[worst] += 1
        for kind, text in found:
            print(f"{film.name}: {kind}: {text}", flush=True)
    print(", ".join(f"{number} {kind}" for kind, number in counts.items()))
    return 1 if counts["differs"] else 0


if __name__ == "__main__":
    sys.exit(main())
