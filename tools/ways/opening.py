"""What is in the cloud is opened."""

import os
import signal
import time
import urllib.parse
import urllib.request

from ways.steps import check, digest, stays, wait_for

NO_APPLICATION = "No application can perform this action!"


def install(person, id_, mime):
    """An application that writes down what it is asked to open."""
    record = os.path.join(person.home, id_ + ".opened")
    program = os.path.join(person.home, id_)
    with open(program, "w", encoding="utf-8") as file:
        file.write(f"#!/bin/sh\nprintf '%s\\n' \"$@\" >> '{record}'\n")
    os.chmod(program, 0o755)
    folder = person.env["ORVANT_APPS_DIR"] if id_.startswith("com.orvant.") else \
        os.path.join(person.env["XDG_DATA_HOME"], "applications")
    os.makedirs(folder, exist_ok=True)
    with open(os.path.join(folder, id_ + ".desktop"), "w", encoding="utf-8") as file:
        file.write(f"[Desktop Entry]\nType=Application\nName={id_}\nExec={program} %U\nMimeType={mime}\n")
    with open(os.path.join(person.env["XDG_CONFIG_HOME"], "mimeapps.list"), "a", encoding="utf-8") as file:
        if os.path.getsize(file.name) == 0:
            file.write("[Default Applications]\n")
        for one in mime.split(";") if mime else []:
            if one:
                file.write(f"{one}={id_}.desktop\n")

    def opened():
        try:
            with open(record, encoding="utf-8") as lines:
                return lines.read().split()
        except FileNotFoundError:
            return []
    return opened


def opens(tour):
    person = tour.person
    person.env["ORVANT_APPS_DIR"] = os.path.join(person.home, "players")
    apps = {"tour-pictures": "image/png;image/jpeg;", "tour-music": "audio/mpeg;", "tour-documents": "application/pdf;",
            "com.orvant.video-player-lite": "", "com.orvant.sound-player-lite": ""}
    opened = {id_: install(person, id_, mime) for id_, mime in apps.items()}
    seen = {}
    contents = {}
    with open(tour.image("picture.png"), "rb") as file:
        contents["picture.png"] = file.read()
    for name in ("clip.mp4", "tone.wav", "song.mp3", "paper.pdf", "odd.qqq"):
        contents[name] = os.urandom(70_000)
    for name, content in contents.items():
        person.put(f"/Photos/{name}", content)
    posts = tour.posts()
    scratch = os.path.join(person.env["VELORA_MEDIA_ROOT"], "Downloads/.com.orvant.docshelf/files/scratch")

    def browse():
        person.share(person.file("one.txt"))
        person.click("Photos")
        person.sees(*contents)

    def tap(name, id_):
        """Opens a file: what its application is asked for."""
        before = {other: len(read()) for other, read in opened.items()}
        person.raise_window()
        person.click(name)
        wait_for(f"{id_} to be asked", lambda: len(opened[id_]()) > before[id_])
        time.sleep(0.3)
        others = [other for other, read in opened.items() if other != id_ and len(read()) > before[other]]
        check(not others, f"{others} were asked as well")
        check(len(opened[id_]()) == before[id_] + 1, f"{id_} was asked more than once")
        wait_for("the popup to go", lambda: not person.find("Processing…"))
        return opened[id_]()[-1]

    def local(name, id_, folder=None):
        address = tap(name, id_)
        # The desktop hands over a path for an address of the file system.
        path = urllib.parse.unquote(address[7:]) if address.startswith("file:///") else address
        check(os.path.isabs(path), f"it was asked for {address}")
        with open(path, "rb") as copy:
            check(digest(copy.read()) == digest(contents[name]), "the copy is not the file")
        check(folder is None or os.path.realpath(path) == os.path.realpath(os.path.join(folder, name)),
              f"the copy lies at {path}")
        seen[name] = path

    def stream(name, id_):
        address = tap(name, id_)
        check(address.startswith(person.web), f"it was asked for {address}")
        with urllib.request.urlopen(address, timeout=20) as answer:
            check(digest(answer.read()) == digest(contents[name]), "the address gives something else")

    def nobody():
        person.click("odd.qqq")
        wait_for("the status message", lambda: NO_APPLICATION in posts())
        check(not person.find("Processing…"), "a popup shows")

    def second():
        person.service.kill()
        person.service.wait()
        person.setting("memory/connection/type", "none")
        local("picture.png", "tour-pictures")

    def refused():
        person.click("paper.pdf")
        person.sees("Wi-Fi")

    tour.step("the folder's files are there", browse)
    tour.step("a picture", local, "picture.png", "tour-pictures")
    tour.step("a video streams", stream, "clip.mp4", "com.orvant.video-player-lite")
    tour.step("a WAV streams", stream, "tone.wav", "com.orvant.sound-player-lite")
    tour.step("an MP3 is downloaded", local, "song.mp3", "tour-music", scratch)
    tour.step("a PDF is downloaded", local, "paper.pdf", "tour-documents", scratch)
    tour.step("nobody opens an unknown kind", nobody)
    tour.step("the picture opens again without service and network", second)
    tour.step("a document without a network asks for Wi-Fi", refused)


def processing(tour):
    """A file of the folder is asked for while the service hangs; the other end of both ways below."""
    person = tour.person
    person.env["ORVANT_APPS_DIR"] = os.path.join(person.home, "players")
    apps = {"tour-pictures": "image/png;", "tour-documents": "application/pdf;", "com.orvant.video-player-lite": ""}
    opened = {id_: install(person, id_, mime) for id_, mime in apps.items()}
    person.put("/Photos/paper.pdf", os.urandom(70_000))
    person.put("/Photos/clip.mp4", os.urandom(70_000))
    with open(tour.image("picture.png"), "rb") as file:
        person.put("/Photos/picture.png", file.read())

    def browse():
        person.share(person.file("one.txt"))
        person.click("Photos")
        person.sees("paper.pdf", "clip.mp4", "picture.png")
        stays("the list", lambda: person.find("paper.pdf"), 1)  # the refresh and the thumbnails are over

    def asks(name):
        person.service.send_signal(signal.SIGSTOP)
        person.click(name)
        person.sees("Processing…")

    def all_opened():
        return sum((read() for read in opened.values()), [])

    tour.step("the folder's files are there", browse)
    return asks, all_opened


def opening(tour):
    person = tour.person
    posts = tour.posts()
    asks, all_opened = processing(tour)

    def dies(name):
        before = posts().count("member=Notify")
        asks(name)
        person.service.kill()
        person.service.wait()
        wait_for("the popup to go", lambda: not person.find("Processing…"), 10)
        wait_for("a status message", lambda: posts().count("member=Notify") > before, 5)
        person.sees("paper.pdf", "Upload to")
        check(not all_opened(), f"it was opened: {all_opened()!r}")
        person.start_service()

    for name in ("paper.pdf", "clip.mp4", "picture.png"):
        tour.step(f"the service dies under {name}: the wait goes, a message says why", dies, name)


def opening_canceled(tour):
    person = tour.person
    asks, all_opened = processing(tour)

    def cancel(name):
        asks(name)
        title = person.find("Upload to")
        waits = wait_for("the wait's Cancel", lambda: [entry for entry in person.visible() if entry[:2] == (
            "Elm_Button", "Cancel") and entry[3] > title[3] + title[5]])
        _, _, x, y, width, height = waits[-1]
        person.run("xdotool", "mousemove", str(x + width // 2), str(y + height // 2), "click", "1")
        wait_for("the popup to go", lambda: not person.find("Processing…"), 5)
        person.service.send_signal(signal.SIGCONT)
        stays("nothing opened", lambda: not all_opened(), 2)
        check(not person.find("Processing…"), "the wait is there again")

    def again(name):
        person.click(name)
        wait_for("the file to open", all_opened)

    for name in ("paper.pdf", "clip.mp4", "picture.png"):
        tour.step(f"Cancel on {name}: nothing is opened", cancel, name)
    tour.step("a second tap opens it", again, "paper.pdf")


WAYS = {"opens": (opens, {}), "opening": (opening, {}), "opening-canceled": (opening_canceled, {})}
