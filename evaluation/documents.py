#!/usr/bin/python3
"""Looks up the query documents of clips and prints how well that went.

    evaluation/documents.py KZFP tune|report [KIND...]

Makes the document of every clip of 14.3 s with kzfp, looks it up in a catalogue of the known tracks
of the half, made with `kzfp add --documents`, and prints a row for each kind. Documents and
catalogue are kept in <cache>/results/<half>.

A clip whose sound begins late has less than the 14.22 s that a document takes, and gives none. The
place is that of the clip's first sound, which is where a document begins.
"""

import concurrent.futures
import json
import pathlib
import subprocess
import sys

import corpus
import score
from scoring import Clip, quantile, row_of, share

NEAR = 0.5  # seconds; documents of a track are kept for every 0.51 s


def provide_catalogue(kzfp, half):
    catalogue = corpus.CACHE / "results" / half / "documents.kzc"
    if not catalogue.exists():
        catalogue.parent.mkdir(parents=True, exist_ok=True)
        command = [kzfp, "add", "--documents", catalogue, *score.known_files(half)]
        done = subprocess.run(command, capture_output=True, text=True, check=False)
        if done.returncode:
            sys.exit(f"documents.py: {kzfp} add failed:\n{done.stderr[-2000:]}")
    return catalogue


def signal_offsets(kzfp, folder, names):
    """Where the sound of each file begins, in seconds; files without a document are left out."""
    done = subprocess.run([kzfp, "--format", "json", *names], cwd=folder, capture_output=True, text=True,
                          check=False)
    lines = [json.loads(line) for line in done.stdout.splitlines()]
    return {line["file"]: line["signal_offset_seconds"] for line in lines if "values" in line}


def write_document(kzfp, clip, target):
    target.parent.mkdir(parents=True, exist_ok=True)
    with target.open("wb") as file:
        subprocess.run([kzfp, clip], stdout=file, stderr=subprocess.DEVNULL, check=True)


def answers(kzfp, catalogue, folder, names):
    """What kzfp answers to the document of each file."""
    documents = [catalogue.parent / "documents" / f"{name}.xml" for name in names]
    with concurrent.futures.ThreadPoolExecutor(corpus.JOBS) as pool:
        list(pool.map(lambda pair: write_document(kzfp, folder / pair[0], pair[1]),
                      zip(names, documents)))
    return score.match(kzfp, catalogue, folder, documents) if names else []


def clips_of(kzfp, half, kind):
    """The clips of a kind that have a document, and how many have none."""
    folder = corpus.CACHE / "clips" / half
    kept = {track["id"] for track in corpus.known(half)}
    truths = [truth for truth in score.truths(half, kind)
              if truth["length"] > 14 and (truth["role"] == "stranger" or truth["track"] in kept)]
    offsets = signal_offsets(kzfp, folder, [truth["file"] for truth in truths]) if truths else {}
    heard = [truth for truth in truths if truth["file"] in offsets]
    for truth in heard:
        truth["seconds"] += offsets[truth["file"]]
    found = answers(kzfp, provide_catalogue(kzfp, half), folder, [truth["file"] for truth in heard])
    shared = score.shared_pairs()
    return [Clip(truth, answer, shared) for truth, answer in zip(heard, found)], len(truths) - len(heard)


def print_row(kind, clips, without):
    row = row_of(clips)
    right = [clip for clip in clips if clip.known and clip.accepted and clip.right]
    print(f"| {kind} | {row['clips']} | {without} | {row['top1']:.3f} | {row['accepted']:.3f} "
          f"| {share(not clip.best['weak'] for clip in right):.3f} | {row['wrong']} "
          f"| {share(clip.error <= NEAR for clip in right):.3f} "
          f"| {quantile([-clip.score for clip in clips if clip.known], 0.5):.0f} "
          f"| {row['strangers']} | {row['false']} | {-row['highest']:.1f} |", flush=True)


def main():
    kzfp, half = pathlib.Path(sys.argv[1]).resolve(), sys.argv[2]
    kinds = sys.argv[3:] or score.degrade.all_kinds()
    print("| kind | clips | no document | top-1 | accepted and right | of these not weak | wrong "
          "| place within 0.5 s | median distance | strangers | false | nearest stranger |\n|---|"
          + "---:|" * 11)
    for kind in kinds:
        clips, without = clips_of(kzfp, half, kind)
        if clips:
            print_row(kind, clips, without)


if __name__ == "__main__":
    main()
