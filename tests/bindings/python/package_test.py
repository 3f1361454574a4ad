"""The package itself: its archives, what it knows of the libraries, its documentation."""

import ast
import doctest
import importlib.metadata
import inspect
import os
import pathlib
import re
import shutil
import subprocess
import sys
import tarfile
import typing
import zipfile

import pytest

import kzsdk
from conftest import without_preloads
from kzsdk import _native
from kzsdk._interface import ffi

FOLDER = pathlib.Path(kzsdk.__file__).parent
MODULES = sorted(path.stem for path in FOLDER.glob("*.py") if path.stem != "_interface")


def test_the_installed_package_is_tested():
    assert FOLDER.is_relative_to(sys.prefix)
    assert importlib.metadata.version("kzsdk") == kzsdk.__version__
    assert _native.text(_native.sdk().kzsdk_get_version()) == kzsdk.__version__


def test_the_wheel_is_for_every_python_of_a_machine(dist):
    (wheel,) = dist.glob("*.whl")
    assert re.fullmatch(r"kzsdk-[\d.]+-py3-none-linux_\w+\.whl", wheel.name)
    names = set(zipfile.ZipFile(wheel).namelist())
    for name in ("py.typed", "_interface.py", "_version.py", "_libraries/libkzsdk.so.1",
                 "_libraries/libkzcat.so.1", "_libraries/libkzsound.so"):
        assert "kzsdk/" + name in names


def test_libraries_are_not_looked_for_around_the_user(dist, tmp_path):
    """A search path of the build tree would end in the current directory."""
    (wheel,) = dist.glob("*.whl")
    with zipfile.ZipFile(wheel) as archive:
        libraries = [name for name in archive.namelist() if "_libraries/" in name]
        archive.extractall(tmp_path, libraries)
    assert len(libraries) == 3
    for library in libraries:
        assert not tags_of(tmp_path / library) & {"RPATH", "RUNPATH"}, library
        assert "NEEDED" in tags_of(tmp_path / library)


def tags_of(library):
    """What the dynamic section of a library has."""
    shown = subprocess.run(["readelf", "--dynamic", "--wide", library], capture_output=True,
                           text=True, check=True, env=without_preloads()).stdout
    return set(re.findall(r"\((\w+)\)", shown))


def test_the_source_archive_has_no_libraries(dist):
    (archive,) = dist.glob("*.tar.gz")
    with tarfile.open(archive) as tar:
        names = {name.partition("/")[2] for name in tar.getnames()}
    assert {"kzsdk/_interface.py", "kzsdk/py.typed", "pyproject.toml", "LICENSE"} <= names
    assert not [name for name in names if ".so" in name]


def test_python_3_9_can_read_every_module():
    for path in FOLDER.glob("*.py"):
        ast.parse(path.read_text(), path.name, feature_version=(3, 9))


def records():
    """The records that have fields, by the names that C knows them by."""
    typedefs, _, _ = ffi.list_types()
    for name in typedefs:
        kind = ffi.typeof(name)
        if kind.kind == "struct" and kind.fields:
            yield name, kind


def constants():
    library = _native.sdk()
    for name in filter(str.isupper, dir(library)):
        yield name, getattr(library, name)


def test_records_and_numbers_are_those_of_the_compiler(tree, tmp_path):
    """The package is not compiled against the headers: what it took from them is compared."""
    lines, expected = [], {}
    for name, kind in records():
        expected[name] = ffi.sizeof(kind)
        lines.append(f'printf("{name} %zu\\n", sizeof({name}));')
        for field, place in kind.fields:
            expected[f"{name}.{field}"] = place.offset * 1000 + ffi.sizeof(place.type)
            lines.append(f'printf("{name}.{field} %zu\\n", offsetof({name}, {field}) * 1000 + '
                         f'sizeof((({name}*)0)->{field}));')
    for name, value in constants():
        expected[name] = value
        lines.append(f'printf("{name} %lld\\n", (long long){name});')
    source = tmp_path / "layouts.c"
    source.write_text('#include <stdio.h>\n#include "kzsdk/kzsdk.h"\n#include "kzcat.h"\n'
                      '#include "kzsound.h"\nint main(void)\n{\n' + "\n".join(lines) +
                      "\nreturn 0;\n}\n")
    includes = [f"-I{tree / folder}" for folder in ("", "catalogue", "tools/sound_reader")]
    subprocess.run([os.environ["KZ_CC"], *includes, source, "-o", tmp_path / "layouts"], check=True,
                   env=without_preloads())
    printed = subprocess.run([tmp_path / "layouts"], capture_output=True, text=True, check=True,
                             env=without_preloads()).stdout
    assert len(expected) > 300
    assert dict(line.split() for line in printed.splitlines()) == {
        name: str(value) for name, value in expected.items()}


def test_everything_public_has_types_and_a_comment():
    for name in kzsdk.__all__:
        thing = getattr(kzsdk, name)
        if inspect.isclass(thing):
            assert thing.__doc__, name
            for own, member in vars(thing).items():
                if inspect.isfunction(member) and (own == "__init__" or own[0] != "_"):
                    check_types(member)
        elif inspect.isfunction(thing):
            assert thing.__doc__
            check_types(thing)


def check_types(function):
    signature = inspect.signature(function)
    names = [name for name in signature.parameters if name != "self"]
    assert {*names, "return"} <= {*typing.cast(dict, function.__annotations__)}, function


@pytest.mark.parametrize("module", MODULES)
def test_examples_in_comments_are_right(module):
    found = doctest.testmod(importlib.import_module(f"kzsdk.{module}".removesuffix(".__init__")))
    assert found.failed == 0


def test_the_page_about_python_is_right(tree, clips, tmp_path, monkeypatch):
    """Runs all of its code, one block after the other, where its files are."""
    text = (tree / "docs/python.md").read_text()
    for name, clip in [("song.flac", "music.flac"), ("clip.wav", "music-22050-mono-s16.wav"),
                       ("song.mp3", "music-tagged.mp3"), ("stream.raw", "music-44100-mono.s16")]:
        (tmp_path / name).symlink_to(clips / clip)
    monkeypatch.chdir(tmp_path)
    blocks = re.findall(r"```python\n(.*?)```", text, re.DOTALL)
    assert len(blocks) >= 4
    names = {}
    for block in blocks:
        exec(compile(block, "docs/python.md", "exec"), names)


def test_the_example_of_a_stream_ends_when_sound_is_short(tree, tmp_path, monkeypatch):
    text = (tree / "docs/python.md").read_text()
    (example,) = (block for block in re.findall(r"```python\n(.*?)```", text, re.DOTALL)
                  if "kzsdk.Stream" in block)
    (tmp_path / "stream.raw").write_bytes(bytes(200000))
    monkeypatch.chdir(tmp_path)
    with pytest.raises(kzsdk.TooLittleSoundError, match="nothing but silence in 2.3 s"):
        exec(compile(example, "docs/python.md", "exec"), {"kzsdk": kzsdk})


def test_the_first_four_lines_recognise_a_clip(tree, clips, tmp_path):
    text = (tree / "docs/python.md").read_text()
    first = re.search(r"```python\n(.*?)```", text, re.DOTALL).group(1)
    (tmp_path / "song.flac").symlink_to(clips / "music.flac")
    (tmp_path / "clip.wav").symlink_to(clips / "music-8000-mono-alaw.wav")
    done = subprocess.run([sys.executable, "-c", first], cwd=tmp_path, capture_output=True,
                          text=True, check=True)
    assert len(first.splitlines()) == 4 and "song.flac" in done.stdout


def test_the_example_recognises_its_tune(tree, tmp_path):
    done = subprocess.run([sys.executable, tree / "examples/python/listen.py", tmp_path],
                          capture_output=True, text=True, check=True)
    assert done.stdout.startswith("Tune 2, from second 17.0 on")
    assert "equal: True" in done.stdout and "same start" in done.stdout
    assert "no pictures" in done.stdout or (tmp_path / "listen.png").stat().st_size > 10000


def test_missing_libraries_are_named(tmp_path):
    code = ("import kzsdk\ntry:\n    kzsdk.Stream(8000)\n"
            "except ImportError as error:\n    print(error)")
    done = subprocess.run([sys.executable, "-c", code], capture_output=True, text=True, check=True,
                          env={**os.environ, "KZSDK_LIBRARY_PATH": str(tmp_path)})
    assert "libkzsdk.so.1 cannot be loaded" in done.stdout
    assert "install the library (Debian: libkzsdk1), or name the folder" in done.stdout
    assert f"KZSDK_LIBRARY_PATH names {tmp_path}, which has none of the libraries" in done.stdout


def test_a_named_folder_may_have_some_libraries_only(clips, tmp_path):
    # A copy: the linked file's path would be that of the package's own library.
    shutil.copy(FOLDER / "_libraries/libkzcat.so.1", tmp_path)
    code = ("import kzsdk, sys\nassert 'libsndfile' in kzsdk.sound_reader\n"
            "print(len(kzsdk.fingerprint(sys.argv[1]).values), len(kzsdk.Catalogue(None)))\n"
            "print([line.split()[-1] for line in open('/proc/self/maps') if 'libkzcat' in line][0])")
    done = subprocess.run([sys.executable, "-c", code, clips / "music.flac"], capture_output=True,
                          text=True, check=True,
                          env={**os.environ, "KZSDK_LIBRARY_PATH": str(tmp_path)})
    assert done.stdout.splitlines() == ["30 0", str((tmp_path / "libkzcat.so.1").resolve())]


def test_a_reader_that_cannot_be_loaded_says_why(clips, tmp_path):
    (tmp_path / "libkzsound.so").write_text("no library")
    code = ("import kzsdk, sys\nsys.modules['soundfile'] = None\ntry:\n"
            "    kzsdk.fingerprint(sys.argv[1])\n"
            "except kzsdk.SoundFileError as error:\n    print(error)")
    done = subprocess.run([sys.executable, "-c", code, clips / "music.flac"], capture_output=True,
                          text=True, check=True,
                          env={**os.environ, "KZSDK_LIBRARY_PATH": str(tmp_path)})
    assert "the reader of sound files cannot be loaded (" in done.stdout
    assert "libkzsound.so" in done.stdout and "install the package soundfile" in done.stdout


def test_an_older_library_is_refused(monkeypatch):
    with pytest.raises(ImportError, match="libkzcat is version 1.0.3, and this package needs 1.1"):
        _native._check_version("libkzcat", "1.0.3", 1, 1)
    with pytest.raises(ImportError, match="needs 1.0 or a later 1.x"):
        _native._check_version("libkzsdk", "2.0.0", 1, 0)
    _native._check_version("libkzsdk", "1.4.0", 1, 2)
