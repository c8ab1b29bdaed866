"""Rogue plug-ins: no libraries at all, cut ones, ones that exit, throw or crash, and ones that others may write.

The run either continues, with the right bytes, or it ends with an error; in each case the file is named.
"""
import os
import subprocess

from runner import Box, CRASH, difference

HEAD = "#include <cstdlib>\n#include <csignal>\n#include <stdexcept>\n"
EXPORT = 'extern "C" __attribute__((visibility("default"))) '
INIT = EXPORT + "void* plugin_init() {{ {0} }}\n"
SOURCES = {  # name: the text of its one unit
    "null": INIT.format("return nullptr;"),
    "exits": INIT.format("std::exit(0);"),
    "exits-quickly": INIT.format("std::quick_exit(0);"),
    "traps": INIT.format("std::raise(SIGTRAP); return nullptr;"),
    "throws": INIT.format('throw std::runtime_error("x");'),
    "throws-a-number": INIT.format("throw 7;"),
    "crashes": INIT.format("std::raise(SIGSEGV); return nullptr;"),
    "aborts": INIT.format("std::abort();"),
    "exits-when-loaded": "struct S { S() { std::exit(0); } } s;\n" + INIT.format("return nullptr;"),
    "throws-when-loaded": "struct S { S() { throw 7; } } s;\n" + INIT.format("return nullptr;"),
    "crashes-when-loaded": "struct S { S() { std::raise(SIGSEGV); } } s;\n" + INIT.format("return nullptr;"),
    "no-entry": "int nothing;\n",
    "other-abi": EXPORT + "unsigned qv_plugin_abi;\nunsigned qv_plugin_abi = 0xffff;\n" +
                 INIT.format("return nullptr;"),
    "needs-a-symbol": 'extern "C" int no_such_function();\n' + INIT.format("no_such_function(); return nullptr;"),
}
JOB = "wav"


def build(sweep, name):
    """The plug-in of this name, compiled once a sweep."""
    made = f"{sweep.scratch}/{name}.so"
    if not os.path.exists(made):
        source = f"{sweep.scratch}/{name}.cpp"
        with open(source, "w") as file:
            file.write(HEAD + SOURCES[name])
        subprocess.run([os.environ.get("CXX", "c++"), "-std=c++20", "-fPIC", "-shared", source, "-o", made + ".part"],
                       check=True, capture_output=True)
        os.rename(made + ".part", made)
    with open(made, "rb") as file:
        return file.read()


def changed(data, name):
    """A shared library that was damaged."""
    size = len(data)
    if name.startswith("cut"):
        return data[:{"cut-head": 40, "cut-quarter": size // 4, "cut-half": size // 2, "cut-end": size - 100}[name]]
    at, value = {"machine": (18, b"\x08\0"), "32-bit": (4, b"\1"), "big-endian": (5, b"\2"), "type": (16, b"\2\0"),
                 "headers": (32, b"\xff" * 8), "count": (56, b"\xff\xff"), "entry-size": (54, b"\0\0")}[name]
    return data[:at] + value + data[at + len(value):]


DAMAGED = ["cut-head", "cut-quarter", "cut-half", "cut-end", "machine", "32-bit", "big-endian", "type", "headers",
           "count", "entry-size"]


def place(box, folder, name, data=b"", mode=0o755):
    folder.mkdir(exist_ok=True, mode=0o755)
    file = folder / name
    file.write_bytes(data)
    file.chmod(mode)


def special(box, folder, what, good):
    """Files that are no plain file of the user's own. True if it has to be refused by name."""
    file = folder / "x_plugin.so"
    folder.mkdir()
    if what == "empty":
        file.touch()
    elif what == "text":
        file.write_text("no library\n")
    elif what == "fifo":
        os.mkfifo(file)
    elif what == "folder":
        file.mkdir()
    elif what == "dangling":
        file.symlink_to("nowhere")
    elif what == "loop":
        file.symlink_to("x_plugin.so")
    elif what == "device":
        file.symlink_to("/dev/zero")
    else:
        place(box, folder, "x_plugin.so", good)
        {"writable": lambda: file.chmod(0o777), "writable-folder": lambda: folder.chmod(0o777),
         "writable-parent": lambda: folder.parent.chmod(0o777)}[what]()
    return what != "folder"  # a folder is no file of that name


SPECIAL = ["empty", "text", "fifo", "folder", "dangling", "loop", "device", "writable", "writable-folder",
           "writable-parent"]


def attack(sweep, name):
    with Box(sweep) as box:
        for part in (box.root, box.work):
            part.chmod(0o755)
        box.lay(sweep.old[JOB])
        parent = box.root / "p"
        parent.mkdir(mode=0o755)
        folder, refused = parent / "q", True
        if name in SOURCES:
            place(box, folder, "x_plugin.so", build(sweep, name))
            refused = name != "null"  # it declines by itself
        elif name in DAMAGED:
            place(box, folder, "x_plugin.so", changed(build(sweep, "null"), name))
        else:
            refused = special(box, folder, name, build(sweep, "null"))
        process = box.start(["--plugins", folder, *sweep.job(JOB).arguments])
        outcome = box.finish(process, 10)
        files, old, new = box.files(), sweep.old[JOB], sweep.new[JOB]
        if outcome.status == "hang" or CRASH.search(outcome.text):
            wrong = "hangs" if outcome.status == "hang" else f"crashes: {outcome.text.strip()}"
        elif refused and "x_plugin.so" not in outcome.text:
            wrong = f"does not name the file (status {outcome.status}): {outcome.text.strip()!r}"
        elif outcome.status == 0:
            wrong = difference(files, new, new)
        else:
            wrong = difference(files, old, old) or (None if name in SOURCES else f"ends with {outcome.status}")
        return outcome.ended(), wrong or (f"leaves {box.litter()}" if box.litter() else None), outcome


def cases(sweep, pool, rng):
    for name in [*SOURCES, *DAMAGED, *SPECIAL]:
        yield "plugin", name, lambda name=name: attack(sweep, name)
