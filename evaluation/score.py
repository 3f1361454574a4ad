#!/usr/bin/python3
"""Looks the clips up with kzfp and prints how well that went, beside the peers.

    evaluation/score.py run KZFP tune|report|loops [KIND...]   look up; keep the answers
    evaluation/score.py table tune|report [--markdown]         the table of docs/recognition.md
    evaluation/score.py strangers tune|report|loops            the highest scores of strangers
    evaluation/score.py thresholds                             what S0 and d would do on `tune`
    evaluation/score.py misses tune|report [KIND...]           clips that were not recognised

`run` makes the catalogue of the known tracks of the half when there is none, or when kzfp is newer,
and writes <cache>/results/<half>/kzfp/<kind>.jsonl. `loops` are drum loops, metronomes and test
signals, looked up among the known tracks of `report` and other such loops.

A clip is right when the best track is the one it was cut from. Two tracks that contain the same
audio are listed in shared.tsv, with the two methods that found it: a match between them is counted
neither as right nor as wrong.
"""

import argparse
import collections
import json
import math
import pathlib
import subprocess
import sys

import corpus
import degrade
from scoring import Clip, accept_above_strangers, row_of, share, track_of

HERE = pathlib.Path(__file__).resolve().parent
BATCH = 100  # files a process


def catalogue_of(half):
    return corpus.CACHE / "results" / half / "known.kzc"


def known_files(half):
    tracks = corpus.known("report" if half == "loops" else half)
    files = [corpus.CACHE / "tracks" / f"{track['id']}.wav" for track in tracks]
    if half == "loops":
        files += sorted((corpus.CACHE / "loops" / "known").glob("*.wav"))
    return files


def provide_catalogue(kzfp, half):
    catalogue = catalogue_of(half)
    if catalogue.exists() and catalogue.stat().st_mtime > pathlib.Path(kzfp).stat().st_mtime:
        return catalogue
    catalogue.parent.mkdir(parents=True, exist_ok=True)
    for old in catalogue.parent.glob("known.kzc*"):
        old.unlink()
    done = subprocess.run([kzfp, "add", catalogue, *known_files(half)], capture_output=True, text=True,
                          check=False)
    if done.returncode:
        sys.exit(f"score.py: {kzfp} add failed:\n{done.stderr[-2000:]}")
    return catalogue


def match(kzfp, catalogue, folder, names):
    """The answers to some clips, each with its name."""
    done = subprocess.run([kzfp, "match", "--format", "json", "--candidates", "2", catalogue, *names],
                          cwd=folder, capture_output=True, text=True, check=False)
    answers = [json.loads(line) for line in done.stdout.splitlines()]
    if len(answers) != len(names):
        sys.exit(f"score.py: {len(answers)} answers to {len(names)} files:\n{done.stderr[-2000:]}")
    return answers


def truths(half, kind=None):
    folder = corpus.CACHE / "clips" / half
    files = [folder / "truth.jsonl"] if half == "loops" else [
        folder / name / "truth.jsonl" for name in ([kind] if kind else degrade.all_kinds())]
    return [json.loads(line) for file in files if file.exists()
            for line in file.read_text(encoding="utf-8").splitlines()]


def run(kzfp, half, kinds):
    kzfp = pathlib.Path(kzfp).resolve()
    catalogue = provide_catalogue(kzfp, half)
    folder = corpus.CACHE / "clips" / half
    results = corpus.CACHE / "results" / half / "kzfp"
    results.mkdir(parents=True, exist_ok=True)
    by_kind = collections.defaultdict(list)
    for truth in truths(half):
        by_kind[truth["kind"]].append(truth["file"])
    missing = [kind for kind in kinds if kind not in by_kind]
    if missing or not by_kind:
        sys.exit(f"score.py: no clips of {half} {' '.join(missing)}; evaluation/clips.py makes them")
    for kind in kinds or by_kind:
        names = by_kind[kind]
        lines = [json.dumps(answer) + "\n" for place in range(0, len(names), BATCH)
                 for answer in match(kzfp, catalogue, folder, names[place:place + BATCH])]
        (results / f"{kind}.jsonl").write_text("".join(lines), encoding="utf-8")
        print(f"{half} {kind}: {len(lines)} clips", file=sys.stderr, flush=True)


def shared_pairs():
    pairs = set()
    for line in (HERE / "shared.tsv").read_text(encoding="utf-8").splitlines():
        if line and not line.startswith("#"):
            pairs.add(frozenset(line.split("\t")[:2]))
    return pairs


def clips_of(half, method):
    """The clips of each kind that a method has looked up; a peer's are accepted above strangers."""
    shared = shared_pairs()
    by_file = {truth["file"]: truth for truth in truths(half)}
    clips = collections.defaultdict(list)
    for kind in degrade.all_kinds():
        file = corpus.CACHE / "results" / half / method / f"{kind}.jsonl"
        if not file.exists():
            continue
        for line in file.read_text(encoding="utf-8").splitlines():
            answer = json.loads(line)
            if answer["file"] in by_file:
                clips[kind].append(Clip(by_file[answer["file"]], answer, shared))
    if method != "kzfp":
        accept_above_strangers([clip for some in clips.values() for clip in some])
    return clips


HEADINGS = ("kind", "clips", "top-1", "accepted and right", "at the threshold of 15,000", "wrong",
            "place: median, 95 % (ms)", "within 30 ms", "strangers", "false", "highest stranger",
            "Chromaprint: top-1", "accepted and right", "with 1 % of strangers")


def cells(kind, row, peer):
    places = f"{row['median']:.0f}, {row['p95']:.0f}"
    beside = [f"{peer[part]:.3f}" for part in ("top1", "accepted", "lenient")] if peer else [""] * 3
    return [kind, row["clips"], f"{row['top1']:.3f}", f"{row['accepted']:.3f}", f"{row['raised']:.3f}",
            row["wrong"], places, f"{row['near']:.3f}", row["strangers"], row["false"],
            f"{row['highest']:.2f}", *beside]


def table(half, markdown):
    ours, peers = clips_of(half, "kzfp"), clips_of(half, "chromaprint")
    separator = " | " if markdown else "\t"
    edge = ("| ", " |") if markdown else ("", "")
    print(edge[0] + separator.join(HEADINGS) + edge[1])
    if markdown:
        print("|---|" + "---:|" * (len(HEADINGS) - 1))
    nothing = collections.defaultdict(lambda: math.nan)
    for kind in degrade.all_kinds():
        if ours[kind] or peers[kind]:
            ours_row = row_of(ours[kind]) if ours[kind] else nothing
            peer_row = row_of(peers[kind]) if peers[kind] else None
            print(edge[0] + separator.join(map(str, cells(kind, ours_row, peer_row))) + edge[1])
    summary("kzfp", ours)
    summary("Chromaprint", peers)


def summary(name, clips):
    every = [clip for some in clips.values() for clip in some]
    if not every:
        return
    rows = [row_of(some) for some in clips.values() if some]
    strangers = [clip for clip in every if not clip.known and not clip.related]
    print(f"\n{name}: mean of {len(rows)} kinds: top-1 {share(row['top1'] for row in rows):.3f}, "
          f"accepted and right {share(row['accepted'] for row in rows):.3f}; accepted and wrong "
          f"{sum(row['wrong'] for row in rows)} of {sum(row['clips'] for row in rows)}; strangers accepted "
          f"{sum(clip.accepted for clip in strangers)} of {len(strangers)}, highest score "
          f"{max((clip.score for clip in strangers), default=math.nan):.4g}; left out for shared audio: "
          f"{sum(clip.related and not clip.right for clip in every)}")


def looped():
    """The answers to loops and signals; all of them are strangers."""
    folder = corpus.CACHE / "results" / "loops" / "kzfp"
    by_file = {truth["file"]: truth for truth in truths("loops")}
    lines = [line for file in sorted(folder.glob("*.jsonl"))
             for line in file.read_text(encoding="utf-8").splitlines()]
    answers = [json.loads(line) for line in lines]
    return [Clip(by_file[answer["file"]], answer, set()) for answer in answers if answer["file"] in by_file]


def strangers(half):
    every = looped() if half == "loops" else [
        clip for some in clips_of(half, "kzfp").values() for clip in some]
    some = sorted((clip for clip in every if not clip.known and not clip.related),
                  key=lambda clip: -clip.score)
    print(f"{len(some)} stranger clips, {sum(clip.accepted for clip in some)} accepted")
    counts = collections.Counter(math.floor(4 * clip.score) / 4 for clip in some if clip.best)
    for score in sorted(counts):
        print(f"  {score:5.2f} to {score + 0.25:5.2f}: {counts[score]}")
    for clip in some[:30]:
        if clip.best:
            print(f"{clip.score:.3f} (needs {clip.threshold:.3f}) {clip.truth['kind']} "
                  f"{clip.truth['track']} at {clip.truth['seconds']:.1f} -> {track_of(clip.best)} at "
                  f"{clip.best['offset']:.1f}, speed {clip.best['speed']} tempo {clip.best['tempo']} pitch "
                  f"{clip.best['pitch']}")


def thresholds():
    """Two thresholds on the strangers and known clips of `tune`."""
    by_kind = clips_of("tune", "kzfp")
    every = [clip for some in by_kind.values() for clip in some if clip.best]
    base = min(clip.threshold for clip in every)
    some = [clip for clip in every if not clip.known and not clip.related]
    plain = [clip.score for clip in some if clip.threshold == base]
    moved = [clip.score for clip in some if clip.threshold != base]
    print(f"{len(some)} strangers; highest: base hypothesis {max(plain, default=math.nan):.3f} "
          f"({len(plain)}), others {max(moved, default=math.nan):.3f} ({len(moved)})")
    hardest = ("pink_0", "pink_3", "white_0", "speech_over", "mic", "tempo+5", "pitch+100", "pink_0_6s")
    print("S0\td\tfalse\tmean\t" + "\t".join(hardest))
    for s0 in [value / 10 for value in range(60, 92, 2)]:
        for d in (0.0, 0.5, 1.0, 1.4):
            passes = lambda clip: clip.score >= s0 + (d if clip.threshold != base else 0)
            wrong = sum(map(passes, some))
            rates = {kind: share(clip.right and passes(clip) for clip in clips if clip.known)
                     for kind, clips in by_kind.items()}
            print(f"{s0}\t{d}\t{wrong}\t{share(rates.values()):.4f}\t" +
                  "\t".join(f"{rates.get(kind, math.nan):.3f}" for kind in hardest))


def misses(half, kinds):
    for kind, clips in clips_of(half, "kzfp").items():
        for clip in clips if not kinds or kind in kinds else []:
            if clip.known and not (clip.accepted and clip.right):
                print(f"{kind} {clip.truth['file']} {clip.truth['track']} at {clip.truth['seconds']:.1f}: "
                      f"{clip.answer.get('verdict')} {clip.found} {clip.score:.2f} of {clip.threshold:.2f}")


def main():
    parser = argparse.ArgumentParser(description=__doc__, formatter_class=argparse.RawTextHelpFormatter)
    parser.add_argument("command", choices=["run", "table", "strangers", "thresholds", "misses"])
    parser.add_argument("rest", nargs="*")
    parser.add_argument("--markdown", action="store_true")
    arguments = parser.parse_args()
    rest = arguments.rest
    if arguments.command == "run":
        run(rest[0], rest[1], rest[2:])
    elif arguments.command == "table":
        table(rest[0], arguments.markdown)
    elif arguments.command == "strangers":
        strangers(rest[0])
    elif arguments.command == "misses":
        misses(rest[0], rest[1:])
    else:
        thresholds()


if __name__ == "__main__":
    main()
