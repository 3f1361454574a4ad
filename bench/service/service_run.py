"""Starts and stops `kzfp serve` for measurements and tests, and reads what it says of itself."""

import http.client
import os
import pathlib
import re
import signal
import socket
import subprocess
import sys
import threading

STARTED = re.compile(r"listening on (https?)://(.+):(\d+)/")
LISTEN_FDS_START = 3  # the first descriptor of a socket that is handed over


class NotStarted(RuntimeError):
    """The service ended, or said something else than where it listens."""


class Service:
    """A running `kzfp serve`. Its standard error is collected, line by line.

    With a listening socket the program is handed that one, as systemd would: connections then wait
    in it while no program runs.
    """

    def __init__(self, kzfp, catalogue, *options, listener=None, environment=None):
        command = [str(kzfp), "serve", str(catalogue), *map(str, options)]
        if listener is None and "--listen" not in options:
            command += ["--listen", "127.0.0.1:0"]
        self.errors = []
        self.process = self._start(command, listener, environment)
        self._reader = threading.Thread(target=self._collect, daemon=True)
        self._reader.start()
        line = self.process.stdout.readline()
        found = STARTED.search(line)
        if not found:
            self.process.wait()
            self._reader.join()
            raise NotStarted(line + "".join(self.errors))
        self.scheme, self.host, self.port = found[1], found[2].strip("[]"), int(found[3])

    def _start(self, command, listener, environment):
        variables = {**os.environ, **(environment or {})}
        if listener is None:
            return subprocess.Popen(command, stdout=subprocess.PIPE, stderr=subprocess.PIPE,
                                    text=True, env=variables)
        # A shell in between, since LISTEN_PID is known in the new process only.
        shell = ["sh", "-c", 'LISTEN_FDS=1 LISTEN_PID=$$ exec "$@"', "sh", *command]
        return subprocess.Popen(shell, stdout=subprocess.PIPE, stderr=subprocess.PIPE, text=True,
                                env=variables, pass_fds=(LISTEN_FDS_START,),
                                preexec_fn=lambda: hand_over(listener.fileno()))

    def _collect(self):
        for line in self.process.stderr:
            self.errors.append(line)

    @property
    def url(self):
        return f"{self.scheme}://{self.host}:{self.port}"

    def request(self, method, path, body=None, headers=None, timeout=60):
        """Status, headers and body of one request on a connection of its own."""
        connection = http.client.HTTPConnection(self.host, self.port, timeout=timeout)
        try:
            connection.request(method, path, body, headers or {})
            answer = connection.getresponse()
            return answer.status, answer.headers, answer.read()
        finally:
            connection.close()

    def metrics(self, headers=None):
        """What /metrics says: a number for each name with its labels."""
        status, _, body = self.request("GET", "/metrics", headers=headers)
        if status != 200:
            raise RuntimeError(f"/metrics answers {status}")
        lines = (line.rsplit(" ", 1) for line in body.decode().splitlines()
                 if line and not line.startswith("#"))
        return {name: float(value) for name, value in lines}

    def stop(self, how=signal.SIGTERM, timeout=60):
        """Asks it to end; gives its exit status."""
        if self.process.poll() is None:
            self.process.send_signal(how)
        return self.ended(timeout)

    def ended(self, timeout=60):
        """Waits for its end; gives its exit status."""
        try:
            status = self.process.wait(timeout)
        except subprocess.TimeoutExpired:
            self.process.kill()
            self.process.wait()
            raise
        self._reader.join()
        return status

    def memory(self):
        """KiB that are resident: all, and what is not mapped from files."""
        text = pathlib.Path(f"/proc/{self.process.pid}/status").read_text(encoding="ascii")
        values = dict(re.findall(r"^(VmRSS|RssAnon):\s+(\d+) kB$", text, re.MULTILINE))
        return int(values["VmRSS"]), int(values["RssAnon"])

    def __enter__(self):
        return self

    def __exit__(self, *_):
        if self.process.poll() is None:
            self.process.kill()
        self.process.wait()
        self._reader.join()
        self.process.stdout.close()
        self.process.stderr.close()


def hand_over(descriptor):
    """Puts a descriptor where a program looks for a socket that it is handed."""
    if descriptor == LISTEN_FDS_START:
        os.set_inheritable(descriptor, True)
    else:
        os.dup2(descriptor, LISTEN_FDS_START)


def listening_socket(backlog=1024):
    """A socket on a free port of this machine, as systemd makes one for a socket unit."""
    listener = socket.socket(socket.AF_INET, socket.SOCK_STREAM)
    listener.setsockopt(socket.SOL_SOCKET, socket.SO_REUSEADDR, 1)
    listener.bind(("127.0.0.1", 0))
    listener.listen(backlog)
    return listener


def total(metrics, name, **labels):
    """The sum of a metric over the labels that are not given."""
    wanted = [f'{key}="{value}"' for key, value in labels.items()]
    return sum(value for key, value in metrics.items()
               if key.split("{")[0] == name and all(part in key for part in wanted))


def fail(message):
    sys.exit(f"{pathlib.Path(sys.argv[0]).name}: {message}")
