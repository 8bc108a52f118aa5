"""Into a folder, with files taken out of the queue, tried again, or no room for all of them."""

from ways.steps import SLOW, check, stored, wait_for

FULL = "Unable to upload, not enough memory"


def upload(tour):
    person = tour.person
    for place in ("/Family/Winter", "/Family/Summer", "/Documents"):
        person.make_folder(place)
    files = {"harbour.jpg": tour.image("harbour.jpg"), "notes.txt": person.file("notes.txt"),
             "clip.mp4": person.file("clip.mp4", size=300_000), "song.mp3": person.file("song.mp3", size=200_000),
             "paper.pdf": person.file("paper.pdf", size=100_000)}

    def see_root():
        person.share(*files.values())
        person.sees("Family", "Documents", "Photos", "Upload to")

    def down():
        person.click("Family")
        person.sees("Winter", "Summer")
        person.click("Winter")
        person.sees("This folder is empty")

    def jump():
        person.click("Family")
        person.sees("Summer")
        check(person.find("Documents") is None, "the path bar led to another folder")
        person.click("Summer")
        person.sees("This folder is empty", "Family", "Summer")

    def done():
        person.click("Done", "Elm_Button")
        person.finished("5 files", "Upload complete")
        person.sees(*files)

    def left():
        reply = person.leave()
        check("SUCCEEDED" in reply, f"the reply is {reply!r}")
        person.has_stored({f"/Family/Summer/{name}": path for name, path in files.items()})
        return reply

    tour.step("the cloud's folders are there", see_root)
    tour.step("two folders down", down)
    tour.step("back one by the path bar, then down into the other", jump)
    tour.step("five files are uploaded", done)
    tour.step("left and answered, the files are stored", left)


def cancel(tour):
    person = tour.person
    files = {name: person.file(name, size=size) for name, size in
             (("running.bin", 40_000_000), ("waiting.txt", 900), ("third.txt", 900), ("fourth.txt", 900))}

    def begin():
        person.upload(*files.values())
        person.notified("0 / 4", ongoing=True)
        person.sees(*files)

    def waiting():
        tour.cancel_row("waiting.txt")
        check(person.find("running.bin"), "the running file went too")

    def running():
        tour.cancel_row("running.bin")
        person.finished("2 files", "Upload complete")

    def left():
        person.leave()
        stored(person, {name: files[name] for name in ("third.txt", "fourth.txt")})

    tour.step("four files are under way", begin)
    tour.step("a waiting file is cancelled by its x", waiting)
    tour.step("the running file is cancelled by its x", running)
    tour.step("only the other two are stored", left)


def remove(tour):
    person = tour.person
    files = {name: person.file(name, size=size) for name, size in
             (("running.bin", 40_000_000), ("second.txt", 900), ("third.txt", 900), ("fourth.txt", 900))}

    def menu():
        person.key("Menu")
        person.click("Remove")
        person.sees("Select All", "0 Selected")

    def begin():
        person.upload(*files.values())
        person.notified("0 / 4", ongoing=True)
        person.sees(*files)
        menu()

    def one():
        person.click("second.txt")
        person.sees("1 Selected")
        person.click("Done", "Elm_Button")
        person.sees("Velora uploads")
        wait_for("the row to go", lambda: not person.find("second.txt"))

    def everything():
        menu()
        person.click("Select All")
        person.sees("3 Selected")

    def stop():
        person.click("Done", "Elm_Button")
        person.sees("Stop 3 uploads?", "Stop")

    def stopped():
        person.click("Stop", "Elm_Button")
        wait_for("the rows to go", lambda: not any(person.find(name) for name in files))
        wait_for("the ongoing notification to go",
                 lambda: not any("\tongoing\t" in line for line in person.notifications()))

    def left():
        by_itself = person.application.poll() is not None
        person.ends() if by_itself else person.leave()
        stored(person, {})
        return "the application had left by itself" if by_itself else None

    tour.step("more menu, Remove", begin)
    tour.step("one file is selected and taken out", one)
    tour.step("Select All", everything)
    tour.step("Done asks first", stop)
    tour.step("Stop ends the queue", stopped)
    tour.step("nothing is stored", left)


def retry(tour):
    person = tour.person
    files = {name: person.file(name, size=size) for name, size in
             (("one.bin", 100_000), ("two.bin", 4_000_000), ("three.bin", 100_000))}

    def fails():
        person.upload(*files.values())
        person.notified("1 / 3", ongoing=True)
        person.service.kill()
        person.service.wait()
        person.finished("2 files", "Upload failed", seconds=90)
        person.sees("two.bin", "Upload failed · No connection")

    def ask():
        person.raise_window()
        person.click("two.bin")
        person.sees("File not uploaded", "Tap Upload to try again.")

    def again():
        person.start_service()
        person.click("Upload", "Elm_Button")
        person.finished("two.bin", "Upload complete")

    def by_keys():
        """The popup's buttons: Cancel has the focus at first."""
        person.raise_window()
        for choice in ("Cancel", "Upload"):
            tour.go_to("three.bin")
            person.key("Return")
            person.sees("File not uploaded")
            tour.go_to(choice, ("Up", "Down"))
            person.key("Return")
            wait_for("the popup to go", lambda: not person.find("File not uploaded"))
        person.finished("three.bin", "Upload complete")

    def left():
        person.leave()
        person.has_stored(files)

    tour.step("the service dies, two files fail", fails)
    tour.step("a tap on the failed row asks", ask)
    tour.step("the service is back, Upload tries again", again)
    tour.step("the other one by keys, refused first", by_keys)
    tour.step("all files are stored", left)


def full(tour):
    person = tour.person
    first, *others = [person.file(name, size=60_000) for name in ("1", "2", "3", "4", "5")]
    posts = tour.posts()

    def begin():
        person.upload(first, *others)
        person.finished("4 files", "Upload failed")

    def message():
        wait_for("the status message", lambda: FULL in posts())

    def ends():
        reply = person.ends()
        check(reply, "no reply")
        person.has_stored({"1": first})
        return reply

    tour.step("the notification counts four files", begin)
    tour.step("the status message is posted", message)
    tour.step("the application ends, its caller is answered", ends)


WAYS = {"upload": (upload, {}), "cancel": (cancel, {"service": SLOW}), "remove": (remove, {"service": SLOW}),
        "retry": (retry, {"service": SLOW, "wait_limit": 1}), "full": (full, {"service": ("--quota", "100000")})}
