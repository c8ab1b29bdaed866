"""Every include goes to its own room or to a lower floor of rooms.txt, and no folder is too full to survey.

usage: rooms.py [TREE]      checks the tree (default: the working folder)
       rooms.py --table     prints the rooms as the table of docs/architecture.md
"""
import os
import pathlib
import re
import sys

MOST_FILES = 30
FLOORS = ("core", "builtin", "plugins", "tarsel")


def read_rooms():
    rooms = {}
    for line in (pathlib.Path(__file__).parent / "rooms.txt").read_text().splitlines():
        if line and not line.startswith("#"):
            floor, folder, text = line.split(None, 2)
            rooms[folder] = (int(floor), text)
    return rooms


def table(rooms):
    rows = ["| floor | room | what lives there |", "|---|---|---|"]
    rows += [f"| {floor} | `{folder}` | {text} |" for folder, (floor, text) in rooms.items()]
    return "\n".join(rows)


def include_faults(tree, file, rooms):
    own = str(file.relative_to(tree).parent)
    if own not in rooms:
        return [f"{file}: the folder {own} is no room of rooms.txt"]
    faults = []
    for line in file.read_text(errors="replace").splitlines():
        found = re.match(r'\s*#\s*include\s*(?:"|<(?=(?:core|builtin|plugins|tarsel|tests)/))([^">]+)', line)
        if not found or found[1] == "soundbytes_data.inc":  # made by the build
            continue
        other = os.path.normpath(os.path.dirname(found[1]))
        if other not in rooms:
            faults.append(f"{file}: includes {found[1]}, which is in no room")
        elif own.startswith("plugins/") and other.startswith("core/"):
            if found[1].endswith("_p.h") or other.endswith("/posix"):
                faults.append(f"{file}: includes {found[1]}, which is not installed")
        elif own.split("/")[0] in ("tarsel", "plugins") and other.split("/")[0] != own.split("/")[0]:
            faults.append(f"{file}: includes {found[1]}; here use installed headers, <qvplugcore/...>")
        elif other != own and rooms[other][0] >= rooms[own][0]:
            faults.append(f"{file}: includes {found[1]}, which is not below it")
    return faults


def check(tree, rooms):
    faults = []
    counts = {}
    for floor in FLOORS:
        for file in sorted((tree / floor).rglob("*")):
            if file.is_file():
                counts[file.parent] = counts.get(file.parent, 0) + 1
            if file.suffix in (".h", ".cpp"):
                faults += include_faults(tree, file, rooms)
    for folder in list((tree / "tests").rglob("*")) + list((tree / "bench").rglob("*")):
        if folder.is_file():
            counts[folder.parent] = counts.get(folder.parent, 0) + 1
    faults += [f"{folder}: {count} files, more than {MOST_FILES}" for folder, count in counts.items() if count > MOST_FILES]
    return faults


if __name__ == "__main__":
    rooms = read_rooms()
    if sys.argv[1:] == ["--table"]:
        print(table(rooms))
        sys.exit(0)
    faults = check(pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else "."), rooms)
    print("\n".join(faults), end="\n" if faults else "")
    sys.exit(bool(faults))
