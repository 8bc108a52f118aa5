"""The servers that are measured, or measured with: each a process of ours with one account and a tree for WebDAV."""

import base64
import contextlib
import hashlib
import os
import socket
import subprocess
import sys
import time

from common import HERE, NotMeasured, wanted_program

USER, PASSWORD = "ann@example.org", "secret"
CURL = ["curl", "-sSf", "-u", f"{USER}:{PASSWORD}"]


class Server:
    def __init__(self, name, port, root, process):
        self.name, self.port, self.root, self.process = name, port, root, process
        self.tree = f"http://127.0.0.1:{port}{root}"

    def ask(self, method, path):
        subprocess.run([*CURL, "-o", os.devnull, "-X", method, self.tree + path], check=True, stdin=subprocess.DEVNULL)


@contextlib.contextmanager
def ended(process):
    try:
        yield process
    finally:
        process.terminate()
        try:
            process.wait(10)
        except subprocess.TimeoutExpired:
            process.kill()
            process.wait()
        for stream in (process.stdin, process.stdout):
            if stream:
                stream.close()


@contextlib.contextmanager
def velora_cloud(build, place):
    process = subprocess.Popen([os.path.join(build, "service/velora-cloud"), "--root", os.path.join(place, "root"),
                                "--add-account", USER, "--listen", "127.0.0.1:0"], stdin=subprocess.PIPE,
                               stdout=subprocess.PIPE, text=True)
    with ended(process):
        process.stdin.write(PASSWORD + "\n")
        process.stdin.close()
        for line in process.stdout:
            if line.startswith("listening on "):
                break
        else:
            raise NotMeasured("velora-cloud does not start")
        yield Server("velora-cloud", int(line.rstrip("/\n").rsplit(":", 1)[1]), "/dav/", process)


def _free_port():
    with socket.create_server(("127.0.0.1", 0)) as found:
        return found.getsockname()[1]


def _answers(port):
    with contextlib.suppress(OSError), socket.create_connection(("127.0.0.1", port), 1):
        return True
    return False


@contextlib.contextmanager
def apache(place):
    program = wanted_program("apache2")
    os.makedirs(os.path.join(place, "dav"))
    sha = base64.b64encode(hashlib.sha1(PASSWORD.encode()).digest()).decode()
    with open(os.path.join(place, "users"), "w", encoding="ascii") as file:
        file.write(f"{USER}:{{SHA}}{sha}\n")
    modules = "".join(f"LoadModule {name}_module /usr/lib/apache2/modules/mod_{name}.so\n" for name in (
        "mpm_event", "authn_core", "authn_file", "authz_core", "authz_user", "auth_basic", "dav", "dav_fs"))
    port = _free_port()
    with open(os.path.join(place, "httpd.conf"), "w", encoding="ascii") as file:
        file.write(f"{modules}Listen 127.0.0.1:{port}\nServerName 127.0.0.1\nServerRoot {place}\nPidFile pid\n"
                   f"ErrorLog error.log\nDocumentRoot {place}\nDavLockDB {place}/lock\nMaxKeepAliveRequests 0\n"
                   f"<Directory {place}/dav>\nDav On\nAuthType Basic\nAuthName bench\nAuthUserFile {place}/users\n"
                   "Require valid-user\n</Directory>\n")
    if os.geteuid() == 0:  # Apache refuses to serve as root
        for name in ("", "dav"):
            os.chown(os.path.join(place, name), 65534, 65534)
    process = subprocess.Popen([program, "-DFOREGROUND", "-f", os.path.join(place, "httpd.conf")],
                               user=65534 if os.geteuid() == 0 else None)
    with ended(process):
        end = time.monotonic() + 10
        while not _answers(port):
            if process.poll() is not None or time.monotonic() > end:
                raise NotMeasured("Apache does not start")
            time.sleep(0.05)
        yield Server("Apache", port, "/dav/", process)


@contextlib.contextmanager
def far(server, seconds):
    """The same server, a round trip of so many seconds away."""
    process = subprocess.Popen([sys.executable, os.path.join(HERE, "distance.py"), str(seconds), str(server.port)],
                               stdin=subprocess.DEVNULL, stdout=subprocess.PIPE, text=True)
    with ended(process):
        port = process.stdout.readline()
        if not port:
            raise NotMeasured("the delaying forwarder does not start")
        yield Server(server.name, int(port), server.root, process)
