"""The first folder page (time and memory), and what the window costs while nothing happens; both beside a bare window of
the toolkit (bench/bare_window)."""

import contextlib
import os
import re
import subprocess
import time

from common import Figure, Goal, NotMeasured, Result, interleaved, memory, processor_seconds
from device import APP, Device, wait_for
from person import Person

PATHS = "http://orvant.com/appcontrol/data/path"
SECONDS = 15  # of each look at an idle window
SETTLE = 4
START_FIGURES = [Figure("wall", "launch request to the folders", "s", Goal(0.26), 3), Figure("cpu", "CPU", "s"),
                 Figure("rss", "memory (RSS)", "MB", Goal(40), 1), Figure("pss", "its share (PSS)", "MB", digits=1)]


@contextlib.contextmanager
def ending(device):
    try:
        yield device
    finally:
        device.end()


def bare_window(device, bench):
    """The process, and when its first frame was painted."""
    process = device.start([bench.program("bench/bare_window")], stdout=subprocess.PIPE)
    painted = process.stdout.readline()
    if not painted:
        raise NotMeasured("the bare window does not start")
    return process, float(painted)


def start_application(person, bench, path):
    seen = person.start([bench.program("bench/until_seen"), APP, "Photos", "Done"], stdout=subprocess.PIPE)
    seen.stdout.readline()  # it is looking
    start = time.monotonic()
    launch = person.launch("multi_share", "--array", PATHS, path)
    words = seen.stdout.readline().split()
    if not words:
        raise NotMeasured("the folders are not seen")
    pid = int(words[0])
    time.sleep(0.5)
    figures = {"wall": float(words[1]) - start, "cpu": processor_seconds(pid), **memory(pid)}
    person.raise_window()
    person.key("Escape")
    launch.wait(20)
    wait_for("the application to leave", lambda: not person.is_on_bus(APP))
    return figures


def start_bare(device, bench):
    start = time.monotonic()
    process, painted = bare_window(device, bench)
    time.sleep(0.5)
    figures = {"wall": painted - start, "cpu": processor_seconds(process.pid), **memory(process.pid)}
    process.terminate()
    process.wait(10)
    return figures


@contextlib.contextmanager
def share_of_one(bench, build):
    """A function that shares a file with the application of a build, which has been started once before."""
    with ending(Person(build)) as person:
        path = person.file("one.txt")

        def share(_number):
            return start_application(person, bench, path)
        share(-1)  # what a first start of all leaves in the home
        yield share


def first_page(bench):
    with share_of_one(bench, bench.build) as share, ending(Device(bench.build)) as device:
        device.start_display()
        device.start_bus()
        start_bare(device, bench)
        return [Result("first folder page", START_FIGURES, interleaved(bench.rounds, {
            "Velora": share, "bare window": lambda _: start_bare(device, bench)}))]


# an idle window

def switches(pid):
    total = 0
    for task in os.listdir(f"/proc/{pid}/task"):
        with contextlib.suppress(OSError), open(f"/proc/{pid}/task/{task}/status", encoding="ascii") as file:
            total += sum(map(int, re.findall(r"ctxt_switches:\s+(\d+)", file.read())))
    return total


class Window:
    """A window on a display of its own, which nobody touches."""

    def __init__(self, device, pid, name):
        self.device, self.pid = device, pid
        self.id = wait_for("the window", lambda: self._visible(name))[-1]
        self.name = name

    def _visible(self, name):
        return subprocess.run(["xdotool", "search", "--onlyvisible", "--name", f"^{name}$"], env=self.device.env,
                              capture_output=True, text=True, check=False).stdout.split()

    def show(self, shown):
        if shown:
            self.device.run("xdotool", "windowmap", self.id, "windowactivate", self.id)
        else:
            self.device.run("xdotool", "windowminimize", self.id)
        wait_for("the window to be there or gone", lambda: bool(self._visible(self.name)) == shown)

    def look(self):
        return time.monotonic(), switches(self.pid), processor_seconds(self.pid)


def share_of(before, after):
    seconds = after[0] - before[0]
    return {"wakeups": (after[1] - before[1]) / seconds, "percent": 100 * (after[2] - before[2]) / seconds}


def idle(bench):
    """All windows at a time, each on its own display: what is to be idle is in nobody's way."""
    figures = [Figure("wakeups", "wake-ups/s", "", Goal(0), 1), Figure("percent", "CPU", "%", Goal(0))]
    with contextlib.ExitStack() as stack:
        windows = {}
        for name in ("on the folder page", "after the uploads"):
            person = stack.enter_context(ending(Person(bench.build)))
            path = person.file("one.txt")
            if name == "on the folder page":
                person.share(path)
                person.sees("Photos", "Done")
            else:
                person.upload(path)
                person.finished("one.txt")
            windows[name] = Window(person, person.application.pid, "velora")
        device = stack.enter_context(ending(Device(bench.build)))
        device.start_display()
        device.start_bus()
        windows["bare window"] = Window(device, bare_window(device, bench)[0].pid, "bare")
        rounds = {(name, shown): [] for name in windows for shown in (True, False)}
        for number in range(bench.rounds):
            for shown in (True, False) if number % 2 == 0 else (False, True):
                for window in windows.values():
                    window.show(shown)
                time.sleep(SETTLE)
                before = {name: window.look() for name, window in windows.items()}
                time.sleep(SECONDS)
                for name, window in windows.items():
                    rounds[name, shown].append(share_of(before[name], window.look()))
    return [Result(f"window {'shown, idle' if shown else 'minimized'}, {name}", figures,
                   {"Velora": rounds[name, shown], "bare window": rounds["bare window", shown]})
            for shown in (True, False) for name in windows if name != "bare window"]


START = {"start": first_page}
IDLE = {"idle": idle}
