"""Requests that no well-behaved client sends: malformed, huge, slow, many at once. The service must
answer or close, and go on working."""

import concurrent.futures
import http.client
import os
import random
import select
import socket

import pytest
import service_run
from conftest import READ_TOKEN, Client

TRAIL = "application/x-kzt"


class Raw:
    """A connection on which anything can be sent."""

    def __init__(self, service):
        self.socket = socket.create_connection((service.host, service.port), timeout=30)

    def send(self, bytes_):
        try:
            self.socket.sendall(bytes_)
        except OSError:
            pass  # it was closed, which is an answer

    def rest(self):
        """All that comes until the connection is closed."""
        received = b""
        try:
            while part := self.socket.recv(65536):
                received += part
        except ConnectionResetError:
            pass
        return received

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self.socket.close()


def said(service, bytes_):
    """What the service answers to these bytes and no more, until it closes the connection."""
    with Raw(service) as raw:
        raw.send(bytes_)
        return raw.rest()


def status_of(answer):
    return int(answer.split(b" ")[1]) if answer.startswith(b"HTTP/1.") else None


def works(client, material):
    return client.match(material.trail)[1]["verdict"] == "match"


HOST = b"Host: localhost\r\n"
MALFORMED = {
    "nothing": b"",
    "an empty line": b"\r\n\r\n",
    "no version": b"GET /v1/health\r\n\r\n",
    "no method": b" /v1/health HTTP/1.1\r\n" + HOST + b"\r\n",
    "words": b"hello\r\n\r\n",
    "TLS": bytes.fromhex("1603010200010001fc0303") + bytes(500),
    "another protocol": b"PRI * HTTP/2.0\r\n\r\nSM\r\n\r\n",
    "no host": b"GET /v1/health HTTP/1.1\r\n\r\n",
    "two hosts": b"GET /v1/health HTTP/1.1\r\n" + HOST + HOST + b"\r\n",
    "a folded host": b"GET /v1/health HTTP/1.1\r\nHost: local\r\n host\r\n\r\n",
    "a blank before a colon": b"GET /v1/health HTTP/1.1\r\nHost : localhost\r\n\r\n",
    "a negative length": b"POST /v1/match HTTP/1.1\r\n" + HOST + b"Content-Length: -1\r\n\r\n",
    "two lengths": b"POST /v1/match HTTP/1.1\r\n" + HOST +
                   b"Content-Type: application/x-kzt\r\nContent-Length: 3\r\nContent-Length: 5"
                   b"\r\n\r\nabcde",
    "a chunk without a number": b"POST /v1/match HTTP/1.1\r\n" + HOST +
                                b"Content-Type: application/x-kzt\r\n"
                                b"Transfer-Encoding: chunked\r\n\r\nxyz\r\n",
    "a body that ends early": b"POST /v1/match HTTP/1.1\r\n" + HOST +
                              b"Content-Type: application/x-kzt\r\nContent-Length: 100\r\n\r\nabc",
    "a long line": b"GET /" + b"x" * 100000 + b" HTTP/1.1\r\n" + HOST + b"\r\n",
    "a long header": b"GET /v1/health HTTP/1.1\r\n" + HOST + b"X: " + b"y" * 100000 + b"\r\n\r\n",
    "many headers": b"GET /v1/health HTTP/1.1\r\n" + HOST + b"X: y\r\n" * 20000 + b"\r\n",
}


@pytest.fixture(scope="module")
def hasty(material, described):
    """A service that soon gives up those who send nothing more."""
    with service_run.Service(os.environ["KZFP"], material.catalogue, "--timeout", "1") as service:
        yield Client(service, described)


@pytest.mark.parametrize("what", MALFORMED)
def test_malformed_requests_are_refused(hasty, material, what):
    answer = said(hasty.service, MALFORMED[what])
    status = status_of(answer)
    assert answer == b"" or 400 <= status < 500 or status in (501, 505), answer
    assert works(hasty, material)


def test_a_zero_byte_ends_the_address(hasty):
    """The HTTP library hands addresses over as C texts, so what is behind it is not seen."""
    said_to = [said(hasty.service, b"GET /v1/health" + more + b" HTTP/1.1\r\n" + HOST + b"\r\n")
               for more in (b"", b"\0/../../etc")]
    assert [status_of(answer) for answer in said_to] == [200, 200]


def test_random_bytes_do_no_harm(hasty, material):
    chance = random.Random(17)
    good = (b"POST /v1/match?top=2 HTTP/1.1\r\n" + HOST + b"Content-Type: application/x-kzt\r\n" +
            b"Content-Length: %d\r\n\r\n" % len(material.trail) + material.trail)
    head = good.index(b"\r\n\r\n")

    def changed(_):
        bytes_ = bytearray(good[:chance.randrange(1, len(good))])
        for _ in range(chance.randrange(1, 8)):
            bytes_[chance.randrange(min(len(bytes_), head))] = chance.randrange(256)
        return bytes(bytes_)
    tries = [changed(number) for number in range(300)]
    with concurrent.futures.ThreadPoolExecutor(60) as pool:
        for bytes_, answer in zip(tries, pool.map(lambda one: said(hasty.service, one), tries)):
            assert answer == b"" or status_of(answer) < 500, (bytes_[:200], answer[:200])
    assert works(hasty, material)


def test_requests_behind_one_another_are_answered_in_order(hasty):
    one = b"GET /v1/health HTTP/1.1\r\n" + HOST + b"\r\n"
    answer = said(hasty.service, one + b"GET /v1/nothing HTTP/1.1\r\n" + HOST + b"\r\n" + one)
    assert [int(part[:3]) for part in answer.split(b"HTTP/1.1 ")[1:]] == [200, 404, 200]


def test_a_refused_body_does_not_become_the_next_request(hasty):
    inner = b"GET /v1/tracks/1 HTTP/1.1\r\n" + HOST + b"\r\n"
    answer = said(hasty.service,
                  b"POST /v1/match HTTP/1.1\r\n" + HOST + b"Content-Type: text/plain\r\n" +
                  b"Content-Length: %d\r\n\r\n" % len(inner) + inner)
    assert answer.count(b"HTTP/1.1 ") == 1
    assert status_of(answer) == 415


@pytest.mark.parametrize("fields", (b"Content-Length: %d\r\nTransfer-Encoding: chunked\r\n",
                                    b"Transfer-Encoding: gzip, chunked\r\n"))
def test_a_body_that_ends_in_two_places_is_refused(hasty, material, fields):
    body = b"%x\r\n" % len(material.trail) + material.trail + b"\r\n0\r\n\r\n"
    stated = fields % len(body) if b"%d" in fields else fields
    answer = said(hasty.service, b"POST /v1/match HTTP/1.1\r\n" + HOST +
                  b"Content-Type: application/x-kzt\r\n" + stated + b"\r\n" + body)
    assert status_of(answer) == 400
    assert answer.count(b"HTTP/1.1 ") == 1
    assert b"bad_framing" in answer or b"<html>" in answer.lower()


def test_a_chunked_body_is_taken(hasty, material):
    body = b"".join(b"%x\r\n" % len(part) + part + b"\r\n"
                    for part in (material.trail[:100], material.trail[100:]))
    answer = said(hasty.service,
                  b"POST /v1/match HTTP/1.1\r\n" + HOST + b"Content-Type: application/x-kzt\r\n"
                  b"Transfer-Encoding: chunked\r\n\r\n" + body + b"0\r\n\r\n")
    assert status_of(answer) == 200


def test_a_huge_body_is_refused_before_it_is_sent(open_service):
    with Raw(open_service.service) as raw:
        raw.send(b"POST /v1/match HTTP/1.1\r\n" + HOST + b"Content-Type: application/x-kzt\r\n"
                 b"Expect: 100-continue\r\nContent-Length: 99999999999\r\n\r\n")
        assert status_of(raw.socket.recv(65536)) == 413


def test_a_huge_body_without_a_length_is_refused(start, material):
    client = start(material.catalogue, "--max-body", "1000000", "--timeout", "1")
    before = client.service.memory()[1]
    with Raw(client.service) as raw:
        raw.send(b"POST /v1/match HTTP/1.1\r\n" + HOST + b"Content-Type: audio/wav\r\n"
                 b"Transfer-Encoding: chunked\r\n\r\n")
        chunk = b"10000\r\n" + bytes(65536) + b"\r\n"
        for _ in range(400):
            raw.send(chunk)
        raw.send(b"0\r\n\r\n")
        answer = raw.rest()
    assert answer == b"" or status_of(answer) == 413
    assert client.service.memory()[1] - before < 8000
    assert works(client, material)


def test_slow_requests_are_ended(start, material):
    client = start(material.catalogue, "--timeout", "1")
    with Raw(client.service) as head, Raw(client.service) as body, Raw(client.service) as idle:
        head.send(b"GET /v1/health HTTP/1.1\r\n")
        body.send(b"POST /v1/match HTTP/1.1\r\n" + HOST + b"Content-Type: application/x-kzt\r\n"
                  b"Content-Length: 1000\r\n\r\nabc")
        for raw in (head, body, idle):
            answer = raw.rest()
            assert answer == b"" or status_of(answer) == 408
    assert works(client, material)


def test_a_request_that_takes_too_long_is_told_so(start, material, described):
    """It keeps sending, so that it is never idle."""
    client = start(material.catalogue, "--timeout", "5", "--deadline", "1")
    with Raw(client.service) as raw:
        raw.send(b"POST /v1/match HTTP/1.1\r\n" + HOST + b"Content-Type: application/x-kzt\r\n"
                 b"Content-Length: 100000\r\n\r\n")
        answered = None
        while not answered:
            raw.send(b"x")
            answered, _, _ = select.select([raw.socket], [], [], 0.2)
        answer = http.client.HTTPResponse(raw.socket, method="POST")
        answer.begin()
        described.check("POST", "/v1/match", answer.status, answer.headers, answer.read())
        assert answer.status == 408


def test_slow_clients_do_not_hold_others_up(start, material):
    client = start(material.catalogue, "--threads", "2", "--lookups", "1")
    slow = [Raw(client.service) for _ in range(20)]
    for raw in slow:
        raw.send(b"POST /v1/match HTTP/1.1\r\n" + HOST + b"Content-Type: application/x-kzt\r\n"
                 b"Content-Length: %d\r\n\r\n" % len(material.trail) + material.trail[:-1])
    for _ in range(5):
        assert works(client, material)
    for raw in slow:
        raw.send(material.trail[-1:])
        assert status_of(raw.socket.recv(65536)) == 200
        raw.socket.close()


def test_connections_of_one_address_are_limited(start, material):
    client = start(material.catalogue, "--per-address", "4", "--timeout", "5")
    held = [Raw(client.service) for _ in range(4)]
    for raw in held:
        raw.send(b"GET /v1/health HTTP/1.1\r\n" + HOST + b"\r\n")
        assert status_of(raw.socket.recv(65536)) == 200
    answer = said(client.service, b"GET /v1/health HTTP/1.1\r\n" + HOST + b"\r\n")
    assert answer == b"" or (status_of(answer) == 429 and b"Retry-After" in answer)
    for raw in held:
        raw.socket.close()
    for _ in range(100):
        try:
            if client.ask("GET", "/v1/health")[0] == 200:
                return
        except OSError:
            pass
    pytest.fail("the address is still refused")


def test_parallel_requests_get_their_own_answers(open_service, material):
    asked = [(material.trail, TRAIL, "match"), (material.other_trail, TRAIL, "no match"),
             (material.clip, "audio/wav", "match"), (material.silence, "audio/wav", "too quiet"),
             (material.document, "text/xml", "match")]

    def ask(number):
        body, kind, verdict = asked[number % len(asked)]
        while (told := open_service.match(body, kind))[0] == 503:
            pass
        return told[1]["verdict"] == verdict
    with concurrent.futures.ThreadPoolExecutor(16) as pool:
        assert all(pool.map(ask, range(200)))


def test_long_tokens_and_odd_ones_are_refused(start, material, token_files):
    client = start(material.catalogue, "--token-file", token_files / "read")
    for field in ("Bearer", "Bearer ", "Basic " + READ_TOKEN, READ_TOKEN, "Bearer " + "x" * 4000,
                  "Bearer " + READ_TOKEN + " x"):
        assert client.ask("GET", "/metrics", headers={"Authorization": field})[0] == 401, field
    small = {"Authorization": "bearer " + READ_TOKEN}
    assert client.ask("GET", "/metrics", headers=small)[0] == 200


def test_answers_repeat_nothing_of_the_request(open_service):
    for path in ("/v1/<script>", "/v1/tracks?%3Cscript%3E=1", "/v1/match?top=<script>"):
        for method in ("GET", "POST"):
            _, _, body = open_service.service.request(method, path, b"x" if method == "POST" else
                                                      None, {"Content-Type": "<script>"})
            assert b"<script>" not in body, path
