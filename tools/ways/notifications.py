"""The notifications, also when the application has left."""

import subprocess

from ways.steps import wait_for


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


WAYS = {"bubble": (bubble, {}), "again": (again, {"service": ("--fail", "1:503")})}
