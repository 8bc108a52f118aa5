"""A person with a device who shares files: what the scenarios do, and what must hold after each of them."""

import hashlib
import os
import re
import subprocess
import sys

sys.path.insert(0, os.path.join(os.path.dirname(os.path.abspath(__file__)), "..", "..", "..", "tools"))
from device import Device, Trouble, wait_for  # noqa: E402

FOLDER = "/Photos"
PACKAGE = "com.orvant.velora-share"
# What EFL, the compiler's run-time checks and the C library print when something is wrong in a program.
# Not EFL's regret that the last widget of a window that could have the focus goes, nor that Edje keeps the parts of
# themes that are gone in its list of those that follow a size class.
# Nor what the web engine's processes say when their connections go with them.
FAULTS = re.compile(r"^(?!\(WebKit)(?:(?:ERR|CRI)<\d+>(?!.*Could not fetch a node located|.*efl_observer_update\(\)).*|.*AddressSanitizer.*|.*LeakSanitizer.*|.*ThreadSanitizer.*|.*runtime error:.*"
                    r"|.*CRITICAL \*\*.*|free\(\).*|malloc.*corrupt.*|terminate called.*)$", re.M)


class Failure(Exception):
    """Something that must hold does not."""


def check(holds, words):
    if not holds:
        raise Failure(words)


def digest(data):
    return hashlib.sha256(data).hexdigest()


class Person(Device):
    def __init__(self, build, account=True, service=(), **options):
        super().__init__(build, **options)
        self.folder = os.path.join(self.home, "files")
        os.mkdir(self.folder)
        self.application = None
        self.request = None
        self.requests = []  # of all who shared
        self.replies = {}
        try:
            self.start_service(*service)
            self.make_folder(FOLDER)
            if account:
                self.sign_in()
            self.start_display()
            self.start_bus()
            self.start_notification_daemon(in_sight=False)
            self.setting("memory/connection/type", "wifi")
        except Exception:
            self.end()
            raise

    def file(self, name, content=None, size=None):
        """Makes a file to share; its path. A name may have folders."""
        path = os.path.join(os.fsencode(self.folder), os.fsencode(name))
        os.makedirs(os.path.dirname(path), exist_ok=True)
        with open(path, "wb") as file:
            file.write(os.urandom(size) if size is not None else content if content is not None
                       else b"content of " + os.fsencode(name))
        return path

    # doing

    def share(self, *files):
        if not self.application or self.application.poll() is not None:
            self.application = self.start_application()
        arguments = ["--array", "http://orvant.com/appcontrol/data/path", *files] if files else []
        self.request = self.launch("multi_share", *arguments)
        self.requests.append(self.request)

    def tap_icon(self):
        """Starts the application as its icon does, without an operation, or tells the one that runs."""
        tap = self.start([self.program("src/setting/main/velora")])
        if self.application and self.application.poll() is None:
            wait_for("the running application to be told", lambda: tap.poll() is not None)
        else:
            self.application = tap
            wait_for("the application on the bus", lambda: self.is_on_bus("com.orvant.velora") or tap.poll() is not None)

    def choose(self, folder="Photos"):
        """Opens the folder and presses Done."""
        self.click(folder)
        self.sees("Done", folder, "Velora")
        self.click("Done", "Elm_Button")

    def upload(self, *files):
        self.share(*files)
        self.choose()

    def retry(self, name):
        """Taps a failed file's row and has it uploaded again."""
        self.raise_window()
        self.click(name)
        self.sees("File not uploaded")
        self.click("Upload", "Elm_Button")

    def leave(self):
        """Leaves with the back key, from wherever the window is."""
        self.raise_window()
        self.key("Escape")
        return self.ends()

    # seeing

    def texts(self):
        texts = [text for _, text, *_ in self.visible()]
        check(not any("IDS_" in text for text in texts), f"a text without its translation: {texts!r}")
        return texts

    def sees(self, *texts, seconds=20):
        """Waits until each of the texts is part of one on the screen."""
        seen = []

        def all_there():
            seen[:] = self.texts()
            return all(any(text in one for one in seen) for text in texts)
        try:
            wait_for("", all_there, seconds)
        except Trouble:
            raise Failure(f"{texts!r} is not on the screen, which shows {seen!r}") from None

    def notified(self, *words, ongoing=False, seconds=60):
        """Waits for a notification with these words."""
        kind = "\tongoing\t" if ongoing else "\tnormal\t"
        lines = []

        def there():
            lines[:] = self.notifications()
            return next((line for line in lines if kind in line and all(word in line for word in words)), None)
        try:
            return wait_for("", there, seconds)
        except Trouble:
            raise Failure(f"no notification with {words!r}: {lines!r}") from None

    def finished(self, *words, seconds=60):
        """Waits for the result of the run, and for the ongoing notification to be gone."""
        self.notified(*words, seconds=seconds)
        try:
            wait_for("", lambda: not any("\tongoing\t" in line for line in self.notifications()), 10)
        except Trouble:
            raise Failure("the run is over, but its ongoing notification stays") from None

    def halves(self):
        """The files that the service is receiving: their sizes in bytes."""
        with os.scandir(os.path.join(self.data, "tmp")) as files:
            sizes = []
            for file in files:
                try:
                    sizes.append(file.stat().st_size)
                except FileNotFoundError:
                    pass
            return sizes

    def on_its_way(self):
        """Waits until the service has some of a large file: what comes first is the client's question how it keeps files."""
        wait_for("bytes on their way", lambda: any(size >= 1 << 16 for size in self.halves()))

    # what must hold

    def ends(self, status=0):
        """The application has ended well, and who asked was answered."""
        try:
            ended = self.application.wait(20)
        except subprocess.TimeoutExpired:
            raise Failure(f"the application does not end; it shows {self.texts()!r}") from None
        check(ended == status, f"the application ended with {ended}")
        return self.reply(self.request)

    def reply(self, request):
        """What the sender of a request was told; it must have been told by now."""
        if request not in self.replies:
            try:
                request.wait(10)
            except subprocess.TimeoutExpired:
                raise Failure("a request is not answered") from None
            self.replies[request] = request.stdout.read().decode(errors="replace").strip()
        return self.replies[request]

    def all_succeeded(self):
        """Everyone who shared was told so."""
        replies = [self.reply(request) for request in self.requests]
        check(all("SUCCEEDED" in reply for reply in replies), f"the replies are {replies!r}")

    def has_stored(self, expected):
        """The service has these files and nothing else: {cloud path: local path or content}."""
        def is_temporary(path):
            return os.path.basename(path).startswith(".velora-")
        wait_for("the client to clear away", lambda: not any(is_temporary(path) for path in self.all_files()), 10)
        there = {os.fsencode(path) for path in self.all_files()}
        wanted = {os.fsencode(os.path.join(FOLDER, os.fsdecode(name))): source for name, source in expected.items()}
        more, less = sorted(there - set(wanted)), sorted(set(wanted) - there)
        check(not more and not less, f"stored are also {len(more)} {more[:20]!r}, missing are {len(less)} {less[:20]!r}")
        for path, source in wanted.items():
            if isinstance(source, bytes) and source.startswith(os.fsencode(self.home)):
                with open(source, "rb") as file:
                    source = file.read()
            with self.get(os.fsdecode(path)) as stored:
                check(digest(stored.read()) == digest(source), f"{path!r} is not what was sent")
        half = self.halves()
        check(not half, f"half a file is left in the service: {half!r} bytes")

    def holds(self):
        """Nothing crashed or complained, and no notification claims that something is still under way."""
        if self.application and self.application.poll() not in (None, 0, -9):
            raise Failure(f"the application ended with {self.application.poll()}")
        with open(self.log, encoding="utf-8", errors="replace") as log:
            faults = FAULTS.findall(log.read())
        check(not faults, "in the log: " + "; ".join(sorted(set(faults))[:5]))
        stays = [line for line in self.notifications() if "\tongoing\t" in line]
        check(not stays, f"this notification stays: {stays!r}")
