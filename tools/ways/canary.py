"""A password and a token that are known: over a sign-in on the pages, an upload and a sign-out they appear in no log at
the highest verbosity, no argument, environment, name of a process or thread, window title, notification or file but the
client's own."""

import configparser
import os
import random
import subprocess
import threading
import time

from ways.settings import configure, remove, told_and_left
from ways.signin import NEW_EMAIL, add_account, allow, nothing_left, page, settings
from ways.steps import check, wait_for

SEEN_OF_PROCESSES = ("cmdline", "environ", "comm")
LOUD = {"DLOG_LEVEL": "verbose", "EINA_LOG_LEVEL": "4", "G_MESSAGES_DEBUG": "all"}


class Watch:
    """Everything that others of this machine, or a report of a crash, would see of the device's processes."""

    def __init__(self, person):
        self.person, self.seen, self.rounds, self.over = person, {}, 0, threading.Event()
        self.thread = threading.Thread(target=self._run, daemon=True)
        self.thread.start()

    def _run(self):
        while not self.over.is_set():
            for pid in self.person.left_over():
                threads = []
                try:
                    threads = [f"/proc/{pid}/task/{thread}/comm" for thread in os.listdir(f"/proc/{pid}/task")]
                except OSError:
                    pass
                for path in [f"/proc/{pid}/{name}" for name in SEEN_OF_PROCESSES] + threads:
                    try:
                        with open(path, "rb") as file:
                            self.seen.setdefault(file.read(), path)
                    except OSError:
                        pass  # it has ended
            titles = subprocess.run(["xdotool", "search", "--name", ".", "getwindowname", "%@"], env=self.person.env,
                                    capture_output=True, check=False).stdout
            self.seen.setdefault(titles, "the titles of the windows")
            self.rounds += 1
            time.sleep(0.05)

    def end(self):
        self.over.set()
        self.thread.join()
        return self.seen


def typed(person, label, words):
    """As a person types: on standard input, for the tool's own arguments are not the product's."""
    person.click(label, "page:field")
    wait_for(f"the focus in {label}", lambda: person.find(label, "page:focus"))
    person.run("xdotool", "type", "--delay", "12", "--file", "-", input=words.encode())


def loud(person):
    """Programs say all they can, and what they say on standard output, as GLib does, is in the log as well."""
    person.env.update(LOUD)
    plainly = person.start

    def start(command, **options):
        with open(person.log, "ab") as log:
            return plainly(command, **({"stdout": log} | options))
    person.start = start


def canary(tour):
    person = tour.person
    loud(person)
    path = person.file("one.txt")
    secrets = {"the password": f"canary-{random.randrange(10 ** 12):012}-im-wind"}
    credentials = os.path.join(person.env["PLATFORM_DATA_DIR"], "cloud", "Velora.credentials")
    posts, watch = tour.posts(), Watch(person)

    def sign_in():
        add_account(person)
        page(person, "Sign in", 60)
        person.click("Create an account", "page:link")
        page(person, "Create an account")
        typed(person, "E-mail address", NEW_EMAIL)
        typed(person, "Password", secrets["the password"])
        person.click("Create an account", "page:button")
        allow(person)
        person.sees("Storage usage", "Camera upload")
        file = configparser.ConfigParser(interpolation=None)
        file.read(credentials, encoding="utf-8")
        secrets["the token"] = file["Credentials"]["Secret"]
        check(len(secrets["the token"]) > 20, "the token is not where it is looked for")
        check(not files_with(secrets["the password"]), f"the password is in {files_with(secrets['the password'])}")
        check(files_with(secrets["the token"]) == [credentials], f"the token is in {files_with(secrets['the token'])}")
        settings(person)
        return person.ends()

    def files_with(secret):
        found = []
        for folder, _, names in os.walk(person.home):
            for name in names:
                try:
                    with open(os.path.join(folder, name), "rb") as file:
                        if secret.encode() in file.read():
                            found.append(os.path.join(folder, name))
                except OSError:
                    pass  # it is gone, or a socket
        return found

    def upload():
        person.share(path)
        person.sees("Upload to")
        person.click("Done", "Elm_Button")
        person.finished("one.txt", "Upload complete")
        person.leave()

    def sign_out():
        configure(person)
        remove(person)
        told_and_left(person)
        return nothing_left(person)

    def silent():
        seen = watch.end()
        check(watch.rounds > 20 and len(seen) > 20, f"only {watch.rounds} looks at {len(seen)} texts")
        log = os.path.getsize(person.log)
        check(log > 100_000, f"the log has only {log} bytes")
        for name, secret in secrets.items():
            found = [where for text, where in seen.items() if secret.encode() in text] + files_with(secret)
            check(not found, f"{name} is in {sorted(set(found))!r}")
            check(secret not in posts(), f"{name} is in a notification")
        return f"{watch.rounds} looks at {len(seen)} texts, {log >> 10} KiB of log"

    tour.step("registered and signed in on the pages", sign_in)
    tour.step("a file is uploaded", upload)
    tour.step("signed out", sign_out)
    tour.step("password and token are nowhere", silent)


WAYS = {"canary": (canary, {"account": False, "service": ("--log", "--log-sql")})}
