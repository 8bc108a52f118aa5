"""A share, or a tap on the icon, while something else is on the screen or under way."""

from ways.steps import SLOW, check, folders, stays, stored, wait_for

FULL = "Unable to upload, not enough memory"
FOLLOWS = "Choose a folder for the new files"
BIG = 20_000_000


# behind a run

def late(tour):
    person = tour.person
    person.make_folder("/Later")
    first, second = person.file("first.bin", size=BIG), person.file("second.txt")
    posts = tour.posts()

    def begin():
        person.upload(first)
        person.notified("0 / 1", ongoing=True)
        person.sees("first.bin")

    def share():
        person.share(second)
        wait_for("the status message", lambda: FOLLOWS in posts())
        check(person.find("first.bin"), "the queue is not there any more")

    def choose():
        person.hurry()
        person.finished("first.bin", "Upload complete")
        person.sees("Upload to", "Later")
        person.choose("Later")
        person.finished("second.txt", "Upload complete")

    tour.step("a file is under way", begin)
    tour.step("another one is shared", share)
    tour.step("it gets a folder of its own", choose)
    tour.step("both are stored", tour.left, {"first.bin": first, "/Later/second.txt": second})


def canceled_run(tour, begin, cancel):
    """A share waits behind a file that is under way, and that one is cancelled."""
    person = tour.person
    person.make_folder("/Later")
    first, second = person.file("first.bin", size=BIG), person.file("second.txt")
    posts = tour.posts()

    def share():
        person.share(second)
        wait_for("the status message", lambda: FOLLOWS in posts())
        person.raise_window()

    def page():
        folders(person, "Later")
        stays("Done", lambda: person.find("Done", "Elm_Button"))
        folders(person, "Later")

    def done():
        person.choose("Later")
        person.finished("second.txt", "Upload complete")

    tour.step("a file is under way", begin, tour, first)
    tour.step("another one is shared", share)
    tour.step("the running one is cancelled", cancel, tour)
    tour.step("the other one's page is there and stays", page)
    tour.step("Done uploads it", done)
    tour.step("it alone is stored", tour.left, {"/Later/second.txt": second})


def uploads(tour, path):
    tour.person.upload(path)
    tour.person.notified("0 / 1", ongoing=True)
    tour.person.sees("first.bin")


def fails_and_is_tried_again(tour, path):
    tour.person.upload(path)
    tour.person.finished("first.bin", "Upload failed")
    tour.person.retry("first.bin")
    tour.person.notified("0 / 1", ongoing=True)


def by_its_x(tour):
    tour.cancel_row("first.bin")


def by_select_all(tour):
    person = tour.person
    person.key("Menu")
    person.click("Remove")
    person.click("Select All")
    person.sees("1 Selected")
    person.click("Done", "Elm_Button")
    person.click("Stop", "Elm_Button")


def cancel_late(tour):
    canceled_run(tour, uploads, by_its_x)


def remove_late(tour):
    canceled_run(tour, uploads, by_select_all)


def retry_late(tour):
    canceled_run(tour, fails_and_is_tried_again, by_its_x)


def full_late(tour):
    person = tour.person
    person.make_folder("/Later")
    stored_one, *others = [person.file(name, size=2_000_000) for name in ("1", "2", "3")]
    second = person.file("second.txt")
    posts = tour.posts()

    def begin():
        person.upload(stored_one, *others)
        person.notified("0 / 3", ongoing=True)

    def share():
        person.share(second)
        wait_for("the status message", lambda: FOLLOWS in posts())

    def full():
        person.hurry()
        wait_for("the status message", lambda: FULL in posts())

    def page():
        folders(person, "Later")
        stays("Done", lambda: person.find("Done", "Elm_Button"))

    def cancel():
        person.raise_window()
        person.click("Cancel", "Elm_Button")
        person.ends()
        for request in person.requests:
            check("reply: " in person.reply(request), "a share was not answered")
        stored(person, {"1": stored_one})

    tour.step("three files are under way", begin)
    tour.step("another one is shared", share)
    tour.step("the second finds no room", full)
    tour.step("the other one's page is there", page)
    tour.step("Cancel leaves, one file is stored", cancel)


# over a message

def connect(tour):
    person = tour.person
    first, second = person.file("first.txt"), person.file("second.txt")

    def offline():
        person.setting("memory/connection/type", "none:flight_mode")
        person.share(first)
        person.sees("No network connection", "Cancel", "Wi-Fi", "Settings")

    def online():
        person.setting("memory/connection/type", "wifi")
        person.share(second)
        folders(person, "Photos")
        check(not person.find("No network connection"), "the message is still there")

    def done():
        person.choose()
        person.finished("2 files", "Upload complete")
        person.sees("first.txt", "second.txt")

    tour.step("a share without a network: the message with its buttons", offline)
    tour.step("connected and shared again: the folders alone", online)
    tour.step("Done uploads both", done)
    tour.step("both are told and stored", tour.left, {"first.txt": first, "second.txt": second})


def icon(tour):
    person = tour.person
    path = person.file("one.txt")

    def start():
        person.tap_icon()
        person.sees("Storage usage")

    def share():
        person.share(path)
        folders(person, "Photos")

    def done():
        person.choose()
        person.finished("one.txt", "Upload complete")

    def back_to_settings():
        person.raise_window()
        person.key("Escape")
        wait_for("the settings", lambda: person.find("Storage usage") and not person.find("one.txt"))

    tour.step("started by its icon, it shows the settings", start)
    tour.step("a share shows the folders alone", share)
    tour.step("Done uploads", done)
    tour.step("Back leads to the settings", back_to_settings)
    tour.step("the sender is told, the file is stored", tour.left, {"one.txt": path})


def icon_in_a_run(tour, dismiss):
    person = tour.person
    files = {name: person.file(name, size=size) for name, size in (("first.bin", BIG), ("second.txt", 900))}

    def begin():
        person.upload(*files.values())
        person.notified("0 / 2", ongoing=True)
        person.sees(*files)

    def tap():
        person.tap_icon()
        person.raise_window()
        stays("the uploads", lambda: any("\tongoing\t" in line for line in person.notifications()), 0.5)

    def gone():
        told = dismiss(person)
        stays("the application", lambda: person.application.poll() is None)
        person.raise_window()
        person.sees("Velora uploads", *files)
        person.notified("0 / 2", ongoing=True)
        return told

    def ends():
        person.hurry()
        person.finished("2 files", "Upload complete")

    tour.step("two files are under way", begin)
    tour.step("a tap on the icon", tap)
    tour.step("what it shows is dismissed, the uploads are there", gone)
    tour.step("they come to their end", ends)
    tour.step("the sender is told, both are stored", tour.left, files)


def back(person):
    person.key("Escape")


def ok(person):
    if not person.find("OK", "Elm_Button"):
        return "there was no OK"
    return person.click("OK", "Elm_Button")


def icon_back(tour):
    icon_in_a_run(tour, back)


def icon_ok(tour):
    icon_in_a_run(tour, ok)


HELD = {"service": SLOW}
WAYS = {"late": (late, HELD), "cancel-late": (cancel_late, HELD), "remove-late": (remove_late, HELD),
        "retry-late": (retry_late, {"service": (*SLOW, "--fail", "1:503")}),
        "full-late": (full_late, {"service": (*SLOW, "--quota", "3000000")}),
        "connect": (connect, {}), "icon": (icon, {}), "icon-back": (icon_back, HELD), "icon-ok": (icon_ok, HELD)}
