#!/usr/bin/env python3
"""Holds the catalogues under res/po against each other and against the texts that the sources ask for.

Prints one line per fault and a summary; exits 1 when there is a fault. Usage: tools/check_catalogues.py [ROOT]
"""
import pathlib
import re
import subprocess
import sys

DOMAINS = ("velora", "velora-share")
HEADER_FIELDS = ("Project-Id-Version", "PO-Revision-Date", "Last-Translator", "Language-Team", "Language",
                 "MIME-Version", "Content-Type", "Content-Transfer-Encoding", "Plural-Forms")
# Functions that look the id they are given up in one domain, wherever they are called.
BUILDERS = {
    "_velora_common_create_warning_popup": "velora",
    "_velora_common_create_one_text_popup_with_timer": "velora",
    "_velora_common_progressbar_layout_create": "velora",
    "_velora_common_create_bottom_buttons": "velora",
    "__bar_button_create": "velora-share",
    "_velora_common_create_processing_popup_with_cancel": "velora-share",
}
STRING = r'"((?:[^"\\]|\\.)*)"'
ID = re.compile(r'"(IDS_[A-Z0-9_]+)"')
CONVERSION = re.compile(r"%(?:\d+\$)?[-+ 0#']*(?:\d+|\*)?(?:\.(?:\d+|\*))?(?:hh|h|ll|l|z|j|t)?[diouxXeEfFgGcsp%]")
# Strings are matched first, so that a // inside one is no comment.
STRING_OR_COMMENT = re.compile(r'"(?:[^"\\\n]|\\.)*"|//[^\n]*|/\*.*?\*/', re.S)
# Only an entity or the line break is meant as markup; widgets would swallow any other < or &.
STRAY_MARKUP = re.compile(r"<(?!br/>)|&(?!(?:amp|lt|gt|quot|nbsp);)")


def read_po(path):
    """Returns (header fields, {msgid: msgstr}, the msgids that occur twice, those marked fuzzy, those with a plural).

    A plural's msgstr is its last form."""
    entries, doubles, fuzzy, plurals = {}, [], [], set()
    for block in re.split(r"\n\s*\n", path.read_text(encoding="utf-8")):
        parts, key = {}, None
        for line in block.splitlines():
            if match := re.match(r'(msg\w+(?:\[\d\])?)\s+' + STRING + "$", line):
                key = match[1]
                parts[key] = match[2]
            elif (match := re.match(STRING + "$", line)) and key:
                parts[key] += match[1]
        if "msgid" not in parts:
            continue
        if parts["msgid"] in entries:
            doubles.append(parts["msgid"])
        if re.search(r"^#,.*fuzzy", block, re.M):
            fuzzy.append(parts["msgid"])
        forms = [text for key, text in parts.items() if key.startswith("msgstr")]
        entries[parts["msgid"]] = forms[-1] if forms else ""
        if "msgid_plural" in parts:
            plurals.add(parts["msgid"])
    fields = dict(line.split(": ", 1) for line in entries.pop("", "").split("\\n") if ": " in line)
    return fields, entries, doubles, fuzzy, plurals


def check_languages(po, languages):
    """Returns ({domain: {language: entries}}, faults)."""
    texts, faults = {}, []
    for domain in DOMAINS:
        texts[domain] = {}
        for stray in {path.stem for path in (po / domain).glob("*.po")} - set(languages):
            faults.append(f"{domain}/{stray}.po is not built: add {stray} to LINGUAS")
        for language in languages:
            path = po / domain / f"{language}.po"
            if not path.exists():
                faults.append(f"{domain}/{language}.po is missing")
                continue
            fields, entries, doubles, fuzzy, plurals = read_po(path)
            texts[domain][language] = entries
            faults += [f"{domain}/{language}.po: no header field {name}" for name in HEADER_FIELDS if not fields.get(name)]
            if fields.get("Language", language) != language:
                faults.append(f"{domain}/{language}.po says it is {fields['Language']}")
            faults += [f"{domain}/{language}.po: {msgid} stands there twice" for msgid in doubles]
            faults += [f"{domain}/{language}.po: {msgid} is fuzzy and would be left out" for msgid in fuzzy]
        english = texts[domain].get("en", {})
        for language, entries in texts[domain].items():
            where = f"{domain}/{language}.po"
            faults += [f"{where}: {msgid} is missing" for msgid in english if msgid not in entries]
            for msgid, text in entries.items():
                # An id says nothing of its conversions but PD, a number; a text that is its own id says all.
                model = english.get(msgid, "") if msgid.startswith("IDS_") else msgid
                if msgid not in english:
                    faults.append(f"{where}: {msgid} is not in English")
                elif not text.strip():
                    faults.append(f"{where}: {msgid} has no text")
                elif CONVERSION.findall(text) != CONVERSION.findall(model):
                    faults.append(f"{where}: {msgid} has other conversions than \"{model}\"")
                elif (msgid.startswith("IDS_") and msgid not in plurals
                      and len(CONVERSION.findall(text)) != msgid.split("_").count("PD")):
                    faults.append(f"{where}: {msgid} does not have the number that its id promises")
                elif text.startswith("IDS_"):
                    faults.append(f"{where}: {msgid} shows an id")
                elif STRAY_MARKUP.search(text):
                    faults.append(f"{where}: {msgid} holds markup")
    return texts, faults


def tracked(root, *patterns):
    """The files git knows or would add, so that a new source counts before its first commit."""
    names = subprocess.run(["git", "-C", root, "ls-files", "-co", "--exclude-standard", "--", *patterns],
                           capture_output=True, text=True, check=True).stdout.splitlines()
    return [path for name in names if (path := pathlib.Path(root, name)).is_file()]


def domain_constants(sources):
    """{name: domain} of the constants and macros that stand for a domain."""
    found = {}
    for text in sources.values():
        for name, domain in re.findall(r'\b(\w+)(?:\[\])?(?:\s*=\s*|[ \t]+)"(velora|velora-share)"', text):
            found[name] = domain
    return found


def check_sources(root, texts):
    """Every id in the sources is in the domain it is looked up in: the one named in the same statement, that of the
    function it is passed to, or else that of its folder. Returns (number of ids, faults)."""
    faults, used = [], set()
    sources = {}
    for path in tracked(root, "src/**.cpp", "src/**.h"):
        bare = STRING_OR_COMMENT.sub(lambda match: match[0] if match[0][0] == '"' else
                                     "\n" * match[0].count("\n") or " ", path.read_text(encoding="utf-8"))
        sources[path] = re.sub(r'"\s*\n\s*"', "", bare)  # a literal broken over lines is one literal
    names = {f'"{domain}"': domain for domain in DOMAINS} | domain_constants(sources) | BUILDERS
    lookup = re.compile(r"(?<![\w\"])(" + "|".join(sorted(map(re.escape, names), key=len, reverse=True)) + r")(?![\w\"])")
    for path, text in sources.items():
        where = path.relative_to(root)
        own = "velora-share" if "share-ui" in where.parts else "velora"
        for statement in re.split(r"[;{}]", text):
            wanted = {names[name] for name in lookup.findall(statement)} or {own}
            ids = set(ID.findall(statement))
            used |= ids
            # Without gettext a plain literal may be anything (a part, a signal): only its direct argument is a text.
            ids |= {match for match in re.findall(r"\bdc?gettext\s*\(\s*[^,]+,\s*" + STRING, statement)}
            for msgid in sorted(ids):
                missing = [domain for domain in sorted(wanted) if msgid not in texts[domain].get("en", {})]
                faults += [f"{where}: {msgid} is not in the catalogues of {domain}" for domain in missing]
    for path in tracked(root, "res/**.edc", "res/**.in"):
        for msgid in sorted(set(ID.findall(path.read_text(encoding="utf-8")))):
            used.add(msgid)
            if not any(msgid in texts[domain].get("en", {}) for domain in DOMAINS):
                faults.append(f"{path.relative_to(root)}: {msgid} is in no catalogue")
    return len(used), faults


def main():
    root = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else pathlib.Path(__file__).parent.parent).resolve()
    po = root / "res" / "po"
    languages = (po / "LINGUAS").read_text(encoding="utf-8").split()
    texts, faults = check_languages(po, languages)
    used, missing = check_sources(root, texts)
    for fault in faults + missing:
        print(fault)
    total = sum(len(texts[domain].get("en", {})) for domain in DOMAINS)
    print(f"{total} texts in {len(languages)} languages, {used} ids in use")
    return 1 if faults + missing else 0


if __name__ == "__main__":
    sys.exit(main())
