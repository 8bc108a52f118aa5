"""What a long queue costs the upload view, beside a plain list of as many rows: bench/queue_view, in which the real client
uploads to the fake service of the tests and the widgets are real, without a display."""

import json
import os
import subprocess

from common import Figure, Goal, Result, attempt, interleaved

ENVIRONMENT = {
    "ELM_ENGINE": "buffer", "DBUS_SESSION_BUS_ADDRESS": "disabled:", "DLOG_LEVEL": "fatal",
    "EINA_LOG_LEVELS": "evas_main:0,eldbus:0,eina_safety:0,ecore_system_upower:0,ecore_system_systemd:0",
}
QUIET = 0.25  # seconds, in which queue_view looks whether the main loop rests


def once(bench, kind, files):
    done = subprocess.run([bench.program("bench/queue_view"), kind, str(files)], text=True, capture_output=True,
                          stdin=subprocess.DEVNULL, timeout=900, env={**os.environ, **ENVIRONMENT})
    if done.returncode:
        raise RuntimeError(f"queue_view {kind} {files} ended with {done.returncode}")
    figures = {name: value for name, value in json.loads(done.stdout).items() if value}  # what it did not measure is 0
    if kind == "app":
        figures["rest"] = figures["quiet"] - figures["run_end"]
    return figures


def pair(bench, files, peer="genlist", ours="app", rounds=None):
    return interleaved(rounds or bench.rounds, {"Velora": lambda _: once(bench, ours, files),
                                                "genlist": lambda _: once(bench, peer, files)})


def ten_thousand(bench):
    figures = [Figure("first_row", "Done to the first row", "s", Goal(0.3), 3),
               Figure("stall", "longest stall", "s", Goal(0.05), 3),
               Figure("stall_own", "of which the main loop ran", "s", digits=3),
               Figure("run_end", "Done to the last upload", "s"),
               Figure("rest", "from there until quiet", "s", Goal(QUIET)),
               Figure("cpu", "CPU", "s"), Figure("cpu_main", "CPU of the main loop", "s"),
               Figure("bytes_per_file", "memory of a waiting file", "B", digits=0)]
    return [Result("Done with 10,000 files, fake service, no display", figures, pair(bench, 10000))]


def hundred_thousand(bench):
    """The page in every round; the whole queue, which takes minutes, once."""
    results = [Result("100,000 files shared, fake service, no display",
                      [Figure("page", "request to the page (peer: first row)", "s", Goal(3.0), 3),
                       Figure("bytes_per_file", "memory of a waiting file", "B", Goal(1024), 0)],
                      pair(bench, 100000, "genlist-page", "app-page"))]
    what = "all 100,000 sent, one round"
    figures = [Figure("first_row", "Done to the first row", "s", digits=3), Figure("stall", "longest stall", "s", digits=3),
               Figure("run_end", "Done to the last upload", "s"), Figure("rest", "from there until quiet", "s", Goal(QUIET)),
               Figure("cpu", "CPU", "s")]
    results.append(attempt(what, lambda: Result(what, figures, pair(bench, 100000, rounds=1))))
    return results


ROWS = {"queue": ten_thousand, "many": hundred_thousand}
