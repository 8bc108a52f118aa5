"""A thousand small files from Done to the end in the real application, on a virtual display, beside curl."""

import os
import time

from common import Bench, Figure, Goal, Result, interleaved, make_files, measured, processor_seconds
from device import EMAIL, PASSWORD, Device, wait_for
from person import FOLDER, Person

COUNT, SIZE = 1000, 10 << 10


def still(person, text, kind):
    """The middle of a widget, once it lies where it stays."""
    place = None
    while True:
        before, place = place, wait_for(text, lambda: person.find(text, kind))
        if place == before:
            return place[2] + place[4] // 2, place[3] + place[5] // 2
        time.sleep(0.15)


def press(person, text, kind):
    """The finger is on it for a while, as fingers are; the time at which it comes off."""
    x, y = still(person, text, kind)
    person.run("xdotool", "mousemove", str(x), str(y), "sleep", "0.05", "mousedown", "1", "sleep", "0.05")
    time.sleep(0.1)
    now = time.monotonic()
    person.run("xdotool", "mouseup", "1")
    return now


def application(bench: Bench, number):
    """From the finger that comes off Done to the notification of the result; the processor's until all is quiet."""
    person = Person(bench.build)
    try:
        paths = make_files(os.path.join(person.folder, "many"), COUNT, SIZE)
        person.share(*paths)
        person.click("Photos")
        person.sees("Done", "Photos", "Velora")
        stored = os.path.join(person.data, "files", EMAIL, FOLDER.strip("/"))
        time.sleep(1)
        used = processor_seconds(person.application.pid)
        start = press(person, "Done", "Elm_Button")
        wait_for("all files to be stored", lambda: len(os.listdir(stored)) >= COUNT, 120, 0.02)
        wait_for("the result", lambda: any("\tnormal\t" in line for line in person.notifications()), 60, 0.01)
        wall = time.monotonic() - start
        time.sleep(1)
        return {"wall": wall, "cpu": processor_seconds(person.application.pid) - used}
    finally:
        person.end()


def curl(bench, number):
    """One connection, and nobody's file overwritten, as the application has to."""
    device = Device(bench.build)
    try:
        device.start_service()
        device.make_folder(FOLDER)
        lines = "".join(f'upload-file = "{path}"\nurl = "{device.web}/dav{FOLDER}/{os.path.basename(path)}"\n'
                        for path in make_files(os.path.join(device.home, "many"), COUNT, SIZE))
        config = os.path.join(device.home, "curl.conf")
        with open(config, "w", encoding="ascii") as file:
            file.write(lines)
        return measured(["curl", "-sSf", "-u", f"{EMAIL}:{PASSWORD}", "-H", "If-None-Match: *", "-H", "Expect:", "-K",
                         config])
    finally:
        device.end()


def thousand(bench):
    figures = [Figure("wall", "Done to the result", "s", Goal(1.2, "curl")),
               Figure("cpu", "CPU of the application", "s", Goal(0.9))]
    return [Result(f"{COUNT:,} x {SIZE >> 10} KiB in the application, velora-cloud in memory", figures,
                   interleaved(bench.rounds, {"Velora": lambda number: application(bench, number),
                                              "curl": lambda number: curl(bench, number)}))]


ROWS = {"done": thousand}
