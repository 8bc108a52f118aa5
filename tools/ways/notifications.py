"""The notifications, also when the application has left."""

import re
import subprocess

from ways.steps import Failure, check, wait_for


def click_bubble(tour):
    """A click on what the notification daemon shows, when the application has left."""
    person = tour.person
    words = wait_for("the bubble", lambda: subprocess.run(
        ["xdotool", "search", "--onlyvisible", "--class", "dunst", "getwindowgeometry", "--shell"],
        env=person.env, capture_output=True, check=False).stdout.decode())
    box = dict(line.split("=") for line in words.split() if "=" in line)
    person.run("xdotool", "mousemove", str(int(box["X"]) + int(box["WIDTH"]) // 2),
               str(int(box["Y"]) + int(box["HEIGHT"]) // 2), "sleep", "0.1", "click", "1")
    wait_for("the application on the bus", lambda: person.is_on_bus("com.orvant.velora"))


def daemon_in_sight(person):
    for process in person.processes:
        if process.args[0] == "dunst" and process.poll() is None:
            process.terminate()
            process.wait()
    person.start_notification_daemon(lasting=True)


def leave_result(person):
    person.raise_window()
    person.key("Escape")
    wait_for("the application to leave", lambda: not person.is_on_bus("com.orvant.velora"))


def bubble(tour):
    person = tour.person

    def uploads():
        """With the daemon in sight from the start of the transfer on."""
        person.share(*[person.file(name, size=600_000) for name in ("first.txt", "second.txt")])
        person.click("Photos")
        person.sees("Done", "Photos", "Velora")
        daemon_in_sight(person)
        person.click("Done", "Elm_Button")
        person.finished("2 files", "Upload complete")
        person.leave()

    def tap():
        click_bubble(tour)
        person.sees("Velora uploads", "first.txt", "second.txt")

    tour.step("uploaded and left, the bubble shows", uploads)
    tour.step("a click on the bubble opens the result", tap)
    tour.step("the result is left", leave_result, person)


def again(tour):
    person = tour.person
    path = person.file("one.txt")

    def fails():
        person.upload(path)
        person.finished("one.txt", "Upload failed")
        person.leave()
        daemon_in_sight(person)

    def tap():
        click_bubble(tour)
        person.sees("Velora uploads", "one.txt", "Upload failed")

    def try_again():
        daemon = [process for process in person.processes if process.args[0] == "dunst"][-1]
        daemon.terminate()  # it lies over the buttons
        daemon.wait()
        person.click("one.txt")
        person.click("Upload", "Elm_Button")
        person.finished("one.txt", "Upload complete")
        leave_result(person)
        person.has_stored({"one.txt": path})

    tour.step("the upload fails, the application leaves", fails)
    tour.step("a click on the bubble opens the result", tap)
    tour.step("Upload tries again, into the folder of the first try", try_again)


def no_page(tour):
    person = tour.person

    def tap():
        """What a tap on an ongoing notification sends, when its application is gone."""
        person.application = person.start([person.program("src/setting/main/velora"), "--operation", "notification/upload"])
        try:
            status = person.application.wait(10)
        except subprocess.TimeoutExpired:
            raise Failure(f"it stays, with a window that shows {person.texts()!r}") from None
        check(status == 0, f"it ended with {status}")

    tour.step("a tap on the notification of uploads that are gone: it leaves again", tap)


# progress within one file

def values(posts, start):
    """The values that the desktop was told of from a place of the log on."""
    return [int(value) for value in re.findall(r'string "value"\s+variant\s+int32 (\d+)', posts()[start:])]


def moves(told, where):
    between = {value for value in told if 0 < value < 100}
    check(told and told[0] < 50, f"{where} begins at {told[:1]!r}")
    check(told == sorted(told), f"{where} goes back: {told!r}")
    check(len(between) >= 4, f"{where} does not move within the file: {told!r}")


def follow(tour, posts):
    """Looks at the row and the notification from the begin of an upload to its end."""
    person, start, row = tour.person, len(posts()), []

    def over():
        bars = [int(text.split()[0]) for kind, text, *_ in person.visible() if kind == "Elm_Progressbar"]
        row.extend(bars[:1])
        return any("\tnormal\t" in line and "Upload complete" in line for line in person.notifications())

    def both():
        wait_for("the end of the upload", over, 60)
        told = values(posts, start)
        moves(told, "the notification")
        moves(row, "the row")
        return f"the notification has {len(set(told))} values, the row {len(set(row))}"
    return both


def progress(tour):
    person = tour.person
    posts = tour.posts()
    path = person.file("one.bin", size=24_000_000)  # a connection on the machine itself swallows megabytes at once

    def fails():
        person.upload(path)
        person.finished("one.bin", "Upload failed")

    def upload():
        person.share(path)
        person.click("Photos")
        person.sees("Done", "Photos", "Velora")
        both = follow(tour, posts)
        person.click("Done", "Elm_Button")
        told = both()
        person.leave()
        return told

    def try_again():
        both = follow(tour, posts)
        person.retry("one.bin")
        told = both()
        person.leave()
        return told

    def open_result():
        person.share(path)
        person.choose()
        person.finished("one.bin", "Upload failed")
        person.leave()
        daemon_in_sight(person)
        click_bubble(tour)
        person.sees("Velora uploads", "one.bin", "Upload failed")
        daemon = [process for process in person.processes if process.args[0] == "dunst"][-1]
        daemon.terminate()  # it lies over the buttons
        daemon.wait()
        person.start_notification_daemon(in_sight=False)

    def again_in_result():
        both = follow(tour, posts)
        person.click("one.bin")
        person.click("Upload", "Elm_Button")
        told = both()
        leave_result(person)
        return told

    if tour.name == "progress":
        tour.step("an upload moves from 0 to 100", upload)
    elif tour.name == "progress-retry":
        tour.step("an upload fails", fails)
        tour.step("another try moves from 0 to 100", try_again)
    else:
        tour.step("an upload fails, its result is opened", open_result)
        tour.step("another try from there moves from 0 to 100", again_in_result)


PACED = ("--delay", "20")  # seven seconds for the 24 MB
WAYS = {"bubble": (bubble, {}), "again": (again, {"service": ("--fail", "1:503")}), "no-page": (no_page, {}),
        "progress": (progress, {"service": PACED}), "progress-retry": (progress, {"service": (*PACED, "--fail", "1:503")}),
        "progress-result": (progress, {"service": (*PACED, "--fail", "1:503")})}
