"""The frame of every way: steps that are told and photographed, and what several ways do alike."""

import os
import re
import subprocess
import sys
import time

sys.path.insert(0, os.path.join(os.path.dirname(os.path.abspath(__file__)), "..", "..", "tests", "e2e", "app"))
from person import Failure, Person, check, digest, wait_for  # noqa: E402,F401 # for the ways as well

SLOW = ("--delay", "600")  # ten seconds per MB, so that a slow machine gets there before the end of a file

reported = []


def report(holds, name, told=None):
    reported.append(holds)
    told = " ".join(str(told).split()) if told else None  # a line is a step
    print(f"{'ok' if holds else 'not ok'} {name}" + (f" ({told})" if told else ""), flush=True)


class Tour:
    """One person's way through the application: steps that are told and photographed."""

    def __init__(self, build, name, folder, **options):
        self.name, self.folder, self.failed, self.count = name, folder, 0, 0
        self.person = Person(build, **options)

    def step(self, words, action, *arguments):
        """Does a step. What follows one that failed has no ground to stand on, so the tour's failure goes on up."""
        self.count += 1
        name = f"{self.name}: {words}"
        try:
            told = action(*arguments)
        except Exception as failure:
            report(False, name, " ".join(f"{failure or type(failure).__name__}; {self.traces()}".split()))
            self.failed += 1
            raise
        finally:
            label = re.sub(r"[^a-z0-9]+", "-", words.lower()).strip("-")
            self.person.picture(os.path.join(self.folder, f"{self.name}-{self.count:02}-{label}.png"))
        report(True, name, told)

    def traces(self):
        """What a failure that is not seen a second time leaves to think about."""
        person = self.person
        try:
            ended = person.application and person.application.poll()
            shown = "ended with %s" % ended if ended is not None else "shows %r" % [entry[:2] for entry in person.visible()]
            with open(person.log, encoding="utf-8", errors="replace") as log:
                return f"the application {shown[:600]}; its last words: {log.read()[-300:]!r}"
        except Exception as failure:  # pylint: disable=broad-except # the first failure is the one to be told
            return f"no traces: {failure!r}"

    def image(self, name, words="gradient:orange-blue"):
        path = os.path.join(self.person.folder, name)
        self.person.run("convert", "-size", "640x480", words, path)
        return os.fsencode(path)

    def go_to(self, text, keys=("Down", "Tab")):
        """Presses keys until what has this text has the focus: the first one while it leads anywhere, then the next."""
        path = [self.person.focused()]
        for key in keys * 3:
            for _ in range(20):
                if path[-1] == text:
                    return f"{len(path) - 1} keys"
                self.person.key(key)
                time.sleep(0.15)
                path.append(self.person.focused())
                if path[-1] == path[-2] or key == "Tab":
                    break
        raise Failure(f"the keys do not lead to {text!r}: {path!r}")

    def posts(self):
        """Follows what the desktop is asked to show; the texts come from the function that is returned."""
        log = os.path.join(self.person.home, "posts.txt")
        with open(log, "wb") as file:
            self.person.start(["dbus-monitor", "--session",
                               "interface='org.freedesktop.Notifications',member='Notify'"], stdout=file)
        wait_for("the bus monitor", lambda: os.path.getsize(log))

        def read():
            with open(log, encoding="utf-8", errors="replace") as file:
                return file.read()
        return read

    def left(self, files):
        """The last step of most ways: Back ends the application, everyone is told, and these files are stored."""
        reply = self.person.leave()
        self.person.all_succeeded()
        stored(self.person, files)
        return reply

    def cancel_row(self, name):
        """The x of an upload's row."""
        person = self.person
        row = wait_for(f"the row {name}", lambda: person.find(name))
        middle = row[3] + row[5] / 2
        buttons = [entry for entry in person.visible() if entry[:2] == ("Elm_Button", "Cancel") and
                   abs(entry[3] + entry[5] / 2 - middle) < 40]
        check(buttons, f"the row {name} has no button Cancel")
        _, _, x, y, width, height = min(buttons, key=lambda entry: abs(entry[3] + entry[5] / 2 - middle))
        person.run("xdotool", "mousemove", str(x + width // 2), str(y + height // 2), "click", "1")
        wait_for(f"the row {name} to go", lambda: not person.find(name))


def folders(person, *names):
    """The page that asks for a folder, with nothing over it."""
    person.sees("Upload to", *names)
    wait_for("Done", lambda: person.find("Done", "Elm_Button"))
    for text in ("OK", "Wi-Fi", "Try again", "Velora uploads"):
        check(not person.find(text), f"{text!r} is there as well: {person.texts()!r}")


def stays(what, condition, seconds=1.5):
    """Something that must not pass by itself."""
    end = time.monotonic() + seconds
    while time.monotonic() < end:
        check(condition(), f"{what}: gone after {seconds - end + time.monotonic():.1f} s")
        time.sleep(0.1)


def stored(person, files):
    """These files and nothing else, once the service has let go of what was cancelled."""
    person.hurry()  # with what was on its way at the cancel
    wait_for("the service to let go of half a file", lambda: not person.halves())
    person.has_stored(files)
