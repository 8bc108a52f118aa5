"""velora-cloud beside Apache's mod_dav, which does not wait for the disk, and beside the bare disk: small uploads by one
connection and by eight at a time, and the processor time of a small download."""

import base64
import contextlib
import http.client
import os
import threading
import time

from common import Figure, Result, interleaved
from servers import PASSWORD, USER, apache, velora_cloud

SIZE, SECONDS, DOWNLOADS = 10 << 10, 1.5, 500
AUTHORIZATION = {"Authorization": "Basic " + base64.b64encode(f"{USER}:{PASSWORD}".encode()).decode()}
BODY = bytes(range(256)) * (SIZE // 256)


def milliseconds(threads, work):
    """Of one work(thread, n), while so many threads do it."""
    counts, end, troubles = [0] * threads, time.monotonic() + SECONDS, []

    def run(number):
        try:
            while time.monotonic() < end:
                work(number, counts[number])
                counts[number] += 1
        except Exception as trouble:  # is raised where it is seen
            troubles.append(trouble)
    runners = [threading.Thread(target=run, args=(number,)) for number in range(threads)]
    for runner in runners:
        runner.start()
    for runner in runners:
        runner.join()
    if troubles:
        raise troubles[0]
    return 1000 * SECONDS / max(1, sum(counts))


def disk(place, number):
    """Writes files as a durable upload has to: content, name, and both on the disk."""
    folder = os.path.join(place, f"disk{number}")
    os.makedirs(folder)
    handle = os.open(folder, os.O_RDONLY)

    def write(number, count):
        name = os.path.join(folder, f"{number}-{count}")
        file = os.open(name + ".part", os.O_WRONLY | os.O_CREAT)
        os.write(file, BODY)
        os.fsync(file)
        os.close(file)
        os.rename(name + ".part", name)
        os.fsync(handle)
    try:
        one, eight = milliseconds(1, write), milliseconds(8, lambda number, count: write(number + 1, count))
    finally:
        os.close(handle)
    return {"one": one, "eight": eight}


def processor_time(process):
    """Seconds of a process and its children, by the scheduler's own clock."""
    parent, total = str(process.pid), 0
    for entry in os.listdir("/proc"):
        with contextlib.suppress(OSError, IndexError):
            with open(f"/proc/{entry}/stat", encoding="ascii", errors="replace") as file:
                if parent not in (entry, file.read().rsplit(")", 1)[1].split()[1]):
                    continue
            for task in os.listdir(f"/proc/{entry}/task"):
                with open(f"/proc/{entry}/task/{task}/schedstat", encoding="ascii") as file:
                    total += int(file.read().split()[0])
    return total / 1e9


def served(server, number):
    def put_into(folder):
        connections = [http.client.HTTPConnection("127.0.0.1", server.port) for _ in range(8)]

        def put(thread, count):
            connections[thread].request("PUT", f"{server.root}{folder}/{thread}-{count}", BODY, AUTHORIZATION)
            answer = connections[thread].getresponse()
            answer.read()
            if answer.status != 201:
                raise RuntimeError(f"PUT: {answer.status}")
        server.ask("MKCOL", folder + "/")
        return put
    figures = {"one": milliseconds(1, put_into(f"one{number}")), "eight": milliseconds(8, put_into(f"eight{number}"))}
    connection = http.client.HTTPConnection("127.0.0.1", server.port)
    before = processor_time(server.process)
    for _ in range(DOWNLOADS):
        connection.request("GET", f"{server.root}one{number}/0-0", headers=AUTHORIZATION)
        connection.getresponse().read()
    figures["download"] = (processor_time(server.process) - before) / DOWNLOADS * 1000
    return figures


def service(bench):
    figures = [Figure("one", "an upload, one connection", "ms", digits=3),
               Figure("eight", "eight connections", "ms", digits=3),
               Figure("download", "CPU of a download", "ms", digits=3)]
    with contextlib.ExitStack() as stack:
        places = [os.path.join(bench.disk, name) for name in ("ours", "apache")]
        for place in places:
            os.makedirs(place, mode=0o755)
        ours = stack.enter_context(velora_cloud(bench.build, places[0]))
        other = stack.enter_context(apache(places[1]))
        subjects = {"Velora": lambda number: served(ours, number),
                    "Apache, not durable": lambda number: served(other, number),
                    "bare disk": lambda number: disk(bench.disk, number)}
        return [Result("velora-cloud on the disk, 10 KiB", figures, interleaved(bench.rounds, subjects))]


ROWS = {"service": service}
