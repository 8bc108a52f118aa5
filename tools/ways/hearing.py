"""A screen reader that is switched on, and what it is told."""

import re
import subprocess

from device import Trouble
from ways.steps import check, wait_for

CONTROLS = ("push button", "list item", "menu item", "check box", "progress bar", "page tab", "entry", "password text", "link")


CHECKED = 4  # ATSPI_STATE_CHECKED


class Reader:
    def __init__(self, person):
        self.person = person
        person.start(["/usr/libexec/at-spi-bus-launcher", "--launch-immediately", "--a11y=1", "--screen-reader=1"],
                     stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
        wait_for("the accessibility bus", lambda: person.is_on_bus("org.a11y.Bus"))
        self.bus = re.search("'(.*)'", person.run("gdbus", "call", "--session", "--dest", "org.a11y.Bus", "--object-path",
                                                  "/org/a11y/bus", "--method", "org.a11y.Bus.GetAddress")).group(1)

    def ask(self, where, method, *arguments):
        dest, path = where
        return self.person.run("gdbus", "call", "--address", self.bus, "--dest", dest, "--object-path", path, "--method",
                               method, *arguments)

    def walk(self, where=("org.a11y.atspi.Registry", "/org/a11y/atspi/accessible/root")):
        """Every (role, name) of the tree below an object; nothing of what goes meanwhile."""
        try:
            return self._walk(where)
        except Trouble as gone:
            if "UnknownObject" in str(gone):
                return []
            raise

    def _walk(self, where):
        role = self.ask(where, "org.a11y.atspi.Accessible.GetRoleName").split("'")[1]
        name = self.ask(where, "org.freedesktop.DBus.Properties.Get", "org.a11y.atspi.Accessible", "Name").strip()[3:-4]
        found = [(role, name)]
        children = self.ask(where, "org.a11y.atspi.Accessible.GetChildren")
        for child in re.findall(r"\('([^']*)', (?:objectpath )?'([^']*)'\)", children):
            found += self.walk(child)
        return found

    def find(self, role, name, where=("org.a11y.atspi.Registry", "/org/a11y/atspi/accessible/root")):
        """The first of this role and name, as its place; None when there is none."""
        if self.ask(where, "org.a11y.atspi.Accessible.GetRoleName").split("'")[1] == role and \
                self.ask(where, "org.freedesktop.DBus.Properties.Get", "org.a11y.atspi.Accessible",
                         "Name").strip()[3:-4] == name:
            return where
        children = self.ask(where, "org.a11y.atspi.Accessible.GetChildren")
        return next((found for child in re.findall(r"\('([^']*)', (?:objectpath )?'([^']*)'\)", children)
                     if (found := self.find(role, name, child))), None)

    def is_checked(self, name):
        """Whether the check box is heard as checked."""
        place = self.find("check box", name)
        check(place, f"no check box {name!r}: {self.walk()!r}")
        states = self.ask(place, "org.a11y.atspi.Accessible.GetState")
        return bool(int(re.search(r"\[(?:uint32 )?(\d+)", states).group(1)) & 1 << CHECKED)

    def hears(self, *wanted):
        heard = self.walk()
        for role, name in heard:
            check(role not in CONTROLS or name, f"a {role} has no name: {heard!r}")
            check("IDS_" not in name, f"a {role} is called {name}")
        for one in wanted:
            check(one in heard, f"{one!r} is not heard, but {heard!r}")
        return f"{sum(role in CONTROLS for role, _ in heard)} controls"
