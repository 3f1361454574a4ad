"""Made-up music for the measurements of `kzfp serve`: catalogues of any size, and clips of them.

The catalogue holds melodies and permutations of them: the same codes with the bits of each in
another order. To the search these are other pieces, as alike along time and among themselves as
music is.
"""

import os
import pathlib
import struct
import subprocess
import tempfile
import wave

import numpy

MEDIA = pathlib.Path(os.environ.get("KZ_MEDIA", "build/media")) / "service"
RATE = 11025
SECONDS = 240
CODES = 1292  # of a track of four minutes
VARIANTS = 128  # permutations of a melody
HEADER = 64
CLIP_CODES = 58  # 11 s


def crc_table():
    table = numpy.arange(256, dtype=numpy.uint32)
    for _ in range(8):
        table = (table >> 1) ^ numpy.where(table & 1, numpy.uint32(0x82F63B78), numpy.uint32(0))
    return table


TABLE = crc_table()


def crc32c(rows):
    """The checksum of each row of bytes."""
    sums = numpy.full(len(rows), 0xFFFFFFFF, numpy.uint32)
    for column in rows.T:
        sums = TABLE[(sums ^ column) & 0xFF] ^ (sums >> 8)
    return sums ^ 0xFFFFFFFF


def trails(rows):
    """The trail file of each row of codes, as docs/trail_file.md describes it."""
    rows = numpy.ascontiguousarray(rows, "<u8")
    codes = rows.shape[1]
    head = b"\x89KZT\r\n\x1a\n" + struct.pack("<IIQQ24x", 1, 1, 4096 + 2048 * (codes - 1), codes)
    sums = crc32c(rows.view(numpy.uint8).reshape(len(rows), -1))
    starts = [head + struct.pack("<I", checksum) for checksum in sums]
    own = crc32c(numpy.array([list(start) for start in starts], numpy.uint8))
    return [start + struct.pack("<I", checksum) + row.tobytes()
            for start, checksum, row in zip(starts, own, rows)]


def melody(seed, seconds=SECONDS, rate=RATE):
    """Notes of three partials, each a quarter of a second, as 16-bit samples."""
    chance = numpy.random.default_rng(seed)
    length = rate // 4
    time = numpy.arange(length) / rate
    fade = numpy.exp(-6 * time)
    notes = []
    for _ in range(int(seconds * rate) // length + 1):
        pitches = 110 * 2 ** (chance.integers(0, 44, 2) / 12)
        notes.append(sum(numpy.sin(2 * numpy.pi * part * pitch * time) / part
                         for pitch in pitches for part in (1, 2, 3)) * fade)
    samples = numpy.concatenate(notes)[:int(seconds * rate)]
    return (samples * 5000).astype("<i2")


def write_wav(path, samples, rate=RATE):
    with wave.open(str(path), "wb") as sound:
        sound.setnchannels(1)
        sound.setsampwidth(2)
        sound.setframerate(rate)
        sound.writeframes(samples.tobytes())


def codes_of(kzfp, folder, seed):
    """The codes of a melody, as the program makes them."""
    sound, catalogue, trail = (folder / name for name in ("one.wav", "one.kzc", "one.kzt"))
    write_wav(sound, melody(seed))
    subprocess.run([kzfp, "add", "-q", catalogue, sound], check=True, stdout=subprocess.DEVNULL)
    subprocess.run([kzfp, "export", "-q", "--trail", "1", catalogue, trail], check=True)
    codes = numpy.fromfile(trail, "<u8", offset=HEADER)[:CODES]
    for path in folder.glob("one.*"):
        path.unlink()
    return codes


def packed(bits):
    """Codes out of rows of 64 bits."""
    return numpy.ascontiguousarray(numpy.packbits(bits, axis=1)).view("<u8").ravel()


def permuted(codes, variant):
    """The codes with their bits in another order; variant 0 is the music itself."""
    order = numpy.random.default_rng(variant).permutation(64) if variant else numpy.arange(64)
    bits = numpy.unpackbits(codes.astype("<u8").view(numpy.uint8).reshape(-1, 8), axis=1)
    return packed(bits[:, order])


def pieces_for(tracks):
    return (tracks + VARIANTS - 1) // VARIANTS


def make_catalogue(kzfp, path, tracks):
    path.parent.mkdir(parents=True, exist_ok=True)
    with tempfile.TemporaryDirectory(dir=path.parent) as name:
        folder = pathlib.Path(name)
        (folder / "trails").mkdir()
        made = 0
        for seed in range(pieces_for(tracks)):
            codes = codes_of(kzfp, folder, seed)
            count = min(VARIANTS, tracks - made)
            rows = numpy.array([permuted(codes, variant) for variant in range(count)])
            for trail in trails(rows):
                (folder / "trails" / f"{made:06}.kzt").write_bytes(trail)
                made += 1
        subprocess.run([kzfp, "add", "-q", folder / "new.kzc", folder / "trails"], check=True,
                       stdout=subprocess.DEVNULL)
        # The first look-up writes the index beside the catalogue.
        subprocess.run([kzfp, "match", "-q", folder / "new.kzc", folder / "trails" / "000000.kzt"],
                       check=True, stdout=subprocess.DEVNULL)
        for made_file in folder.glob("new.kzc*"):
            made_file.rename(path.parent / made_file.name.replace("new.kzc", path.name))


def provide_catalogue(kzfp, tracks):
    """A catalogue of so many tracks, which is made when it is not there yet."""
    path = MEDIA / f"{tracks}.kzc"
    if not path.exists():
        make_catalogue(kzfp, path, tracks)
    return path


def damaged(codes, share, chance):
    """The codes with this share of their bits inverted, as noise does."""
    bits = chance.random((len(codes), 64)) < share
    return codes ^ packed(bits)


def make_clips(kzfp, folder, catalogue, tracks, count, seed=1):
    """Trails of 11 s out of tracks of the catalogue, a sixth of the bits wrong."""
    chance = numpy.random.default_rng(seed)
    paths = []
    for track in chance.integers(1, tracks + 1, count):
        trail = folder / "whole.kzt"
        subprocess.run([kzfp, "export", "-q", "--trail", str(track), catalogue, trail], check=True)
        codes = numpy.fromfile(trail, "<u8", offset=HEADER)
        begin = chance.integers(0, len(codes) - CLIP_CODES)
        part = damaged(codes[begin:begin + CLIP_CODES], 1 / 6, chance)
        paths.append(folder / f"track-{len(paths)}-{track}.kzt")
        paths[-1].write_bytes(trails(part[None, :])[0])
        trail.unlink()
    return paths


def make_strangers(kzfp, folder, tracks, count, seed=2):
    """Trails of 11 s out of a melody that no catalogue of so many tracks holds."""
    chance = numpy.random.default_rng(seed)
    codes = codes_of(kzfp, folder, pieces_for(tracks) + 1000)
    paths = []
    for begin in chance.integers(0, len(codes) - CLIP_CODES, count):
        paths.append(folder / f"stranger-{len(paths)}.kzt")
        paths[-1].write_bytes(trails(codes[None, begin:begin + CLIP_CODES])[0])
    return paths
