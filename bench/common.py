"""What all measures share: rounds in turn, times of programs, figures with goals, the table and the JSON file."""

import contextlib
import dataclasses
import json
import os
import signal
import statistics
import subprocess
import sys
import tempfile
import threading
import time

HERE = os.path.dirname(os.path.abspath(__file__))
ROOT = os.path.dirname(HERE)
sys.path[:0] = [os.path.join(ROOT, "tools"), os.path.join(ROOT, "tests", "e2e", "app")]
MEMORY = "/dev/shm"  # a file system without a disk
running = set()  # programs that are measured
stopped = threading.Event()


class NotMeasured(Exception):
    """Why a row has no figures, for a person."""


@dataclasses.dataclass
class Goal:
    """At most `limit`; of a ratio when `beside` names a peer or another figure of our own."""
    limit: float
    beside: str = ""


@dataclasses.dataclass
class Figure:
    key: str  # in the rounds
    name: str
    unit: str
    goal: Goal | None = None
    digits: int = 2


@dataclasses.dataclass
class Result:
    """One thing measured: `rounds` are {who: [{key: value}, ...]}, ours first."""
    what: str
    figures: list[Figure] = dataclasses.field(default_factory=list)
    rounds: dict = dataclasses.field(default_factory=dict)
    reason: str = ""  # it was not measured
    notes: list[str] = dataclasses.field(default_factory=list)


@dataclasses.dataclass
class Bench:
    """What a row gets: the build, how often, and folders in memory and on the disk that go in the end."""
    build: str
    rounds: int
    place: str
    disk: str

    def program(self, path):
        return os.path.join(self.build, path)


# measuring

def wanted_program(name):
    for folder in (*os.environ.get("PATH", "").split(":"), "/usr/sbin", "/sbin"):
        path = os.path.join(folder, name)
        if os.access(path, os.X_OK):
            return path
    raise NotMeasured(f"{name} is not installed")


def measured(command, environment=None):
    """Wall and processor seconds of a program that must succeed, with what it started and waited for."""
    start = time.monotonic()
    process = subprocess.Popen(command, env=environment, stdin=subprocess.DEVNULL, stdout=subprocess.DEVNULL,
                               stderr=subprocess.PIPE)
    running.add(process)
    try:
        words = process.stderr.read()
        _, status, used = os.wait4(process.pid, 0)
        process.returncode = os.waitstatus_to_exitcode(status)
    except BaseException:
        process.kill()
        process.wait()
        raise
    finally:
        running.discard(process)
        process.stderr.close()
    wall = time.monotonic() - start
    if stopped.is_set():
        raise NotMeasured("interrupted")
    if process.returncode:
        last = words.decode(errors="replace").strip().splitlines()[-1:]
        raise NotMeasured(f"{os.path.basename(command[0])} ended with {process.returncode}: {''.join(last)}")
    return {"wall": wall, "cpu": used.ru_utime + used.ru_stime}


def processor_seconds(pid):
    """Of a process that runs, with its threads that have ended."""
    return time.clock_gettime((~pid << 3) | 2)  # what clock_getcpuclockid makes of a process's id


def memory(pid):
    """{"rss": MB, "pss": MB} of a process."""
    with open(f"/proc/{pid}/smaps_rollup", encoding="ascii") as file:
        sizes = dict(line.split()[:2] for line in file if line.split()[0].endswith(":"))
    return {"rss": int(sizes["Rss:"]) * 1024 / 1e6, "pss": int(sizes["Pss:"]) * 1024 / 1e6}


def interleaved(rounds, subjects):
    """Each subject(number of the round) once a round, in turn, every other round from the last to the first."""
    rows = {name: [] for name in subjects}
    for number in range(rounds):
        for name in list(subjects)[::-1 if number % 2 else 1]:
            if stopped.is_set():
                raise NotMeasured("interrupted")
            rows[name].append(subjects[name](number))
    return rows


def room_for(folder, size):
    """Raises unless the folder, and the memory when it lies there, have room for so many bytes."""
    status = os.statvfs(folder)
    free = status.f_bavail * status.f_frsize
    with open("/proc/meminfo", encoding="ascii") as file:
        available = next(int(line.split()[1]) * 1024 for line in file if line.startswith("MemAvailable"))
    if min(free, available) < size:
        raise NotMeasured(f"{size / 1e9:.1f} GB of room wanted, there are {min(free, available) / 1e9:.1f}")


def make_files(folder, count, size):
    os.makedirs(folder)
    paths = [os.path.join(folder, f"{number:05}.bin") for number in range(count)]
    for path in paths:
        with open(path, "wb") as file:
            file.write(os.urandom(size))
    return paths


def words_of(trouble):
    return " ".join(str(trouble).split()) or type(trouble).__name__


def attempt(what, function):
    """The result of function(), or why there is none: what one row lacks is not the others' trouble."""
    try:
        return function()
    except Exception as trouble:  # of any kind, on purpose
        return Result(what, reason=words_of(trouble))


# showing

def median(rows, key):
    """None when a round has no such figure."""
    values = [row[key] for row in rows if key in row]
    return statistics.median(values) if len(values) == len(rows) and rows else None


def judge(result):
    """The figures of a result as they go to the JSON file: medians, ratios and goals."""
    judged, ours = [], next(iter(result.rounds), "")
    for figure in result.figures:
        medians = {who: median(rows, figure.key) for who, rows in result.rounds.items()}
        one = {"name": figure.name, "unit": figure.unit, "digits": figure.digits, "ratio": {}, "goal": None, "met": None,
               "median": {who: value for who, value in medians.items() if value is not None}}
        for who in list(one["median"])[1:]:
            pairs = list(zip(result.rounds[ours], result.rounds[who]))
            if all(peer[figure.key] for _, peer in pairs):
                one["ratio"][who] = statistics.median(mine[figure.key] / peer[figure.key] for mine, peer in pairs)
        if figure.goal:
            one["goal"] = {"at_most": figure.goal.limit, "beside": figure.goal.beside}
            value = one["ratio"].get(figure.goal.beside) if figure.goal.beside else medians.get(ours)
            digits = 2 if figure.goal.beside else figure.digits  # what counts is what the table shows
            one["met"] = None if value is None else round(value, digits) <= figure.goal.limit
        judged.append(one)
    return judged


def table(results):
    lines = ["| what | figure | Velora | beside it | times | goal | |", "|---|---|---|---|---|---|---|"]
    for result in results:
        what = result.what
        if result.reason:
            lines.append(f"| {what} | not measured: {result.reason} | | | | | |")
        for one in judge(result) if not result.reason else ():
            ours, *peers = one["median"].items() or [("", None)]
            unit = f" {one['unit']}" if one["unit"] else ""
            shown = f"{ours[1]:.{one['digits']}f}{unit}" if ours[1] is not None else ""
            beside = ", ".join(f"{who} {value:.{one['digits']}f}{unit}" for who, value in peers)
            times = ", ".join(f"{one['ratio'][who]:.2f}" if who in one["ratio"] else "–" for who, _ in peers)
            goal, verdict = "", ""
            if one["goal"]:
                of = one["goal"]["beside"]
                goal = f"{one['goal']['at_most']:g} x {of}" if of else f"{one['goal']['at_most']:g}{unit}"
                verdict = {True: "met", False: "**missed**", None: "?"}[one["met"]]
            lines.append(f"| {what} | {one['name']} | {shown} | {beside} | {times} | {goal} | {verdict} |")
            what = ""
    return "\n".join(lines)


def as_json(result):
    return {"what": result.what, "not_measured": result.reason or None, "notes": result.notes,
            "figures": judge(result) if not result.reason else [], "rounds": result.rounds}


# around it

def build_options(build):
    """{name: value} of what makes a program fast or slow."""
    done = subprocess.run(["meson", "introspect", build, "--buildoptions"], capture_output=True, text=True, check=True)
    names = ("buildtype", "optimization", "debug", "b_sanitize", "b_lto")
    return {one["name"]: one["value"] for one in json.loads(done.stdout) if one["name"] in names}


def make(build):
    subprocess.run(["ninja", "-C", build, "benches", "src/setting/main/velora"], check=True, stdout=sys.stderr)


def _interrupted(*_):
    for number in (signal.SIGINT, signal.SIGTERM, signal.SIGHUP):
        signal.signal(number, signal.SIG_IGN)  # what is being taken away is taken away
    stopped.set()
    for process in list(running):
        process.kill()  # other threads wait for them
    raise KeyboardInterrupt


@contextlib.contextmanager
def place(on_disk=False):
    """A folder for this program's files and those of all it starts, in memory where there is such a place. It goes in the
    end, also of a program that is interrupted."""
    for number in (signal.SIGINT, signal.SIGTERM, signal.SIGHUP):
        signal.signal(number, _interrupted)
    memory_folder = None if on_disk or not os.access(MEMORY, os.W_OK) else MEMORY
    with tempfile.TemporaryDirectory(prefix="bench-", dir=memory_folder, ignore_cleanup_errors=True) as folder:
        os.chmod(folder, 0o755)  # Apache runs as somebody else
        if on_disk:
            yield folder
            return
        before = tempfile.tempdir
        os.environ["TMPDIR"] = tempfile.tempdir = folder
        try:
            yield folder
        finally:
            tempfile.tempdir = before
