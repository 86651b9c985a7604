#!/usr/bin/env python3
"""Lists a server home, one line per entry: path, type, mode, size and the
SHA-256 of a file's bytes (a link's target), sorted, so that two listings
compare as text. With --state, the tool's bookkeeping is left out: its logs
and records, the run manifests, the VXAENV backups and the stand-in loader's
catalog, which an undo keeps by design."""

import hashlib
import os
import stat
import sys

TOP_BOOKKEEPING_DIRS = {"logs", ".zr7inst"}
BOOKKEEPING_FILES = {"qdsload.catalog"}


def entry_line(root, path):
    info = os.lstat(path)
    rel = os.path.relpath(path, root)
    mode = "%04o" % stat.S_IMODE(info.st_mode)
    if stat.S_ISLNK(info.st_mode):
        return "%s link %s -> %s" % (rel, mode, os.readlink(path))
    if stat.S_ISDIR(info.st_mode):
        return "%s dir %s" % (rel, mode)
    digest = hashlib.sha256()
    with open(path, "rb") as handle:
        digest.update(handle.read())
    return "%s file %s %d %s" % (rel, mode, info.st_size, digest.hexdigest())


def listing(root, state_only):
    lines = []
    for top, dirs, files in os.walk(root):
        if state_only:
            skip = TOP_BOOKKEEPING_DIRS if top == root else set()
            dirs[:] = [d for d in dirs if d not in skip and d != ".archive"]
            files = [f for f in files if f not in BOOKKEEPING_FILES]
        for name in dirs + files:
            lines.append(entry_line(root, os.path.join(top, name)))
    return sorted(lines)


def main(argv):
    state_only = "--state" in argv
    roots = [a for a in argv if a != "--state"]
    if len(roots) != 1:
        sys.stderr.write("usage: tree.py [--state] DIR\n")
        return 2
    for line in listing(roots[0], state_only):
        print(line)
    return 0


if __name__ == "__main__":
    sys.exit(main(sys.argv[1:]))
