"""Every path of docs/openapi.yaml, asked of the running service; each answer must be as described
there, and each that is promised there must be seen."""

import json
import shutil

import pytest
import service_run
from conftest import READ_TOKEN, TREE, WRITE_TOKEN, Client

TRAIL, XML, JSON, WAV = "application/x-kzt", "application/xml", "application/json", "audio/wav"


def values_body(values):
    return json.dumps({"values": values})


def best(answer):
    """What a match says for certain."""
    return answer["verdict"], [found["title"] for found in answer["matches"]]


FOUND = ("match", ["Harbour Lights"])


def test_a_trail_is_named_with_its_place(open_service, material):
    status, answer, _ = open_service.match(material.trail)
    assert (status, best(answer), answer["by"]) == (200, FOUND, "trail")
    assert answer["matches"][0]["offset"] == pytest.approx(20, abs=0.2)
    assert answer["matches"][0]["artist"] == "The Quays"


def test_sound_is_named_as_its_trail_is(open_service, material):
    _, by_trail, _ = open_service.match(material.trail)
    status, by_sound, _ = open_service.match(material.clip, WAV)
    assert (status, best(by_sound)) == (200, best(by_trail))
    # Sound is read at more places, so that its trail lies closer to the track's.
    assert by_sound["matches"][0]["offset"] == pytest.approx(20, abs=0.02)
    assert by_sound["matches"][0]["score"] > by_trail["matches"][0]["score"]


@pytest.mark.parametrize("kind", [XML, "text/xml"])
def test_a_document_is_named_and_its_worth_told(open_service, material, kind):
    status, answer, _ = open_service.match(material.document, kind)
    assert (status, best(answer), answer["by"]) == (200, FOUND, "document")
    assert answer["worth"]


def test_values_are_named_as_their_document_is(open_service, material):
    _, by_document, _ = open_service.match(material.document, XML)
    status, by_values, _ = open_service.match(values_body(material.values), JSON)
    assert status == 200
    assert by_values["matches"] == by_document["matches"]
    assert by_values["worth"] == by_document["worth"]


def test_answers_are_those_of_the_program(open_service, material, kzfp):
    told = json.loads(kzfp("match", "--format", "json", material.catalogue,
                           material.folder / "clip.wav"))
    _, answer, _ = open_service.match(material.clip, WAV)
    for name in ("verdict", "matches", "runner_up"):
        assert answer[name] == told[name], name


def test_strangers_and_silence_have_verdicts_of_their_own(open_service, material):
    assert open_service.match(material.stranger, WAV)[1]["verdict"] == "no match"
    assert open_service.match(material.silence, WAV)[1]["verdict"] == "too quiet"


def test_parameters_add_what_they_say(open_service, material):
    _, answer, _ = open_service.match(material.other_trail, query="?top=2")
    assert len(answer["candidates"]) == 2
    _, answer, _ = open_service.match(material.trail, query="?passages=1&speeds=0")
    assert answer["gaps"] == []
    assert best(answer) == FOUND


@pytest.mark.parametrize("query", ["?top=101", "?top=-1", "?top=x", "?top=", "?passages=2",
                                   "?speeds=yes", "?nothing=1", "?top=1&top=2", "?%zz=1"])
def test_parameters_that_cannot_be_are_refused(open_service, material, query):
    status, answer, _ = open_service.match(material.trail, query=query)
    assert status == 400
    assert len(answer["error"]["message"]) > 20


def test_bodies_that_are_not_what_they_say_are_refused(open_service, material):
    for kind, body in ((TRAIL, b"no trail"), (TRAIL, material.trail[:-1]), (TRAIL, b""),
                       (XML, b"<NOTHING/>"), (XML, b"<"), (JSON, b"{"), (JSON, b"[]"),
                       (JSON, values_body(material.values[:-1])), (JSON, values_body([1.5] * 30)),
                       (JSON, values_body([70000] * 30)), (JSON, b'{"values": 1}')):
        status, answer, _ = open_service.match(body, kind)
        assert status == 400, (kind, body[:40], answer)


def test_sound_that_cannot_be_decoded_is_unprocessable(open_service):
    assert open_service.match(b"These are words, not sound.", WAV)[0] == 422


def test_other_types_are_refused_with_those_that_are_taken(open_service, material):
    for kind in ("text/plain", None, "application/octet-stream", "nonsense"):
        status, answer, _ = open_service.match(material.trail, kind)
        assert status == 415
        assert TRAIL in answer["error"]["message"]


def test_large_bodies_are_refused(start, material):
    client = start(material.catalogue, "--max-body", "100000")
    assert client.match(material.clip, WAV)[0] == 413
    assert client.match(b"x" * 1000000, JSON)[0] == 413
    assert client.match(material.trail)[0] == 200


def test_sound_can_be_switched_off(start, material):
    client = start(material.catalogue, "--no-audio")
    status, answer, _ = client.match(material.clip, WAV)
    assert (status, answer["error"]["code"]) == (403, "audio_is_off")
    assert client.match(material.trail)[0] == 200
    assert client.ask("GET", "/v1/options")[1]["audio"] is False


def test_tracks_are_listed_in_parts(open_service):
    _, first, _ = open_service.ask("GET", "/v1/tracks?limit=2")
    _, rest, _ = open_service.ask("GET", f"/v1/tracks?after={first['next']}&limit=2")
    assert [track["track"] for track in first["tracks"] + rest["tracks"]] == [1, 2, 3]
    assert rest["next"] is None
    for query in ("limit=0", "limit=1001", "after=-1", "after=x", "no=1"):
        assert open_service.ask("GET", f"/v1/tracks?{query}")[0] == 400, query


def test_a_track_is_found_by_its_source(open_service):
    _, everything, _ = open_service.ask("GET", "/v1/tracks")
    source = everything["tracks"][1]["sources"][0]
    assert open_service.ask("GET", f"/v1/tracks?source={source}")[1]["tracks"] == [
        everything["tracks"][1]]
    assert open_service.ask("GET", "/v1/tracks?source=none.wav")[0] == 404


def test_a_track_has_facts_and_a_trail(open_service, material, kzfp):
    status, track, _ = open_service.ask("GET", "/v1/tracks/1")
    assert (status, track["title"], track["album"]) == (200, "Harbour Lights", "First")
    assert track["seconds"] == pytest.approx(60, abs=0.1)
    status, trail, _ = open_service.ask("GET", "/v1/tracks/1/trail")
    assert trail == kzfp("export", "-q", "--trail", "1", material.catalogue, "-")
    for path in ("/v1/tracks/99", "/v1/tracks/99/trail"):
        assert open_service.ask("GET", path)[0] == 404
    for path in ("/v1/tracks/x", "/v1/tracks/0", "/v1/tracks/99999999999999999999/trail"):
        assert open_service.ask("GET", path)[0] in (400, 404), path
    for path in ("/v1/tracks/1?no=1", "/v1/tracks/1/trail?no=1"):
        assert open_service.ask("GET", path)[0] == 400, path


@pytest.fixture()
def guarded(start, catalogue, token_files):
    return start(catalogue, "--token-file", token_files / "read", "--write-token-file",
                 token_files / "write", "--max-body", "2000000")


def test_tracks_are_added_and_removed(guarded, material):
    path = "/v1/tracks?source=new.wav&title=New&artist=One"
    status, answer, headers = guarded.ask("POST", path, material.other_trail, TRAIL, WRITE_TOKEN)
    assert (status, answer["track"], answer["added"]) == (201, 4, True)
    assert headers["Location"] == "/v1/tracks/4"
    status, answer, _ = guarded.ask("POST", path, material.other_trail, TRAIL, WRITE_TOKEN)
    assert (status, answer["track"], answer["added"]) == (200, 4, False)
    _, found, _ = guarded.match(material.other_trail, token=READ_TOKEN)
    assert best(found) == ("match", ["New"])
    assert guarded.ask("DELETE", "/v1/tracks/4", token=WRITE_TOKEN)[0] == 204
    assert guarded.ask("DELETE", "/v1/tracks/4", token=WRITE_TOKEN)[0] == 404
    assert guarded.match(material.other_trail, token=READ_TOKEN)[1]["verdict"] == "no match"


def test_sound_is_added_with_its_tags(guarded, material):
    sound = (material.folder / "music/meadow.wav").read_bytes()
    assert guarded.ask("DELETE", "/v1/tracks/2", token=WRITE_TOKEN)[0] == 204
    status, answer, _ = guarded.ask("POST", "/v1/tracks?source=m.wav", sound, WAV, WRITE_TOKEN)
    assert status == 201
    _, track, _ = guarded.ask("GET", f"/v1/tracks/{answer['track']}", token=READ_TOKEN)
    assert (track["title"], track["artist"], track["sources"]) == (
        "Meadow", "Nora Field", ["m.wav"])


def test_wrong_additions_are_refused(guarded, material):
    for path, body, kind, status in (
            ("/v1/tracks", material.trail, TRAIL, 400),
            ("/v1/tracks?source=", material.trail, TRAIL, 400),
            ("/v1/tracks?source=a&no=1", material.trail, TRAIL, 400),
            ("/v1/tracks?source=a", b"no trail", TRAIL, 400),
            ("/v1/tracks?source=a", material.trail, "text/plain", 415),
            ("/v1/tracks?source=a", material.document, XML, 415),
            ("/v1/tracks?source=a", b"no sound", WAV, 422),
            ("/v1/tracks?source=a", b"x" * 3000000, WAV, 413)):
        assert guarded.ask("POST", path, body, kind, WRITE_TOKEN)[0] == status, (path, kind)
    assert guarded.ask("DELETE", "/v1/tracks/x", token=WRITE_TOKEN)[0] in (400, 404)
    assert guarded.ask("DELETE", "/v1/tracks/1?no=1", token=WRITE_TOKEN)[0] == 400


def test_tokens_are_asked_for(guarded, material):
    reading = [("GET", "/v1/tracks"), ("GET", "/v1/tracks/1"), ("GET", "/v1/tracks/1/trail"),
               ("GET", "/metrics"), ("POST", "/v1/match")]
    writing = [("POST", "/v1/tracks?source=a"), ("DELETE", "/v1/tracks/1")]
    for method, path in reading + writing:
        body, kind = (material.trail, TRAIL) if method == "POST" else (None, None)
        for token in (None, "wrong-token-of-24-letters", READ_TOKEN[:-1], READ_TOKEN + "x"):
            status, _, headers = guarded.ask(method, path, body, kind, token)
            assert (status, headers["WWW-Authenticate"][:6]) == (401, "Bearer"), (path, token)
    for method, path in reading:
        body, kind = (material.trail, TRAIL) if method == "POST" else (None, None)
        assert guarded.ask(method, path, body, kind, READ_TOKEN)[0] == 200, path
    for method, path in writing:
        body, kind = (material.trail, TRAIL) if method == "POST" else (None, None)
        assert guarded.ask(method, path, body, kind, READ_TOKEN)[0] in (401, 403), path


def test_health_and_options_take_no_token(guarded, open_service):
    assert guarded.ask("GET", "/v1/health")[1] == {"status": "ok"}
    assert guarded.ask("GET", "/v1/health", token=READ_TOKEN)[1]["tracks"] == 3
    assert guarded.ask("GET", "/v1/options")[1]["token"] is True
    assert guarded.ask("GET", "/v1/options")[1]["write"] is True
    assert open_service.ask("GET", "/v1/health")[1]["tracks"] == 3
    assert open_service.ask("GET", "/v1/options")[1]["token"] is False


def test_nothing_is_changed_without_a_write_token(open_service, material):
    assert open_service.ask("POST", "/v1/tracks?source=a", material.trail, TRAIL)[0] == 403
    assert open_service.ask("DELETE", "/v1/tracks/1")[0] == 403
    assert open_service.ask("GET", "/v1/tracks/1")[0] == 200


def test_metrics_count_what_was_asked(start, material):
    client = start(material.catalogue)
    client.match(material.trail)
    client.match(material.stranger, WAV)
    client.match(b"no trail")
    client.ask("GET", "/metrics")
    told = client.service.metrics()
    assert sum(value for name, value in told.items()
               if name.startswith("kzfp_lookups_total")) == 2
    assert told["kzfp_lookup_seconds_count"] == 2
    assert told["kzfp_catalogue_tracks"] == 3
    assert told["kzfp_queue_capacity"] == 64
    assert any(name.startswith("kzfp_requests_total") and 'status="400"' in name for name in told)


def test_the_description_is_served(open_service):
    status, text, headers = open_service.ask("GET", "/v1/openapi.yaml")
    assert (status, text) == (200, (TREE / "docs/openapi.yaml").read_bytes())
    assert headers["Content-Type"].startswith("application/yaml")


def test_a_program_without_its_files_serves_no_description(material, kzfp, described, tmp_path):
    program = shutil.copy(kzfp.program, tmp_path / "kzfp")
    with service_run.Service(program, material.catalogue) as service:
        assert Client(service, described).ask("GET", "/v1/openapi.yaml")[0] == 404
        assert Client(service, described).ask("GET", "/")[0] == 404


@pytest.fixture()
def page(tmp_path):
    folder = tmp_path / "page"
    (folder / "app").mkdir(parents=True)
    (folder / "index.html").write_text("<!doctype html><title>A page</title>", encoding="utf-8")
    (folder / "app/main.js").write_text("export {};\n", encoding="utf-8")
    return folder


def test_the_page_is_served_with_its_rules(start, material, page):
    client = start(material.catalogue, "--page", page)
    status, text, headers = client.ask("GET", "/")
    assert (status, text) == (200, (page / "index.html").read_bytes())
    assert "'unsafe-inline'" not in headers["Content-Security-Policy"]
    assert "default-src 'none'" in headers["Content-Security-Policy"]
    tag = headers["ETag"]
    assert client.ask("GET", "/", headers={"If-None-Match": tag})[0] == 304
    status, headers, body = client.service.request("GET", "/app/main.js")
    assert (status, headers.get_content_type()) == (200, "text/javascript")


def test_no_file_outside_the_page_is_served(start, material, page):
    client = start(material.catalogue, "--page", page)
    for path in ("/../music.kzc", "/app/../../music.kzc", "/%2e%2e/music.kzc", "//etc/passwd",
                 "/app", "/app/", "/nothing.js", "/app%2fmain.js%00"):
        status, _, _ = client.service.request("GET", path)
        assert status in (400, 404), path


def test_a_service_without_a_page_says_so(start, material):
    assert start(material.catalogue, "--no-page").ask("GET", "/")[0] == 404


def test_other_methods_are_refused_with_those_there_are(open_service, described):
    for template, item in described.text["paths"].items():
        path = template.replace("{track}", "1")
        for method in ("GET", "POST", "PUT", "DELETE", "PATCH"):
            if method.lower() in item:
                continue
            status, _, headers = open_service.ask(method, path, b"" if method != "GET" else None)
            assert status == 405, (method, path)
            allowed = {name.strip() for name in headers["Allow"].split(",")}
            told = {name.upper() for name in item if name in ("get", "post", "delete", "options")}
            assert allowed - {"HEAD"} == told, path


def test_heads_are_those_of_the_whole_answers(open_service, described):
    for template, item in described.text["paths"].items():
        if "get" in item:
            path = template.replace("{track}", "1")
            status, _, headers = open_service.ask("GET", path)
            short, body, own = open_service.ask("HEAD", path)
            assert (short, body) == (status, None), path
            assert own["Content-Type"] == headers["Content-Type"], path


def test_unknown_paths_are_not_found(open_service):
    for path in ("/v1", "/v1/", "/v1/match/", "/v1/nothing", "/v2/match", "/v1/tracks/1/nothing",
                 "/v1/tracks/1/trail/", "/metrics/x", "/" + "x" * 1000):
        status, answer, _ = open_service.ask("GET", path)
        assert status == 404, path
        assert answer["error"]["code"] in ("no_such_address", "no_such_track"), path


def test_preflights_are_answered_to_allowed_origins(start, material, described):
    origin = "https://music.example"
    client = start(material.catalogue, "--allow-origin", origin)
    for template in described.text["paths"]:
        asked = {"Origin": origin, "Access-Control-Request-Method": "GET"}
        status, _, headers = client.ask("OPTIONS", template.replace("{track}", "1"), headers=asked)
        assert (status, headers["Access-Control-Allow-Origin"]) == (204, origin), template
        asked["Origin"] = "https://other.example"
        status, _, headers = client.ask("OPTIONS", template.replace("{track}", "1"), headers=asked)
        assert (status, headers["Access-Control-Allow-Origin"]) == (403, None), template
    status, _, headers = client.match(material.trail, headers={"Origin": origin})
    assert (status, headers["Access-Control-Allow-Origin"]) == (200, origin)


def test_pages_of_other_origins_are_refused(open_service, material):
    other = {"Origin": "https://other.example"}
    for method, path in (("GET", "/v1/tracks"), ("GET", "/v1/tracks/1/trail"), ("GET", "/metrics")):
        assert open_service.ask(method, path, headers=other)[0] == 403, path
    assert open_service.match(material.trail, headers=other)[0] == 403
    own = {"Origin": open_service.service.url}
    assert open_service.match(material.trail, headers=own)[0] == 200


def test_other_names_of_the_host_are_refused(start, material):
    client = start(material.catalogue, "--host", "music.example")
    for host, status in (("evil.example", 421), ("music.example", 200), ("localhost", 200),
                         (f"127.0.0.1:{client.service.port}", 200),
                         ("127.0.0.1.evil.example", 421)):
        assert client.ask("GET", "/v1/health", headers={"Host": host})[0] == status, host


def test_every_promised_answer_was_seen(described):
    """Runs last, after the tests of the other files too."""
    missing = described.promised() - described.seen
    assert not missing, "\n".join(f"{method} {path}: {status}"
                                  for method, path, status in sorted(missing))
