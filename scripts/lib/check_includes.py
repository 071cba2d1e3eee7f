"""Checks that every project header a module includes belongs to the module or to one it depends on.

Usage: check_includes.py <modules.txt> <src folder>. modules.txt is written when CMake configures: a line
"name: source;source: dependency;dependency" for each module. A header belongs to the module that compiles
the source of the same name; a header without a source belongs to nobody, and what it includes counts as
included by whoever includes it.
"""

import pathlib
import re
import sys

INCLUDE = re.compile(r'^#include "([a-z]+/[a-z_]+\.h)"', re.MULTILINE)


def read_modules(path):
    sources, depends = {}, {}
    for line in path.read_text().splitlines():
        name, files, needed = (line + " ").split(": ", 2)
        sources[name] = [f for f in files.split(";") if f]
        depends[name] = [d for d in needed.strip().split(";") if d]
    return sources, depends


def reachable(name, depends, seen=None):
    seen = set() if seen is None else seen
    if name not in seen:
        seen.add(name)
        for other in depends.get(name, []):
            reachable(other, depends, seen)
    return seen


def included(path, src, owner, seen):
    """The owned headers that a file includes, directly or through headers without an owner."""
    found = set()
    for header in INCLUDE.findall((src / path).read_text()):
        if header in seen or not (src / header).exists():
            continue
        seen.add(header)
        if header in owner:
            found.add(header)
        else:
            found |= included(header, src, owner, seen)
    return found


def main():
    sources, depends = read_modules(pathlib.Path(sys.argv[1]))
    src = pathlib.Path(sys.argv[2])
    owner = {f.replace(".cpp", ".h"): name for name, files in sources.items() for f in files}
    wrong = 0
    for name, files in sources.items():
        allowed = reachable(name, depends)
        used = {name}
        for path in files:
            own = path.replace(".cpp", ".h")
            headers = included(path, src, owner, set())
            if (src / own).exists():
                headers |= included(own, src, owner, set())
            used |= {owner[header] for header in headers}
            for header in sorted(headers):
                if owner[header] not in allowed:
                    print(f"src/{path}: includes {header} of {owner[header]}, which {name} "
                          "does not name in DEPENDS")
                    wrong += 1
        for other in sorted((set(depends[name]) & set(sources)) - used):
            print(f"{name} names {other} in DEPENDS and includes nothing of it")
            wrong += 1
    compiled = {f for files in sources.values() for f in files}
    for path in sorted(src.glob("*/*.cpp")):
        if str(path.relative_to(src)) not in compiled | {"cli/main.cpp"}:
            print(f"{path}: belongs to no module")
            wrong += 1
    return 1 if wrong else 0


sys.exit(main())
