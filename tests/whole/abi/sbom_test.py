"""The list of what is linked, against the built files.

Arguments: the script, the build directory, and which of the optional libraries it was built with.
"""
import json
import pathlib
import re
import subprocess
import sys
import tempfile
import unittest

SCRIPT, BUILD = sys.argv[1], pathlib.Path(sys.argv[2])
OPTIONAL = {
    "FFMPEG": ["deb:libavcodec59", "deb:libavformat59", "deb:libavutil57"],
    "LIBPQ": ["deb:libpq5"],
    "MICROHTTPD": ["deb:libmicrohttpd12"],
    "PORTAUDIO": ["deb:libportaudio2"],
}
BUILT_WITH = sys.argv[3:]


def packages(always, may_use):
    """What is always linked, and the libraries of `may_use` that this build has."""
    return sorted(always + [p for name in may_use if name in BUILT_WITH for p in OPTIONAL[name]])


def run(build):
    return subprocess.run([SCRIPT, str(build)], capture_output=True, text=True)


def needed(file):
    dynamic = subprocess.run(["readelf", "-d", str(file)], check=True, capture_output=True, text=True)
    return set(re.findall(r"NEEDED.*\[(.*)\]", dynamic.stdout))


class Sbom(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.text = run(BUILD).stdout
        cls.list = json.loads(cls.text)
        cls.depends = {d["ref"]: d["dependsOn"] for d in cls.list["dependencies"]}

    def test_the_library_needs_the_c_library_and_nothing_else(self):
        self.assertEqual(needed(BUILD / "kzsdk/libkzsdk.so"), {"libc.so.6", "libm.so.6"})
        self.assertEqual(self.depends["libkzsdk"], ["deb:libc6"])

    def test_the_catalogue_needs_the_library_and_its_packages(self):
        self.assertEqual(
            self.depends["libkzcat"],
            packages(["deb:libc6", "deb:libgcc-s1", "deb:libnettle8", "deb:libsqlite3-0", "deb:libstdc++6",
                      "libkzsdk"], ["LIBPQ"]))

    def test_the_program_needs_the_libraries_and_its_packages(self):
        self.assertEqual(
            self.depends["kzfp"],
            packages(["deb:libc6", "deb:libcli11-dev", "deb:libgcc-s1", "deb:libnettle8", "deb:libpng16-16",
                      "deb:libsndfile1", "deb:libsoxr0", "deb:libsqlite3-0", "deb:libstdc++6",
                      "deb:nlohmann-json3-dev", "libkzcat", "libkzsdk"], OPTIONAL))

    def test_names_nothing_that_is_not_described(self):
        described = {c["bom-ref"] for c in self.list["components"]} | {"libkzsdk"}
        self.assertEqual(described, set(self.depends))
        for below in self.depends.values():
            self.assertLessEqual(set(below), described)

    def test_tells_version_and_origin_of_all_and_the_licence_of_what_we_use(self):
        ours = set(self.depends["kzfp"] + self.depends["libkzsdk"] + self.depends["libkzcat"])
        for component in self.list["components"]:
            self.assertTrue(component["version"], component)
            self.assertTrue(component["purl"].startswith("pkg:"), component)
            self.assertTrue(component["bom-ref"] not in ours or component["licenses"], component)

    def test_is_the_same_each_time(self):
        self.assertEqual(self.text, run(BUILD).stdout)

    def test_stops_at_a_library_without_a_licence_on_record(self):
        with tempfile.TemporaryDirectory() as place:
            build = pathlib.Path(place)
            for file in ("kzsdk/libkzsdk.so", "catalogue/libkzcat.so", "tools/kzfp/kzfp"):
                (build / file).parent.mkdir(parents=True)
                (build / file).symlink_to("/bin/bash")  # needs libtinfo
            (build / "CMakeCache.txt").write_text("CMAKE_PROJECT_VERSION:STATIC=1\n")
            stopped = run(build)
        self.assertEqual(stopped.returncode, 1)
        self.assertIn("libkzsdk uses libtinfo6, which has no licence", stopped.stderr)

    def test_asks_for_a_build_where_there_is_none(self):
        with tempfile.TemporaryDirectory() as place:
            stopped = run(place)
        self.assertEqual(stopped.returncode, 1)
        self.assertIn("./run build makes it", stopped.stderr)


if __name__ == "__main__":
    unittest.main(argv=sys.argv[:1])
