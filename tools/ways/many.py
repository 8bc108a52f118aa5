"""Many files."""

import os
import re
import threading
import time

from ways.steps import check, wait_for


def many(tour):
    person = tour.person
    person.service.terminate()
    person.service.wait()
    top = os.path.join(person.data, "files", "demo@velora.example")
    os.makedirs(os.path.join(top, "Many"), exist_ok=True)
    with open(tour.image("one.jpg"), "rb") as file:
        picture = file.read()
    for number in range(10_000):
        name = f"{number:05}.jpg" if number < 20 else f"{number:05}.txt"
        with open(os.path.join(top, "Many", name), "wb") as file:
            file.write(picture if number < 20 else b"text")
    for number in range(500):
        os.makedirs(os.path.join(top, "Wide", f"folder {number:03}"))
    begun = time.monotonic()
    person.start_service()
    ready = time.monotonic() - begun

    def browse():
        begun = time.monotonic()
        person.share(person.file("one.txt"))
        person.sees("Many", "Wide", seconds=180)
        return f"service ready after {ready:.1f} s, folders after {time.monotonic() - begun:.1f} s"

    def enter(folder, expected):
        person.click(folder)
        begun = time.monotonic()
        wait_for(f'"{expected}"', lambda: person.find(expected), 60, 0.01)
        return f"{(time.monotonic() - begun) * 1000:.0f} ms from tap to list"

    def scroll(last):
        pauses = []
        over = threading.Event()

        def probe():
            while not over.is_set():
                asked = time.monotonic()
                person.visible()
                pauses.append(time.monotonic() - asked)
        prober = threading.Thread(target=probe)
        person.run("xdotool", "mousemove", "240", "500")
        prober.start()
        try:
            for _ in range(10):
                person.run("xdotool", "click", "--repeat", "40", "--delay", "10", "5")
        finally:
            over.set()
            prober.join()
        begun = time.monotonic()
        rows = sorted(wait_for("rows after scrolling", lambda: [text for _, text, *_ in person.visible()
                                                                if re.fullmatch(last, text)]))
        settled = time.monotonic() - begun
        pauses.sort()
        return (f"longest without an answer {pauses[-1] * 1000:.0f} ms, median {pauses[len(pauses) // 2] * 1000:.0f} "
                f"ms of {len(pauses)}; rows {settled * 1000:.0f} ms after the last turn; shows {rows[0]} to {rows[-1]}")

    def thumbnails():
        """The middle of the first row's icon has the picture's colours, not one."""
        _, _, _, y, _, height = person.find("00000.jpg")
        file = os.path.join(person.home, "row.png")

        def coloured():
            person.run("import", "-window", "root", "-crop", f"40x{height}+24+{y}", file)
            return int(person.run("identify", "-format", "%k", file)) > 20
        wait_for("a thumbnail of many colours", coloured, 10)

    def back():
        person.raise_window()
        person.click("Velora")
        person.sees("Wide")

    def left():
        person.click("Cancel", "Elm_Button")
        person.ends()

    tour.step("the cloud's folders are there", browse)
    tour.step("10,000 files", enter, "Many", "00000.jpg")
    tour.step("thumbnails", thumbnails)
    tour.step("scrolling 10,000 files", scroll, r"\d{5}\.(?:jpg|txt)")
    tour.step("back by the path bar", back)
    tour.step("500 folders", enter, "Wide", "folder 000")
    tour.step("scrolling 500 folders", scroll, r"folder \d{3}")
    tour.step("left", left)


def hundred_thousand(tour):
    person = tour.person
    paths = [person.file(f"{number}.txt") for number in range(10)]
    paths += [f"/m/{number}" for number in range(100_000 - len(paths))]  # missing, and short enough for a command line

    def share():
        person.application = person.start_application()
        begun = time.monotonic()
        person.share(*paths)
        person.sees("Photos", "Upload to", seconds=200)
        took = time.monotonic() - begun
        check(took < 5, f"the page was there after {took:.1f} s")
        return f"the page was there {took:.1f} s after the start of the sender"

    def leave():
        begun = time.monotonic()
        person.click("Cancel", "Elm_Button")
        person.ends()
        return f"{time.monotonic() - begun:.1f} s"

    tour.step("the page for 100,000 files", share)
    tour.step("Cancel leaves", leave)


WAYS = {"many": (many, {}), "hundred-thousand": (hundred_thousand, {})}
