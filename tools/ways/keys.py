"""By keys alone, and what a screen reader is told."""

import re
import subprocess
import time

from ways.hearing import Reader
from ways.steps import SLOW, Failure, check, stays, wait_for


def keys(tour):
    person = tour.person
    for place in ("/Alpha/Inner", "/Beta"):
        person.make_folder(place)
    files = {name: person.file(name, size=size) for name, size in (("large.bin", 28_000_000), ("extra.txt", 900), ("small.txt", 900))}

    def presses(*names):
        for name in names:
            person.key(name)
            time.sleep(0.2)

    def until(key, seen, most=12):
        """Presses a key and Return until something is seen, as one tries who does not see the ring."""
        for count in range(most):
            presses(*[key] * (count > 0), "Return")
            if wait(seen):
                return count
        raise Failure(f"{most} times {key} and Return lead nowhere: {person.texts()!r}")

    def wait(seen):
        try:
            return wait_for("", seen, 3)
        except Exception:  # pylint: disable=broad-except
            return False

    def named():
        for kind, text, *place in person.visible():
            check(kind != "Elm_Button" or text, f"the button at {place} has no name")

    def see():
        person.share(*files.values())
        person.sees("Alpha", "Beta")
        named()

    def enter():
        presses("Tab")
        for count in range(12):
            if person.find("Inner"):
                return f"{count} times Down"
            presses("Down", "Return")
            wait(lambda: not person.find("Beta"))
            if person.find("This folder is empty"):
                presses("Escape")
                person.sees("Beta")
        raise Failure(f"Down and Return do not open a folder: {person.texts()!r}")

    def done():
        presses("shift+Tab", "shift+Tab", "shift+Tab", "Return")
        person.notified("0 / 3", ongoing=True)
        person.sees("Velora uploads", *files)
        named()

    def menu():
        presses("Menu")
        person.sees("Remove")
        until("Down", lambda: "0 Selected" in person.texts(), 3)
        named()

    def select():
        tour.go_to("Select All", ("Up", "Tab"))
        presses("Return")
        person.sees("3 Selected")
        named()

    def give_up():
        presses("Escape")
        person.sees("Velora uploads")
        check(all(person.find(name) for name in files), "a file left the queue")

    def cancel_one():
        tour.go_to("Cancel")
        presses("Down", "Return")  # from the first row's to the second's
        wait_for("the row to go", lambda: not person.find("extra.txt"))
        check(person.find("large.bin"), "the running file went too")

    def left():
        del files["extra.txt"]
        person.hurry()
        person.finished("2 files", "Upload complete")
        person.leave()
        person.has_stored({f"/Alpha/{name}": path for name, path in files.items()})

    tour.step("the page is there, every button has a name", see)
    tour.step("a folder is entered", enter)
    tour.step("Done", done)
    tour.step("more menu, Remove", menu)
    tour.step("Select All", select)
    tour.step("Escape leaves the selection", give_up)
    tour.step("a row's own Cancel", cancel_one)
    tour.step("the end of the queue, and Escape", left)


# one press of a back key is one step back

def escape(tour):
    person = tour.person
    path = ("Alpha", "Beta", "Gamma")
    for depth in range(len(path) + 1):
        person.make_folder("/" + "/".join((*path[:depth], f"side {depth}")))  # tells where one is
    request = []

    def see():
        person.share(person.file("one.txt"))
        person.sees("Alpha", "side 0")
        request.append(person.request)

    def here(depth):
        return [text for text in person.texts() if text.startswith("side ")] == [f"side {depth}"]

    def down(depth, way):
        """To a folder; then nothing has the focus, or the list has it."""
        for level in range(depth):
            person.click(path[level])
            wait_for(f"the folder {path[level]}", lambda: here(level + 1))  # pylint: disable=cell-var-from-loop
        for key in way:
            person.key(key)
        return f"the focus is on {person.focused()!r}"

    def up(key, depth):
        person.key(key)
        wait_for(f"the folder of depth {depth}", lambda: here(depth), 5)
        stays(f"the folder of depth {depth}", lambda: here(depth), 0.5)
        check(person.application.poll() is None and request[0].poll() is None, "the application has left")

    tour.step("the folders are there", see)
    for key in ("XF86Back", "Escape"):
        for way in ((), ("Tab",), ("Tab", "Down")):
            where = f"{key} after {' and '.join(way) or 'a click'}"
            tour.step(f"{where}: in the first folder", down, 1, way)
            tour.step(f"{where}: to the root and not out", up, key, 0)
            tour.step(f"{where}: three folders down", down, 3, way)
            for depth in (2, 1, 0):
                tour.step(f"{where}: up to depth {depth}", up, key, depth)
    tour.step("and out", person.leave)


def reader(tour):
    person = tour.person
    file = person.file("large.bin", size=28_000_000)
    hears = Reader(person).hears

    def browse():
        person.share(file)
        person.sees("Photos")
        return hears(("page tab", "Upload to"), ("list item", "Photos"), ("menu item", "Velora"),
                     ("push button", "Back"), ("push button", "Cancel"), ("push button", "Done"))

    def queue():
        person.choose()
        person.sees("large.bin")
        return hears(("page tab", "Velora uploads"), ("list item", "large.bin"),
                     ("push button", "Cancel, large.bin"), ("progress bar", "large.bin"))

    def select():
        person.key("Menu")
        person.click("Remove")
        person.sees("0 Selected")
        return hears(("page tab", "0 Selected"), ("check box", "Select All"), ("check box", "large.bin"))

    def popup():
        person.click("large.bin")
        person.click("Done", "Elm_Button")
        person.sees("Stop 1 upload?")
        told = hears(("push button", "Stop"), ("push button", "Cancel"))
        person.click("Stop", "Elm_Button")
        person.leave()
        return told

    tour.step("the folders", browse)
    tour.step("the queue", queue)
    tour.step("the selection mode", select)
    tour.step("a popup", popup)


WAYS = {"keys": (keys, {"service": SLOW}), "escape": (escape, {}),
        "reader": (reader, {"service": SLOW})}
