#!/usr/bin/env python3
"""Checks who includes whom: main -> pages -> velora_common -> platform, and never the other way.

platform/ and service/ know nothing of src/. A page knows velora_common, the platform and, of another page, only a header of
at most 20 lines: the one that declares its constructor. The files of the upload view know only those that stand before
them in UPLOAD_VIEW, which ARCHITECTURE.md draws. Prints one line per fault; exits 1 when there is one.
Usage: tools/layers.py [ROOT]
"""
import pathlib
import re
import subprocess
import sys

SHORT_HEADER = 20
# The files of the upload view without "upload_" and ending, from the bottom up: each knows those of earlier lines alone.
UPLOAD_VIEW = (
    "pace message",
    "notification run text waiting",
    "book wait",
    "record worker",
    "signin",
    "names page path_bar row state",
    "listed",
    "meta progress thumbnails types",
    "cancel icon open",
    "browser select",
    "keys menu",
    "list start",
    "retry",
    "queue",
    "left",
    "result share",
    "messages",
    "view",
)
UPLOAD_RANK = {name: rank for rank, names in enumerate(UPLOAD_VIEW) for name in names.split()}
SOURCES = ("platform/**.h", "platform/**.cpp", "service/**.h", "service/**.cpp", "src/**.h", "src/**.cpp")


def layer_of(path):
    """'platform', 'service', 'tests', 'common', 'main', or the folder of a page."""
    parts = path.parts
    if parts[0] != "src":
        return parts[0]
    if parts[1:3] == ("setting", "velora_common"):
        return "common"
    return "main" if parts[1:3] == ("setting", "main") else "/".join(parts[:3])


def allowed(source, target, lines):
    """Whether a file of the layer source may include a header, of so many lines, of the layer target."""
    if source == target or target == "platform":
        return True
    if source in ("platform", "service", "common"):
        return False
    if target == "common" or (source == "main" and target.startswith("src/")):
        return True
    return target.startswith("src/") and lines <= SHORT_HEADER


def upload_rank(path):
    """Where a file of the upload view stands; None for other files. A file that stands nowhere is above all."""
    match = re.fullmatch(r"src/share-ui/velora_upload_file/(?:velora_)?upload_(\w+)\.(?:h|cpp)", str(path))
    return UPLOAD_RANK.get(match[1], len(UPLOAD_VIEW)) if match else None


def in_order(source, target):
    """Whether a file may include a header as far as the order within the upload view goes."""
    above, below = upload_rank(source), upload_rank(target)
    own = re.sub(r"\.\w+$", "", target.name).removeprefix("velora_") == source.stem
    return above is None or below is None or own or below < above


def resolve(root, including, name, headers):
    """The headers that an #include may mean: the neighbour, else every header whose path ends so."""
    neighbour = (root / including.parent / name).resolve()
    if neighbour.is_file() and neighbour.is_relative_to(root):
        return [neighbour.relative_to(root)]
    end = [part for part in pathlib.PurePosixPath(name).parts if part not in ("..", ".")]
    return [header for header in headers if list(header.parts[-len(end):]) == end]


def main():
    root = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else pathlib.Path(__file__).parent.parent).resolve()
    listed = subprocess.run(["git", "-C", root, "ls-files", "-co", "--exclude-standard", "--", *SOURCES, "tests/**.h"],
                            capture_output=True, text=True, check=True).stdout.splitlines()
    files = [path for name in listed if (root / (path := pathlib.Path(name))).is_file()]
    headers = [path for path in files if path.suffix == ".h"]
    faults = includes = 0
    for path in files:
        if path.parts[0] == "tests":
            continue
        text = (root / path).read_text(encoding="utf-8")
        for number, line in enumerate(text.splitlines(), 1):
            match = re.match(r'\s*#\s*include\s*(?:"([^"]+)"|<(\w+/[^>]+)>)', line)
            if not match:
                continue
            includes += 1
            targets = resolve(root, path, match[1] or match[2], headers)
            # Where a name fits several headers, the compiler may take any of them: one that is allowed will do.
            if targets and not any(in_order(path, target) and
                    allowed(layer_of(path), layer_of(target), len((root / target).read_text().splitlines()))
                    for target in targets):
                print(f"{path}:{number}: must not include {targets[0]}")
                faults += 1
    print(f"{len(files)} files, {includes} includes")
    return 1 if faults else 0


if __name__ == "__main__":
    sys.exit(main())
