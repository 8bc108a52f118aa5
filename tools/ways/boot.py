"""The first boot: the wizard asks for the application's page, and is told where to go next."""

import subprocess

import first_boot
from ways.settings import configure, remove, stored_settings, told_and_left, uploaded_by
from ways.signin import NEW_EMAIL, NEW_PASSWORD, accounts, allow, fill, nothing_left, one_account, page, sign_in
from ways.steps import check, wait_for

CREATE, SIGN_IN, PREVIOUS, SKIP = "Create new account", "Sign in", "Previous", "Skip"
ENABLE, NEXT = "Enable camera upload", "Next"


def boot(person):
    """The wizard asks; the welcome page is there."""
    if not person.application or person.application.poll() is not None:
        person.application = person.start_application()
    person.request = person.start([person.program("platform/app/velora-launch"), *first_boot.REQUEST],
                                  stdout=subprocess.PIPE)
    wait_for("the welcome page", lambda: person.find(SKIP, "Elm_Button") and person.find(PREVIOUS, "Elm_Button"), 30)


def answered(person, answer):
    reply = person.ends()
    check(first_boot.answer_of(reply) == answer, f"the wizard is told {reply!r}")
    return reply


def press(person, button, answer):
    person.click(button, "Elm_Button")
    return answered(person, answer)


def back_to_welcome(person, presses=1):
    for _ in range(presses):
        person.key("Escape")
    wait_for("the welcome page", lambda: person.find(CREATE, "Elm_Button") and not person.find("Loading…"))


def register(tour):
    """A newcomer's whole sitting: first boot, a new account, camera upload, a share, the settings, the removal."""
    person = tour.person
    path = person.file("one.txt")

    def leave_and_come():
        boot(person)
        press(person, PREVIOUS, "lbutton_click")
        boot(person)
        person.key("Escape")
        return answered(person, "lbutton_click")

    def make_account():
        boot(person)
        person.click(CREATE, "Elm_Button")
        page(person, "Create an account")
        fill(person, "E-mail address", NEW_EMAIL)
        fill(person, "Password", NEW_PASSWORD)
        person.click("Create an account", "page:button")
        allow(person)
        person.sees("Wi-Fi only")
        one_account(person)

    def enable():
        person.click("Wi-Fi only")
        person.click(ENABLE, "Elm_Button")
        wait_for("the last page", lambda: person.find(NEXT, "Elm_Button"))
        found = stored_settings(person)
        check(found.get("camera_upload") == 1 and found.get("wifi_only.4") == 1, f"stored are {found}")

    def back_and_again():
        person.key("Escape")
        wait_for("the page before", lambda: person.find(ENABLE, "Elm_Button"))
        person.click("Wi-Fi or mobile networks")
        person.click(ENABLE, "Elm_Button")
        wait_for("the last page", lambda: person.find(NEXT, "Elm_Button"))
        check(stored_settings(person).get("wifi_only.4") == 0, f"stored are {stored_settings(person)}")
        return press(person, NEXT, "rbutton_next")

    def known():
        boot(person)
        check(person.find(NEW_EMAIL), f"the account's name is not on the page: {person.texts()}")
        check(not person.find(CREATE, "Elm_Button"), "there is an account and a button for another")
        return press(person, SKIP, "rbutton_skip")

    def share():
        person.share(path)
        person.sees("Upload to")
        person.click("Done", "Elm_Button")
        person.finished("one.txt", "Upload complete")
        person.leave()
        check(uploaded_by(person, NEW_EMAIL) == ["one.txt"], f"stored are {uploaded_by(person, NEW_EMAIL)}")

    def settings():
        configure(person)
        remove(person)
        reply = told_and_left(person)
        nothing_left(person)
        return reply

    tour.step("Previous and Back", leave_and_come)
    tour.step("a new account", make_account)
    tour.step("camera upload, over Wi-Fi alone", enable)
    tour.step("Back, the other choice, Next", back_and_again)
    tour.step("the wizard once more: the account is known", known)
    tour.step("a share", share)
    tour.step("the settings, and the account is removed", settings)


def sign_in_there(tour):
    """With an account that there is, and all that comes between."""
    person = tour.person
    path = person.file("one.txt")

    def no_network():
        boot(person)
        person.setting("memory/connection/type", "none")
        person.click(SIGN_IN, "Elm_Button")
        person.sees("Wi-Fi")
        person.click("Cancel", "Elm_Button")
        wait_for("the popup to go", lambda: not person.find("Cancel", "Elm_Button"))
        check(person.find(CREATE, "Elm_Button"), f"the welcome page is gone: {person.texts()}")
        person.setting("memory/connection/type", "wifi")

    def there_and_back():
        person.click(SIGN_IN, "Elm_Button")
        page(person, "Sign in")
        back_to_welcome(person)
        check(accounts(person) == (0, 0, 0), f"left are {accounts(person)}")

    def with_a_share():
        person.click(SIGN_IN, "Elm_Button")
        sign_in(person)
        allow(person)
        person.sees("Wi-Fi only")
        wizard = person.request
        person.share(path)
        person.sees("Upload to", "Photos")
        person.choose()
        person.finished("one.txt", "Upload complete")
        person.raise_window()
        person.key("Escape")
        wait_for("the wizard's page again", lambda: person.find(ENABLE, "Elm_Button"))
        person.reply(person.request)
        person.all_succeeded()
        person.request = wizard
        reply = press(person, SKIP, "rbutton_skip")
        found = stored_settings(person)
        check(not found.get("camera_upload"), f"stored are {found}")
        return reply

    tour.step("no network: the page stays", no_network)
    tour.step("sign-in, and Back to the welcome page", there_and_back)
    tour.step("signed in; a share in the middle; skipped", with_a_share)


NEW = {"account": False}
WAYS = {"boot-register": (register, NEW), "boot-sign-in": (sign_in_there, NEW)}
