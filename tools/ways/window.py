"""The window gets another size."""

from ways.steps import SLOW, check, wait_for


def resize(person, width, height):
    """Puts the window into the screen's corner, where its coordinates are the screen's, in a size: (0, 0, width, height)."""
    window = person.run("xdotool", "search", "--onlyvisible", "--name", "^velora$").split()[-1]
    person.run("xdotool", "windowsize", "--sync", window, str(width), str(height))
    person.run("xdotool", "windowmove", window, "0", "0")

    def place():
        words = person.run("xdotool", "getwindowgeometry", "--shell", window)
        box = {key: int(value) for key, value in (line.split("=") for line in words.split())}
        return (0, 0, width, height) if (box["WIDTH"], box["HEIGHT"]) == (width, height) else None
    return wait_for("the window's size", place)


def within(entry, place):
    _, text, x, y, width, height = entry
    left, top, wide, high = place
    inside = left <= x and top <= y and x + width <= left + wide and y + height <= top + high
    check(inside, f"{text!r} at {entry[2:]!r} is not within the window at {place!r}")


def path_bar(tour):
    person = tour.person
    names = ("A folder of a long name", "Another one below it", "The innermost of them")
    person.make_folder("/" + "/".join(names))

    def browse():
        person.share(person.file("one.txt"))
        person.sees(names[0])
        resize(person, 700, 700)
        for name in names:
            person.click(name)
        person.sees("This folder is empty")

    def narrower():
        place = resize(person, 360, 640)
        # A text that slides is looked at when it has come to rest.
        wait_for(f"{names[-1]!r} in sight", lambda: person.find(names[-1]), 5)
        last = []

        def rests():
            seen, last[:] = last[:], [person.find(names[-1])]
            return seen == last
        wait_for("the path to rest", rests, 5, 0.3)
        within(last[0], place)

    tour.step("three folders down", browse)
    tour.step("narrower: the open folder is in sight in the path bar", narrower)


def resized(tour):
    person = tour.person
    path = person.file("large.bin", size=20_000_000)

    def menu():
        person.share(path)
        person.sees("Photos")
        resize(person, 700, 700)
        person.choose()
        person.notified("0 / 1", ongoing=True)
        person.raise_window()
        person.sees("large.bin")
        person.key("Menu")
        person.sees("Remove")

    def follows(width, height):
        place = resize(person, width, height)
        moved = []

        def rests():
            seen, moved[:] = moved[:], [person.find("Remove")]
            return seen == moved and moved[0]
        wait_for("the menu to rest", rests, 5, 0.3)
        within(moved[0], place)

    def click():
        person.click("Remove")
        person.sees("0 Selected")

    def left():
        person.key("Escape")
        person.hurry()
        person.finished("large.bin", "Upload complete")
        person.leave()

    tour.step("a queue, and its more menu", menu)
    tour.step("narrower and lower: the menu is in the window", follows, 400, 420)
    tour.step("wider and higher: the menu is in the window", follows, 700, 700)
    tour.step("narrower again: the menu is in the window", follows, 360, 640)
    tour.step("its entry can be clicked", click)
    tour.step("left", left)


FREE = {"size": "800x800", "maximized": False}
WAYS = {"path-bar": (path_bar, FREE), "resized": (resized, {"service": SLOW, **FREE})}
