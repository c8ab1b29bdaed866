"""What the documents say about modules, names and examples is made from what the tool and the sources say.

usage: tables.py TARSEL            checks that the documents are current
       tables.py TARSEL --write    makes them current

docs/modules.md is made as a whole; in other documents a part between <!-- NAME --> and <!-- /NAME --> is: a table, or
the source of an example (NAME is its path).
"""
import json
import pathlib
import re
import subprocess
import sys

ROOT = pathlib.Path(__file__).resolve().parents[2]
MARK = re.compile(r"(<!-- (?P<name>raw names|examples/\w+\.cpp) -->\n).*?(<!-- /(?P=name) -->)", re.S)
KINDS = {"decoder": "Decoders", "video filter": "Video filters", "audio filter": "Audio filters",
         "video encoder": "Video encoders", "audio encoder": "Audio encoders", "multiplexer": "Multiplexers",
         "sink": "Sinks", "encode pipe": "Pipes", "video pipe": "Pipes", "audio pipe": "Pipes"}
HEAD = """# The modules and their parameters

This page is made by `python3 tests/lint/tables.py build/release/bin/tarsel --write`; `tarsel modules NAME` prints the
same of the modules that are installed, those of plug-ins too. A parameter is set with `setParam(name, value)`, in the
tool with `--filter NAME:parameter=value`. The types are those of `Any`; a flag is an Int32 from 0 to 1.
*Needed* parameters have no default that anybody could mean. `docs/parameters.md` says more about the filters.
"""


def told(tarsel, command):
    return json.loads(subprocess.run([tarsel, "--no-plugins", command, "--json"], check=True, capture_output=True).stdout)


def cell(text):
    return text.replace("|", "\\|")


def parameter_rows(module):
    rows = ["| parameter | type | unit | range | default | meaning |", "|---|---|---|---|---|---|"]
    for p in module["parameters"]:
        if not p["read_only"]:
            default = "needed" if p["needed"] else p["default"]
            cells = (f"`{p['name']}`", p["type"], p["unit"], p["range"], default, p["meaning"])
            rows.append(re.sub(" +", " ", "| " + " | ".join(cell(c) for c in cells) + " |"))
    return rows if len(rows) > 2 else []


def modules_page(modules):
    page = [HEAD]
    for title in dict.fromkeys(KINDS.values()):
        page.append(f"## {title}\n")
        for m in modules:
            if KINDS.get(m["kind"]) != title or not m["usable"]:
                continue
            page.append(f"### `{m['name']}`\n\n{m['description']}.\n")
            if rows := parameter_rows(m):
                page.append("\n".join(rows) + "\n")
            if read := [f"`{p['name']}`" for p in m["parameters"] if p["read_only"]]:
                page.append(f"To read: {', '.join(read)}.\n")
    unusable = ", ".join(f"`{m['name']}`" for m in modules if not m["usable"])
    if unusable:
        page.append(f"## Not usable yet\n\n{unusable}.\n")
    return re.sub(r"\n## [^\n]+\n\n(?=\n?## )", "\n", "\n".join(page))


def raw_names(formats):
    rows = ["| extension | format | bytes |", "|---|---|---|"]
    rows += [f"| `.{n['extension']}` | {n['fourcc'] or ''} | {n['description']} |" for n in formats["raw_names"]]
    rows += [f"| `.{n['extension']}` | refused | does not say the order of its bytes; use {n['instead']} |"
             for n in formats["open_names"]]
    return "\n".join(rows) + "\n"


def current(root, modules, formats):
    """The documents that are made or have a part that is, as they should be."""
    pages = {root / "docs/modules.md": modules_page(modules)}

    def part(found):
        name = found["name"]
        made = raw_names(formats) if name == "raw names" else f"```cpp\n{(root / name).read_text()}```\n"
        return found[1] + made + found[3]

    for page in sorted((root / "docs").glob("*.md")):
        if page.name != "modules.md" and MARK.search(text := page.read_text()):
            pages[page] = MARK.sub(part, text)
    return pages


def main(arguments):
    write = "--write" in arguments
    tarsel = [a for a in arguments if a != "--write"][0]
    pages = current(ROOT, told(tarsel, "modules"), told(tarsel, "formats"))
    stale = [page for page, text in pages.items() if not page.exists() or page.read_text() != text]
    for page in stale:
        if write:
            page.write_text(pages[page])
        else:
            print(f"{page.relative_to(ROOT)} is not current; use tests/lint/tables.py {tarsel} --write")
    return 1 if stale and not write else 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
