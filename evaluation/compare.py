#!/usr/bin/python3
"""Measures how often the verdicts of `kzfp compare` are wrong.

    evaluation/compare.py make tune|report         makes the files that go on differently
    evaluation/compare.py run KZFP tune|report     compares; keeps the answers
    evaluation/compare.py table tune|report        the tables of docs/comparing.md
    evaluation/compare.py thresholds               what other limits would do on `tune`

The music is what `corpus.py fetch` provides, the clips what `clips.py` makes, the copies what
`duplicates.py make` makes, and <cache>/trails/<id>.kzt the trails of the known tracks. The pairs:

    copy       a track and a copy of all of it: other encodings, rates, levels, silence before it
    cut        a track and a copy without its first and last 2 to 5 s
    beginning  a track and its first 20 s
    continued  a track and its first 20 s with 20 s of another track after them
    excerpt    a track and 20 s of it
    clip       a track and 14.3 s of it that were degraded or run at another speed
    stranger   a track and a clip of one that is not known
    tracks     two different tracks

Tracks that contain the same audio (shared.tsv) are not compared with each other.
"""

import collections
import hashlib
import json
import pathlib
import subprocess
import sys

import corpus

FOLDER = corpus.CACHE / "compare"
COPIES = corpus.CACHE / "duplicates"
TRAILS = corpus.CACHE / "trails"
COPIED = 20  # tracks of `report` that are compared with their copies, of those that have any
OTHERS = 20  # tracks that each track is compared with
CLIPS = 40  # clips a kind, of known tracks and of strangers each
KINDS = ("clean", "telephone", "mic", "pink_0", "speed+5", "tempo+5")
RIGHT = {
    "copy": {"same recording"},
    "cut": {"same recording", "related"},
    "beginning": {"same start"},
    "continued": {"same start"},
    "excerpt": {"related"},
    "clip": {"related"},
    "stranger": {"different"},
    "tracks": {"different"},
}
NEAR_START = 3.0  # seconds; an excerpt from there has the same start too
VERDICTS = ("same recording", "same start", "related", "different", "too quiet")


def shared():
    lines = (corpus.HERE / "shared.tsv").read_text(encoding="utf-8").splitlines()
    return {frozenset(line.split("\t")[:2]) for line in lines if not line.startswith("#")}


def rank(*words):
    return hashlib.sha256(" ".join(words).encode()).digest()


def copied(half):
    """The tracks that have copies, and the files of each kind of copy."""
    kinds = sorted(path for path in (COPIES / half).iterdir() if path.is_dir())
    if not kinds:
        sys.exit(f"compare.py: no copies in {COPIES / half}; run duplicates.py make {half}")
    names = sorted(path.stem for path in kinds[0].iterdir())[:COPIED]
    return names, {kind.name: {path.stem: path for path in kind.iterdir()} for kind in kinds}


def wav(name):
    return corpus.CACHE / "tracks" / f"{name}.wav"


def encode(target, *inputs):
    """The inputs one after the other, each a file with options before it, as MP3 of 128 kbit/s."""
    if target.exists():
        return
    target.parent.mkdir(parents=True, exist_ok=True)
    parts = "".join(f"[{i}:a]aresample=44100,aformat=channel_layouts=stereo[p{i}];"
                    for i in range(len(inputs)))
    joined = "".join(f"[p{i}]" for i in range(len(inputs))) + f"concat=n={len(inputs)}:v=0:a=1"
    done = corpus.run("ffmpeg", "-v", "error", "-y", *(word for each in inputs for word in each),
                      "-filter_complex", parts + joined, "-b:a", "128k", target)
    if done.returncode:
        sys.exit(f"compare.py: ffmpeg failed: {done.stderr.decode()}")


def make(half):
    names, _ = copied(half)
    for i, name in enumerate(names):
        other = names[(i + 1) % len(names)]
        first = ("-t", "20", "-i", wav(name))
        encode(FOLDER / half / "beginning" / f"{name}.mp3", first)
        encode(FOLDER / half / "continued" / f"{name}.mp3", first,
               ("-ss", "15", "-t", "20", "-i", wav(other)))


def pair_kind(kind):
    return {"cut_both_ends": "cut", "excerpt_20s": "excerpt"}.get(kind, "copy")


def copy_pairs(half):
    """(kind, detail, first file, other files)."""
    names, copies = copied(half)
    for name in names:
        files = [(pair_kind(kind), kind, of[name]) for kind, of in copies.items() if name in of]
        files += [(kind, kind, FOLDER / half / kind / f"{name}.mp3")
                  for kind in ("beginning", "continued")]
        yield wav(name), files


def clip_pairs(half, known, apart):
    """Clips beside the track that they are from, and those of strangers beside some track."""
    for kind in KINDS:
        folder = corpus.CACHE / "clips" / half
        truths = [json.loads(line) for line in (folder / kind / "truth.jsonl").open()]
        for role in ("known", "stranger"):
            for truth in sorted(t for t in (json.dumps(t, sort_keys=True) for t in truths
                                            if t["role"] == role))[:CLIPS]:
                truth = json.loads(truth)
                if role == "known":
                    yield TRAILS / f"{truth['track']}.kzt", [("clip", kind, folder / truth["file"])]
                else:
                    other = min((name for name in known if apart(name, truth["track"])),
                                key=lambda name: rank(truth["file"], name))
                    yield TRAILS / f"{other}.kzt", [("stranger", kind, folder / truth["file"])]


def track_pairs(known, apart):
    for name in known:
        others = sorted((other for other in known if other != name and apart(name, other)),
                        key=lambda other: rank(name, other))[:OTHERS]
        yield (TRAILS / f"{name}.kzt",
               [("tracks", "", TRAILS / f"{other}.kzt") for other in others])


def pairs(half):
    known = sorted(track["id"] for track in corpus.known(half))
    related = shared()

    def apart(one, other):
        return frozenset((one, other)) not in related

    yield from track_pairs(known, apart)
    yield from clip_pairs(half, known, apart)
    yield from copy_pairs(half)


def run(kzfp, half):
    FOLDER.mkdir(parents=True, exist_ok=True)
    with (FOLDER / f"{half}.jsonl").open("w", encoding="utf-8") as kept:
        for first, others in pairs(half):
            done = subprocess.run([kzfp, "compare", "--format", "json", "--quiet", first,
                                   *(file for _, _, file in others)],
                                  capture_output=True, text=True, check=False)
            lines = done.stdout.splitlines()
            if len(lines) != len(others):
                sys.exit(f"compare.py: {first}: {done.stderr}")
            for (kind, detail, _), line in zip(others, lines):
                kept.write(json.dumps({"kind": kind, "detail": detail, **json.loads(line)}) + "\n")


def answers(half):
    return [json.loads(line) for line in (FOLDER / f"{half}.jsonl").open(encoding="utf-8")]


def is_right(answer, verdict=None):
    verdict = verdict or answer["verdict"]
    if verdict == "same start" and answer["kind"] in ("excerpt", "clip"):
        return abs(answer["offset"]) <= NEAR_START
    return verdict in RIGHT[answer["kind"]]


def start_distances(half):
    """Distances of documents whose sound begins alike, and of those that begin otherwise.

    Silence before a copy is skipped by the fingerprint, so that such copies begin alike too.
    """
    same = [(answer["detail"], answer["document_distance"]) for answer in answers(half)
            if answer["kind"] in ("copy", "beginning", "continued")
            and answer["document_distance"] is not None]
    return same, other_distances(half)


def other_distances(half):
    """Of the documents of all pairs of tracks that share nothing."""
    values = json.loads((FOLDER / f"{half}_values.json").read_text(encoding="utf-8"))
    names = sorted(values)
    related = shared()
    return [sum(abs(a - b) for a, b in zip(values[one], values[other])) / len(values[one])
            for i, one in enumerate(names) for other in names[i + 1:]
            if frozenset((one, other)) not in related]


def keep_values(kzfp, half):
    known = sorted(track["id"] for track in corpus.known(half))
    values = {}
    for name in known:
        done = subprocess.run([kzfp, "--format", "values", "--length", "20", wav(name)],
                              capture_output=True, text=True, check=False)
        if done.returncode == 0:
            values[name] = [int(number) for number in done.stdout.split()[-30:]]
    (FOLDER / f"{half}_values.json").write_text(json.dumps(values), encoding="utf-8")


def table(half):
    counts = collections.defaultdict(collections.Counter)
    verdicts = collections.defaultdict(collections.Counter)
    for answer in answers(half):
        counts[answer["kind"]][answer["verdict"]] += 1
        verdicts[answer["verdict"]][is_right(answer)] += 1
    print("| pairs | number | " + " | ".join(VERDICTS) + " |")
    print("|---|---:|" + "---:|" * len(VERDICTS))
    for kind in RIGHT:
        row = counts[kind]
        print(f"| {kind} | {row.total()} | " + " | ".join(str(row[v]) for v in VERDICTS) + " |")
    print("\n| verdict | given | wrong |\n|---|---:|---:|")
    for verdict in VERDICTS:
        given = verdicts[verdict]
        print(f"| {verdict} | {given.total()} | {given[False]} |")
    same, other = start_distances(half)
    print("\n| documents | pairs | below 100 |\n|---|---:|---:|")
    for name, distances in (("alike", [d for _, d in same]), ("different", other)):
        print(f"| {name} | {len(distances)} | {sum(d < 100 for d in distances)} |")


def thresholds():
    same, other = start_distances("tune")
    print("limit of documents: starts that are alike and missed, different ones taken as alike")
    for limit in (20, 40, 60, 80, 100, 120, 150, 200):
        missed = sum(d >= limit for _, d in same)
        print(f"{limit:5} {missed}/{len(same)} {sum(d < limit for d in other)}/{len(other)}")
    print("share that agrees, in copies and in cut ones, least first:")
    for kind in ("copy", "cut"):
        shares = sorted(a["agreeing_share"] for a in answers("tune") if a["kind"] == kind)
        print(kind, [round(s, 3) for s in shares[:12]])
    for kind in ("beginning", "continued", "excerpt", "tracks"):
        shares = sorted(a["agreeing_share"] for a in answers("tune") if a["kind"] == kind)
        print(kind, "most:", [round(s, 3) for s in shares[-6:]])


def main():
    match sys.argv[1:]:
        case ["make", ("tune" | "report") as half]:
            make(half)
        case ["run", kzfp, ("tune" | "report") as half]:
            run(kzfp, half)
            keep_values(kzfp, half)
        case ["table", ("tune" | "report") as half]:
            table(half)
        case ["thresholds"]:
            thresholds()
        case _:
            sys.exit(__doc__)


if __name__ == "__main__":
    main()
