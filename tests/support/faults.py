#!/usr/bin/env python3
"""A bad network between a client and a service: an HTTP proxy on this machine that breaks what goes through it.

    faults.py --upstream http://127.0.0.1:8631/ --rule "PUT first lost"
    faults.py --upstream ... --seed 7 --chance 0.2 [--method PUT ...] [--fault 500-stored ...]

It prints `listening on http://127.0.0.1:PORT/` and forwards each request whole. On SIGTERM or SIGINT it prints how often
it did what, one line `FAULT COUNT` each, and ends. --log FILE gets a line `FAULT METHOD PATH STATUS` per fault; STATUS is
what the service said, 0 when it was not asked.

A rule is METHOD WHEN FAULT; METHOD may be `*`; WHEN is `always`, `first` (of each path), `every:N` (of the method) or
`once:N` (the N-th alone). The first rule that applies counts; with --chance the rest is left to luck. Luck depends on
the seed, the method, the path and how often it was asked for, not on the order: the same seed does the same again.

Faults that keep the request from the service, and by the name with `-stored` do the same after it has answered:
    reset        the connection is reset; without -stored sometimes in the middle of the body
    half-close   nothing more is sent, but what comes is read until the client closes
    stall        silence for --stall seconds, then the end
    rubbish      bytes that are no answer
    500 502 504 408 429 503   that status; 429 and 503 with Retry-After
and those that need the service's answer:
    lost         the connection is closed without it
    truncate     a part of it, then the end
    dribble      all of it, byte by byte
"""

import argparse
import collections
import hashlib
import http.client
import random
import signal
import socket
import struct
import sys
import tempfile
import threading
import time
import urllib.parse

STATUSES = {"500": "Internal Server Error", "502": "Bad Gateway", "504": "Gateway Timeout", "408": "Request Timeout",
            "429": "Too Many Requests", "503": "Service Unavailable"}
BOTH = ("reset", "half-close", "stall", "rubbish", *STATUSES)
FAULTS = (*BOTH, *(name + "-stored" for name in BOTH), "lost", "truncate", "dribble")
PIECE = 64 * 1024


class Rule:
    def __init__(self, text):
        self.method, when, self.fault = text.split()
        self.when, _, number = when.partition(":")
        self.number = int(number or 0)
        if self.fault not in FAULTS or self.when not in ("always", "first", "every", "once") or \
                (self.when in ("every", "once")) != (self.number > 0):
            raise ValueError(text)

    def applies(self, method, of_path, of_method):
        if self.method not in ("*", method):
            return False
        return {"always": True, "first": of_path == 1, "every": self.number and of_method % self.number == 0,
                "once": of_method == self.number}[self.when]


class Faults:
    """The proxy: started when it is made, at `address`; `tally` and `log` may be read at any time."""

    def __init__(self, upstream, rules=(), seed=0, chance=0.0, methods=("PUT",), faults=FAULTS, stall=3.0, retry_after=1):
        self.host = urllib.parse.urlsplit(upstream).netloc
        self.rules, self.seed, self.chance = [Rule(text) for text in rules], seed, chance
        self.methods, self.faults, self.stall, self.retry_after = methods, list(faults), stall, retry_after
        self.tally, self.log = collections.Counter(), []
        self.lock, self.paths, self.counts = threading.Lock(), collections.Counter(), collections.Counter()
        self.listener = socket.create_server(("127.0.0.1", 0), backlog=128)
        self.address = f"http://127.0.0.1:{self.listener.getsockname()[1]}/"
        threading.Thread(target=self._accept, daemon=True).start()

    def close(self):
        self.listener.close()

    def _accept(self):
        while True:
            try:
                connection, _ = self.listener.accept()
            except OSError:
                return
            threading.Thread(target=self._serve, args=(connection,), daemon=True).start()

    def _serve(self, connection):
        connection.setsockopt(socket.IPPROTO_TCP, socket.TCP_NODELAY, 1)
        service = http.client.HTTPConnection(self.host, timeout=600)
        try:
            with connection, connection.makefile("rb") as reader:
                while self._one(connection, reader, service):
                    pass
        except (OSError, http.client.HTTPException, ValueError):
            pass  # either side went away, or the client sends what is not HTTP
        finally:
            service.close()

    def _choose(self, method, path):
        with self.lock:
            self.paths[method, path] += 1
            self.counts[method] += 1
            of_path, of_method = self.paths[method, path], self.counts[method]
            self.tally["requests"] += 1
        luck = random.Random(hashlib.sha256(f"{self.seed} {method} {path} {of_path}".encode()).digest())
        if "/.velora-" in path:  # the client finds out how to store without replacing; what it stores so is no file of anybody
            return None, luck
        for rule in self.rules:
            if rule.applies(method, of_path, of_method):
                return rule.fault, luck
        if method in self.methods and luck.random() < self.chance:
            return luck.choice(self.faults), luck
        return None, luck

    def _one(self, connection, reader, service):
        """One request; whether the connection is good for another one."""
        line = reader.readline(PIECE)
        if not line:
            return False
        method, path, _ = line.decode("latin-1").split()
        headers = http.client.parse_headers(reader)
        fault, luck = self._choose(method, path)
        if "100-continue" in headers.get("Expect", ""):
            connection.sendall(b"HTTP/1.1 100 Continue\r\n\r\n")
        with tempfile.SpooledTemporaryFile(max_size=4 * 1024 * 1024) as body:
            length = int(headers.get("Content-Length", 0))
            if fault == "reset" and length and luck.random() < 0.5:
                body.write(reader.read(luck.randrange(length)))
                return self._break(connection, fault, method, path, 0, luck)
            if headers.get("Transfer-Encoding", "").lower() == "chunked":
                length = self._take_chunks(reader, body)
            else:
                self._take(reader, body, length)
            if fault in BOTH:
                return self._break(connection, fault, method, path, 0, luck)
            body.seek(0)
            answer = self._ask(service, method, path, headers, body, length)
            if fault:
                head = self._head(answer) + answer.read()
                done = self._break(connection, fault, method, path, answer.status, luck, head)
                return done and not answer.will_close
            connection.sendall(self._head(answer))
            while piece := answer.read(PIECE):
                connection.sendall(piece)
            return answer.length in (None, 0) and not answer.will_close

    @staticmethod
    def _take(reader, body, length):
        while length > 0:
            piece = reader.read(min(length, PIECE))
            if not piece:
                raise OSError("the body breaks off")
            body.write(piece)
            length -= len(piece)

    def _take_chunks(self, reader, body):
        total = 0
        while size := int(reader.readline(PIECE).split(b";")[0], 16):
            self._take(reader, body, size)
            reader.readline(PIECE)
            total += size
        while reader.readline(PIECE).strip():
            pass
        return total

    @staticmethod
    def _ask(service, method, path, headers, body, length):
        service.putrequest(method, path, skip_host=True, skip_accept_encoding=True)
        for name, value in headers.items():
            if name.lower() not in ("connection", "content-length", "transfer-encoding", "expect"):
                service.putheader(name, value.encode("latin-1"))
        if length or method in ("PUT", "POST"):
            service.putheader("Content-Length", str(length))
        service.endheaders()
        try:
            while piece := body.read(PIECE):
                service.send(piece)
        except (BrokenPipeError, ConnectionResetError):
            pass  # it has answered before it read everything
        return service.getresponse()

    @staticmethod
    def _head(answer):
        lines = [f"HTTP/1.1 {answer.status} {answer.reason}"]
        lines += [f"{name}: {value}" for name, value in answer.getheaders()
                  if name.lower() not in ("connection", "transfer-encoding", "keep-alive")]
        if answer.length is None or answer.will_close:
            lines.append("Connection: close")
        return ("\r\n".join(lines) + "\r\n\r\n").encode("latin-1")

    def _break(self, connection, fault, method, path, status, luck, answer=b""):
        """Does the fault; whether the connection is good for another request."""
        with self.lock:
            self.tally[fault] += 1
            self.log.append(f"{fault} {method} {path} {status}")
        kind = fault.removesuffix("-stored")
        if kind in STATUSES:
            wait = f"Retry-After: {self.retry_after}\r\n" if kind in ("429", "503") else ""
            connection.sendall(f"HTTP/1.1 {kind} {STATUSES[kind]}\r\n{wait}Content-Length: 0\r\n\r\n".encode())
            return True
        if kind == "reset":
            connection.setsockopt(socket.SOL_SOCKET, socket.SO_LINGER, struct.pack("ii", 1, 0))
        elif kind == "half-close":
            connection.shutdown(socket.SHUT_WR)
            connection.settimeout(self.stall)
            while connection.recv(PIECE):
                pass
        elif kind == "stall":
            time.sleep(self.stall)
        elif kind == "rubbish":
            connection.sendall(luck.randbytes(luck.randrange(1, 2000)) + b"\r\n\r\n")
        elif kind == "truncate":
            connection.sendall(answer[:luck.randrange(1, len(answer))])
        elif kind == "dribble":
            for at in range(len(answer)):
                connection.sendall(answer[at:at + 1])
                time.sleep(0.001)
            return True
        return False


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("--upstream", required=True, help="the service, http://HOST:PORT/")
    parser.add_argument("--rule", action="append", default=[], help="METHOD WHEN FAULT; may be given several times")
    parser.add_argument("--seed", type=int, default=0)
    parser.add_argument("--chance", type=float, default=0.0, help="of a fault at each request, 0 to 1")
    parser.add_argument("--method", action="append", help="what --chance is for, PUT when not given")
    parser.add_argument("--fault", action="append", choices=FAULTS, help="what --chance chooses from, all when not given")
    parser.add_argument("--stall", type=float, default=3.0, help="seconds (3)")
    parser.add_argument("--retry-after", type=int, default=1, help="seconds (1)")
    parser.add_argument("--log", help="a file for a line per fault")
    wanted = parser.parse_args()
    # Blocked before the threads begin, so that the signal waits for this one.
    signals = {signal.SIGTERM, signal.SIGINT}
    signal.pthread_sigmask(signal.SIG_BLOCK, signals)
    try:
        proxy = Faults(wanted.upstream, wanted.rule, wanted.seed, wanted.chance, wanted.method or ("PUT",),
                       wanted.fault or FAULTS, wanted.stall, wanted.retry_after)
    except ValueError as error:
        parser.error(f"no such rule: {error}")
    print(f"listening on {proxy.address}", flush=True)
    signal.sigwait(signals)
    with proxy.lock:
        for name, count in sorted(proxy.tally.items()):
            print(name, count)
        if wanted.log:
            with open(wanted.log, "w", encoding="utf-8") as file:
                file.writelines(line + "\n" for line in proxy.log)
    return 0


if __name__ == "__main__":
    sys.exit(main())
