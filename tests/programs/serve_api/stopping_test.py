"""A full queue, and the end: what was accepted is answered, and another start goes on."""

import concurrent.futures
import http.client
import signal
import socket
import threading
import time

import pytest
import service_run
from conftest import WRITE_TOKEN

TRAIL, WAV = "application/x-kzt", "audio/wav"


class Flood:
    """Keeps a service busy with half hours of sound."""

    def __init__(self, client, material, threads=4):
        self.client, self.material = client, material
        self.over = threading.Event()
        self.statuses = []
        self.threads = [threading.Thread(target=self.run, args=(path, token))
                        for path, token in (("/v1/match", None),
                                            ("/v1/tracks?source=long", WRITE_TOKEN))
                        for _ in range(threads)]

    def run(self, path, token):
        while not self.over.is_set():
            self.statuses.append(self.client.ask("POST", path, self.material.long, WAV, token)[0])

    def __enter__(self):
        for thread in self.threads:
            thread.start()
        return self

    def __exit__(self, *_):
        self.over.set()
        for thread in self.threads:
            thread.join()


def until_busy(ask):
    """Asks until the answer is 503; gives it."""
    for _ in range(3000):
        status, answer, headers = ask()
        if status == 503:
            return answer, headers
    pytest.fail("the queue was never full")


def test_a_full_queue_refuses_at_once(start, catalogue, material, token_files):
    client = start(catalogue, "--lookups", "1", "--queue", "1",
                   "--write-token-file", token_files / "write")
    with Flood(client, material) as flood:
        answer, headers = until_busy(lambda: client.match(material.trail))
        assert answer["error"]["code"] == "queue_full"
        assert int(headers["Retry-After"]) >= 1
        for ask in (lambda: client.ask("POST", "/v1/tracks?source=a", material.other_trail, TRAIL,
                                       WRITE_TOKEN),
                    lambda: client.ask("DELETE", "/v1/tracks/99", token=WRITE_TOKEN),
                    lambda: client.ask("GET", "/v1/tracks"),
                    lambda: client.ask("GET", "/v1/tracks/1"),
                    lambda: client.ask("GET", "/v1/tracks/1/trail")):
            until_busy(ask)
        assert client.ask("GET", "/v1/health")[0] == 200
        assert client.ask("GET", "/metrics")[0] == 200
    assert 200 in flood.statuses
    assert client.match(material.trail)[0] == 200
    refused = service_run.total(client.service.metrics(), "kzfp_refused_total")
    assert refused >= 6


def sent(service, request):
    """A connection on which these bytes have been sent."""
    connection = socket.create_connection((service.host, service.port), timeout=30)
    connection.sendall(request)
    return connection


def answer_on(connection):
    """Status, headers and body of what comes on a connection."""
    with connection, http.client.HTTPResponse(connection, method="POST") as answer:
        answer.begin()
        return answer.status, answer.headers, answer.read()


@pytest.mark.parametrize("how", [signal.SIGTERM, signal.SIGINT])
def test_what_was_accepted_is_answered_before_the_end(start, material, described, how):
    """The signal follows on the heels of the requests."""
    client = start(material.catalogue, "--lookups", "1")
    request = (b"POST /v1/match HTTP/1.1\r\nHost: localhost\r\nContent-Type: application/x-kzt\r\n"
               b"Content-Length: %d\r\n\r\n" % len(material.trail) + material.trail)
    waiting = [sent(client.service, request) for _ in range(60)]
    client.service.process.send_signal(how)
    for connection in waiting:
        told = described.check("POST", "/v1/match", *(answer := answer_on(connection)))
        assert (answer[0], told["verdict"]) == (200, "match")
    assert client.service.ended() == 0


def test_health_says_that_the_service_is_being_stopped(start, material, described):
    """Asked by who had sent a part of the request before."""
    client = start(material.catalogue)
    connection = sent(client.service, b"GET /v1/health HTTP/1.1\r\nHost: ")
    assert client.ask("GET", "/v1/health")[0] == 200  # by now the part has been read
    client.service.process.send_signal(signal.SIGTERM)
    with pytest.raises(OSError):
        for _ in range(1000):
            sent(client.service, b"").close()
    connection.sendall(b"localhost\r\n\r\n")
    told = described.check("GET", "/v1/health", *(answer := answer_on(connection)))
    assert (answer[0], told["status"]) == (503, "draining")
    assert client.service.ended() == 0


def test_who_sends_nothing_more_does_not_hold_the_end_up(start, material):
    client = start(material.catalogue, "--drain", "1")
    with sent(client.service, b"POST /v1/match HTTP/1.1\r\nHost: "):
        assert client.service.stop(timeout=20) == 0


def test_no_connection_is_taken_after_the_end(start, material):
    client = start(material.catalogue)
    assert client.service.stop() == 0
    with pytest.raises(OSError):
        client.service.request("GET", "/v1/health")


def test_another_start_goes_on(start, material):
    listener = service_run.listening_socket()
    with listener:
        first = start(material.catalogue, listener=listener)
        assert first.match(material.trail)[0] == 200
        assert first.service.stop() == 0
        with concurrent.futures.ThreadPoolExecutor(4) as pool:
            # Connections wait in the socket while no program runs.
            waiting = [pool.submit(first.match, material.trail) for _ in range(4)]
            second = start(material.catalogue, listener=listener)
            assert [one.result()[0] for one in waiting] == [200] * 4
        assert second.service.stop() == 0


def test_a_stop_in_the_middle_of_many_loses_none(start, material):
    """Whatever connection was made is answered, over three stops."""
    listener = service_run.listening_socket()
    over = threading.Event()
    statuses = []

    def ask(client):
        while not over.is_set():
            statuses.append(client.match(material.trail)[0])  # raises when there is no answer
    with listener, concurrent.futures.ThreadPoolExecutor(8) as pool:
        client = start(material.catalogue, listener=listener)
        asking = [pool.submit(ask, client) for _ in range(8)]
        for _ in range(3):
            seen = len(statuses)
            while len(statuses) < seen + 40 and not any(one.done() for one in asking):
                time.sleep(0.01)
            assert client.service.stop() == 0
            client = start(material.catalogue, listener=listener)
        over.set()
        for one in asking:
            one.result()
    assert set(statuses) <= {200, 503}
    assert statuses.count(200) >= 120


def test_tracks_that_were_added_are_there_after_another_start(start, catalogue, material,
                                                              token_files):
    options = ("--write-token-file", token_files / "write")
    first = start(catalogue, *options)
    assert first.ask("POST", "/v1/tracks?source=new.wav&title=New", material.other_trail, TRAIL,
                     WRITE_TOKEN)[0] == 201
    first.service.process.kill()  # without any warning
    first.service.process.wait()
    second = start(catalogue, *options)
    assert second.match(material.other_trail)[1]["matches"][0]["title"] == "New"


@pytest.mark.parametrize("options,told", [
    (("--listen", "0.0.0.0:0"), "--insecure"), (("--listen", "nonsense"), "HOST:PORT"),
    (("--listen", "127.0.0.1:99999"), "HOST:PORT"), (("--token-file", "/nowhere"), "/nowhere"),
    (("--tls-cert", "/nowhere"), "--tls-key"), (("--queue", "0"), "--queue"),
    (("--page", "/nowhere"), "/nowhere")])
def test_wrong_usage_is_told_with_the_cure(material, kzfp, options, told):
    with pytest.raises(service_run.NotStarted) as failure:
        service_run.Service(kzfp.program, material.catalogue, *options)
    assert told in str(failure.value)


def test_short_and_open_tokens_are_refused(material, kzfp, tmp_path):
    path = tmp_path / "token"
    for text, mode in (("short", 0o600), ("", 0o600), ("a-token-that-is-long-enough", 0o644)):
        path.write_text(text, encoding="ascii")
        path.chmod(mode)
        with pytest.raises(service_run.NotStarted) as failure:
            service_run.Service(kzfp.program, material.catalogue, "--token-file", path)
        assert str(path) in str(failure.value)
        assert "a-token" not in str(failure.value)
