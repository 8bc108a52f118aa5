#!/usr/bin/env python3
"""Floods the application with launch requests, and measures how it bears that.

    ninja -C build && ninja -C build tests/e2e/app/flooder && tests/e2e/app/flood.py [--build build] [COUNTxPATHS...]

Each flood (100000x1, 1x100000 and 1000x10 when none is named) meets an application of its own with an account and the
upload view open. Printed: what became of the requests, the longest answer to a ping of its bus thread and of its main
loop meanwhile, and the memory before and at most. Not part of CI."""

import argparse
import os
import re
import sys

HERE = os.path.dirname(os.path.abspath(__file__))
ROOT = os.path.dirname(os.path.dirname(os.path.dirname(HERE)))
sys.path.insert(0, os.path.join(ROOT, "tools"))
from device import APP, Device, Trouble, wait_for  # noqa: E402


def memory(process, field):
    with open(f"/proc/{process.pid}/status", encoding="ascii") as file:
        return int(re.search(rf"^{field}:\s+(\d+)", file.read(), re.M).group(1)) // 1024


def flood(wanted, text):
    count, paths = text.split("x")
    device = Device(os.path.abspath(wanted.build))
    try:
        device.start_bus()
        device.start_display()
        device.start_service()
        device.sign_in()
        application = device.start_application()
        picture = os.path.join(device.home, "first.jpg")
        with open(picture, "wb") as file:
            file.write(b"picture")
        device.start([device.program("platform/app/velora-launch"), "share", picture])
        wait_for("the upload view", lambda: device.find("Done"))
        before = memory(application, "VmRSS")
        said = device.tool("tests/e2e/app/flooder", APP, count, paths, wanted.operation, timeout=600).strip()
        print(f"{text}: {said}; memory {before} MiB, at most {memory(application, 'VmHWM')} MiB", flush=True)
    finally:
        device.end()


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("floods", nargs="*", default=["100000x1", "1x100000", "1000x10"])
    parser.add_argument("--build", default=os.path.join(ROOT, "build"))
    parser.add_argument("--operation", default="multi_share")
    wanted = parser.parse_args()
    try:
        for text in wanted.floods:
            flood(wanted, text)
    except (Trouble, OSError, ValueError) as trouble:
        print(f"flood.py: {trouble}", file=sys.stderr)
        return 1
    return 0


sys.exit(main())
