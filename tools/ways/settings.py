"""The account's settings: switches and schedule that stay as they were set, and the account's removal."""

import os
import random
import signal
import sqlite3
import subprocess
import threading
import time

from device import Trouble
from ways.hearing import Reader
from ways.signin import accounts, nothing_left
from ways.steps import SLOW, check, stays, wait_for

REFRESH_PERIODIC, TYPES = 3, 4


def stored_settings(person):
    """What the client keeps for the account: {key: number}."""
    database = sqlite3.connect(f"file:{device_file(person, 'Velora.db')}?mode=ro", uri=True)
    found = dict(database.execute("SELECT key, value FROM account_setting"))
    database.close()
    return found


def device_file(person, *names):
    return os.path.join(person.env["PLATFORM_DATA_DIR"], "cloud", *names)


def uploaded_by(person, email):
    return sorted(os.listdir(os.path.join(person.data, "files", email)))


def configure(person):
    if not person.application or person.application.poll() is not None:
        person.application = person.start_application()
    person.request = person.launch("account/configure")
    person.sees("Storage usage", "Camera upload")
    wait_for("the size of the storage", lambda: any(" / " in text for text in person.texts()))


def becomes(person, key, value):
    wait_for(f"{key} to be {value}", lambda: stored_settings(person).get(key) == value, 5)


def back(person):
    person.key("Escape")
    return person.ends()


def switches(tour):
    person = tour.person

    def off_rows():
        before = stored_settings(person)
        person.click("Upload via Wi-Fi only")  # of no use while camera upload is off
        stays("what is stored", lambda: stored_settings(person) == before, 1)

    def each():
        for row, key, value in (("Camera upload", "camera_upload", 1), ("Upload via Wi-Fi only", "wifi_only.4", 1),
                                ("Sync images via Wi-Fi only", "wifi_only.1", 1), ("Sync images", "activation.1", 0),
                                ("Sync videos", "activation.2", 0), ("Sync videos", "activation.2", 1),
                                ("Sync videos via Wi-Fi only", "wifi_only.2", 1)):
            person.click(row)
            becomes(person, key, value)
        return f"{stored_settings(person)!r}"

    def by_the_switch():
        _, _, _, y, _, height = person.find("Camera upload")
        person.run("xdotool", "mousemove", str(person.width - 48), str(y + height // 2), "click", "1")
        becomes(person, "camera_upload", 0)

    def schedule(choice, hours, at_radio):
        person.click("Sync schedule")
        person.sees("Every 3 hours", "Every day")
        if at_radio:
            _, _, _, y, _, height = wait_for("the choice", lambda: person.find(choice))
            time.sleep(0.6)  # the popup comes to rest
            _, _, _, y, _, height = person.find(choice)
            person.run("xdotool", "mousemove", str(person.width - 64), str(y + height // 2), "click", "1")
        else:
            person.click(choice)
        becomes(person, "refresh_type", hours * 3600 * TYPES + REFRESH_PERIODIC)
        wait_for("the popup to go", lambda: not person.find("Every 3 hours") or choice == "Every 3 hours")
        person.sees(choice)

    def again():
        before = stored_settings(person)
        configure(person)
        person.sees("Every 12 hours")
        check(stored_settings(person) == before, f"{before} became {stored_settings(person)}")

    def by_keys():
        tour.go_to("Sync videos", ("Tab", "Down"))
        person.key("Return")
        becomes(person, "activation.2", 0)
        tour.go_to("Sync schedule", ("Up",))
        person.key("Return")
        person.sees("Every 3 hours")
        tour.go_to("Every day", ("Down", "Tab"))
        person.key("Return")
        becomes(person, "refresh_type", 24 * 3600 * TYPES + REFRESH_PERIODIC)
        person.key("Menu")
        person.sees("Remove")
        person.key("Menu")
        wait_for("the menu to go", lambda: not person.find("Remove"))

    tour.step("the account's settings", configure, person)
    tour.step("a disabled switch does nothing", off_rows)
    tour.step("each switch is stored at once", each)
    tour.step("the switch itself", by_the_switch)
    tour.step("the schedule, by its row", schedule, "Every 6 hours", 6, False)
    tour.step("the schedule, by its radio", schedule, "Every 12 hours", 12, True)
    tour.step("Back", back, person)
    tour.step("all is as it was set", again)
    tour.step("by keys alone", by_keys)
    tour.step("Back again", back, person)


def remove(person, question=(), before_last=lambda: None):
    person.click("More options", "Elm_Button")
    person.click("Remove")
    person.sees("All data related to this account", *question)
    before_last()
    person.click("Remove", "Elm_Button")


def told_and_left(person):
    person.sees("You have been signed out", seconds=30)
    person.click("OK", "Elm_Button")
    return person.ends()


def kept(person):
    """What the client still has of the account's: rows of its database, files of its caches."""
    database = sqlite3.connect(f"file:{device_file(person, 'Velora.db')}?mode=ro", uri=True)
    rows = sum(database.execute(f"SELECT count(*) FROM {table}").fetchone()[0]
               for table in ("folder", "content", "account_setting"))
    database.close()
    files = [name for part in ("cache", "thumbnails") for _, _, names in os.walk(device_file(person, part))
             for name in names]
    return rows, files


def removal(tour):
    """While files are being uploaded."""
    person = tour.person

    def upload():
        person.share(person.file("one.bin", size=24 << 20), person.file("two.txt"))
        person.choose()
        person.notified("0 / 2", ongoing=True)
        person.raise_window()

    def ask():
        request = person.request
        configure(person)
        person.click("Camera upload")
        becomes(person, "camera_upload", 1)
        person.click("More options", "Elm_Button")
        person.click("Remove")
        person.sees("2 files are still being uploaded")
        person.click("Cancel", "Elm_Button")
        stays("the account", lambda: accounts(person) == (1, 1, 1))
        person.requests.append(request)

    def gone():
        remove(person, ("2 files are still being uploaded",))
        reply = told_and_left(person)
        nothing_left(person)
        check(kept(person) == (0, []), f"the client still has {kept(person)}")
        person.hurry()
        time.sleep(1)
        check(not person.all_files(), f"stored are {person.all_files()}")
        check(not [line for line in person.notifications() if "\tongoing\t" in line], "a notification stays")
        return reply

    tour.step("two files are on their way", upload)
    tour.step("the question names them, and can be refused", ask)
    tour.step("removed: nothing is left, nothing claims to be stored", gone)


def offline(tour):
    person = tour.person

    def unreachable():
        person.service.send_signal(signal.SIGSTOP)
        begun = time.monotonic()
        remove(person)
        reply = told_and_left(person)
        took = time.monotonic() - begun
        person.service.send_signal(signal.SIGCONT)
        found = accounts(person)
        check(found[:2] == (0, 0), f"left are (records, credentials, tokens) {found}")
        check(kept(person) == (0, []), f"the client still has {kept(person)}")
        return f"{took:.0f} s; {reply}"

    tour.step("the account's settings", configure, person)
    tour.step("a silent service does not keep the account on the phone", unreachable)


def killed(tour):
    """kill -9 at fifty moments of a removal, from the tap on. What comes after it finds the account, or none."""
    person = tour.person

    def once(after):
        person.sign_in()
        person.application = None
        configure(person)
        kill = threading.Timer(after, person.application.kill)
        try:
            remove(person, before_last=kill.start)
        except (Trouble, subprocess.SubprocessError):
            pass  # it was killed under the pointer
        kill.join()
        person.application.wait()
        # the next start brings what was broken off to its end
        person.application = None
        person.tap_icon()
        wait_for("a page", lambda: person.find("Sign in", "page:text") or person.find("Storage usage"), 30)
        records, credentials, _ = accounts(person)
        person.key("Escape")
        person.application.wait(20)
        check(records == credentials, f"killed after {after:.3f} s: {records} records, {credentials} credentials")
        check(credentials or kept(person) == (0, []), f"of the account that is gone there are {kept(person)}")
        return credentials

    def fifty():
        left = [once(random.Random(i).uniform(0.2, 0.45)) for i in range(50)]
        return f"{sum(left)} times the account, {left.count(0)} times none"

    tour.step("fifty times", fifty)


def reader(tour):
    """Every row is heard with what it is and how it stands."""
    person = tour.person
    reader_of = Reader(person)

    def heard():
        configure(person)
        return reader_of.hears(("check box", "Camera upload"), ("check box", "Sync images"), ("push button", "Back"))

    def changes():
        check(not reader_of.is_checked("Camera upload"), "camera upload is heard as on")
        person.click("Camera upload")
        becomes(person, "camera_upload", 1)
        wait_for("the change to be heard", lambda: reader_of.is_checked("Camera upload"))

    tour.step("the settings", heard)
    tour.step("a switch that changes", changes)
    tour.step("Back", back, person)


TALL = {"size": "480x1200"}
WAYS = {"settings": (switches, TALL), "removal": (removal, TALL | {"service": SLOW}), "removal-offline": (offline, TALL),
        "removal-killed": (killed, TALL), "settings-reader": (reader, TALL)}
