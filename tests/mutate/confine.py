#!/usr/bin/env python3
"""Runs a program that can change files only in one folder, which it sees as /tmp.

    tests/mutate/confine.py FOLDER PROGRAM [ARGUMENT...]

A fault in code that removes folders, or that writes without end, must not reach the files of the user who looks for
it. So everything else is read-only, /dev/shm is a new one, and memory and the size of files are limited. This takes
no privilege, but a kernel that lets users make namespaces; on another one the program is not run and the exit
status is 125.
"""
import ctypes
import os
import resource
import struct
import sys

LIMITS = {resource.RLIMIT_AS: 4 << 30, resource.RLIMIT_FSIZE: 8 << 30, resource.RLIMIT_CORE: 0}  # bytes

NEW_USER, NEW_MOUNTS = 0x10000000, 0x00020000
BIND, RECURSIVE, PRIVATE = 1 << 12, 1 << 14, 1 << 18
MOUNT_SETATTR, HERE, WHOLE_TREE, READ_ONLY = 442, -100, 0x8000, 1

libc = ctypes.CDLL(None, use_errno=True)


def checked(result):
    if result < 0:
        raise OSError(ctypes.get_errno(), os.strerror(ctypes.get_errno()))


def mount(source, place, kind, flags, options=None):
    checked(libc.mount(source, place, kind, ctypes.c_ulong(flags), options))


def change_mount(place, flags, turn_on=0, turn_off=0):
    attributes = struct.pack("QQQQ", turn_on, turn_off, 0, 0)
    checked(libc.syscall(MOUNT_SETATTR, HERE, place, flags, attributes, ctypes.c_size_t(len(attributes))))


def confine(folder):
    user, group = os.getuid(), os.getgid()
    checked(libc.unshare(NEW_USER | NEW_MOUNTS))
    for name, text in (("setgroups", "deny"), ("uid_map", f"{user} {user} 1"), ("gid_map", f"{group} {group} 1")):
        with open("/proc/self/" + name, "w", encoding="ascii") as file:
            file.write(text)
    mount(None, b"/", None, RECURSIVE | PRIVATE)
    mount(os.fsencode(folder), b"/tmp", None, BIND)
    mount(b"tmpfs", b"/dev/shm", b"tmpfs", 0, b"size=1g")
    change_mount(b"/", WHOLE_TREE, turn_on=READ_ONLY)
    for place in (b"/tmp", b"/dev/shm"):
        change_mount(place, 0, turn_off=READ_ONLY)
    os.chdir("/tmp")
    os.environ["TMPDIR"] = "/tmp"


def main():
    if len(sys.argv) < 3:
        print(__doc__, file=sys.stderr)
        return 2
    program = os.open(sys.argv[2], os.O_RDONLY)  # it may lie in the /tmp that is hidden from here on
    for kind, most in LIMITS.items():
        resource.setrlimit(kind, (most, most))
    try:
        confine(sys.argv[1])
    except OSError as failure:
        print(f"confine.py: can not make namespaces on this system: {failure.strerror}", file=sys.stderr)
        return 125
    os.execve(program, sys.argv[2:], os.environ)


if __name__ == "__main__":
    sys.exit(main())
