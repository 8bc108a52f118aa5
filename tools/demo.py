"""The demo behind tools/run: a service, a signed-in device, and a share that a person or the pointer completes."""

import argparse
import hashlib
import os
import re
import sys
import tempfile
import time

sys.path.insert(0, os.path.dirname(os.path.abspath(__file__)))
from device import APP, Device, Trouble, wait_for  # noqa: E402

OPERATION = "multi_share"
PATHS = "http://orvant.com/appcontrol/data/path"
REASONS = {  # the client's error codes, as in cloud_content_sync.h
    20: "the service cannot be reached", 21: "the service refuses the account", 22: "the service failed",
    23: "missing, unreadable or not a regular file", 24: "what is stored is not what was sent",
    25: "the service refuses the file", 26: "the storage is full", 27: "the service cannot store this name",
    28: "the file changed while it was sent",
}


def say(text):
    print(text, flush=True)


def printable(path):
    """A file name on one line of a terminal, whatever bytes it holds."""
    shown = os.fsencode(path).decode(errors="backslashreplace")
    return "".join(c if c.isprintable() else c.encode("unicode_escape").decode() for c in shown)


def digest(stream):
    total = hashlib.sha256()
    while block := stream.read(1 << 20):
        total.update(block)
    return total.hexdigest()


def sample_pictures(device):
    folder = os.path.join(device.home, "pictures")
    os.makedirs(folder)
    for name, colours in (("harbour.jpg", "#20415f-#f6b26b"), ("meadow.jpg", "#2f6b3c-#f4f0c0"),
                          ("rooftops & chimneys.png", "#6b2f2f-#d0d8e8")):
        device.run("convert", "-size", "1200x900", f"gradient:{colours}", "-attenuate", "0.4", "+noise", "Gaussian",
                   os.path.join(folder, name))
    return [os.path.join(folder, name) for name in sorted(os.listdir(folder))]


class Pictures:
    def __init__(self, device):
        self.device, self.count = device, 0
        self.folder = os.path.join(tempfile.gettempdir(), f"velora-pictures-{os.getuid()}")
        os.makedirs(self.folder, mode=0o700, exist_ok=True)
        for old in os.listdir(self.folder):
            os.unlink(os.path.join(self.folder, old))

    def take(self, name):
        self.count += 1
        self.device.picture(os.path.join(self.folder, f"{self.count}-{name}.png"))


def follow_upload(device, pictures, count):
    """Shows the ongoing notification move until the result is there."""
    seen, shots = "", 0
    end = time.monotonic() + 600
    while time.monotonic() < end:
        lines = device.notifications()
        ongoing = next((line for line in lines if "\tongoing\t" in line), None)
        if ongoing and ongoing != seen:
            seen = ongoing
            say("  notification: " + printable(ongoing.split("\tongoing\t")[1].replace("\t", "  ")))
            if shots == 0:
                pictures.take("uploading-notification")
                # Back to the application, by a tap on its ongoing notification.
                device.tool("platform/notification/notifications", "tap", "com.orvant.velora-share",
                            ongoing.split("\t")[0])
                shots = 1
            elif shots == 1 and count > 1:
                pictures.take("uploading-queue")
                shots = 2
        result = next((line for line in lines if "\tnormal\t" in line), None)
        if result and not ongoing:
            say("  notification: " + printable(result.split("\tnormal\t")[1].replace("\t", "  ")))
            return
        time.sleep(0.1)
    raise Trouble("the uploads do not come to an end")


def operate(device, pictures, folder, count):
    """What a person would do: walk to the folder, press Done, watch, and leave."""
    first, *others = folder.strip("/").split("/") if folder.strip("/") else [None]
    if first:
        wait_for("the folders of the account", lambda: device.find(first), 30)
    else:
        wait_for("the folder browser", lambda: device.find("Done"), 30)
    pictures.take("folder-browser")
    for segment in [first, *others] if first else []:
        device.click(segment)
        time.sleep(0.6)
        pictures.take("folder-opened")
    device.click("Done")
    follow_upload(device, pictures, count)
    device.run("xdotool", "search", "--sync", "--onlyvisible", "--name", "^velora$", "windowactivate")
    time.sleep(0.5)
    pictures.take("result")
    device.key("Escape")


def report(device, folder, files, before):
    """One line per file; true when each is on the server, byte for byte."""
    with open(device.log, encoding="utf-8", errors="surrogateescape") as log:
        errors = {path: int(code) for code, path in re.findall(r"upload failed\[(\d+)\]: \[(.*?)\]\033", log.read())}
    places = {}
    for place in sorted(device.all_files() - before):
        with device.get(place) as stream:
            places.setdefault(digest(stream), []).append(place)
    whole = True
    for path in files:
        try:
            with open(path, "rb") as stream:
                found = places.get(digest(stream))
        except OSError:
            found = None
        if found:
            say(f"uploaded {printable(path)} -> {printable(found.pop(0))}")
            continue
        whole = False
        say(f"failed {printable(path)}: {REASONS.get(errors.get(path), 'not on the server')}")
    return whole


def main():
    parser = argparse.ArgumentParser()
    parser.add_argument("--build", required=True)
    parser.add_argument("--data")
    parser.add_argument("--to")
    parser.add_argument("--headless", action="store_true")
    parser.add_argument("files", nargs="*")
    options = parser.parse_args()
    folder = options.to or "/Photos/Holidays"

    device = Device(os.path.abspath(options.build), options.data, keep_display=not options.headless)
    try:
        # In pictures the uploads of small files would be over before they can be seen.
        device.start_service(*(["--delay", "40"] if options.headless else []))
        say(f"velora-cloud: {device.web}/  files: {device.data}/files")
        for place in ("/Documents", "/Photos/Holidays", "/Photos/Family & friends"):
            device.make_folder(place)
        if folder.strip("/"):
            device.make_folder(folder)
        device.sign_in()
        if options.headless:
            device.start_display()
            device.start_bus()
            device.start_notification_daemon()
        elif "DBUS_SESSION_BUS_ADDRESS" not in device.env:
            device.start_bus()
        if device.tool("platform/vconf/settings-store", "list").find("memory/connection/type") < 0:
            device.setting("memory/connection/type", "ethernet")  # the service is on this machine, network or not
        files = [os.path.abspath(file) for file in options.files] or sample_pictures(device)
        before = device.all_files()
        device.start([device.program("src/setting/main/velora"), "--service"])
        say(f"sharing {len(files)} file{'s' if len(files) != 1 else ''} to {folder if options.headless else 'your choice'}")
        wait_for("the application on the bus", lambda: APP in device.run(
            "gdbus", "call", "--session", "--dest", "org.freedesktop.DBus", "--object-path", "/", "--method",
            "org.freedesktop.DBus.ListNames"))
        launch = device.launch(OPERATION, "--array", PATHS, *files)
        pictures = Pictures(device) if options.headless else None
        if pictures:
            operate(device, pictures, folder, len(files))
            launch.wait(30)
        else:
            say("the window is open: choose a folder and press Done; leave it with Back when the files are up")
            launch.wait()
        whole = report(device, folder, files, before)
        say(launch.stdout.read().decode().strip() or "no reply")
        if pictures:
            say(f"pictures: {pictures.folder}")
        return 0 if whole and launch.returncode == 0 else 1
    except Trouble as trouble:
        say(f"tools/run: {trouble}")
        keep = os.path.join(tempfile.gettempdir(), f"velora-log-{os.getuid()}.txt")
        if os.path.exists(device.log):
            with open(device.log, "rb") as log, open(keep, "wb") as copy:
                copy.write(log.read())
            say(f"log: {keep}")
        return 1
    except KeyboardInterrupt:
        return 130
    finally:
        device.end()


sys.exit(main())
