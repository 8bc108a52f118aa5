"""The cloud client alone beside curl and rclone: small files, a large one, and small ones over a distance."""

import concurrent.futures
import contextlib
import functools
import os
import subprocess

from common import Figure, Goal, Result, attempt, interleaved, make_files, measured, room_for, wanted_program
from servers import CURL, PASSWORD, USER, apache, far, velora_cloud

SMALL, COUNT, LARGE, ROUND_TRIP = 10 << 10, 200, 1 << 30, 0.05


class Uploads:
    """How each program uploads the same files to a server."""

    def __init__(self, bench, server, home, files):
        self.server, self.files = server, files
        self.program = bench.program("bench/client_upload")
        os.makedirs(home)
        self.environment = dict(os.environ, CLOUD_SERVICES_DIR=home, PLATFORM_DATA_DIR=home, CLOUD_SECRETS="file",
                                HOME=home, XDG_CACHE_HOME=home, RCLONE_CONFIG=os.path.join(home, "rclone.conf"))
        self.list = os.path.join(home, "curl.conf")
        with open(os.path.join(home, "Bench.conf"), "w", encoding="ascii") as file:
            file.write(f"[Service]\nStorage={server.tree}\n")
        for tool, words in (("platform/vconf/settings-store", ("set", "memory/connection/type", "wifi")),
                            ("platform/cloud_content_sync/cloud-account", ("set", "Bench", "--user", USER))):
            subprocess.run([bench.program(tool), *words], input=PASSWORD + "\n", text=True, check=True,
                           env=self.environment, stdout=subprocess.DEVNULL)

    def _once(self, name, upload):
        """Uploads into a folder of its own, which is gone afterwards."""
        self.server.ask("MKCOL", name + "/")
        try:
            return upload(name)
        finally:
            self.server.ask("DELETE", name + "/")

    def client(self, number):
        return self._once(f"client{number}", lambda folder: measured(
            [self.program, "Bench", "/" + folder, *self.files], self.environment))

    def curl(self, number):
        """One connection, and nobody's file overwritten, as the client has to."""
        def upload(folder):
            with open(self.list, "w", encoding="ascii") as file:
                for path in self.files:
                    file.write(f'upload-file = "{path}"\nurl = "{self.server.tree}{folder}/{os.path.basename(path)}"\n')
            return measured([*CURL, "-H", "If-None-Match: *", "-H", "Expect:", "-K", self.list])
        return self._once(f"curl{number}", upload)

    def with_rclone(self):
        rclone = wanted_program("rclone")
        hidden = subprocess.run([rclone, "obscure", "-"], input=PASSWORD, text=True, check=True, capture_output=True)
        with open(self.environment["RCLONE_CONFIG"], "w", encoding="utf-8") as file:
            file.write(f"[bench]\ntype = webdav\nvendor = other\nurl = {self.server.tree}\nuser = {USER}\n"
                       f"pass = {hidden.stdout.strip()}\n")

        def upload(folder):
            words = ("copyto", self.files[0], f"bench:{folder}/{os.path.basename(self.files[0])}") \
                if len(self.files) == 1 else ("copy", os.path.dirname(self.files[0]), f"bench:{folder}")
            return measured([rclone, *words], self.environment)
        return lambda number: self._once(f"rclone{number}", upload)

    def subjects(self, rclone):
        found = {"client": self.client, "curl": self.curl}
        if rclone:
            found["rclone"] = self.with_rclone()
        return found


def beside(bench, what, server, files, goal, rclone=False, first=True, place=None):
    home = os.path.join(place or bench.place, f"home-{server.name}-{server.port}")
    uploads = Uploads(bench, server, home, files)
    notes = []
    try:
        subjects = uploads.subjects(rclone)
    except Exception as trouble:  # the others are measured without it
        subjects = uploads.subjects(False)
        notes.append(f"without rclone: {trouble}")
    if first:
        uploads.client("-first")  # what is found out once about a service
    return Result(what, [Figure("wall", "time", "s", Goal(goal, "curl")), Figure("cpu", "CPU", "s")],
                  interleaved(bench.rounds, subjects), notes=notes)


@contextlib.contextmanager
def server_of(kind, bench, where):
    place = os.path.join(where, kind)
    os.makedirs(place, mode=0o755)
    with velora_cloud(bench.build, place) if kind == "velora-cloud" else apache(place) as server:
        yield server


def small(bench):
    """All on the disk, where the server waits for it, and all in memory, where the programs are what is left."""
    runs = []
    for where, place in (("on the disk", bench.disk), ("in memory", bench.place)):
        files = make_files(os.path.join(place, "small"), COUNT, SMALL)
        for kind, goal in (("velora-cloud", 1.1), ("Apache", 1.5)):
            what = f"{COUNT} x {SMALL >> 10} KiB, client alone, to {kind} {where}"

            def run(kind=kind, goal=goal, what=what, place=place, files=files):
                with server_of(kind, bench, place) as server:
                    return beside(bench, what, server, files, goal, place=place)
            runs.append(attempt(what, run))
    return runs


def large(bench):
    what = "1 GiB, client alone, to velora-cloud in memory"

    def run():
        room_for(bench.place, 3 * LARGE)  # the file, what is stored, and as much again for who keeps it twice
        folder = os.path.join(bench.place, "large")
        os.makedirs(folder)
        path = os.path.join(folder, "large.bin")
        piece = os.urandom(1 << 20)
        try:
            with open(path, "wb") as file:
                for number in range(LARGE >> 20):
                    file.write(number.to_bytes(4, "big") + piece[4:])
            with server_of("velora-cloud", bench, bench.place) as server:
                return beside(bench, what, server, [path], 1.15, rclone=True, first=False)
        finally:
            with contextlib.suppress(OSError):
                os.unlink(path)
    return [attempt(what, run)]


def distant(bench):
    """Both servers at a time: everyone waits nearly all the time."""
    files = make_files(os.path.join(bench.place, "distant"), COUNT, SMALL)

    def to(kind, goal):
        with server_of(kind, bench, bench.place) as server, far(server, ROUND_TRIP) as away:
            return beside(bench, what(kind), away, files, goal, rclone=True)

    def what(kind):
        return f"{COUNT} x {SMALL >> 10} KiB, client alone, {ROUND_TRIP * 1000:.0f} ms round trip, to {kind}"
    kinds = {"velora-cloud": 1.05, "Apache": 1.1}
    with concurrent.futures.ThreadPoolExecutor() as pool:
        runs = [pool.submit(attempt, what(kind), functools.partial(to, kind, goal)) for kind, goal in kinds.items()]
        return [run.result() for run in runs]


ROWS = {"small": small, "large": large, "far": distant}
