#!/usr/bin/env python3
"""Puts faults into a library, one at a time, and reports those that no unit test notices.

scripts/mutate.py [COUNT] [SEED] [kzsdk | catalogue]

COUNT faults (30) are drawn by SEED (1) from the sources of a folder (kzsdk): a comparison, an operator, a constant or a condition
changed, or a statement left out. Works on a copy of the tree in build/mutants. A fault that survives
needs a test, or changes nothing that a caller can observe: a larger buffer, a bound that only a
slower path needs. What only sanitizers would detect, such as a buffer too small, is not detected
here.
"""
import pathlib
import random
import re
import shutil
import subprocess
import sys
import time

ROOT = pathlib.Path(__file__).resolve().parent.parent
TREE = ROOT / "build/mutants/tree"
HOUSE = sys.argv[3] if len(sys.argv) > 3 else "kzsdk"
BUILD = ROOT / "build/mutants" / HOUSE
# Tests that read the built files, which are built otherwise here, or the sources.
NOT_RUN = ("tests/whole/abi/",)
# Not this machine's loops, or the choice among them: all are bit-identical.
LEFT_OUT = ("neon", "select.cpp", "processor.cpp")
# The catalogue's tests run over the library too, but its own find what there is to find.
OPTIONS = {"kzsdk": ["-DKZ_BUILD_CATALOGUE=OFF"], "catalogue": ["-DKZ_BUILD_CATALOGUE=ON"]}
TARGETS = {"kzsdk": "all", "catalogue": "catalogue_tests"}
# Trees of a million levels, and what reads the built files, which are built otherwise here.
TESTS = "-DeepTree.*:EveryAllocatingFunction*"
SWAPS = [
    (" < ", " <= "), (" <= ", " < "), (" > ", " >= "), (" >= ", " > "), (" == ", " != "), (" != ", " == "),
    (" + ", " - "), (" - ", " + "), (" * ", " + "), (" && ", " || "), (" || ", " && "), ("<< ", ">> "),
    (">> ", "<< "), ("std::min", "std::max"), ("std::max", "std::min"), ("true", "false"), ("false", "true"),
    ("++", ""),
]
SOURCE = re.compile(r"(kzsdk/\w+|catalogue(?:/\w+)?)/.*\.[ch]pp$")
STATEMENT = re.compile(r"\s+[\w:.>*\[\]()-]+(\(.*\)| [-+*/|&^<>]*= .*);$")
DECLARATION = re.compile(r"\s*(const|auto|return|u?int\w+_t|size_t|float|double)\b")


def code_lines(text):
    """The indices of lines that are neither comments nor checked while compiling."""
    comment = False
    for index, line in enumerate(text):
        bare = line.strip()
        if comment or bare.startswith("/*"):
            comment = "*/" not in bare
        elif bare and not bare.startswith(("//", "#", "namespace", "using", "template", "}")):
            if "static_assert" not in bare:
                yield index


def faults_of(line):
    """Every line that one fault makes of this one."""
    code = line.split("//")[0].rstrip()
    for old, new in SWAPS:
        for at in re.finditer(re.escape(old), code):
            yield code[:at.start()] + new + code[at.end():]
    for number in re.finditer(r"(?<![\w.])\d+\b", code):
        yield code[:number.start()] + str(int(number[0]) + 1) + code[number.end():]
    condition = re.fullmatch(r"(.*\bif \()(.*)(\) \{)", code)
    if condition:
        yield f"{condition[1]}!({condition[2]}){condition[3]}"
    if STATEMENT.fullmatch(code) and not DECLARATION.match(code):
        yield ""


def draw(chance, places):
    while True:
        file, index = chance.choice(places)
        text = (TREE / file).read_text().splitlines(keepends=True)
        faults = list(faults_of(text[index]))
        if faults:
            fault = chance.choice(faults)
            return file, index, text, fault


def runs(command, seconds, **options):
    try:
        return subprocess.run(command, stdout=subprocess.PIPE, stderr=subprocess.STDOUT, timeout=seconds,
                              **options).returncode == 0
    except subprocess.TimeoutExpired:
        return False


def builds(seconds=1800):
    return runs(["cmake", "--build", str(BUILD), "--target", TARGETS[HOUSE]], seconds)


def read_tests():
    """{test program: the rooms whose code it runs}, as the build has written them down."""
    lines = (line.split() for line in (BUILD / "layers.txt").read_text().splitlines())
    tests = {line[1]: line[2].removeprefix("rooms=").split(",") for line in lines
             if line[0] == "test" and not line[1].startswith(NOT_RUN)}
    return {test: rooms for test, rooms in tests.items()
            if rooms[0].split("/")[0] == HOUSE and (BUILD / test).exists()}


def tests_of(room, tests):
    """The tests that run a room's code, most likely to see a fault first: its own, then the others as declared,
    from the lowest room to the whole library."""
    house, _, name = room.partition("/")
    own = f"tests/library/{name}/" if house == "kzsdk" else f"tests/catalogue/{name or 'door'}/"
    return sorted((test for test, rooms in tests.items() if room in rooms),
                  key=lambda test: not test.startswith(own))


def first_to_fail(tests):
    """The first of these test programs that fails, or None."""
    for test in tests:
        program = BUILD / test
        if not runs([program, "--gtest_fail_fast", f"--gtest_filter={TESTS}"], 900, cwd=program.parent):
            return program.name
    return None


def bring(file):
    """Copies one file of the tree, unless it is there: then what was built of it holds."""
    there = TREE / file
    if not there.exists() or there.read_bytes() != (ROOT / file).read_bytes():
        there.parent.mkdir(parents=True, exist_ok=True)
        shutil.copy(ROOT / file, there)


def prepare(files):
    for file in files:
        bring(file)
    subprocess.run(["cmake", "-S", TREE, "-B", BUILD, "-G", "Ninja", "-DCMAKE_BUILD_TYPE=None",
                    "-DCMAKE_CXX_FLAGS=-O1", "-DKZ_BUILD_TOOLS=OFF", "-DKZ_JNI=OFF", "-DKZ_HARDEN=OFF", *OPTIONS[HOUSE]],
                   stdout=subprocess.DEVNULL, check=True)
    if not builds(None):  # everything, which takes as long as it takes
        sys.exit(f"mutate: {BUILD} does not build")
    subprocess.run([TREE / "scripts/make_disc_images.sh", BUILD / "disc_images"],
                   stdout=subprocess.DEVNULL, check=True)
    tests = read_tests()
    failing = first_to_fail(tests)
    if failing:
        sys.exit(f"mutate: {failing} fails without a fault, or takes 15 minutes")
    return tests


def main():
    count, seed = (int(word) for word in (sys.argv[1:] + ["30", "1"][len(sys.argv) - 1:])[:2])
    if HOUSE not in OPTIONS:
        sys.exit(f"mutate: {HOUSE} is none of {', '.join(OPTIONS)}")
    files = subprocess.check_output(["git", "ls-files"], cwd=ROOT, text=True).splitlines()
    tests = prepare(files)
    rooms = set().union(*tests.values())
    places = []
    for file in files:
        source = SOURCE.match(file)
        if source and source[1] in rooms and not any(name in file for name in LEFT_OUT):
            lines = (TREE / file).read_text().splitlines()
            places += [(file, index) for index in code_lines(lines)]
    chance = random.Random(seed)
    noticed = survived = 0
    while noticed + survived < count:
        file, index, text, fault = draw(chance, places)
        begun = time.monotonic()
        (TREE / file).write_text("".join(text[:index] + [fault + "\n"] + text[index + 1:]))
        if builds():
            by = first_to_fail(tests_of(SOURCE.match(file)[1], tests))
            noticed += by is not None
            survived += by is None
            print(f"{'noticed' if by else 'SURVIVED'} {file}:{index + 1}: {text[index].strip()}  =>  "
                  f"{fault.strip() or 'nothing'}  [{by or 'no test'}, {time.monotonic() - begun:.0f} s]",
                  flush=True)
        (TREE / file).write_text("".join(text))
    print(f"{noticed} of {count} faults noticed, {survived} survived (seed {seed})")


if __name__ == "__main__":
    main()
