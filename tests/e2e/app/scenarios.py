#!/usr/bin/python3
"""The real application, service, bus and window manager, operated as a person would; most of it goes wrong on purpose.

Every scenario has a device of its own. Prints a test per scenario in the Test Anything Protocol.
usage: scenarios.py BUILD [PATTERN]"""

import concurrent.futures
import ctypes
import os
import re
import signal
import subprocess
import sys
import threading
import time

from person import FOLDER, Person, check, wait_for

GONE = "Upload failed · Not readable"


def hostile_names(person):
    names = [b"<b>&amp; \xe2\x82\xac.txt", b"two\nlines.txt", b"x" * 251 + b".txt", b"..%2f..%2fup.txt", b"-rf",
             b" ", b"...", b"plain.txt", b"empty.dat", b"large.bin"]
    paths = [person.file(name, size={b"empty.dat": 0, b"large.bin": 5_000_000}.get(name)) for name in names]
    person.upload(person.file(b"bad \xff\xfe bytes.txt"), *paths)  # no service of text names can store that one
    person.finished("bytes.txt", "Upload failed")
    person.sees("bytes.txt", "Upload failed · Name refused", "<b>&amp; €.txt", "two␊lines.txt")
    check("SUCCEEDED" in person.leave(), "a share is answered")
    person.has_stored(dict(zip(names, paths)))


def bad_files(person):
    good = person.file("good.txt"), person.file("last.txt")
    fifo = os.path.join(person.folder, "fifo")
    os.mkfifo(fifo)
    unreadable = person.file("secret.txt")
    os.chmod(unreadable, 0)
    bad = [os.path.join(person.folder, "missing.txt"), os.path.join(person.folder, "two\nlines gone.txt"), person.folder] + ([unreadable] if os.getuid() else [])
    person.upload(good[0], fifo, *bad, good[1])
    person.finished(f"{len(bad)} files", "Upload failed")
    person.sees("missing.txt", GONE)
    check(person.texts().count(GONE) == len(bad), f"a reason is missing: {person.texts()!r}")
    # What was missing is there now.
    found = person.file("missing.txt")
    person.retry("missing.txt")
    person.finished("missing.txt", "Upload complete")
    reply = person.leave()
    check(reply == f"reply: SUCCEEDED refused[]={fifo}", f"the sender was told {reply!r}")
    person.has_stored({"good.txt": good[0], "last.txt": good[1], "missing.txt": found})


def callers_window(person):
    """The window belongs to that of the application that shared."""
    x11 = ctypes.CDLL("libX11.so.6")
    x11.XOpenDisplay.restype = ctypes.c_void_p
    display = ctypes.c_void_p(x11.XOpenDisplay(person.env["DISPLAY"].encode()))
    x11.XDefaultRootWindow.restype = x11.XCreateSimpleWindow.restype = ctypes.c_ulong
    root = ctypes.c_ulong(x11.XDefaultRootWindow(display))
    caller = x11.XCreateSimpleWindow(display, root, 0, 0, 9, 9, 0, ctypes.c_ulong(0), ctypes.c_ulong(0))
    x11.XSync(display, 0)
    person.env["WINDOWID"] = str(caller)
    person.share(person.file("one.txt"))
    wait_for("the window", person.raise_window)
    ours = person.run("xdotool", "search", "--onlyvisible", "--name", "^velora$").split()[-1]
    owner = ctypes.c_ulong(0)
    x11.XGetTransientForHint(display, ctypes.c_ulong(int(ours)), ctypes.byref(owner))
    x11.XCloseDisplay(display)
    check(owner.value == caller, f"the window belongs to {owner.value:#x}, not to {caller:#x}")


def names_taken(person):
    person.put(f"{FOLDER}/photo.jpg", b"taken before")
    paths = [person.file(name) for name in ("photo.jpg", "elsewhere/photo.jpg", "late.jpg", "a/late.jpg")]
    person.share(*paths)
    person.click("Photos")
    person.sees("photo.jpg")
    person.put(f"{FOLDER}/late.jpg", b"taken by another client")
    person.put(f"{FOLDER}/late(1).jpg", b"and once more")
    person.click("Done", "Elm_Button")
    person.finished("4 files", "Upload complete")
    person.leave()
    person.has_stored({"photo.jpg": b"taken before", "photo(1).jpg": paths[0], "photo(2).jpg": paths[1],
                       "late.jpg": b"taken by another client", "late(1).jpg": b"and once more",
                       "late(2).jpg": paths[2], "late(3).jpg": paths[3]})


def application_killed(person):
    paths = [person.file(name, size=40_000_000) for name in ("one", "two")]
    person.upload(*paths)
    person.notified("Velora", ongoing=True)
    person.on_its_way()
    person.application.kill()
    person.application.wait()
    wait_for("the service to let go of half a file", lambda: not person.halves())
    person.request.wait(20)
    person.has_stored({})
    person.notified("Upload interrupted")
    small = person.file("small")
    person.share(small)
    person.sees("Go on uploading?", "2 files have not been uploaded yet.")
    person.click("Upload", "Elm_Button")
    person.hurry()
    person.notified("2 files", "Upload complete")
    person.choose()  # for the other one
    person.finished("small", "Upload complete")
    person.leave()
    person.has_stored({"one": paths[0], "two": paths[1], "small": small})


def window_closed(person):
    paths = {name: person.file(name, size=40_000_000) for name in ("one", "two")}
    person.upload(*paths.values())
    person.notified("Velora", ongoing=True)
    person.on_its_way()
    person.raise_window()
    person.key("alt+F4")
    person.ends()
    wait_for("the service to let go of half a file", lambda: not person.halves())
    person.has_stored({name: path for name, path in paths.items() if f"{FOLDER}/{name}" in person.all_files()})
    person.notified("Upload interrupted")
    person.tap_icon()
    person.click("Upload", "Elm_Button")
    person.hurry()
    person.finished("Upload complete")
    person.raise_window()
    person.key("Escape")
    person.has_stored(paths)


def no_bus(person):
    """The files are on the command line, the reply on standard output. Nothing tells where the button is."""
    path = person.file("-one.txt")
    for process in person.processes:
        if process.args[0] == "dbus-daemon":
            process.terminate()
    del person.env["DBUS_SESSION_BUS_ADDRESS"]
    person.application = person.request = person.start(
        [person.program("src/setting/main/velora"), "--print-reply", "--", path], stdout=subprocess.PIPE)
    wait_for("the window", person.raise_window)
    for _ in range(40):
        person.run("xdotool", "mousemove", "430", "36", "click", "1")
        time.sleep(0.5)
        if any("\tnormal\t" in line for line in person.notifications()):
            break
    person.finished("-one.txt", "Upload complete")
    check(person.leave().startswith("reply: SUCCEEDED"), "no reply on standard output")
    with person.get("/-one.txt") as stored, open(path, "rb") as file:
        check(stored.read() == file.read(), "what is stored is not the file")


SLOW = ("--delay", "300")
SCENARIOS = [  # the longest ones first
    ("the application is killed in the middle", application_killed, {"service": SLOW}),
    ("names that could be mistaken for something else", hostile_names, {}),
    ("files that cannot be read, between good ones", bad_files, {}),
    ("the window of the caller", callers_window, {}),
    ("names that are taken, also in the last moment", names_taken, {}),
    ("the window is closed in the middle", window_closed, {"service": SLOW}),
    ("no session bus", no_bus, {}),
]
printing = threading.Lock()
interrupted = threading.Event()


def run(build, scenario, options):
    """What is wrong, or nothing; and what there is to say."""
    words = []
    if interrupted.is_set():
        return "interrupted", words
    person = None
    try:
        person = Person(build, **options)
        scenario(person)
        person.holds()
        return None, words
    except Exception as failure:  # pylint: disable=broad-except # whatever it is, the other scenarios go on
        if person:
            with open(person.log, encoding="utf-8", errors="replace") as log:
                words += ["log: " + line for line in log.read().splitlines()[-30:]]
        return f"{type(failure).__name__}: {failure}", words
    finally:
        if person:
            person.end()


def main():
    build = os.path.abspath(sys.argv[1])
    wanted = [entry for entry in SCENARIOS if len(sys.argv) < 3 or re.search(sys.argv[2], entry[0])]
    print(f"1..{len(wanted)}", flush=True)
    begun, failed = time.monotonic(), 0
    for number in (signal.SIGTERM, signal.SIGINT):
        signal.signal(number, lambda *_: interrupted.set())
    with concurrent.futures.ThreadPoolExecutor(max(2, (os.cpu_count() or 2) // 2)) as pool:
        futures = {pool.submit(run, build, scenario, options): (number, name)
                   for number, (name, scenario, options) in enumerate(wanted, 1)}
        for future in concurrent.futures.as_completed(futures):
            number, name = futures[future]
            wrong, words = future.result()
            failed += bool(wrong)
            print(f"{'not ok' if wrong else 'ok'} - {name}")  # unnumbered: they end in any order
            for word in ([wrong] if wrong else []) + words:
                print("#", word.replace("\n", "\n# "))
            sys.stdout.flush()
    print(f"# {time.monotonic() - begun:.0f} s")
    return 1 if failed else 0


if __name__ == "__main__":
    sys.exit(main())
