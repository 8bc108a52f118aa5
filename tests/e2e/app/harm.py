#!/usr/bin/env python3
"""Uploads through a network that breaks (tests/support/faults.py), and looks at what velora-cloud holds in the end.

    ninja -C build tests/e2e/app/uploader && tests/e2e/app/harm.py [--build build] [--files 100] [FAULT...]
    tests/e2e/app/harm.py --files 1000 lost            the answer to every first PUT is lost
    tests/e2e/app/harm.py --chance 0.3 --seed 7 all    any fault, by luck, on any PUT and PROPFIND

For each FAULT (all of them one by one when none is named) N files of their own content go up, the fault being done to
the first PUT of each path; what the client calls failed is asked for again, as a person would, --again times. Counted:
    lost     not stored whole in the end, whatever was said
    doubled  stored more than once
    false    called done and not stored whole where the client says; or called failed, with another error than
             --unknown, and stored
    failed   called failed at the first try, which is a figure and no fault
The last line is "N passed, M failed": faults without and with lost, doubled or false files. Not part of CI."""

import argparse
import collections
import hashlib
import os
import random
import subprocess
import sys
import tempfile
import time

HERE = os.path.dirname(os.path.abspath(__file__))
ROOT = os.path.dirname(os.path.dirname(os.path.dirname(HERE)))
sys.path[:0] = [os.path.join(ROOT, "tools"), os.path.join(ROOT, "tests", "support")]
from device import EMAIL, Device, Trouble  # noqa: E402
from faults import FAULTS, Faults  # noqa: E402


def stored(device):
    """{digest: [cloud paths]} of everything in the service's plain tree."""
    top = os.path.join(device.data, "files", EMAIL)
    found = collections.defaultdict(list)
    for path in device.all_files():
        with open(top + path, "rb") as file:
            found[hashlib.sha256(file.read()).hexdigest()].append(path)
    return found


def upload(device, wanted, seconds):
    lines = "".join(f"{local}\t{path}\n" for local, path in wanted)
    out = device.run(device.program("tests/e2e/app/uploader"), "Velora", input=lines.encode(), timeout=seconds)
    return [line.split("\t") for line in out.splitlines()]


def measure(device, web, name, options, wanted):
    """Uploads a folder of files through the fault `name`; the counts."""
    local = tempfile.mkdtemp(dir=device.home)
    luck = random.Random(f"{wanted.seed} {name}")
    files = []
    for i in range(wanted.files):
        body = luck.randbytes(luck.randrange(1, wanted.size))
        files.append((os.path.join(local, f"{i}.jpg"), f"/{name}/{i}.jpg", hashlib.sha256(body).hexdigest()))
        with open(files[-1][0], "wb") as file:
            file.write(body)
    device.make_folder("/" + name)
    proxy = Faults(web, stall=wanted.stall, seed=wanted.seed, **options)
    with open(os.path.join(device.env["CLOUD_SERVICES_DIR"], "Velora.conf"), "w", encoding="utf-8") as file:
        file.write(f"[Service]\nApi={proxy.address}\nStorage={proxy.address}dav/\nStallTimeout=10\n")
    count, left, begun = collections.Counter(), files, time.monotonic()
    for attempt in range(1 + wanted.again):
        said = upload(device, [file[:2] for file in left], wanted.timeout)
        held, failed = stored(device), []
        for file, (verdict, words) in zip(left, said, strict=True):
            count["false"] += words not in held[file[2]] if verdict == "DONE" else \
                bool(held[file[2]]) and words != str(wanted.unknown)
            if verdict != "DONE":
                failed.append(file)
                count[f"error {words}"] += attempt == 0
        count["failed"] += len(failed) if attempt == 0 else 0
        left = failed
        if not left:
            break
    proxy.close()
    held = stored(device)
    count["lost"] = sum(not held[digest] for *_, digest in files)
    count["doubled"] = sum(len(held[digest]) > 1 for *_, digest in files)
    count["injected"] = sum(proxy.tally.values()) - proxy.tally["requests"]
    count["seconds"] = round(time.monotonic() - begun)
    return count


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("faults", nargs="*", metavar="FAULT", help="of faults.py; or all, a mixture by luck")
    parser.add_argument("--build", default=os.path.join(ROOT, "build"))
    parser.add_argument("--files", type=int, default=100)
    parser.add_argument("--size", type=int, default=20000, help="bytes of a file, at most")
    parser.add_argument("--again", type=int, default=2)
    parser.add_argument("--unknown", type=int, default=30, help="the client's error for an outcome that it does not know")
    parser.add_argument("--chance", type=float, default=0.3)
    parser.add_argument("--seed", type=int, default=1)
    parser.add_argument("--stall", type=float, default=1.0)
    parser.add_argument("--timeout", type=float, default=1800.0)
    wanted = parser.parse_args()
    for name in wanted.faults:
        if name not in (*FAULTS, "all"):
            parser.error(f"no such fault: {name}")
    device, bad = Device(os.path.abspath(wanted.build)), 0
    names = wanted.faults or FAULTS
    try:
        device.start_service()
        device.sign_in()
        device.setting("memory/connection/type", "wifi")  # a machine without a network would wait for one
        web = device.web
        print(f"{'':18}{'injected':>9}{'failed':>7}{'lost':>6}{'doubled':>8}{'false':>6}{'s':>5}", flush=True)
        for name in names:
            options = {"rules": [f"PUT first {name}"]} if name != "all" else \
                {"chance": wanted.chance, "methods": ("PUT", "PROPFIND")}
            count = measure(device, web, name, options, wanted)
            bad += any(count[what] for what in ("lost", "doubled", "false"))
            errors = "  ".join(f"{key}: {value}" for key, value in sorted(count.items()) if "error" in key and value)
            print(f"{name:18}{count['injected']:9}{count['failed']:7}{count['lost']:6}{count['doubled']:8}"
                  f"{count['false']:6}{count['seconds']:5}  {errors}", flush=True)
    except (Trouble, OSError, subprocess.SubprocessError, ValueError) as trouble:
        print(f"harm.py: {trouble}", file=sys.stderr)
        return 1
    finally:
        device.end()
    print(f"{len(names) - bad} passed, {bad} failed")
    return 1 if bad else 0


sys.exit(main())
