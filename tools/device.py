"""A device of one's own for demos and end-to-end tests: its folders, its bus, its display, a service with an account,
and the means to look at the application and to click in it. Everything it starts it ends."""

import ast
import base64
import os
import re
import shutil
import signal
import ssl
import subprocess
import tempfile
import threading
import time
import urllib.error
import urllib.parse
import urllib.request

EMAIL, PASSWORD = "demo@velora.example", "velora-demo"
APP = "com.orvant.velora"


class Trouble(Exception):
    """Something a person should read, as one line."""


def wait_for(what, condition, seconds=20.0, pause=0.05):
    """The first true result of condition(); Trouble when there is none in time."""
    end = time.monotonic() + seconds
    while True:
        result = condition()
        if result:
            return result
        if time.monotonic() > end:
            raise Trouble(f"waited {seconds:.0f} s in vain for {what}")
        time.sleep(pause)


class Device:
    def __init__(self, build, data=None, size="480x800", language=None, scale=None, dark=False,
                 keep_display=False, maximized=True, secure=False, wait_limit=None):
        self.build, self.size, self.maximized, self.secure = build, size, maximized, secure
        self.wait_limit = wait_limit  # seconds that uploads wait for a service in trouble
        self.width = int(size.split("x")[0])
        self.home = tempfile.mkdtemp(prefix="velora-")
        self.data = data or os.path.join(self.home, "cloud")
        self.processes = []
        self.port = 0
        self.authority = None  # the certificate that this device trusts, and no other
        self.env = dict(os.environ)
        runtime = os.path.join(self.home, "run")
        os.makedirs(runtime, mode=0o700)
        if keep_display:  # found by way of the folders that are replaced below
            self.env.setdefault("XAUTHORITY", os.path.expanduser("~/.Xauthority"))
            runtime = self.env.get("XDG_RUNTIME_DIR", runtime)
        else:
            for name in ("DISPLAY", "WAYLAND_DISPLAY", "XAUTHORITY", "DBUS_SESSION_BUS_ADDRESS", "WINDOWID"):
                self.env.pop(name, None)
        self.env.update(
            HOME=self.home,
            XDG_CONFIG_HOME=os.path.join(self.home, "config"),
            XDG_DATA_HOME=os.path.join(self.home, "share"),
            XDG_CACHE_HOME=os.path.join(self.home, "cache"),
            XDG_RUNTIME_DIR=runtime,
            PLATFORM_DATA_DIR=os.path.join(self.home, "device"),
            CLOUD_SERVICES_DIR=os.path.join(self.home, "services"),
            VELORA_MEDIA_ROOT=os.path.join(self.home, "media"),
            ORVANT_INSPECT="1",
            CLOUD_SECRETS="file",  # nobody's keyring
        )
        if scale:
            self.env["ELM_SCALE"] = str(scale)
        if dark:
            self.env["ORVANT_THEME"] = "dark"
        for name in ("XDG_CONFIG_HOME", "XDG_DATA_HOME", "XDG_CACHE_HOME", "CLOUD_SERVICES_DIR", "VELORA_MEDIA_ROOT"):
            os.makedirs(self.env[name], exist_ok=True)
        self.log = os.path.join(self.home, "log.txt")
        if language:
            self.setting("db/menu_widget/language", language)

    def program(self, path):
        return os.path.join(self.build, path)

    def start(self, command, **options):
        with open(self.log, "ab") as log:
            options.setdefault("stderr", log)
            options.setdefault("stdin", subprocess.DEVNULL)
            options.setdefault("env", self.env)
            process = subprocess.Popen(command, start_new_session=True, **options)
        self.processes.append(process)
        return process

    def run(self, *command, **options):
        """The standard output of a command that must succeed."""
        options.setdefault("timeout", 60)
        if "input" not in options:
            options["stdin"] = subprocess.DEVNULL
        try:
            done = subprocess.run(command, env=self.env, capture_output=True, **options)
        except subprocess.TimeoutExpired:
            raise Trouble(f"{os.path.basename(command[0])} does not come to an end") from None
        if done.returncode != 0:
            words = done.stderr.decode(errors="replace").strip().splitlines()
            raise Trouble(f"{os.path.basename(command[0])} failed: {words[-1] if words else done.returncode}")
        return done.stdout.decode(errors="surrogateescape")

    def tool(self, path, *arguments, **options):
        return self.run(self.program(path), *arguments, **options)

    # the session

    def start_bus(self):
        bus = self.start(["dbus-daemon", "--session", "--nofork", "--print-address=1"], stdout=subprocess.PIPE,
                         stderr=subprocess.DEVNULL)
        self.env["DBUS_SESSION_BUS_ADDRESS"] = bus.stdout.readline().decode().strip()

    def is_on_bus(self, name):
        return name in self.run("gdbus", "call", "--session", "--dest", "org.freedesktop.DBus", "--object-path", "/",
                                "--method", "org.freedesktop.DBus.ListNames")

    def has_display(self):
        """Whether a window can be opened: a variable may be set and name nothing."""
        if self.env.get("DISPLAY"):
            return subprocess.run(["xdotool", "getdisplaygeometry"], env=self.env, capture_output=True).returncode == 0
        socket = os.path.join(self.env["XDG_RUNTIME_DIR"], self.env.get("WAYLAND_DISPLAY", ""))
        return bool(self.env.get("WAYLAND_DISPLAY")) and os.path.exists(socket)

    def start_display(self):
        # No frames and no menus, and unless told otherwise the window is the screen, as on a phone.
        looks = "<decor>no</decor>" + "<maximized>yes</maximized>" * self.maximized
        rules = os.path.join(self.home, "openbox.xml")
        with open(rules, "w", encoding="utf-8") as file:
            file.write('<openbox_config xmlns="http://openbox.org/3.4/rc"><applications>'
                       f'<application class="*" type="normal">{looks}</application>'
                       f'<application class="*" type="dialog">{looks}</application>'
                       '</applications><keyboard><keybind key="A-F4"><action name="Close"/></keybind></keyboard>'
                       "</openbox_config>")
        for attempt in range(3):
            server = self.start(
                ["Xvfb", "-displayfd", "1", "-screen", "0", f"{self.size}x24", "-nolisten", "tcp"],
                stdout=subprocess.PIPE, stderr=subprocess.DEVNULL)
            self.env["DISPLAY"] = ":" + server.stdout.readline().decode().strip()
            manager = self.start(["openbox", "--sm-disable", "--config-file", rules], stdout=subprocess.DEVNULL,
                                 stderr=subprocess.DEVNULL)
            try:
                wait_for("the window manager", lambda: subprocess.run(
                    ["xdotool", "get_desktop"], env=self.env, capture_output=True, timeout=10).returncode == 0, 5)
                return
            except (Trouble, subprocess.TimeoutExpired):
                # A server that ends removes the socket of the next one, when that took its number just then.
                for process in (manager, server):
                    process.kill()
                    process.wait()
                if attempt == 2:
                    raise Trouble("the virtual display does not start") from None

    def start_notification_daemon(self, in_sight=True, lasting=False):
        """Out of sight means: too small to cover what is to be clicked. Lasting bubbles wait for their click."""
        if not shutil.which("dunst"):
            return
        rules = os.path.join(self.home, "dunstrc")
        width = self.width - 32
        with open(rules, "w", encoding="utf-8") as file:
            file.write(f"[global]\nwidth = {width}\norigin = top-center\noffset = 0x16\nfont = Sans 12\n"
                       "frame_width = 1\ncorner_radius = 8\nmax_icon_size = 48\nshow_indicators = no\n"
                       "markup = full\nformat = \"<b>%s</b>\\n%b\"\n"
                       "mouse_left_click = do_action, close_current\n")
            if not in_sight:
                file.write("width = 8\nheight = 8\norigin = bottom-right\noffset = 0x0\nicon_position = off\n"
                           "padding = 0\nhorizontal_padding = 0\nframe_width = 0\nfont = Sans 1\n")
            if lasting:
                file.write("[urgency_low]\ntimeout = 0\n[urgency_normal]\ntimeout = 0\n")
        self.start(["dunst", "-conf", rules], stdout=subprocess.DEVNULL, stderr=subprocess.DEVNULL)
        wait_for("the notification daemon", lambda: self.is_on_bus("org.freedesktop.Notifications"))

    # the service and the account

    def make_authority(self):
        """A certificate authority of this device's own, whose key is gone at once, and a certificate of the service."""
        def at(name):
            return os.path.join(self.home, name)
        new_key = ("-newkey", "ec", "-pkeyopt", "ec_paramgen_curve:P-256", "-noenc", "-days", "365")
        self.run("openssl", "req", "-x509", *new_key, "-keyout", at("authority.key"), "-out", at("authority.pem"),
                 "-subj", "/CN=Velora demo authority", "-addext", "keyUsage=critical,keyCertSign")
        self.run("openssl", "req", "-x509", *new_key, "-keyout", at("service.key"), "-out", at("service.pem"),
                 "-CA", at("authority.pem"), "-CAkey", at("authority.key"), "-subj", "/CN=velora-cloud",
                 "-addext", "basicConstraints=critical,CA:FALSE", "-addext", "subjectAltName=IP:127.0.0.1")
        os.unlink(at("authority.key"))
        return at("authority.pem"), at("service.pem"), at("service.key")

    def start_service(self, *options):
        """Starts velora-cloud, a second time at the port that it had."""
        if self.secure and not self.authority:
            self.authority, self.certificate, self.key_file = self.make_authority()
        if self.secure:
            options += ("--tls-certificate", self.certificate, "--tls-key", self.key_file)
        cloud = self.start([self.program("service/velora-cloud"), "--root", self.data, "--listen",
                            f"127.0.0.1:{self.port}", "--add-account", EMAIL, *options],
                           stdin=subprocess.PIPE, stdout=subprocess.PIPE)
        cloud.stdin.write(PASSWORD.encode() + b"\n")
        cloud.stdin.close()
        for line in cloud.stdout:
            found = re.match(r"listening on (https?://\S+)", line.decode())
            if found:
                break
        else:
            raise Trouble("velora-cloud does not start; its words are in " + self.log)
        self.service = cloud
        self.web = found.group(1).rstrip("/")
        self.port = urllib.parse.urlsplit(self.web).port
        with open(os.path.join(self.env["CLOUD_SERVICES_DIR"], "Velora.conf"), "w", encoding="utf-8") as file:
            file.write(f"[Service]\nWeb={self.web}/\nApi={self.web}/\nStorage={self.web}/dav/\n")
            if self.wait_limit is not None:
                file.write(f"WaitLimit={self.wait_limit}\n")
            if self.authority:
                file.write(f"CAFile={self.authority}\n")
        return cloud

    def hurry(self):
        """Ends what was asked of the service with --delay."""
        self.service.send_signal(signal.SIGUSR1)

    def sign_in(self):
        self.token = self.tool("service/velora-cloud", "--root", self.data, "--token", EMAIL).split()[-1]
        self.token_set(self.token)
        self.tool("platform/account/device-account", "add", "--package", APP, "--domain", "Velora", "--user", EMAIL)

    def token_set(self, token):
        self.tool("platform/cloud_content_sync/cloud-account", "set", "Velora", "--email", EMAIL,
                  input=token.encode() + b"\n")

    def setting(self, key, value):
        self.tool("platform/vconf/settings-store", "set", key, value)

    def _ask(self, method, path, body=None, headers=None):
        request = urllib.request.Request(self.web + "/dav" + urllib.parse.quote(path, errors="surrogateescape"),
                                         data=body, method=method, headers=headers or {})
        secret = base64.b64encode(f"{EMAIL}:{PASSWORD}".encode()).decode()
        request.add_header("Authorization", "Basic " + secret)
        trusted = ssl.create_default_context(cafile=self.authority) if self.authority else None
        return urllib.request.urlopen(request, timeout=60, context=trusted)

    def make_folder(self, path):
        """Makes a cloud folder and those above it."""
        above = ""
        for segment in path.strip("/").split("/"):
            above += "/" + segment
            try:
                self._ask("MKCOL", above)
            except urllib.error.HTTPError as error:
                if error.code != 405:  # 405: it is there
                    raise Trouble(f"the service does not make the folder {above}: {error}") from error

    def put(self, path, body):
        self._ask("PUT", path, body, {"Content-Type": "application/octet-stream"})

    def get(self, path):
        return self._ask("GET", path)

    def all_files(self):
        """The cloud paths of all files, from the service's plain tree."""
        top = os.path.join(self.data, "files", EMAIL)
        return {os.path.join("/", os.path.relpath(os.path.join(folder, name), top))
                for folder, _, names in os.walk(top) for name in names}

    def stored_files(self):
        """{local path: cloud path} of all files of all accounts."""
        top = os.path.join(self.data, "files")
        found = {}
        for folder, _, names in os.walk(top):
            for name in names:
                local = os.path.join(folder, name)
                found[local] = "/" + "/".join(os.path.relpath(local, top).split("/")[1:])
        return found

    # the application

    def start_application(self):
        application = self.start([self.program("src/setting/main/velora"), "--service"])
        wait_for("the application on the bus", lambda: self.is_on_bus(APP) or application.poll() is not None)
        if application.poll() is not None:
            raise Trouble("the application does not start; its words are in " + self.log)
        return application

    # what a person sees and does

    def visible(self):
        """What the application shows: (kind, text, x, y, width, height), bottom to top; nothing while it is not there."""
        return [entry for entry in self._inspect() if entry[0] != "focus"]

    def focused(self):
        """The text of what has the keys' focus, or its type."""
        return next((text for kind, text, *_ in self._inspect() if kind == "focus"), None)

    def _ask_application(self, method):
        done = subprocess.run(["gdbus", "call", "--session", "--dest", APP, "--object-path", "/com/orvant/Inspect",
                               "--method", "com.orvant.Inspect." + method], env=self.env, capture_output=True, timeout=20)
        return done.stdout.decode(errors="replace") if done.returncode == 0 else ""

    def _inspect(self):
        rows = re.findall(r"\('((?:[^'\\]|\\.)*)', (?:'((?:[^'\\]|\\.)*)'|\"((?:[^\"\\]|\\.)*)\"), "
                          r"(-?\d+), (-?\d+), (-?\d+), (-?\d+)\)", self._ask_application("Visible"))
        return [(kind, ast.literal_eval(f"'{single}'" if single else f'"{double}"'), *map(int, place))
                for kind, single, double, *place in rows]

    def find(self, text, kind=None):
        found = [entry for entry in self.visible() if entry[1] == text and kind in (None, entry[0])]
        return found[-1] if found else None

    def click(self, text, kind=None, seconds=20.0):
        """A pointer click in the middle of a text or widget, once it is there and lies still."""
        place = wait_for(f'"{text}" on screen', lambda: self.find(text, kind), seconds)
        end = time.monotonic() + seconds
        while True:
            time.sleep(0.15)
            now = self.find(text, kind)
            if now == place:
                break
            if time.monotonic() > end:
                raise Trouble(f'"{text}" does not stay on screen')
            place = now or place
        _, _, x, y, width, height = place
        self.run("xdotool", "mousemove", str(x + width // 2), str(y + height // 2), "sleep", "0.05", "mousedown", "1",
                 "sleep", "0.05", "mouseup", "1")

    def key(self, name):
        """Presses a key, and comes back when the application has dealt with it or has left, or will not get it."""
        before = self._ask_application("Keys")
        self.run("xdotool", "key", name)
        end = time.monotonic() + 3
        while before and self._ask_application("Keys") == before and time.monotonic() < end:
            time.sleep(0.02)

    def raise_window(self):
        """Brings the application's window back to the front; false when there is none."""
        found = subprocess.run(["xdotool", "search", "--onlyvisible", "--name", "^velora$"], env=self.env,
                               capture_output=True, check=False)
        windows = found.stdout.split()
        if windows:
            subprocess.run(["xdotool", "windowactivate", "--sync", windows[-1]], env=self.env, capture_output=True,
                           timeout=20, check=False)
        return bool(windows)

    def picture(self, path):
        time.sleep(0.3)  # what is on its way to the screen
        self.run("import", "-window", "root", path)

    def launch(self, operation, *arguments, **options):
        """Sends a launch request as another application would; the process prints the reply."""
        return self.start([self.program("platform/app/velora-launch"), "--operation", operation, *arguments],
                          stdout=subprocess.PIPE, **options)

    def notifications(self):
        return self.tool("platform/notification/notifications", "list").splitlines()

    def left_over(self):
        """The ids of processes, also of those that others started for us, that work in this device's folders."""
        mine = b"PLATFORM_DATA_DIR=" + os.fsencode(self.env["PLATFORM_DATA_DIR"])
        found = []
        for pid in filter(str.isdigit, os.listdir("/proc")):
            try:
                with open(f"/proc/{pid}/environ", "rb") as file:
                    if mine in file.read().split(b"\0") and int(pid) != os.getpid():
                        found.append(int(pid))
            except OSError:
                pass
        return found

    def end(self):
        """Ends every process and removes the device's folders. A second interrupt does not stop this."""
        handlers = {}
        if threading.current_thread() is threading.main_thread():
            handlers = {number: signal.signal(number, signal.SIG_IGN)
                        for number in (signal.SIGINT, signal.SIGTERM, signal.SIGHUP)}
        for process in reversed(self.processes):
            if process.poll() is None:
                process.terminate()
                try:
                    process.wait(5)
                except subprocess.TimeoutExpired:
                    process.kill()
                    process.wait()
            if process.stdout:
                process.stdout.close()
        end = time.monotonic() + 3
        while (left := self.left_over()) and time.monotonic() < end:
            time.sleep(0.05)
        for pid in left:
            try:
                os.kill(pid, signal.SIGKILL)
            except ProcessLookupError:
                pass
        shutil.rmtree(self.home, ignore_errors=True)
        for number, handler in handlers.items():
            signal.signal(number, handler)
