#!/usr/bin/python3
"""Measures `kzfp serve` with wrk: look-ups a second and how long each takes, beside the look-up
alone.

    bench/service/load.py KZFP [--tracks 10000] [--seconds 20] [--connections 1 8 64]

The catalogue is made once, in $KZ_MEDIA/service. Trails of 11 s are posted by wrk on this machine,
which takes a part of its processors. "Alone" is the mean of the service's own histogram of
look-ups, without waiting, receiving and answering; beside it stands what `kzfp match` of as many
clips takes, less that of one.
"""

import argparse
import json
import os
import pathlib
import shutil
import subprocess
import tempfile
import time

import service_music
import service_run

HERE = pathlib.Path(__file__).resolve().parent
KINDS = {"of a track": "/v1/match", "of a stranger": "/v1/match",
         "of a stranger, speeds=0": "/v1/match?speeds=0"}


def wrk(service, path, clips, connections, seconds):
    """What wrk reports of one run."""
    threads = min(connections, os.cpu_count() or 1)
    command = ["wrk", "-t", threads, "-c", connections, "-d", f"{seconds}s", "--timeout", "60s",
               "-s", HERE / "post.lua", service.url, "--", path, *clips]
    told = subprocess.run([str(part) for part in command], check=True, capture_output=True,
                          text=True).stdout
    return json.loads(told.splitlines()[-1])


def lookups(service):
    """Seconds and number of the look-ups so far."""
    metrics = service.metrics()
    return (service_run.total(metrics, "kzfp_lookup_seconds_sum"),
            service_run.total(metrics, "kzfp_lookup_seconds_count"))


def until_idle(service):
    """wrk ends without its last answers, which are still being worked on."""
    while service_run.total(service.metrics(), "kzfp_queue_length"):
        time.sleep(0.1)
    time.sleep(0.5)


def measure(service, kind, clips, connections, seconds):
    wrk(service, KINDS[kind], clips, connections, 2)  # so that nothing is read for the first time
    until_idle(service)
    before = lookups(service)
    told = wrk(service, KINDS[kind], clips, connections, seconds)
    spent, count = (after - early for after, early in zip(lookups(service), before))
    wrong = told["others"] + told["connect"] + told["read"] + told["write"] + told["timeout"]
    print(f"| {kind} | {connections} | {(told['requests'] - told['busy']) / told['seconds']:.1f} | "
          f"{1000 * told['median']:.1f} ms | {1000 * told['p99']:.1f} ms | "
          f"{1000 * spent / max(count, 1):.1f} ms | {told['busy']} | {wrong} |", flush=True)


def matching(kzfp, catalogue, options, clips):
    """Seconds on the clock of `kzfp match`."""
    begin = time.perf_counter()
    subprocess.run([kzfp, "match", "-q", *options, catalogue, *clips], check=True,
                   stdout=subprocess.DEVNULL)
    return time.perf_counter() - begin


def measure_program(kzfp, catalogue, kind, clips):
    """Look-ups a second of the program without a service, on all processors."""
    options = ["--no-speeds"] if KINDS[kind].endswith("speeds=0") else []
    many = clips * 10
    spent = matching(kzfp, catalogue, options, many) - matching(kzfp, catalogue, options, clips[:1])
    print(f"| {kind} | {(len(many) - 1) / spent:.1f} |", flush=True)


def measure_all(options, folder):
    catalogue = service_music.provide_catalogue(options.kzfp, options.tracks)
    found = service_music.make_clips(options.kzfp, folder, catalogue, options.tracks, options.clips)
    strangers = service_music.make_strangers(options.kzfp, folder, options.tracks, options.clips)
    clips = {kind: strangers if "stranger" in kind else found for kind in KINDS}
    print("| clip | connections | look-ups a second | median | 99 % | look-up alone | 503 | failed "
          "|\n|---|---:|---:|---:|---:|---:|---:|---:|")
    with service_run.Service(options.kzfp, catalogue, "--log", "none", *options.serve) as service:
        for kind in KINDS:
            for connections in options.connections:
                measure(service, kind, clips[kind], connections, options.seconds)
        resident, own = service.memory()
        service.stop()
    print(f"\nResident at the end: {resident / 1024:.0f} MiB, {own / 1024:.0f} MiB of it its own\n")
    print("| clip | look-ups a second of `kzfp match` |\n|---|---:|")
    for kind in KINDS:
        measure_program(options.kzfp, catalogue, kind, clips[kind])


def main():
    parser = argparse.ArgumentParser(description=__doc__,
                                     formatter_class=argparse.RawDescriptionHelpFormatter)
    parser.add_argument("kzfp", type=pathlib.Path)
    parser.add_argument("--tracks", type=int, default=10000)
    parser.add_argument("--clips", type=int, default=40, help="different ones of each kind")
    parser.add_argument("--seconds", type=int, default=20, help="of each row")
    parser.add_argument("--connections", type=int, nargs="+", default=[1, 8, 64])
    parser.add_argument("--serve", nargs=argparse.REMAINDER, default=[],
                        help="options of kzfp serve; must come last")
    options = parser.parse_args()
    options.kzfp = options.kzfp.resolve()
    if shutil.which("wrk") is None:
        service_run.fail("wrk is missing: scripts/setup.sh service")
    with tempfile.TemporaryDirectory(prefix="kzfp-load-") as name:
        measure_all(options, pathlib.Path(name))


if __name__ == "__main__":
    main()
