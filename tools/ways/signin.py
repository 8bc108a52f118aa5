"""Signing in on the service's pages: by pointer and by keys, registration, declined, a share without an account, an
account that was signed out, and what goes wrong on the way."""

import os
import signal
import sqlite3
import subprocess
import time
import urllib.request

from device import EMAIL, PASSWORD
from ways.hearing import Reader
from ways.steps import check, stored, wait_for

NEW_EMAIL, NEW_PASSWORD = "new.person@velora.example", "ein Lied im Wind"


def fill(person, label, words):
    """A tap on a field of a page, and what is typed into it."""
    person.click(label, "page:field")
    wait_for(f"the focus in {label}", lambda: person.find(label, "page:focus"))
    person.run("xdotool", "type", "--delay", "12", words)


def page(person, title, seconds=20):
    """A page of the service, with no wait over it."""
    wait_for(f"the page {title!r}", lambda: person.find(title, "page:text") and not person.find("Processing…") and
             not person.find("Loading…"), seconds)


def sign_in(person, email=EMAIL, password=PASSWORD):
    page(person, "Sign in")
    fill(person, "E-mail address", email)
    fill(person, "Password", password)
    person.click("Sign in", "page:button")


def allow(person):
    page(person, "Connect this device?")
    person.click("Allow", "page:button")


def add_account(person):
    person.application = person.start_application()
    person.request = person.launch("account/add")


def accounts(person):
    """(accounts of the device, whether the client has credentials, devices that the service knows)."""
    listed = subprocess.run([person.program("platform/account/device-account"), "list"], env=person.env,
                            capture_output=True, text=True, check=False).stdout
    records = [line for line in listed.splitlines() if "com.orvant.velora" in line]
    credentials = os.path.exists(os.path.join(person.env["PLATFORM_DATA_DIR"], "cloud", "Velora.credentials"))
    database = sqlite3.connect(f"file:{os.path.join(person.data, 'velora-cloud.db')}?mode=ro", uri=True)
    tokens = database.execute("SELECT count(*) FROM tokens").fetchone()[0]
    database.close()
    return len(records), int(credentials), tokens


def nothing_left(person):
    found = accounts(person)
    check(found == (0, 0, 0), f"left are (records, credentials, tokens) {found}")
    return "no record, no credentials, no token"


def settings(person, press="Done"):
    """The account's settings, which a sign-in leads to, are left by this button."""
    person.sees("Storage usage", "Camera upload")
    one_account(person)
    person.click(press, "Elm_Button")


def one_account(person):
    found = accounts(person)
    check(found == (1, 1, 1), f"there are (records, credentials, tokens) {found}")


def uploaded(person, path):
    person.sees("Upload to", "Photos")
    person.choose()
    person.finished(os.path.basename(os.fsdecode(path)), "Upload complete")


def share(tour):
    """A share on a new device: a wrong password first, then sign-in, and the file is stored."""
    person = tour.person
    path = person.file("one.txt")

    def wrong():
        sign_in(person, password="not that one")
        wait_for("the error", lambda: person.find("Password", "page:field") and
                 any(kind == "page:alert" for kind, *_ in person.visible()))
        nothing_left(person)

    def right():
        fill(person, "Password", PASSWORD)
        person.click("Sign in", "page:button")
        allow(person)
        settings(person)
        person.sees("Upload to", "Photos")

    tour.step("a share without an account opens the sign-in", lambda: (person.share(path), page(person, "Sign in")))
    tour.step("a wrong password", wrong)
    tour.step("the right one, and allowed", right)
    tour.step("the file is still there, and goes up", uploaded, person, path)
    tour.step("Back", tour.left, {"one.txt": path})


def tab_to(person, name):
    for _ in range(12):
        if person.find(name, "page:focus"):
            return
        person.key("Tab")
        time.sleep(0.4)  # the page's list is made five times a second
    check(False, f"Tab does not lead to {name!r}: {person.visible()!r}")


def keys(tour):
    person = tour.person

    def type_in():
        page(person, "Sign in")
        tab_to(person, "E-mail address")
        person.run("xdotool", "type", "--delay", "12", EMAIL)
        tab_to(person, "Password")
        person.run("xdotool", "type", "--delay", "12", PASSWORD)
        person.key("Return")
        page(person, "Connect this device?")

    def approve():
        tab_to(person, "Allow")
        person.key("Return")
        person.sees("Storage usage")
        one_account(person)

    def leave():
        tour.go_to("Done", ("Tab",))
        person.key("Return")
        return person.ends()

    tour.step("the account settings open the sign-in", add_account, person)
    tour.step("address and password, by keys", type_in)
    tour.step("allowed", approve)
    tour.step("Done leaves", leave)


def register(tour):
    person = tour.person
    path = person.file("one.txt")

    def register_page():
        person.tap_icon()
        page(person, "Sign in")
        person.click("Create an account", "page:link")
        page(person, "Create an account")

    def fill_in():
        fill(person, "E-mail address", NEW_EMAIL)
        fill(person, "Password", NEW_PASSWORD)
        person.click("Create an account", "page:button")
        allow(person)
        settings(person)
        check(person.application.wait(20) == 0, "it ended with an error")

    def share_one():
        person.share(path)
        person.sees("Upload to")
        person.click("Done", "Elm_Button")
        person.finished("one.txt", "Upload complete")
        person.leave()
        check(os.path.exists(os.path.join(person.data, "files", NEW_EMAIL, "one.txt")), "it is not in the new account")

    tour.step("the icon, and the page for a new account", register_page)
    tour.step("registered, and allowed", fill_in)
    tour.step("a file goes into the new account", share_one)


def declined(tour):
    person = tour.person

    def decline():
        sign_in(person)
        page(person, "Connect this device?")
        person.click("Don’t allow", "page:button")
        reply = person.ends()
        nothing_left(person)
        return reply

    def back(reach, presses):
        add_account(person)
        reach()
        for _ in range(presses):
            person.key("Escape")
        person.ends()
        return nothing_left(person)

    tour.step("the account settings open the sign-in", add_account, person)
    tour.step("declined: the application leaves", decline)
    tour.step("Back on the first wait", back, lambda: person.sees("Loading…"), 1)
    tour.step("Back on the page", back, lambda: page(person, "Sign in"), 1)


def again(tour):
    """The person has signed the device out at the service."""
    person = tour.person
    path = person.file("one.txt")

    def revoke():
        request = urllib.request.Request(person.web + "/1/oauth/revoke", method="POST", data=b"",
                                         headers={"Authorization": "Bearer " + person.token})
        urllib.request.urlopen(request, timeout=10).close()

    def told():
        person.share(path)
        person.sees("You are signed out")
        person.click("Sign in", "Elm_Button")
        sign_in(person)
        allow(person)
        person.sees("Upload to", "Photos")
        one_account(person)

    tour.step("the device is signed out at the service", revoke)
    tour.step("a share says so, and leads to the sign-in", told)
    tour.step("the file is still there, and goes up", uploaded, person, path)
    tour.step("Back", tour.left, {"one.txt": path})


def web_processes(person):
    found = []
    for pid in person.left_over():
        try:
            with open(f"/proc/{pid}/comm", encoding="ascii") as file:
                if file.read().startswith("WebKitWebProces"):
                    found.append(pid)
        except OSError:
            pass
    return found


def trouble(tour):
    person = tour.person

    def killed():
        add_account(person)
        page(person, "Sign in")
        for pid in web_processes(person):
            os.kill(pid, signal.SIGKILL)
        person.sees("Something went wrong on the server")
        person.click("OK", "Elm_Button")
        person.ends()
        return nothing_left(person)

    def service_dies():
        path = person.file("one.txt")
        person.share(path)
        page(person, "Sign in")
        person.service.kill()
        person.service.wait()
        fill(person, "E-mail address", EMAIL)
        fill(person, "Password", PASSWORD)
        person.key("Return")
        person.sees("Velora cannot be reached")
        person.start_service()
        person.click("Try again", "Elm_Button")
        sign_in(person)
        allow(person)
        settings(person)
        uploaded(person, path)
        person.leave()
        stored(person, {"one.txt": path})

    tour.step("the web process is killed", killed)
    tour.step("the service dies under the form, and comes back", service_dies)


def certificate(tour):
    """The service shows a certificate of another authority than the device trusts."""
    person = tour.person

    def refused():
        person.make_authority()  # another one, in the place of the file that is trusted
        add_account(person)
        person.sees("Connection not safe", seconds=30)
        texts = person.texts()
        person.click("OK", "Elm_Button")
        person.ends()
        one_account(person)  # the one that was there
        return f"{texts!r}"

    def trusted():
        add_account(person)
        sign_in(person)
        allow(person)
        settings(person)
        return person.ends()

    tour.step("the right certificate: signed in over TLS", trusted)
    tour.step("another one: nothing is sent", refused)


def thirty(tour):
    """Sign-ins in one process, which an open share keeps: what grows?"""
    person = tour.person

    def once():
        person.request = person.launch("account/add")
        sign_in(person)
        allow(person)
        settings(person)
        wait_for("the folders again", lambda: person.find("Done", "Elm_Button") and person.find("Photos") and
                 not web_processes(person), 30)

    def size():
        folder = f"/proc/{person.application.pid}"
        with open(folder + "/status", encoding="ascii") as file:
            status = dict(line.split(":", 1) for line in file)
        return (len(os.listdir(folder + "/fd")), int(status["Threads"]), int(status["VmRSS"].split()[0]))

    def many():
        sizes = []
        for _ in range(40):
            once()
            time.sleep(1)
            sizes.append(size())
        one_account(person)
        # Pools breathe, so the most of the first ten against the least of the last ten.
        before, after = ([choice(column) for column in zip(*part)]
                         for choice, part in ((max, sizes[:10]), (min, sizes[-10:])))
        told = f"descriptors, threads, KiB of the first ten: {before}, of the last ten: {after}"
        check(all(late <= early * 1.02 for early, late in zip(before, after)), f"{told}; in between {sizes}")
        return told

    tour.step("a share is open", lambda: (person.share(person.file("one.txt")), person.sees("Photos", "Done")))
    tour.step("forty sign-ins, and the last thirty leave nothing behind", many)


def reader(tour):
    """The page is read out, and the keys work while a screen reader is on."""
    person = tour.person
    reader_of = Reader(person)

    def spoken(words):
        """What is read out is the name of the view at that moment."""
        return wait_for(f"{words!r} to be read out", lambda: any(words in name for _, name in reader_of.walk()))

    def first():
        add_account(person)
        page(person, "Sign in")
        spoken("Sign in")
        return reader_of.hears(("push button", "Back"))

    def wrong():
        for label, words in (("E-mail address", EMAIL), ("Password", "not that one")):
            tab_to(person, label)
            spoken(label)
            person.run("xdotool", "type", "--delay", "12", words)
        person.key("Return")
        spoken("The e-mail address or the password is wrong.")

    def right():
        tab_to(person, "Password")
        person.run("xdotool", "type", "--delay", "12", PASSWORD)
        person.key("Return")
        page(person, "Connect this device?")
        spoken("Connect this device?")
        tab_to(person, "Allow")
        spoken("Allow")
        person.key("Return")
        person.sees("Storage usage")
        one_account(person)
        tour.go_to("Done", ("Tab",))
        person.key("Return")
        return person.ends()

    tour.step("the page", first)
    tour.step("a wrong password", wrong)
    tour.step("the right one, and allowed", right)


NEW = {"account": False}
WAYS = {"signin-share": (share, NEW), "signin-keys": (keys, NEW), "signin-register": (register, NEW),
        "signin-declined": (declined, NEW), "signin-again": (again, {}), "signin-trouble": (trouble, NEW), "signin-reader": (reader, NEW),
        "signin-thirty": (thirty, {}), "signin-certificate": (certificate, NEW | {"secure": True})}
