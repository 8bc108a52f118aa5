"""The demo behind tools/run: a service, a signed-in device, and a share that a person or the pointer completes."""

import argparse
import hashlib
import os
import re
import signal
import subprocess
import sys
import tempfile
import time

sys.path.insert(0, os.path.dirname(os.path.abspath(__file__)))
import first_boot as wizard_page  # noqa: E402
from device import APP, PASSWORD, Device, Trouble, wait_for  # noqa: E402
from ways import signin as service  # noqa: E402

OPERATION = "multi_share"
NEW_EMAIL = "new.person@velora.example"
CREATE, WIFI_ONLY, ENABLE, NEXT = "Create new account", "Wi-Fi only", "Enable camera upload", "Next"
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
        if os.stat(self.folder).st_uid != os.getuid():  # somebody else took the name
            self.folder = tempfile.mkdtemp(prefix="velora-pictures-")
        for old in os.listdir(self.folder):
            os.unlink(os.path.join(self.folder, old))

    def take_at(self, name, button):
        """Once this button is there and the page has come to rest."""
        wait_for(f'"{button}"', lambda: self.device.find(button, "Elm_Button"), 60)
        time.sleep(0.6)
        self.take(name)

    def take(self, name):
        self.count += 1
        name = re.sub(r"[^\w.-]+", "-", printable(name)).strip("-")[:60]
        self.device.picture(os.path.join(self.folder, f"{self.count}-{name}.png"))


def show_progress(line):
    _, kind, title, content, percent = line.split("\t")
    say(f"  notification: {printable(title)}  {printable(content)}" + (f"  {percent}%" if kind == "ongoing" else ""))


def follow_upload(device, pictures, application, launch):
    """Shows the ongoing notification move until the result is there."""
    told, moments = None, ["uploading-as-a-notification", "uploading-as-a-list"] if pictures else []
    end = time.monotonic() + 3600
    stuck = time.monotonic() + 120 if pictures else end
    while time.monotonic() < min(end, stuck):
        lines = device.notifications()
        ongoing = next((line for line in lines if "\tongoing\t" in line), None)
        result = next((line for line in lines if "\tnormal\t" in line), None)
        if ongoing and ongoing != told:
            told, stuck = ongoing, time.monotonic() + 120 if pictures else end
            show_progress(ongoing)
            if moments:
                pictures.take(moments.pop(0))
                device.raise_window()
        if result and not ongoing:
            show_progress(result)
            return
        if launch.poll() is not None or application.poll() is not None:
            return  # left before the files were up
        time.sleep(0.05)
    raise Trouble("the uploads do not come to an end")


def operate(device, pictures, folder):
    """What a person would do up to Done: walk to the folder."""
    segments = [segment for segment in folder.split("/") if segment]
    wait_for("the folders of the account", lambda: device.find(segments[0] if segments else "Done"), 30)
    pictures.take("folders-of-the-account")

    def enter(segment, words):
        device.click(segment)
        # The path bar shows it, and the row that was tapped is gone.
        wait_for(f'the folder "{segment}"', lambda: device.find("Done", "Elm_Button"), 10)
        time.sleep(0.6)
        pictures.take(f"{words}-{segment}")
    for segment in segments:
        enter(segment, "folder")
    above = (["Velora"] + segments)[-2:-1]
    if len(segments) > 1 and segments.count(above[0]) == 1:  # one step back by the path bar, as who has gone too far
        enter(above[0], "path-bar")
        enter(segments[-1], "folder-again")
    device.click("Done", "Elm_Button")


def escaped(path):
    """A path as the log writes it."""
    shown = os.fsencode(path).decode(errors="surrogateescape").replace("\n", "\\n").replace("\t", "\\t")
    return re.sub(r"[\0-\x1f\x7f]", lambda control: f"\\x{ord(control[0]):02x}", shown)


def report(device, files, before):
    """One line per file; true when each is on the server, byte for byte."""
    with open(device.log, encoding="utf-8", errors="surrogateescape") as log:
        errors = {path: int(code) for code, path in re.findall(r"upload failed\[(\d+)\]: \[(.*)\]$", log.read(), re.M)}
    places = {}
    for stored, place in sorted(device.stored_files().items()):
        if stored not in before:
            with open(stored, "rb") as stream:
                places.setdefault(digest(stream), []).append(place)
    whole = True
    for path in files:
        error = errors.get(escaped(path))
        found = None
        if not error:
            try:
                with open(path, "rb") as stream:
                    found = places.get(digest(stream))
            except OSError:
                pass
        if found:
            say(f"uploaded {printable(path)} -> {printable(found.pop(0))}")
            continue
        whole = False
        reason = REASONS.get(error) or ("not sent: the storage is full" if 26 in errors.values() else "not sent")
        say(f"failed {printable(path)}: {reason}")
    return whole


def leave(device, pictures):
    if device.raise_window():
        time.sleep(0.5)
        pictures.take("result")
        device.key("Escape")


def first_boot(device, pictures):
    """The first-boot wizard comes to the application's page; headless, an account is made there."""
    say("wizard  page 2 of 3 is Velora's")
    if not pictures:
        say("        make an account there: any address and any password of 8 characters and more will do")
    application = device.start_application()
    wizard = device.start([device.program("platform/app/velora-launch"), *wizard_page.REQUEST], stdout=subprocess.PIPE)
    if pictures:
        pictures.take_at("welcome", CREATE)
        device.click(CREATE, "Elm_Button")
        service.page(device, "Create an account")
        pictures.take("register")
        service.fill(device, "E-mail address", NEW_EMAIL)
        service.fill(device, "Password", PASSWORD)
        device.click("Create an account", "page:button")
        service.page(device, "Connect this device?")
        pictures.take("connect-this-device")
        device.click("Allow", "page:button")
        pictures.take_at("camera-upload", ENABLE)
        device.click(WIFI_ONLY)
        device.click(ENABLE, "Elm_Button")
        pictures.take_at("camera-upload-enabled", NEXT)
        device.click(NEXT, "Elm_Button")
    wizard.wait()
    for line in wizard_page.told(wizard.stdout.read().decode().strip()):
        say(line)
    application.wait(30)


def last_things(device, pictures):
    """The account's settings, and its removal."""
    application = device.start_application()
    settings = device.launch("account/configure")
    wait_for("the size of the storage", lambda: any(" / " in text for _, text, *_ in device.visible()))
    pictures.take("settings")
    device.click("More options", "Elm_Button")
    device.click("Remove")
    wait_for("the question", lambda: device.find("Cancel", "Elm_Button"))
    pictures.take("remove-account")
    device.click("Remove", "Elm_Button")
    pictures.take_at("signed-out", "OK")
    device.click("OK", "Elm_Button")
    application.wait(30)
    settings.wait(30)
    say("removed the account from this phone; its files are still in the cloud")


def prepare(device, folder, headless, new_phone):
    """The service with the account, the display and the bus."""
    # In pictures the uploads of small files would be over before they can be seen.
    device.start_service(*(["--delay", "60"] if headless else []))
    say(f"velora-cloud: {device.web}/  files: {device.data}/files")
    if not new_phone:
        for place in ("/Documents", "/Photos/Holidays", "/Photos/Family & friends", folder):
            device.make_folder(place)
        device.sign_in()
    if headless:
        device.start_display()
    if headless or "DBUS_SESSION_BUS_ADDRESS" not in device.env or device.is_on_bus(APP):
        device.start_bus()
        device.start_notification_daemon()
    # The service is on this machine, network or not.
    device.setting("memory/connection/type", "ethernet")


def main():
    parser = argparse.ArgumentParser()
    parser.add_argument("--build", required=True)
    parser.add_argument("--data")
    parser.add_argument("--to")
    parser.add_argument("--headless", action="store_true")
    parser.add_argument("--new-phone", action="store_true")
    parser.add_argument("files", nargs="*")
    options = parser.parse_args()
    folder = options.to or ("/" if options.new_phone else "/Photos/Holidays")  # a new account has no folders

    # However it is ended, nothing stays behind.
    for number in (signal.SIGTERM, signal.SIGHUP):
        signal.signal(number, lambda *_: sys.exit(1))
    device = Device(os.path.abspath(options.build), options.data, keep_display=not options.headless,
                    secure=True)
    try:
        if not options.headless and not device.has_display():
            say("no window can be opened on this display; using a virtual one")
            device.end()
            options.headless = True
            device = Device(os.path.abspath(options.build), options.data, secure=True)
        prepare(device, folder, options.headless, options.new_phone)
        files = [os.path.abspath(file) for file in options.files] or sample_pictures(device)
        before = set(device.stored_files())
        pictures = Pictures(device) if options.headless else None
        if options.new_phone:
            first_boot(device, pictures)
        application = device.start_application()
        say(f"sharing {len(files)} file{'s' if len(files) != 1 else ''} to "
            + (folder if options.headless else "your choice"))
        launch = device.launch(OPERATION, "--array", PATHS, *files)
        if pictures:
            operate(device, pictures, folder)
            follow_upload(device, pictures, application, launch)
            leave(device, pictures)
            launch.wait(30)
        else:
            say("the window is open: choose a folder and press Done; leave it with Back (Escape) when the files are up")
            follow_upload(device, None, application, launch)
            launch.wait()
        whole = report(device, files, before)
        say(launch.stdout.read().decode().strip() or "no reply")
        if pictures and options.new_phone:
            last_things(device, pictures)
        if pictures:
            say(f"pictures: {pictures.folder}")
        return 0 if whole and launch.returncode == 0 else 1
    except (Trouble, OSError, subprocess.SubprocessError) as trouble:
        say(f"tools/run: {trouble}")
        if os.path.exists(device.log):
            number, keep = tempfile.mkstemp(prefix="velora-log-", suffix=".txt")
            with open(device.log, "rb") as log, open(number, "wb") as copy:
                copy.write(log.read())
            say(f"log: {keep}")
        return 1
    except KeyboardInterrupt:
        return 130
    finally:
        device.end()


sys.exit(main())
