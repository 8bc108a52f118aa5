#!/usr/bin/env python3
"""site.py PROGRAM [ARGUMENT...]: runs the program with a display, an empty home, and the site that the tests of the web
view visit: $SITE, $SITE_TLS with a certificate of $SITE_CA, and $SITE_OTHER, which nobody may ask. Fails when the
program does, when $SITE_OTHER was asked, or when something was written into the home."""

import http.server
import os
import shutil
import ssl
import subprocess
import sys
import tempfile
import threading
import time

HEAD = ("<!DOCTYPE html><meta name=viewport content='width=device-width'><title>page</title>"
        "<style>body{margin:0;font:16px sans-serif} .all{position:fixed;inset:0;width:100%;height:100%}</style>")
PAGES = {
    "/link": "<a class=all href=/page>link</a>",
    "/link-foreign": "<a class=all href=https://foreign.invalid/>link</a>",
    "/link-window": "<a class=all href=/page target=_blank>link</a>",
    # each field reports what it holds, or that it was reached, as an address of the site
    "/form": "<form method=post action=/sent><input class=all name=a><input name=b><button></button></form>",
    "/select": "<select class=all onchange=\"location='/chose-'+value\"><option>1<option>2<option>3</select>",
    "/alert": "<button class=all onclick=\"alert('a <b>&amp;</b>');location='/closed'\">ask</button>",
    "/foreign-parts": "<img src=OTHER/a.png><script src=OTHER/b.js></script><iframe src=OTHER/c></iframe>"
                      "<script>fetch('OTHER/d').catch(()=>0).then(()=>{location='/parts-done'})</script>",
}


def handler(other, seen):
    class Handler(http.server.BaseHTTPRequestHandler):
        protocol_version = "HTTP/1.1"

        def reply(self, code, body=b"", kind="text/html", **fields):
            self.send_response(code)
            for name, value in fields.items():
                self.send_header(name.replace("_", "-"), value)
            self.send_header("Content-Type", kind)
            self.send_header("Content-Length", str(len(body)))
            self.end_headers()
            self.wfile.write(body)

        def do_GET(self):
            path = self.path.split("?")[0]
            seen.append(path)
            if path == "/slow":
                time.sleep(60)
            elif path == "/broken":
                self.connection.shutdown(2)
            elif path == "/zip":
                self.reply(200, b"PK", "application/zip")
            elif path == "/to-callback":
                self.reply(303, Location="https://callback.invalid/auth_complete")
            elif path == "/to-foreign":
                self.reply(302, Location="https://foreign.invalid/?token=1")
            elif path == "/cookie":
                self.reply(302, Location="/has-cookie" if self.headers.get("Cookie") else "/no-cookie", Set_Cookie="c=1")
            else:
                self.reply(200, (HEAD + PAGES.get(path, path).replace("OTHER", other or "")).encode())

        def do_POST(self):
            body = self.rfile.read(int(self.headers["Content-Length"])).decode()
            self.reply(303, Location="/got?" + body)

        def log_message(self, *_):
            pass

    return Handler


def serve(other=None, certificate=None):
    seen = []
    server = http.server.ThreadingHTTPServer(("127.0.0.1", 0), handler(other, seen))
    server.daemon_threads = True
    if certificate:
        context = ssl.SSLContext(ssl.PROTOCOL_TLS_SERVER)
        context.load_cert_chain(certificate)
        server.socket = context.wrap_socket(server.socket, server_side=True)
    threading.Thread(target=server.serve_forever, daemon=True).start()
    return server.server_port, seen


def certificate(folder, name, extra):
    path = os.path.join(folder, name + ".pem")
    subprocess.run(["openssl", "req", "-x509", "-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:prime256v1", "-nodes",
                    "-days", "2", "-subj", "/CN=localhost", "-keyout", path + ".key", "-out", path, *extra],
                   check=True, capture_output=True)
    with open(path, "a", encoding="ascii") as file, open(path + ".key", encoding="ascii") as key:
        file.write(key.read())
    return path


def main():
    folder = tempfile.mkdtemp(prefix="webview-")
    home, run = os.path.join(folder, "home"), os.path.join(folder, "run")
    os.mkdir(home)
    os.mkdir(run, 0o700)
    names = ["-addext", "subjectAltName=DNS:localhost"]
    right, wrong = certificate(folder, "right", names), certificate(folder, "wrong", names)
    other, asked = serve()
    site, _ = serve(f"http://127.0.0.1:{other}")
    secure, _ = serve(certificate=right)
    display = subprocess.Popen(["Xvfb", "-displayfd", "1", "-screen", "0", "480x800x24", "-nolisten", "tcp"],
                               stdout=subprocess.PIPE, stderr=subprocess.DEVNULL)
    environment = dict(os.environ, DISPLAY=":" + display.stdout.readline().decode().strip(), HOME=home,
                       XDG_RUNTIME_DIR=run, SITE=f"http://127.0.0.1:{site}", SITE_TLS=f"https://localhost:{secure}",
                       SITE_CA=right, SITE_WRONG_CA=wrong, LC_ALL="C.UTF-8", ELM_ENGINE="software_x11")
    # The search for leaks ends the program in the engine's memory; what views leave behind is a test of its own.
    environment["ASAN_OPTIONS"] = environment.get("ASAN_OPTIONS", "") + ":detect_leaks=0"
    for name in ("XDG_CACHE_HOME", "XDG_CONFIG_HOME", "XDG_DATA_HOME", "DBUS_SESSION_BUS_ADDRESS", "WAYLAND_DISPLAY"):
        environment.pop(name, None)
    manager = subprocess.Popen(["openbox", "--sm-disable"], env=environment, stdout=subprocess.DEVNULL,
                               stderr=subprocess.DEVNULL)  # without one no window has the focus
    try:
        while subprocess.run(["xdotool", "get_desktop"], env=environment, capture_output=True).returncode:
            time.sleep(0.05)
        result = subprocess.run(sys.argv[1:], env=environment).returncode
    finally:
        for process in (manager, display):
            process.kill()
            process.wait()
    written = [os.path.join(path, name) for path, _, files in os.walk(home) for name in files]
    # Elementary's and openbox's own; the list of GStreamer's plugins, which the engine makes when it is sent what is no page
    written = [name for name in written if "/.elementary/" not in name and "/openbox/" not in name and "/gstreamer-1.0/registry" not in name]
    shutil.rmtree(folder, ignore_errors=True)
    for fault in [f"written: {name}" for name in written] + [f"asked elsewhere: {path}" for path in asked]:
        print(fault, file=sys.stderr)
    sys.exit(result or bool(written or asked))


main()
