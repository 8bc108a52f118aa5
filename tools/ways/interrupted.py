"""Uploads that are interrupted, by the end of the application or by trouble on the way, and go on."""

import os
import random
import sqlite3
import time

from device import EMAIL
from ways.steps import SLOW, check, stored, wait_for

QUESTION, INTERRUPTED = "Go on uploading?", "Upload interrupted"


def kill(person):
    person.application.kill()
    person.application.wait()


def entries(person):
    """What the client's book of uploads holds."""
    database = sqlite3.connect(f"file:{os.path.join(person.env['PLATFORM_DATA_DIR'], 'cloud', 'Velora.db')}?mode=ro", uri=True)
    count = database.execute("SELECT count(*) FROM upload").fetchone()[0]
    database.close()
    return count


def killed(tour):
    person = tour.person
    files = {f"{number}.bin": person.file(f"{number}.bin", size=250_000) for number in range(6)}
    new = person.file("new.txt")

    def begin():
        person.upload(*files.values())
        person.notified("2 / 6", ongoing=True)
        kill(person)
        return person.notified(INTERRUPTED)

    def later():
        person.share(new)
        person.sees(QUESTION, "files have not been uploaded yet.")
        person.click("Later", "Elm_Button")
        person.choose()
        person.finished("new.txt", "Upload complete")
        person.leave()

    def ask():
        person.tap_icon()
        person.sees(QUESTION)

    def go_on():
        person.click("Upload", "Elm_Button")
        person.sees("5.bin")
        person.finished("files", "Upload complete")
        check(entries(person) == 0, f"{entries(person)} entries are left")
        person.raise_window()
        person.key("Escape")
        person.application.wait(20)
        stored(person, files | {"new.txt": new})

    tour.step("killed in the middle, which is told", begin)
    tour.step("another share: later", later)
    tour.step("the icon asks again", ask)
    tour.step("all are stored once, and the book is empty", go_on)


def trouble(tour):
    person = tour.person
    files = {f"{number}.bin": person.file(f"{number}.bin", size=250_000) for number in range(4)}
    told = []

    def away():
        person.upload(*files.values())
        person.notified("1 / 4", ongoing=True)
        person.service.kill()
        person.service.wait()
        person.notified("Velora does not answer", ongoing=True)
        person.raise_window()
        person.sees("Velora does not answer")

    def no_network():
        person.setting("memory/connection/type", "none")
        person.sees("Waiting for a network")

    def back():
        person.start_service(*SLOW)
        time.sleep(3)  # a pause of the client's would be over by now
        person.sees("Waiting for a network") if not told else None
        begun = time.monotonic()
        person.setting("memory/connection/type", "wifi")
        wait_for("an upload", lambda: person.halves() or
                 not person.find("Waiting for a network"), 5, 0.02)
        return f"it goes on after {time.monotonic() - begun:.2f} s"

    tour.step("the service goes away: it is said", away)
    tour.step("so does the network", no_network)
    tour.step("both are back: it goes on by itself", back)
    tour.step("all are stored", lambda: (person.finished("4 files", "Upload complete", seconds=90), tour.left(files)))


def two_hundred(tour):
    """kill -9 at 200 random moments of 500 files; each start goes on."""
    person = tour.person
    files = {f"{number:03}.bin": person.file(f"{number:03}.bin", size=2000) for number in range(500)}
    seed = int(os.environ.get("TOUR_SEED", "1"))
    random.seed(seed)

    def kills():
        person.upload(*files.values())
        wait_for("the files in the book", lambda: entries(person))
        done = 0
        while done < 200:
            time.sleep(random.uniform(0, 0.08))
            kill(person)
            done += 1
            if not entries(person):
                break
            person.tap_icon()
            person.click("Upload", "Elm_Button")
        while entries(person):
            time.sleep(0.5)
        top = os.path.join(person.data, "files", EMAIL, "Photos")
        return f"seed {seed}: {done} kills, {len(os.listdir(top))} files"

    tour.step("killed at 200 moments", kills)
    tour.step("each is stored once", lambda: stored(person, files))


WAYS = {"interrupted": (killed, {"service": ("--delay", "400")}), "interrupted-trouble": (trouble, {"service": SLOW}),
        "interrupted-200": (two_hundred, {})}
