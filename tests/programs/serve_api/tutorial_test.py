"""The lines of docs/service.md, run as they are printed, one after the other in one folder; what is
shown beneath must come out. The configuration of nginx there is tried as well."""

import json
import os
import pathlib
import re
import shutil
import signal
import socket
import subprocess

import pytest
from conftest import TREE

DOCUMENT = TREE / "docs/service.md"
BLOCK = re.compile(r"^```(\w+)\n(.*?)^```\n", re.MULTILINE | re.DOTALL)
# What differs from run to run and from machine to machine.
VARIABLE = {"took", "added", "version"}
MARK = "--- end of a block ---"


def blocks():
    """The shell blocks of the document, each with the kind and the text of what it shows."""
    found = BLOCK.findall(DOCUMENT.read_text(encoding="utf-8"))
    shell = []
    for position, (kind, text) in enumerate(found):
        if kind == "sh":
            following = found[position + 1] if position + 1 < len(found) else ("sh", "")
            shell.append((text, *(following if following[0] in ("json", "text") else ("", ""))))
    return shell


def is_as_shown(value, shown, name=None):
    """Whether a value is the one that is shown; a text that is shown up to three dots may go on."""
    if name in VARIABLE and not isinstance(value, bool):
        return type(value) is type(shown)
    if isinstance(value, dict):
        return list(value) == list(shown) and all(
            is_as_shown(value[part], shown[part], part) for part in value)
    if isinstance(value, list):
        return len(value) == len(shown) and all(map(is_as_shown, value, shown))
    if isinstance(shown, str) and shown.endswith("..."):
        return value.startswith(shown[:-3])
    return value == shown


def is_free(port):
    with socket.socket() as one:
        one.setsockopt(socket.SOL_SOCKET, socket.SO_REUSEADDR, 1)
        try:
            one.bind(("127.0.0.1", port))
        except OSError:
            return False
    return True


def free_port():
    with socket.socket() as one:
        one.bind(("127.0.0.1", 0))
        return one.getsockname()[1]


def script(shell):
    """All blocks as one script; ports that are taken are replaced by free ones."""
    text = "".join(f"{block}\necho; echo '{MARK}'\n" for block, _, _ in shell)
    if not is_free(8080):
        port = free_port()
        text = text.replace(":8080", f":{port}")
        text = re.sub(r"kzfp serve (?!.*--listen)", f"kzfp serve --listen 127.0.0.1:{port} ", text)
    return text if is_free(8443) else text.replace(":8443", f":{free_port()}")


@pytest.fixture()
def place(material, tmp_path):
    """A folder with the music and the clip, and the program in the path."""
    shutil.copytree(material.folder / "music", tmp_path / "music")
    shutil.copy(material.folder / "clip.wav", tmp_path)
    programs = tmp_path / ".programs"
    programs.mkdir()
    (programs / "kzfp").symlink_to(pathlib.Path(os.environ["KZFP"]).resolve())
    return tmp_path


def run(shell, place):
    """What each block prints."""
    path = f"{place / '.programs'}:{os.environ['PATH']}"
    bash = subprocess.Popen(["bash", "-eu", "-o", "pipefail", "-c", script(shell)], cwd=place,
                            env={**os.environ, "PATH": path}, stdout=subprocess.PIPE,
                            stderr=subprocess.PIPE, text=True, start_new_session=True)
    try:
        out, errors = bash.communicate(timeout=120)
    finally:
        end_all_of(bash.pid)
    printed = out.split(MARK + "\n")
    assert bash.returncode == 0, f"after {len(printed) - 1} blocks: {out}{errors}"
    return printed[:-1]


def end_all_of(group):
    """Ends a service that a shell has left behind."""
    try:
        os.killpg(group, signal.SIGKILL)
    except ProcessLookupError:
        pass


def without_starts(text):
    return "".join(line for line in text.splitlines(keepends=True)
                   if not line.startswith("kzfp: listening on "))


def test_every_line_works_as_it_is_printed(place):
    shell = blocks()
    assert len(shell) > 10
    for (block, kind, shown), printed in zip(shell, run(shell, place)):
        printed = without_starts(printed).strip()
        if os.environ.get("KZ_SHOW"):
            print(block, printed, sep="\n")
        elif kind == "json":
            assert is_as_shown(json.loads(printed), json.loads(shown)), f"{block}\n{printed}"
        elif kind == "text":
            assert printed == shown.strip(), block


def nginx_configuration(place, service_port, port):
    """That of the document, with a certificate and ports of this run."""
    text = next(text for kind, text in BLOCK.findall(DOCUMENT.read_text(encoding="utf-8"))
                if kind == "nginx")
    for printed, own in (("127.0.0.1:8080", f"127.0.0.1:{service_port}"),
                         ("listen 443", f"listen 127.0.0.1:{port}"),
                         ("/etc/ssl/certs/music.example.pem", str(place / "cert.pem")),
                         ("/etc/ssl/private/music.example.key", str(place / "key.pem"))):
        assert printed in text
        text = text.replace(printed, own)
    paths = "".join(f"{kind}_temp_path {place}/{kind};\n" for kind in
                    ("client_body", "proxy", "fastcgi", "uwsgi", "scgi"))
    return (f"pid {place}/nginx.pid;\nerror_log {place}/error.log;\n"
            f"events {{}}\nhttp {{\naccess_log off;\n{paths}{text}}}\n")


@pytest.mark.skipif(not (shutil.which("nginx") or pathlib.Path("/usr/sbin/nginx").exists()),
                    reason="nginx is missing: scripts/setup.sh service")
def test_nginx_passes_requests_on_as_configured(start, material, place):
    client = start(material.catalogue, "--host", "music.example")
    port = free_port()
    subprocess.run(["openssl", "req", "-x509", "-newkey", "rsa:2048", "-nodes", "-subj",
                    "/CN=music.example", "-addext", "subjectAltName=DNS:music.example", "-keyout",
                    place / "key.pem", "-out", place / "cert.pem"], check=True, capture_output=True)
    (place / "nginx.conf").write_text(nginx_configuration(place, client.service.port, port),
                                      encoding="utf-8")
    (place / "clip.kzt").write_bytes(material.trail)
    nginx = subprocess.Popen([shutil.which("nginx") or "/usr/sbin/nginx", "-c",
                              place / "nginx.conf", "-g", "daemon off; master_process off;"])
    try:
        assert nginx.poll() is None
        ask = ["curl", "--silent", "--retry", "5", "--retry-connrefused", "--cacert",
               place / "cert.pem", "--resolve", f"music.example:{port}:127.0.0.1"]
        url = f"https://music.example:{port}"
        answer = subprocess.run([*ask, "--data-binary", f"@{place / 'clip.kzt'}", "-H",
                                 "Content-Type: application/x-kzt", f"{url}/v1/match"], check=True,
                                capture_output=True).stdout
        assert json.loads(answer)["verdict"] == "match"
        for path, status in (("/v1/health", "200"), ("/metrics", "403"), ("/v1/no", "404")):
            told = subprocess.run([*ask, "--output", place / "out", "--write-out", "%{http_code}",
                                   f"{url}{path}"], check=True, capture_output=True, text=True)
            assert told.stdout == status, path
    finally:
        nginx.terminate()
        nginx.wait()
