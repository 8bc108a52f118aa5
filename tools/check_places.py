#!/usr/bin/env python3
"""Holds against each other what has to stand in several places: the languages and the colours.

A language of res/po/LINGUAS has a text of its own in every translatable line of the desktop entries and of the metainfo,
and no other language has one; English is the text without a language. (check_catalogues.py looks at the catalogues.)
A light colour of the colour table is the one that is built into the theme's palette, which holds when no table does.
Prints one line per fault and a summary; exits 1 when there is a fault. Usage: tools/check_places.py [ROOT]
"""
import pathlib
import re
import sys
import xml.etree.ElementTree as tree

LANGUAGE_ATTRIBUTE = "{http://www.w3.org/XML/1998/namespace}lang"


def compare(where, there, wanted):
    return [f"{where}: no text in {language}" for language in sorted(wanted - there)] + \
           [f"{where}: {language} is not in res/po/LINGUAS" for language in sorted(there - wanted)]


def desktop_entry(path, wanted):
    """The faults of a desktop entry: each group's keys that have a text with a language, and those that must."""
    faults, group = [], ""
    languages = {}  # by group and key
    for line in path.read_text(encoding="utf-8").splitlines():
        if line.startswith("["):
            group = line
        elif match := re.match(r"(\w+)(?:\[([^]]+)\])?=", line):
            if match[2]:
                languages.setdefault((group, match[1]), set()).add(match[2])
            elif match[1] in ("Name", "GenericName", "Comment", "Keywords"):
                languages.setdefault((group, match[1]), set())
    for (group, key), there in languages.items():
        # A name alone may be the same in all languages: the product's.
        if there or not (group == "[Desktop Entry]" and key == "Name"):
            faults += compare(f"{path.name}: {group} {key}", there, wanted)
    return faults


def metainfo(path, wanted):
    there = {}
    for element in tree.parse(path).iter():
        if language := element.get(LANGUAGE_ATTRIBUTE):
            there.setdefault(element.tag, set()).add(language)
    faults = [] if "summary" in there else [f"{path.name}: the summary is in no language but English"]
    for tag, languages in there.items():
        faults += compare(f"{path.name}: {tag}", languages, wanted)
    return faults


def colours(palette, table):
    built_in = dict(re.findall(r'color_class\s*{\s*name:\s*"([^"]+)";\s*color:\s*"([^"]+)"', palette.read_text()))
    light = {color.get("class"): color.get("light") for color in tree.parse(table).iter("color")}
    # The table has the toolkit's own classes as well, whose names begin with a stroke.
    own = {name: value for name, value in light.items() if not name.startswith("/")}
    faults = [f"{palette.name}: {name} is not in {table.name}" for name in built_in if name not in own]
    faults += [f"{table.name}: {name} is not in {palette.name}" for name in own if name not in built_in]
    faults += [f"{palette.name}: {name} is {value}, but {own[name]} in {table.name}"
               for name, value in built_in.items() if name in own and own[name].upper() != value.upper()]
    return len(built_in), faults


def main():
    root = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else pathlib.Path(__file__).parent.parent).resolve()
    wanted = set((root / "res/po/LINGUAS").read_text(encoding="utf-8").split()) - {"en"}
    packaging = root / "packaging"
    entries, infos = sorted(packaging.glob("*.desktop.in")), sorted(packaging.glob("*.metainfo.xml"))
    tables = sorted((root / "shared/res/tables").glob("*ColorInfo.xml"))
    faults = [] if entries and infos and tables else ["no desktop entry, metainfo or colour table is found"]
    for path in entries:
        faults += desktop_entry(path, wanted)
    for path in infos:
        faults += metainfo(path, wanted)
    count = 0
    for table in tables:
        count, wrong = colours(root / "platform/theme/palette.edc", table)
        faults += wrong
        faults += [] if count else ["palette.edc: no colour is found"]
    print(*faults, f"{len(wanted) + 1} languages in {len(entries) + len(infos)} files of packaging, {count} colours", sep="\n")
    return 1 if faults else 0


if __name__ == "__main__":
    sys.exit(main())
