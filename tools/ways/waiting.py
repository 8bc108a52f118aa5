"""The wait for the first list of folders, with a service that hangs."""

import os
import signal

from ways.steps import check, folders, stays, wait_for

PAGE = {"Upload to", "Velora", "Cancel", "Done", "Back", "More options"}  # what a page without its list has
UNREACHABLE = "The service does not answer"


def hang(person):
    person.service.send_signal(signal.SIGSTOP)


def go_on(person):
    person.service.send_signal(signal.SIGCONT)


def words(person):
    """What the window says beyond its bars."""
    return [text for text in person.texts() if text not in PAGE]


def cancel_of_wait(person):
    """The wait's own Cancel, below the title."""
    title = person.find("Upload to")
    bottom = title[3] + title[5] if title else 0
    return next((entry for entry in person.visible() if entry[:2] == ("Elm_Button", "Cancel") and entry[3] > bottom), None)


def nothing_to_press(person):
    """The files went with the wait: Done must not begin anything."""
    told = any("nothing to upload" in text for text in person.texts())
    check(told or not person.find("Done", "Elm_Button"), "Done can be pressed, with nothing to upload")


def wait(tour):
    person = tour.person
    first, second = person.file("first.txt"), person.file("second.txt")
    said = []

    def begin():
        hang(person)
        person.share(first)
        said[:] = wait_for("words", lambda: words(person))
        wait_for("the wait's Cancel", lambda: cancel_of_wait(person), 5)
        return ", ".join(said)

    def share():
        person.share(second)
        person.sees("2 files · 1\u00a0KB")  # the line above the list counts on behind the wait
        stays("the wait", lambda: said[-1] in words(person) and cancel_of_wait(person))

    def page():
        go_on(person)
        folders(person, "Photos")
        check(said[-1] not in words(person), f"the wait is still there: {person.texts()!r}")

    def done():
        person.choose()
        person.finished("2 files", "Upload complete")
        person.sees("first.txt", "second.txt")

    tour.step("the wait has words and a Cancel", begin)
    tour.step("another share leaves the wait up", share)
    tour.step("the service answers: the folders", page)
    tour.step("Done uploads both", done)
    tour.step("both are told and stored", tour.left, {"first.txt": first, "second.txt": second})


def wait_back(tour):
    person = tour.person

    def begin():
        hang(person)
        person.share(person.file("one.txt"))
        wait_for("the window", person.raise_window)
        person.sees("Upload to")

    def back():
        person.key("Escape")
        stays("the application", lambda: person.application.poll() is None)

    def again():
        person.raise_window()
        wait_for("words on the page", lambda: words(person), 5)
        nothing_to_press(person)
        return ", ".join(words(person))

    def answers():
        go_on(person)
        wait_for("words on the page", lambda: words(person), 5)
        nothing_to_press(person)

    def leave():
        while person.application.poll() is None and person.raise_window():
            person.key("Escape")
        person.ends()
        person.has_stored({})

    tour.step("the wait", begin)
    tour.step("Back does not end the application", back)
    tour.step("raised, the page is not blank", again)
    tour.step("the service answers: there is nothing to upload", answers)
    tour.step("left", leave)


def wait_in_vain(tour):
    person = tour.person
    path = person.file("one.txt")
    with open(os.path.join(person.env["CLOUD_SERVICES_DIR"], "Velora.conf"), "a", encoding="utf-8") as file:
        file.write("StallTimeout=2\n")

    def begin():
        hang(person)
        person.share(path)
        person.sees("Try again", seconds=30)
        check(not person.find("You are offline"), "it says offline while Wi-Fi is connected")
        person.sees(UNREACHABLE)

    def again():
        go_on(person)
        person.click("Try again", "Elm_Button")
        folders(person, "Photos")
        check(not person.find(UNREACHABLE), "the message is still there")

    def done():
        person.choose()
        person.finished("one.txt", "Upload complete")

    tour.step("the client gives up: the service does not answer", begin)
    tour.step("Try again leads to the folders", again)
    tour.step("Done uploads", done)
    tour.step("told and stored", tour.left, {"one.txt": path})


WAYS = {"wait": (wait, {}), "wait-back": (wait_back, {}), "wait-in-vain": (wait_in_vain, {})}
