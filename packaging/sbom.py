#!/usr/bin/env python3
"""Lists what the built libraries and kzfp are linked with, as CycloneDX 1.5 (JSON).

packaging/sbom.py [BUILD_DIRECTORY]     build/release if not given; prints to standard output

Read from the built files, not from what the build asked for: the libraries that they name, those
that kzfp opens when it needs them, and those that these name in turn, each by the Debian package
that it came in. Headers that leave no name behind are in INCLUDED. Nothing in it depends on when or
where it is made.
"""
import functools
import hashlib
import json
import os
import pathlib
import re
import subprocess
import sys
from urllib.parse import quote

ROOT = pathlib.Path(__file__).resolve().parent.parent
# What we link or include ourselves. Another one has to be entered here, with its licence.
LICENCES = {
    "libc6": "LGPL-2.1-or-later",
    "libgcc-s1": "GPL-3.0-or-later WITH GCC-exception-3.1",
    "libstdc++6": "GPL-3.0-or-later WITH GCC-exception-3.1",
    "libmicrohttpd12": "LGPL-2.1-or-later",
    "libnettle8": "LGPL-3.0-or-later OR GPL-2.0-or-later",
    "libsndfile1": "LGPL-2.1-or-later",
    "libsqlite3-0": "blessing",
    "libpq5": "PostgreSQL",
    "libsoxr0": "LGPL-2.1-or-later",
    "libpng16-16": "libpng-2.0",
    "libportaudio2": "MIT",
    # Debian builds FFmpeg with its parts under the GPL.
    "libavcodec59": "GPL-2.0-or-later",
    "libavformat59": "GPL-2.0-or-later",
    "libavutil57": "GPL-2.0-or-later",
    "libcli11-dev": "BSD-3-Clause",
    "nlohmann-json3-dev": "MIT",
}
OUR_FILES = {"libkzsdk.so.1": "libkzsdk"}
INCLUDED = {"kzfp": ["libcli11-dev", "nlohmann-json3-dev"]}


def output(*command):
    return subprocess.run(command, check=True, capture_output=True, text=True,
                          env={**os.environ, "LC_ALL": "C"}).stdout


def dynamic(file, kind):
    return re.findall(rf"\({kind}\).*\[(.*)\]", output("readelf", "-d", str(file)))


def needed(file):
    """The libraries that a file names: ["libm.so.6", ...]"""
    return dynamic(file, "NEEDED")


def opened(file):
    """The libraries whose names a program has among its texts, to open them: ["libavutil.so.57", ...]

    Compilers put texts that are only copied behind each other, without an end between them.
    """
    texts = re.findall(rb"(?<![a-z0-9_+-])lib[a-z0-9_+-]+\.so\.[0-9]+(?=\0)", file.read_bytes())
    return sorted({text.decode() for text in texts} - set(needed(file)) - set(dynamic(file, "SONAME")))


@functools.cache
def places_of_all():
    """Where the loader finds every library that is installed."""
    lines = output("/sbin/ldconfig", "-p").splitlines()[1:]
    return dict(re.findall(r"^\s*(\S+) .* => (/\S+)$", "\n".join(reversed(lines)), re.MULTILINE))


def places_of(file):
    """Where the loader finds all libraries that a file needs: {"libm.so.6": "/lib/.../libm.so.6"}"""
    return dict(re.findall(r"(\S+) => (/\S+)", output("ldd", str(file))))


@functools.cache
def packages_of_all():
    """The Debian package of every shared library: asked for at once, since each question takes half
    a second."""
    lines = re.findall(r"^([^:,\s]+)[^/]*: (/.*)$", output("dpkg-query", "-S", "*.so*"), re.MULTILINE)
    return {place: package for package, place in lines}


def package_of(place):
    """The Debian package that a file came in. It may list the file by its name from before /usr was
    merged."""
    place = os.path.realpath(place)
    for name in (place, place.removeprefix("/usr")):
        if name in packages_of_all():
            return packages_of_all()[name]
    sys.exit(f"sbom: no Debian package holds {place}; build with Debian's own libraries")


@functools.cache
def versions_of_all():
    """Version and architecture of every package."""
    lines = output("dpkg-query", "-W", "-f", "${Package} ${Version} ${Architecture}\n").splitlines()
    return {line.split()[0]: line.split()[1:] for line in reversed(lines) if len(line.split()) == 3}


def packaged(package):
    version, architecture = versions_of_all()[package]
    component = {
        "type": "library",
        "bom-ref": f"deb:{package}",
        "name": package,
        "version": version,
        "purl": f"pkg:deb/debian/{quote(package)}@{quote(version)}?arch={architecture}",
    }
    if package in LICENCES:
        component["licenses"] = [{"expression": LICENCES[package]}]
    return component


def our_own(kind, name, version, file):
    return {
        "type": kind,
        "bom-ref": name,
        "name": name,
        "version": version,
        "hashes": [{"alg": "SHA-256", "content": hashlib.sha256(file.read_bytes()).hexdigest()}],
        "licenses": [{"expression": "MIT"}],
        "purl": f"pkg:generic/{name}@{version}",
    }


class List:
    def __init__(self):
        self.packages = {}
        self.links = {}
        self.seen = set()

    def add(self, package):
        if package not in self.packages:
            self.packages[package] = packaged(package)
            self.links.setdefault(self.packages[package]["bom-ref"], set())
        return self.packages[package]["bom-ref"]

    def add_linked(self, file, ref, places):
        """What a file names, and what that names in turn."""
        refs = self.links.setdefault(ref, set())
        for soname in needed(file):
            if soname not in places:  # the loader itself
                continue
            if soname in OUR_FILES:
                refs.add(OUR_FILES[soname])
                continue
            package = package_of(places[soname])
            below = self.add(package)
            if ref in ("libkzsdk", "libkzcat", "kzfp"):
                self.expect_licence(ref, package)
            refs.add(below)
            if places[soname] not in self.seen:
                self.seen.add(places[soname])
                self.add_linked(places[soname], below, places)

    def add_opened(self, file, ref):
        for soname in opened(file):
            if soname not in places_of_all():
                sys.exit(f"sbom: {ref} opens {soname}, which is not installed here; install its package")
            place = places_of_all()[soname]
            package = package_of(place)
            self.expect_licence(ref, package)
            self.links[ref].add(self.add(package))
            self.add_linked(place, self.packages[package]["bom-ref"], places_of(place))

    def add_included(self, ref):
        for package in INCLUDED.get(ref, []):
            self.expect_licence(ref, package)
            self.links[ref].add(self.add(package))

    @staticmethod
    def expect_licence(ref, package):
        if package not in LICENCES:
            sys.exit(f"sbom: {ref} uses {package}, which has no licence in packaging/sbom.py: enter it there")


def main():
    build = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else "build/release")
    library, catalogue = build / "kzsdk/libkzsdk.so", build / "catalogue/libkzcat.so"
    program = build / "tools/kzfp/kzfp"
    for file in (library, catalogue, program):
        if not file.exists():
            sys.exit(f"sbom: {file} is not there; ./run build makes it")
    version = re.search(r"^CMAKE_PROJECT_VERSION:STATIC=(.*)$", (build / "CMakeCache.txt").read_text(),
                        re.MULTILINE).group(1)
    catalogue_version = re.search(r'define KZCAT_VERSION "(.*)"', (ROOT / "catalogue/kzcat.h").read_text()).group(1)

    found = List()
    for ref, file in (("libkzsdk", library), ("libkzcat", catalogue), ("kzfp", program)):
        found.add_linked(file, ref, places_of(file))
        found.add_included(ref)
    found.add_opened(catalogue, "libkzcat")
    found.add_opened(program, "kzfp")
    found.links["kzfp"] |= {"libkzsdk", "libkzcat"}  # their static forms
    document = {
        "bomFormat": "CycloneDX",
        "specVersion": "1.5",
        "version": 1,
        "metadata": {"component": our_own("library", "libkzsdk", version, library)},
        "components": [our_own("application", "kzfp", version, program),
                       our_own("library", "libkzcat", catalogue_version, catalogue)]
                      + [found.packages[name] for name in sorted(found.packages)],
        "dependencies": [{"ref": ref, "dependsOn": sorted(found.links[ref] - {ref})}
                         for ref in sorted(found.links)],
    }
    print(json.dumps(document, indent=2))


main()
