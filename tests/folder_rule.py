#!/usr/bin/env python3
"""The rule of which folder may include what: folder_rule.py [PROJECT].

    src/                  itself, include/webapi, platform/include; nothing of platform/reference, hosts, packages
    packages/             <webapi/...> and what lies in packages/ itself
    platform/reference/   itself and platform/include; nothing of src, include/webapi, hosts, packages
    include/webapi/       itself
    hosts/                itself, <webapi/...> and platform/include

Prints each include that breaks it, and the count of files looked at. Ends with 1 if there is one, or if a folder named
here holds no source.
"""

import pathlib
import re
import sys

INCLUDE = re.compile(r'^[ \t]*#[ \t]*include[ \t]*(<[^>\n]+>|"[^"\n]+")', re.MULTILINE)
SOURCES = ("*.cpp", "*.h")

# Folder: the folders of the project that it may include from, itself being one always.
MAY_INCLUDE = {
    "src": ("include/webapi", "platform/include"),
    "packages": ("include/webapi",),
    "platform/reference": ("platform/include",),
    "platform/include": (),
    "include/webapi": (),
    "hosts": ("include/webapi", "platform/include"),
}


def sources(folder):
    return sorted(path for pattern in SOURCES for path in folder.rglob(pattern))


def headers_by_name(project):
    """Every header of the folders under the rule, by each name that an include could give it: all its path's endings."""
    names = {}
    for folder in MAY_INCLUDE:
        for path in sorted((project / folder).rglob("*.h")):
            parts = path.relative_to(project).parts
            for start in range(len(parts)):
                names.setdefault("/".join(parts[start:]), set()).add(folder)
    return names


def targets(source, text, folder, project, names):
    """The folders that an include can lead to; empty for one outside the project."""
    beside = (source.parent / text).resolve()
    if beside.is_file() and beside.is_relative_to(project):
        inside = beside.relative_to(project).as_posix()
        return {name for name in MAY_INCLUDE if inside.startswith(name + "/")} or {inside}
    found = names.get(text, set())
    # A name that stands in the folder itself is meant so.
    return {folder} if folder in found else found


def broken_includes(project):
    names = headers_by_name(project)
    for folder, allowed in MAY_INCLUDE.items():
        for source in sources(project / folder):
            for match in INCLUDE.finditer(source.read_text(encoding="utf-8")):
                text = match.group(1)[1:-1]
                for target in sorted(targets(source, text, folder, project, names)):
                    if target != folder and target not in allowed:
                        yield source.relative_to(project), text, target


def main():
    project = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else pathlib.Path(__file__).parents[1]).resolve()
    empty = [folder for folder in MAY_INCLUDE if not sources(project / folder)]
    for folder in empty:
        print(f"{folder}: no source here")
    broken = list(broken_includes(project))
    for source, text, target in broken:
        print(f"{source}: includes {text}, which is {target}'s")
    print(f"{sum(len(sources(project / folder)) for folder in MAY_INCLUDE)} files looked at, {len(broken)} bad includes")
    return 1 if broken or empty else 0


if __name__ == "__main__":
    sys.exit(main())
