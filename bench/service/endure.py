#!/usr/bin/python3
"""Loads `kzfp serve` for long, with a stop and a start in the middle: no request may be lost and
no memory kept.

    bench/service/endure.py KZFP [--minutes 30] [--tracks 10000] [--stops 1] [--own-socket]

The listening socket is held by this program and handed over, as systemd does; with --own-socket
the service opens it, and connections are refused while none runs. Clients send trails of tracks
and of strangers, values, questions about tracks, requests that are wrong, and some byte by byte.

A request counts as accepted when its connection was and all of it was sent. Lost is one without
a whole answer. What is sent on a connection that was kept and that the service has just closed,
before any of an answer came, is sent again on a new one, as HTTP wants it, and is counted too.
Exits with 1 when a request was lost, an answer was wrong, a stop failed or memory grew.
"""

import argparse
import collections
import http.client
import json
import pathlib
import random
import statistics
import sys
import tempfile
import threading
import time

import service_music
import service_run

CLIENTS = 12
SAMPLE_SECONDS = 5
GROWTH = 1.05  # of a program's own memory that counts as flat
SLACK_KIB = 4096
TRAIL = {"Content-Type": "application/x-kzt"}
JSON = {"Content-Type": "application/json"}
BUSY = 503  # under load as right an answer as the one that is expected


class Case:
    """A request, how often it is drawn, and what its answer must say."""

    def __init__(self, weight, method, path, body=None, headers=None, status=200):
        self.weight, self.method, self.path = weight, method, path
        self.body, self.headers, self.status = body, headers or {}, status
        self.answer = None  # that of an idle service

    def essence(self, body):
        """What of an answer must not change: all but the times it took."""
        if self.path.startswith("/v1/match") and self.status == 200:
            answer = json.loads(body)
            return json.dumps([answer["verdict"], answer["matches"], answer["runner_up"]])
        return ""


def make_cases(options, folder, catalogue):
    values = json.dumps({"values": [1000 + 7 * i for i in range(30)]})
    found = service_music.make_clips(options.kzfp, folder, catalogue, options.tracks, 40)
    strangers = service_music.make_strangers(options.kzfp, folder, options.tracks, 8)
    cases = [Case(3, "POST", "/v1/match", path.read_bytes(), TRAIL) for path in found]
    cases += [Case(2, "POST", "/v1/match?speeds=0", path.read_bytes(), TRAIL) for path in strangers]
    cases += [
        Case(4, "POST", "/v1/match", values, JSON),
        Case(4, "GET", "/v1/tracks/17"),
        Case(2, "GET", "/v1/tracks/18/trail"),
        Case(2, "GET", "/v1/tracks?limit=50"),
        Case(4, "GET", "/v1/health"),
        Case(2, "POST", "/v1/match", b"no trail", TRAIL, status=400),
        Case(2, "POST", "/v1/match", b"?", {"Content-Type": "text/plain"}, status=415),
        Case(2, "GET", "/v1/nothing", status=404),
        Case(1, "POST", "/v1/match?no=1", found[0].read_bytes(), TRAIL, status=400),
    ]
    return cases


class Tally:
    """What became of the requests, counted by all clients."""

    def __init__(self):
        self.lock = threading.Lock()
        self.counts = collections.Counter()
        self.notes = []
        self.times = []

    def add(self, what, note=None):
        with self.lock:
            self.counts[what] += 1
            if note and len(self.notes) < 30:
                self.notes.append(f"{what}: {note}")


class Client(threading.Thread):
    """Sends one request after the other until told to stop."""

    def __init__(self, number, address, cases, tally, stopped):
        super().__init__(daemon=True)
        self.address, self.cases, self.tally, self.stopped = address, cases, tally, stopped
        self.chance = random.Random(number)
        self.keeps = number % 2 == 0
        self.slow = number % 6 == 5
        self.connection = None

    def run(self):
        weights = [case.weight for case in self.cases]
        while not self.stopped.is_set():
            self.ask(self.chance.choices(self.cases, weights)[0])
        self.close()

    def close(self):
        if self.connection:
            self.connection.close()
            self.connection = None

    def send(self, case):
        """Sends all of a request, at times slowly; gives whether the connection was kept."""
        kept = self.connection is not None
        if not kept:
            self.connection = http.client.HTTPConnection(*self.address, timeout=120)
            self.connection.connect()
        headers = {**case.headers, **({} if self.keeps else {"Connection": "close"})}
        if self.slow and case.body:
            self.connection.putrequest(case.method, case.path)
            for name, value in {**headers, "Content-Length": len(case.body)}.items():
                self.connection.putheader(name, str(value))
            self.connection.endheaders()
            body = case.body if isinstance(case.body, bytes) else case.body.encode()
            for at in range(0, len(body), 100):
                self.connection.send(body[at:at + 100])
                time.sleep(0.05)
        else:
            self.connection.request(case.method, case.path, case.body, headers)
        return kept

    def ask(self, case):
        while not self.stopped.is_set():
            begin = time.monotonic()
            kept = self.connection is not None
            try:
                self.send(case)
            except OSError as error:
                self.close()
                self.tally.add("not sent", None if kept else str(error))
                time.sleep(0.05)
                continue
            self.tally.add("sent")
            if self.receive(case, kept, begin):
                return

    def receive(self, case, kept, begin):
        """Whether an answer came; else the request is to be sent again."""
        try:
            answer = self.connection.getresponse()
            body = answer.read()
        except http.client.RemoteDisconnected as error:
            self.close()
            self.tally.add("closed" if kept else "lost", None if kept else f"{case.path}: {error}")
            return not kept
        except (OSError, http.client.HTTPException) as error:
            self.close()
            self.tally.add("closed" if kept and isinstance(error, ConnectionResetError) else "lost",
                           f"{case.path}: {error!r}")
            return False
        if not self.keeps or answer.will_close:
            self.close()
        self.judge(case, answer, body, time.monotonic() - begin)
        return True

    def judge(self, case, answer, body, seconds):
        self.tally.add(f"answered {answer.status}")
        if answer.status == BUSY and answer.headers["Retry-After"]:
            time.sleep(0.2)
        elif answer.status != case.status or case.essence(body) != case.answer:
            self.tally.add("wrong", f"{case.method} {case.path}: {answer.status} {body[:300]!r}")
        elif case.path.startswith("/v1/match") and case.status == 200 and not self.slow:
            with self.tally.lock:
                self.tally.times.append(seconds)


def learn(service, cases):
    """What an idle service answers."""
    for case in cases:
        status, _, body = service.request(case.method, case.path, case.body, case.headers)
        if status != case.status:
            service_run.fail(f"{case.method} {case.path}: {status}, not {case.status}: {body!r}")
        case.answer = case.essence(body)


class Memory:
    """Samples what the running program holds."""

    def __init__(self):
        self.samples = []

    def take(self, service):
        resident, own = service.memory()
        self.samples.append((resident, own))
        return resident, own

    def flat(self):
        """Whether the last quarter of the samples holds no more than the second; says so."""
        quarter = max(len(self.samples) // 4, 1)
        early, late = self.samples[quarter:2 * quarter] or self.samples, self.samples[-quarter:]
        before, after = (statistics.median(own for _, own in part) for part in (early, late))
        flat = after <= GROWTH * before + SLACK_KIB
        print(f"memory of its own: {before / 1024:.1f} MiB, later {after / 1024:.1f} MiB "
              f"({len(self.samples)} samples): {'flat' if flat else 'GROWS'}", flush=True)
        return flat


class Run:
    """The service, its clients, and the stops in between."""

    def __init__(self, options, folder):
        self.options = options
        self.catalogue = service_music.provide_catalogue(options.kzfp, options.tracks)
        self.cases = make_cases(options, folder, self.catalogue)
        self.listener = None if options.own_socket else service_run.listening_socket()
        self.port = 0 if options.own_socket else self.listener.getsockname()[1]
        self.tally = Tally()
        self.stopped = threading.Event()
        self.good = True
        self.logged = 0

    def start(self):
        listen = [] if self.listener else ["--listen", f"127.0.0.1:{self.port}"]
        service = service_run.Service(self.options.kzfp, self.catalogue, "--log", "json", *listen,
                                      *self.options.serve, listener=self.listener)
        self.port = self.port or service.port
        return service

    def part(self, service, seconds):
        """Lets the clients work for a while, and prints how it goes."""
        memory = Memory()
        end = time.monotonic() + seconds
        shown = 0
        while time.monotonic() < end:
            time.sleep(min(SAMPLE_SECONDS, max(end - time.monotonic(), 0)))
            if service.process.poll() is not None:
                print(f"the service ended by itself: {service.process.returncode}", flush=True)
                self.good = False
                return
            resident, own = memory.take(service)
            shown += 1
            if shown % 12 == 1:
                self.show(resident, own)
        self.good &= memory.flat()

    def show(self, resident, own):
        with self.tally.lock:
            counts = dict(sorted(self.tally.counts.items()))
        print(f"{time.strftime('%H:%M:%S', time.gmtime())} {resident / 1024:.1f} MiB resident, "
              f"{own / 1024:.1f} its own; {counts}", flush=True)

    def stop(self, service):
        begin = time.monotonic()
        status = service.stop(timeout=120)
        print(f"stopped in {time.monotonic() - begin:.2f} s with status {status}", flush=True)
        self.good &= status == 0
        self.logged += sum('"status":' in line and '"status":null' not in line
                           for line in service.errors)

    def start_clients(self, service):
        learn(service, self.cases)
        address = (service.host, service.port)
        clients = [Client(number, address, self.cases, self.tally, self.stopped)
                   for number in range(CLIENTS)]
        for client in clients:
            client.start()
        return clients

    def all(self):
        clients = []
        parts = self.options.stops + 1
        for part in range(parts):
            with self.start() as service:
                clients = clients or self.start_clients(service)
                self.part(service, 60 * self.options.minutes / parts)
                if part + 1 == parts:
                    self.stopped.set()
                    for client in clients:
                        client.join(120)
                self.stop(service)
        return self.conclude()

    def conclude(self):
        counts = self.tally.counts
        answered = sum(number for what, number in counts.items() if what.startswith("answered"))
        print("\n".join(self.tally.notes))
        print(f"\nsent {counts['sent']}, answered {answered}, closed before an answer on a kept "
              f"connection and sent again {counts['closed']}, not sent {counts['not sent']}, wrong "
              f"{counts['wrong']}, LOST {counts['lost']}; logged by the service "
              f"{self.logged - len(self.cases)}")
        print(", ".join(f"{what}: {number}" for what, number in sorted(counts.items())))
        times = sorted(self.tally.times)
        if times:
            print(f"matches: {len(times)}, median {1000 * times[len(times) // 2]:.0f} ms, 99 % "
                  f"{1000 * times[len(times) * 99 // 100]:.0f} ms")
        self.good &= not counts["lost"] and not counts["wrong"] and bool(answered)
        print("GOOD" if self.good else "BAD", flush=True)
        return self.good


def main():
    parser = argparse.ArgumentParser(description=__doc__,
                                     formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("kzfp", type=pathlib.Path)
    parser.add_argument("--minutes", type=float, default=30)
    parser.add_argument("--tracks", type=int, default=10000)
    parser.add_argument("--stops", type=int, default=1, help="stops and starts in between")
    parser.add_argument("--own-socket", action="store_true")
    parser.add_argument("--serve", nargs=argparse.REMAINDER, default=[],
                        help="options of kzfp serve; must come last")
    options = parser.parse_args()
    options.kzfp = options.kzfp.resolve()
    with tempfile.TemporaryDirectory(prefix="kzfp-endure-") as name:
        sys.exit(0 if Run(options, pathlib.Path(name)).all() else 1)


if __name__ == "__main__":
    main()
