#!/usr/bin/python3
"""Provides the music that the recogniser is measured on: freely licensed, out of Debian packages.

    evaluation/corpus.py fetch             every track of manifest.jsonl, into the cache
    evaluation/corpus.py fetch --half tune only that half
    evaluation/corpus.py survey            write manifest.jsonl anew from packages.txt

The packages are downloaded with apt-get and not installed. Each track is decoded by FFmpeg to a
16-bit WAV file at its own rate with one or two channels, at most 240 s of it. The cache is
build/media/evaluation, or $KZ_MEDIA/evaluation:

    debs/              the packages
    tracks/<id>.wav    the tracks of the manifest
    loops/             what loops.py makes

The survey takes every file of a package that sounds for 30 s or more, leaves out what another
track contains as well (see weed.py), and divides the rest: groups of packages, one of which may not
lie in both halves, into `tune`, on which thresholds are chosen, and `report`, which is only
measured; and in each half three tracks in five are `known` (in the catalogue), the others are
`strangers`. What decides is a hash of the track's name, so that the same packages give the same
manifest. Recordings of nature (not_music.txt) are never in a catalogue.
"""

import argparse
import collections
import concurrent.futures
import contextlib
import hashlib
import io
import json
import os
import pathlib
import re
import subprocess
import sys
import tarfile
import wave
import zipfile

import weed

HERE = pathlib.Path(__file__).resolve().parent
MANIFEST = HERE / "manifest.jsonl"
PACKAGES = HERE / "packages.txt"
NOT_MUSIC = HERE / "not_music.txt"
CACHE = pathlib.Path(os.environ.get("KZ_MEDIA", HERE.parent / "build/media")) / "evaluation"
AUDIO = re.compile(r"\.(ogg|oga|opus|mp3|wav|flac|mod|xm|it|s3m|m4a|aac)$", re.IGNORECASE)
ARCHIVE = re.compile(r"\.(pk3|pk4|zip|love|data)$", re.IGNORECASE)
SMALLEST = 30_000  # bytes; a tracker module of a minute is as small as that
SHORTEST = 30.0  # seconds
LONGEST = 240
JOBS = int(os.environ.get("JOBS", "2"))


def run(*command, **options):
    return subprocess.run([str(part) for part in command], capture_output=True, check=False, **options)


def digest(data):
    return hashlib.sha256(data).hexdigest()


def packages():
    """Each package with its group and whether an earlier study was tuned on it."""
    for line in PACKAGES.read_text(encoding="utf-8").splitlines():
        fields = line.split("#")[0].split()
        if fields:
            yield fields[0], fields[1], fields[2:] == ["earlier"]


def download(package):
    """The package's file; only the latest of several is looked at."""
    folder = CACHE / "debs"
    folder.mkdir(parents=True, exist_ok=True)
    found = sorted(folder.glob(f"{package}_*.deb"))
    if not found:
        done = run("apt-get", "-q", "download", package, cwd=folder)
        found = sorted(folder.glob(f"{package}_*.deb"))
        if not found:
            sys.exit(f"corpus.py: {package} cannot be downloaded:\n{done.stderr.decode()}")
    return found[-1]


def version_of(deb):
    return run("dpkg-deb", "-f", deb, "Version").stdout.decode().strip()


def inside(path, data):
    """The sound files of an archive inside the package, as <path>!<name>."""
    with contextlib.suppress(zipfile.BadZipFile), zipfile.ZipFile(io.BytesIO(data)) as archive:
        for name in archive.namelist():
            if AUDIO.search(name) and archive.getinfo(name).file_size >= SMALLEST:
                yield f"{path}!{name}", archive.read(name)


def sounds(deb):
    """Path and bytes of each sound file of a package, also of those in archives in it."""
    with subprocess.Popen(["dpkg-deb", "--fsys-tarfile", deb], stdout=subprocess.PIPE) as unpacking:
        with tarfile.open(fileobj=unpacking.stdout, mode="r|") as tar:
            for member in tar:
                path = member.name.removeprefix("./")
                if not member.isfile() or member.size < SMALLEST:
                    continue
                if AUDIO.search(path):
                    yield path, tar.extractfile(member).read()
                elif ARCHIVE.search(path):
                    yield from inside(path, tar.extractfile(member).read())


def probe(file):
    """The first sound stream and the tags of a file, or None when FFmpeg finds no sound in it."""
    done = run("ffprobe", "-v", "error", "-select_streams", "a:0", "-show_entries",
               "stream=sample_rate,channels:stream_tags:format_tags", "-of", "json", file)
    answer = json.loads(done.stdout or b"{}")
    if not answer.get("streams"):
        return None
    stream = answer["streams"][0]
    tags = {**stream.get("tags", {}), **answer.get("format", {}).get("tags", {})}
    return {"rate": int(stream["sample_rate"]), "channels": min(int(stream["channels"]), 2),
            "tags": {name.lower(): text for name, text in tags.items()}}


def frames_of(file):
    with wave.open(str(file), "rb") as opened:
        return opened.getnframes()


def decode(data, suffix, target):
    """Decodes at most 240 s; what was probed, or None when there is no sound."""
    target.parent.mkdir(parents=True, exist_ok=True)
    source = target.with_suffix(".source" + suffix)
    part = target.with_suffix(".part.wav")
    source.write_bytes(data)
    try:
        found = probe(source)
        if found is None:
            return None
        run("ffmpeg", "-v", "error", "-y", "-i", source, "-map", "0:a:0", "-t", LONGEST, "-ac",
            found["channels"], "-c:a", "pcm_s16le", "-bitexact", part)
        if not part.exists() or frames_of(part) == 0:
            return None
        found["frames"] = frames_of(part)
        part.rename(target)
        return found
    finally:
        source.unlink(missing_ok=True)
        part.unlink(missing_ok=True)


def identifier(package, path):
    """<package>--<name of the file>, of letters, digits, points and hyphens only."""
    stem = re.sub(r"\.[^.]*$", "", re.split(r"[/!]", path)[-1])
    return f"{package}--{re.sub(r'[^A-Za-z0-9.-]+', '_', stem)}"


def survey_package(package):
    """All tracks of a package that are long enough, decoded into the cache."""
    deb = download(package)
    version = version_of(deb)
    seen = collections.Counter()
    tracks = []
    for path, data in sorted(sounds(deb)):
        name = identifier(package, path)
        seen[name] += 1
        if seen[name] > 1:
            name += f"-{seen[name]}"
        target = CACHE / "tracks" / f"{name}.wav"
        found = decode(data, pathlib.Path(path).suffix.lower(), target)
        if found is None:
            continue
        if found["frames"] < SHORTEST * found["rate"]:
            target.unlink()
            continue
        tags = found.pop("tags")
        tracks.append({"id": name, "package": package, "version": version, "path": path,
                       "sha256": digest(data), "title": tags.get("title", ""),
                       "artist": tags.get("artist", ""), **found})
    return tracks


def order(track, purpose):
    return digest(f"{purpose} {track['id']}".encode())


def halve(tracks):
    """Sets `half`. Packages that an earlier study was tuned on go to `tune` as far as they fit."""
    group_of = {package: group for package, group, _ in packages()}
    earlier = {group for _, group, known in packages() if known}
    size = collections.Counter(group_of[track["package"]] for track in tracks)
    total = sum(size.values())
    report, counted = set(), 0
    by_size = sorted(size, key=lambda group: (group in earlier, -size[group], group))
    for group in by_size:
        if counted + size[group] <= total / 2 + 5:
            report.add(group)
            counted += size[group]
    for track in tracks:
        track["half"] = "report" if group_of[track["package"]] in report else "tune"


def cast(tracks):
    """Sets `role`: three tracks in five of each half are known."""
    for half in ("tune", "report"):
        members = sorted((track for track in tracks if track["half"] == half),
                         key=lambda track: order(track, "role"))
        for place, track in enumerate(members):
            track["role"] = "known" if place < round(0.6 * len(members)) else "stranger"


def survey():
    with concurrent.futures.ProcessPoolExecutor(JOBS) as pool:
        found = pool.map(survey_package, [package for package, _, _ in packages()])
        tracks = []
        for some in found:
            tracks += some
            print(f"{some[0]['package'] if some else '(nothing)'}: {len(some)} tracks",
                  file=sys.stderr, flush=True)
    (CACHE / "surveyed.jsonl").write_text("".join(json.dumps(track) + "\n" for track in tracks))
    divide(tracks)


def divide(tracks):
    left_out = weed.repeated(tracks, CACHE)
    nature = set(NOT_MUSIC.read_text(encoding="utf-8").splitlines())
    for track in tracks:
        track["left_out"] = left_out.get(track["id"], "")
        track["music"] = track["id"] not in nature
    kept = [track for track in tracks if not track["left_out"]]
    halve(kept)
    cast(kept)
    with MANIFEST.open("w", encoding="utf-8") as file:
        for track in sorted(kept, key=lambda track: track["id"]):
            track.pop("left_out")
            file.write(json.dumps(track, ensure_ascii=False, sort_keys=True) + "\n")
    with (HERE / "left_out.tsv").open("w", encoding="utf-8") as file:
        for name in sorted(left_out):
            file.write(f"{name}\t{left_out[name]}\n")
    print(f"{len(kept)} tracks, {len(left_out)} left out", file=sys.stderr)


def known(half):
    """The tracks of a half that are in the catalogue."""
    return [track for track in manifest(half) if track["role"] == "known" and track["music"]]


def manifest(half=None):
    """The tracks of a half, or of both."""
    lines = MANIFEST.read_text(encoding="utf-8").splitlines()
    return [track for track in map(json.loads, lines) if half in (None, track["half"])]


def fetch_package(package, tracks):
    """Decodes the given tracks of a package; complains about those that are not as they were."""
    wanted = {track["path"]: track for track in tracks}
    complaints = []
    for path, data in sounds(download(package)):
        track = wanted.pop(path, None)
        if track is None:
            continue
        if digest(data) != track["sha256"]:
            complaints.append(f"{package}: {path} is not the file of the manifest")
            continue
        found = decode(data, pathlib.Path(path).suffix.lower(), CACHE / "tracks" / f"{track['id']}.wav")
        if found is None or found["frames"] != track["frames"]:
            complaints.append(f"{package}: {path} decodes to another length than in the manifest")
    return complaints + [f"{package}: {path} is missing in the package" for path in wanted]


def fetch(half):
    missing = collections.defaultdict(list)
    for track in manifest(half):
        if not (CACHE / "tracks" / f"{track['id']}.wav").exists():
            missing[track["package"]].append(track)
    with concurrent.futures.ProcessPoolExecutor(JOBS) as pool:
        answers = pool.map(fetch_package, missing, missing.values())
        complaints = [complaint for answer in answers for complaint in answer]
    for complaint in complaints:
        print(f"corpus.py: {complaint}", file=sys.stderr)
    return 1 if complaints else 0


def main():
    parser = argparse.ArgumentParser(description=__doc__.split("\n", maxsplit=1)[0])
    parser.add_argument("command", choices=["fetch", "survey", "divide"])
    parser.add_argument("--half", choices=["tune", "report"])
    arguments = parser.parse_args()
    if arguments.command == "survey":
        return survey()
    if arguments.command == "divide":
        lines = (CACHE / "surveyed.jsonl").read_text().splitlines()
        return divide([json.loads(line) for line in lines])
    return fetch(arguments.half)


if __name__ == "__main__":
    sys.exit(main())
