#!/usr/bin/env python3
"""Writes the seeds of the fuzz targets: fuzz/seeds.py DIRECTORY makes DIRECTORY/<target>/<seed>.

The targets read their input as LLVM's FuzzedDataProvider does: numbers from the end of the input, texts
and bytes from its beginning. A Seed writes what they read, in the order in which they read it.
"""

import pathlib
import random
import sys

TARGETS = (
    "extraction stream tags paths render exchange resampler_fixed resampler_float converters dyn_buf "
    "disc_names disc_files documents trail_file trails index_file catalogue_file kzfp_options "
    "kzfp_files requests"
).split()


class Seed:
    def __init__(self):
        self.front = b""
        self.back = []  # in the order of reading

    def number(self, value, least, most):
        size = ((most - least).bit_length() + 7) // 8
        self.back.extend((value - least).to_bytes(size, "big"))
        return self

    def flag(self, value):
        return self.number(int(value), 0, 1)

    def text(self, text):
        """Of any length; two backslashes are one, and one before anything else ends it."""
        self.front += text.replace(b"\\", b"\\\\") + b"\\x"
        return self

    def all(self):
        return self.front + bytes(reversed(self.back))


def extraction():
    """A complete fingerprint at each rate by both algorithms, from noise after silence."""
    rates = [8000, 11025, 16000, 22050, 24000, 32000, 44100, 48000]
    for fixed in (True, False):
        for index, rate in enumerate(rates):
            form = 1 + (index + int(fixed)) % 4
            channels = 1 + index // 4 % 2
            seed = Seed().flag(fixed).number(form, 1, 4).number(index, 0, 7)
            seed.number(channels, 1, 2).number(0, 0, 3).number(0, 0, 31).number(0, 0, 7)
            seed.number(3, 0, 7).number(31, 0, 31)  # address, and long
            wanted = 15 * rate * channels * (2 if form == 2 else 1)
            stretches = [0] + [65535] * (wanted // 262141 + 1)
            seed.number(len(stretches), 0, 12)
            for kind, count in enumerate(stretches):
                seed.number(count, 0, 65535).number(0, 0, 255).number(kind, 0, 65535)
                seed.number(min(kind, 1), 0, 3)
            seed.number(4096 + 7 * form, 1, 100000)
            yield seed.all()


def stream():
    """A complete fingerprint in each format by both algorithms, at plain and at decimated rates."""
    rates = [8000, 11025, 16000, 22050, 24000, 32000, 44100, 48000]
    sizes = [1, 2, 1, 1, 3, 4, 4, 8, 1]
    for fixed in (True, False):
        for form, size in enumerate(sizes, 1):
            index = 0 if size > 2 else form % 3
            halvings = int(fixed and size < 3 and form != 1)
            channels = 1 + form % 3 if form != 1 and size < 4 else 1
            seed = Seed().flag(fixed).number(form, 1, 9).number(index, 0, 7).number(halvings, 0, 4)
            seed.number(channels, 1, 8).number(0, 0, 15).number(0, 0, 63).number(31, 0, 31)
            wanted = 15 * (rates[index] << halvings) * channels * size
            stretches = [0] + [65535] * min(11, wanted // 262141 + 1)
            seed.number(len(stretches), 0, 12)
            for kind, count in enumerate(stretches):
                seed.number(count, 0, 65535).number(0, 0, 255).number(kind, 0, 65535)
                seed.number(min(kind, 1), 0, 2)
            seed.number(4096 + 7 * form, 1, 100000)
            yield seed.all()


def documents():
    """A document as the library writes it, and one with everything else that is read."""
    numbers = " ".join(str(1000 + 30 * i) for i in range(30)).encode()
    block = b'TYPE="SIGNED_INT_16" COUNT="30" ENCODING="ASCII" SEPARATOR=" "'
    for text in (
            b'<?xml version="1.0" encoding="UTF-8" ?>\n<KZFPX_FP_QUERY VERSION="1.0">\n  <ALGORITHM>\n'
            b"    <NAME>Quenvar</NAME>\n    <VERSION>1.1</VERSION>\n    <QUERY>Quenvar&quot;1.1</QUERY>\n"
            b"  </ALGORITHM>\n  <FP_BLOCKS>\n    <FP_BLOCK " + block + b">" + numbers +
            b"</FP_BLOCK>\n  </FP_BLOCKS>\n</KZFPX_FP_QUERY>\n",
            b"<!-- -->\r\n<KZFPX_FP_QUERY VERSION='1.0'><A B='&#x41;&lt;' C='\t'/><FP_BLOCKS><FP_BLOCK "
            + block + b">\n0 32768 &#32;" + numbers[10:] + b"<!-- 31 --></FP_BLOCK></FP_BLOCKS>"
            b"</KZFPX_FP_QUERY>"):
        yield text + bytes(reversed((0).to_bytes(2, "big")))


def trail_file():
    """Files of no, one and many codes; their checksums are made right by the target."""
    for samples in (0, 4096, 100000):
        count = 0 if samples < 4096 else (samples - 4096) // 2048 + 1
        header = b"\x89KZT\r\n\x1a\n" + b"".join(
            number.to_bytes(size, "little")
            for number, size in ((1, 4), (1, 4), (samples, 8), (count, 8), (0, 32)))
        codes = random.Random(samples).randbytes(8 * count)
        yield header + codes + Seed().flag(True).flag(True).all()


def trails():
    """Sound of every encoding, at stored, doubled and odd rates."""
    for form in range(1, 10):
        for rate in (0, 2, 7, 10, 12):
            seed = Seed().number(form, 1, 9).number(rate, 0, 13).number(1 + form % 3, 1, 4)
            seed.number(0, 0, 7).number(0, 0, 31).number(0, 0, 63).number(1001, 1, 10000)
            size = 30000 if rate else 160000
            seed.number(0 if rate else 15, 0, 15).number(size, 0, size)
            yield seed.number(form, 0, 65535).flag(True).all()


def index_file():
    """A file as it is, and with a field of each section changed."""
    for larger in (True, False):
        yield Seed().flag(larger).number(0, 0, 8).number(0, 0, 7).number(0, 0, 7).flag(False).all()
        for section in range(10):
            for at_end in (True, False):
                seed = Seed().flag(larger).number(1, 0, 8).flag(False).number(section, 0, 9)
                seed.number(16 if at_end else 8, 0, 1 << 20).flag(at_end).text(b"\x01\xff\xff\xff")
                yield seed.number(0, 0, 7).number(0, 0, 7).flag(True).all()


def kzfp_files():
    """Sound that is long enough: WAV at 8000 Hz, headerless at 1000 Hz, from standard input too."""
    for raw in (True, False):
        for standard_input in (0, 7):
            seed = Seed().number(1, 0, 2).flag(True).flag(raw)
            if raw:
                seed.flag(True)
            seed.number(0, 0, 3).number(0, 0, 3).number(0, 0, 7).number(standard_input, 0, 7)
            seed.number(60000, 0, 65535).flag(not raw)
            if not raw:  # 1000 Hz, one channel, 8 bits
                seed.number(0, 0, 6).number(0, 0, 7).number(0, 0, 7).number(1, 0, 9)
                seed.number(0, 0, 6).number(0, 0, 3).number(0, 0, 3)
            yield seed.text(b"").all()


def requests():
    """Each known target with each method, with a token and a type; and bodies of 30 values."""
    values = b'{"values": [' + b", ".join(b"%d" % (31 * i - 500) for i in range(30)) + b"]}"
    for method in range(6):
        for target in range(14):
            seed = Seed().flag(True).flag(True).flag(True).flag(method % 2)
            if method % 2:
                seed.flag(False)
            seed.number(0, 0, 3).number(method, 0, 5).number(0, 0, 2)
            seed.number(0, 0, 3).number(target, 0, 13).number(0, 0, 2)
            seed.number(2, 0, 6)
            for name, value in ((1, 3), (2, 4)):
                seed.number(0, 0, 3).number(name, 0, 8).number(0, 0, 2)
                seed.number(0, 0, 3).number(value, 0, 12).number(0, 0, 2)
            seed.number(0, 0, 2)
            seed.front += values
            yield seed.all()


def at_random(target):
    """Bytes of many lengths, the same every time."""
    source = random.Random(target)
    for size in (0, 1, 2, 3, 5, 8, 16, 32, 64, 128, 256, 512, 1024, 2000):
        for _ in range(4):
            yield source.randbytes(size)


def main():
    directory = pathlib.Path(sys.argv[1])
    for target in TARGETS:
        seeds = list(at_random(target))
        if target in globals():
            seeds += globals()[target]()
        place = directory / target
        place.mkdir(parents=True, exist_ok=True)
        for number, seed in enumerate(seeds):
            (place / f"seed-{number:03}").write_bytes(seed)


if __name__ == "__main__":
    main()
