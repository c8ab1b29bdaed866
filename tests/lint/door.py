"""The system is called in one place: core/arch for the library, tarsel/host for the tool, one file for a plug-in.

usage: door.py [TREE]     checks the tree (default: the working folder)

Elsewhere nothing opens files or folders, starts processes or threads, or asks the environment or a clock. Types of
<mutex>, <atomic>, <condition_variable> and <chrono>, and std::filesystem::path as text, are free.
"""
import pathlib
import re
import sys

# What a line must not hold, and why. Comments and texts are cut before.
CALLS = [
    (r'#\s*include\s*<(unistd|fcntl|dlfcn|dirent|signal|csignal|poll|termios|spawn|pwd|sched|pthread|netdb|sys/\w+)(\.h)?>',
     "a header of the system"),
    (r'#\s*include\s*<(fstream|filesystem)>', "files"),
    (r'(?<![\w.>:*])(?<!\* )(std::|::)?(fopen|freopen|fdopen|tmpfile|mkstemp|opendir|gzopen|FT_New_Face)\s*\(',
     "opens a file or folder"),
    (r'\b(std::)?(basic_)?[io]?fstream\b', "opens a file"),
    (r'\b(std::)?filesystem::(?!path\b)\w+', "asks the file system"),
    (r'\bfs::(?!path\b)\w+', "asks the file system"),
    (r'(?<![\w.>:])(std::|::)(remove|rename)\s*\(\s*[^,()]*(\.c_str\(\)|,)', "changes files"),
    (r'(?<![\w.>:])::(unlink|mkdir|rmdir|chmod|symlink)\s*\(', "changes files"),
    (r'(?<![\w.>:])(std::|::)?(system|popen|posix_spawnp?|fork|execvp?|waitpid)\s*\(', "starts a process"),
    (r'(?<![\w.>:])(std::|::)?(getenv|secure_getenv|setenv|putenv)\s*\(', "asks the environment"),
    (r'\b\w*clock\w*::now\s*\(|\bClock::now\s*\(', "asks a clock"),
    (r'(?<![\w.>:])(std::|::)?(clock_gettime|gettimeofday|localtime(_r)?|gmtime(_r)?|nanosleep|usleep)\s*\(', "asks a clock"),
    (r'\bthis_thread::sleep', "asks a clock"),
    (r'\bstd::random_device\b', "asks the system's entropy"),
    (r'\bstd::j?thread\s*[({]|\bstd::j?thread\s+\w+\s*[({]|\bstd::async\b|\bpthread_create\b', "starts a thread"),
    (r'\b(dlopen|dlsym)\s*\(', "loads a library"),
]
COMPILED = [(re.compile(pattern), why) for pattern, why in CALLS]
FREE = {("tarsel", "#include <filesystem>")}  # for its paths, which are text
TEXTS = re.compile(r'"(\\.|[^"\\])*"|\'(\\.|[^\'\\])\'|//.*')


def is_door(file):
    parts = file.parts
    return parts[:2] in (("core", "arch"), ("tarsel", "host")) or (parts[0] == "plugins" and file.stem.endswith("system"))


def faults_of(file, name):
    for number, line in enumerate(file.read_text(errors="replace").splitlines(), 1):
        code = TEXTS.sub(lambda m: "" if m[0].startswith("//") else '""', line)
        if (name.parts[0], line.strip()) in FREE:
            continue
        for pattern, why in COMPILED:
            if pattern.search(code):
                yield f"{name}:{number}: {why}: {line.strip()}"
                break


def check(tree):
    faults = []
    for floor in ("core", "builtin", "plugins", "tarsel"):
        for file in sorted((tree / floor).rglob("*")):
            name = file.relative_to(tree)
            if file.suffix in (".h", ".cpp") and not is_door(name):
                faults += faults_of(file, name)
    return faults


if __name__ == "__main__":
    faults = check(pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else "."))
    print("\n".join(faults), end="\n" if faults else "")
    sys.exit(bool(faults))
