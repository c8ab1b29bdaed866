"""Headers include files of their own room or of a room below it; what lies above is forward-declared."""
import pathlib
import re
import sys

CORE = ["arch", "value", "engine", "media", "stream", "decode", "encode", "filter", "transcode", "batch",
        "caption", "preset", "compose"]
LEVEL = {f"core/{room}": i for i, room in enumerate(CORE)} | {"builtin": 100}


def room(path):
    parts = path.split("/")
    return "/".join(parts[:2]) if parts[0] == "core" else parts[0]


faults = []
for file in [*pathlib.Path("core").rglob("*.h"), *pathlib.Path("core").rglob("*.cpp")]:
    own = room(str(file))
    for line in file.read_text().splitlines():
        found = re.match(r'#include "([^"]+)"', line)
        if not found:
            continue
        other = room(found.group(1))
        up = LEVEL.get(other, -1) > LEVEL.get(own, 0)
        if other == "builtin" or (up and file.suffix == ".h" and not file.stem.endswith("_p")):
            faults.append(f"{file}: includes {found.group(1)}, which lies above")
print("\n".join(faults), end="\n" if faults else "")
sys.exit(bool(faults))
