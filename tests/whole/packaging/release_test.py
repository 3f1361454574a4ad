"""What is published, against the tree that it is made from. Argument: the root of the tree."""
import os
import pathlib
import re
import subprocess
import sys
import tarfile
import tempfile
import unittest

ROOT = pathlib.Path(sys.argv[1])
DEBIAN = ROOT / "packaging/debian"


def output(*command, **environment):
    return subprocess.run(command, check=True, capture_output=True, text=True, cwd=ROOT,
                          env={**os.environ, **environment}).stdout.strip()


def text(name):
    return (ROOT / name).read_text(encoding="utf-8")


VERSION = output("packaging/version.sh")


class Version(unittest.TestCase):
    def test_has_three_numbers(self):
        self.assertRegex(VERSION, r"^\d+\.\d+\.\d+$")

    def test_is_that_of_the_header(self):
        self.assertIn(f'#define KZSDK_VERSION "{VERSION}"', text("kzsdk/abs/version.h"))

    def test_is_that_of_every_man_page(self):
        pages = [*ROOT.glob("tools/**/man/*.1"), *ROOT.glob("packaging/**/*.1")]
        self.assertGreater(len(pages), 15)
        for page in pages:
            self.assertIn(f'"libkzsdk {VERSION}"', page.read_text().splitlines()[0], page)

    def test_has_a_day_in_the_changelog(self):
        self.assertRegex(output("packaging/version.sh", "date"), r"^\d{4}-\d\d-\d\d$")


@unittest.skipIf(subprocess.run(["git", "rev-parse", "HEAD"], cwd=ROOT, capture_output=True).returncode,
                 "not a checkout of git")
class Tarball(unittest.TestCase):
    def made(self, folder, **environment):
        return pathlib.Path(output("packaging/tarball.sh", folder, **environment))

    def test_is_the_same_whoever_makes_it(self):
        with tempfile.TemporaryDirectory() as one, tempfile.TemporaryDirectory() as other:
            first = self.made(one).read_bytes()
            umask = os.umask(0o077)
            try:
                second = self.made(other, TZ="Asia/Kathmandu", LC_ALL="C", HOME=other).read_bytes()
            finally:
                os.umask(umask)
            self.assertEqual(first, second)
            self.assertEqual(first[4:8], bytes(4), "gzip has noted a time")

    def test_holds_the_sources_and_nothing_built(self):
        with tempfile.TemporaryDirectory() as folder:
            with tarfile.open(self.made(folder)) as tarball:
                names = {name.partition("/")[2] for name in tarball.getnames()}
                owners = {(member.uid, member.gid) for member in tarball.getmembers()}
        self.assertLessEqual({"CMakeLists.txt", "LICENSE", "kzsdk/kzsdk.h", "catalogue/kzcat.h"}, names)
        self.assertFalse([name for name in names if name.startswith("build/")])
        self.assertEqual(owners, {(0, 0)})


class DebianPackages(unittest.TestCase):
    packages = set(re.findall(r"^Package: (.*)$", text("packaging/debian/control"), re.MULTILINE))

    def test_own_every_file_of_the_recipe(self):
        self.assertGreater(len(self.packages), 6)
        for file in DEBIAN.glob("*.*"):
            self.assertIn(file.name.rpartition(".")[0], self.packages, file)

    def test_are_used_by_tests_that_are_declared(self):
        declared = set(re.findall(r"^Tests: (.*)$", text("packaging/debian/tests/control"), re.MULTILINE))
        there = {file.name for file in (DEBIAN / "tests").iterdir()} - {"control", "music"}
        self.assertEqual(declared, there)
        run = re.search(r'^tests="(.*)"$', text("packaging/package_test.sh"), re.MULTILINE).group(1)
        self.assertEqual(set(run.split()), declared)

    def test_state_the_version_of_their_names(self):
        for library in ("kzsdk", "kzcat"):
            names = f"{library.upper()}_1.0"
            self.assertIn(f" (symver){names} 1.0.0\n", text(f"packaging/debian/lib{library}1.symbols"))
            folder = "kzsdk" if library == "kzsdk" else "catalogue"
            self.assertRegex(text(f"{folder}/{library}.map"), rf"(?m)^{names} {{$")


if __name__ == "__main__":
    unittest.main(argv=sys.argv[:1])
