"""Fingerprints: the documents of the C library and of kzfp, from every kind of input."""

import array
import itertools

import numpy
import pytest
import sounds

import kzsdk

FILES = ["music-44100-stereo-s16.wav", "music-8000-mono-alaw.wav", "music-8000-stereo-ulaw.wav",
         "music-22050-mono.mp3", "music-24bit.wav", "music-37800.wav", "music-4-channels.wav",
         "music-6-channels.wav", "music-8bit.wav", "music-96000.wav", "music-alac.m4a",
         "music-double.wav", "music-float.wav", "music.flac", "music.ogg", "music.opus",
         "music.wma", "music.mp4", "late-44100-stereo.wav", "music-tagged.mp3"]


@pytest.fixture(scope="module")
def golden(tree):
    """Digests by what stands before them on their line."""
    lines = (tree / "tests/whole/golden/documents.txt").read_text().splitlines()
    return dict(line.rsplit(" ", 1) for line in lines)


@pytest.fixture(scope="module")
def music(clips):
    """The samples of a clip, after its header, as (frames, 2)."""
    data = (clips / "music-44100-stereo-s16.wav").read_bytes()
    return numpy.frombuffer(data[44:], dtype=numpy.int16).reshape(-1, 2)


@pytest.mark.parametrize("rate, channels, format, name", [
    (8000, 2, "int16", "s16"), (8000, 1, "pcm8", "u8"),
    (8000, 1, "alaw", "alaw"), (8000, 1, "ulaw", "ulaw")])
@pytest.mark.parametrize("algorithm", ["fixed", "float"])
def test_documents_are_the_golden_ones(golden, rate, channels, format, name, algorithm):
    sound = sounds.melody(rate, channels, 15)
    if format != "int16":  # any byte is a sample: the high ones serve
        sound = bytes(sample >> 8 & 255 for sample in sound)
    document = kzsdk.fingerprint(bytes(sound), rate=rate, channels=channels, format=format,
                                 algorithm=algorithm).document
    expected = golden[f"{algorithm} {rate} {channels} {name} music"]
    assert sounds.digest(document + "\n") == expected


@pytest.mark.parametrize("line", [
    "fixed 8000 1 s16 noise", "float 8000 1 s16 noise", "fixed 11025 1 s16 noise",
    "float 11025 1 s16 noise", "float 12345 1 s16 music"])
def test_arrays_have_the_golden_documents(golden, line):
    algorithm, rate, _, _, piece = line.split()
    rate = int(rate)
    sound = sounds.noise(rate, 15, 1, rate + 1) if piece == "noise" else sounds.melody(rate, 1, 15)
    document = kzsdk.fingerprint(sound, rate=rate, algorithm=algorithm).document
    assert sounds.digest(document + "\n") == golden[line]


@pytest.mark.parametrize("rate, channels, dtype, name", [
    (11025, 3, numpy.float64, "f64"), (8000, 2, numpy.uint8, "linear8")])
def test_wide_samples_have_the_golden_documents(golden, rate, channels, dtype, name):
    sound = numpy.frombuffer(sounds.melody(rate, channels, 15), numpy.int16).astype(numpy.int32)
    wide = sound * 65536 + (sound & 255) * 251
    if dtype == numpy.float64:
        wide = wide / 2**31
    elif dtype == numpy.uint8:
        wide = sound >> 8 & 255
    samples = wide.astype(dtype).reshape(-1, channels)
    document = kzsdk.fingerprint(samples, rate=rate).document
    expected = golden[f"stream fixed {rate} {channels} {name} music"]
    assert sounds.digest(document + "\n") == expected


@pytest.mark.parametrize("name", FILES)
def test_a_file_has_the_document_of_kzfp(clips, kzfp, name):
    made = kzsdk.fingerprint(clips / name)
    assert made.document == kzfp(clips / name).strip()


def test_values_and_offset_are_those_of_kzfp(clips, kzfp_json):
    for name in ("music.flac", "late-44100-stereo.wav"):
        (line,) = kzfp_json(clips / name)
        made = kzsdk.fingerprint(str(clips / name))
        assert list(made.values) == line["values"]
        assert made.offset == pytest.approx(line["signal_offset_seconds"], abs=1e-4)
        assert made.duration == 14.21


def test_the_float_algorithm_takes_every_rate(clips, kzfp):
    path = clips / "music-37800.wav"
    made = kzsdk.fingerprint(path, algorithm="float")
    assert made.document == kzfp("--algorithm", "float", path).strip()


def test_every_type_of_samples_gives_one_document(music):
    expected = kzsdk.fingerprint(music, rate=44100).document
    same = [music.astype(numpy.int32) << 16, (music / 32768).astype(numpy.float32), music / 32768,
            music.astype(">i2"), numpy.asfortranarray(music), music[::-1][::-1],
            memoryview(music), memoryview(music.tobytes()).cast("h", music.shape)]
    for samples in same:
        assert kzsdk.fingerprint(samples, rate=44100).document == expected
    data = music.tobytes()
    for plain in (data, bytearray(data), memoryview(data)):
        assert kzsdk.fingerprint(plain, rate=44100, channels=2).document == expected


def test_one_channel_may_have_one_dimension(music):
    left = numpy.ascontiguousarray(music[:, 0])
    expected = kzsdk.fingerprint(left, rate=44100)
    assert kzsdk.fingerprint(left.reshape(-1, 1), rate=44100) == expected
    assert kzsdk.fingerprint(music[:, 0], rate=44100) == expected, "samples that are not adjacent"
    assert kzsdk.fingerprint(array.array("h", left.tobytes()), rate=44100) == expected


def test_pieces_leave_no_trace(music):
    expected = kzsdk.fingerprint(music, rate=44100)
    data = music.tobytes()
    cuts = [bytes(data[i:i + 99_991]) for i in range(0, len(data), 99_991)]
    assert kzsdk.fingerprint(iter(cuts), rate=44100, channels=2) == expected
    arrays = [music[i:i + 4097] for i in range(0, len(music), 4097)]
    assert kzsdk.fingerprint(arrays, rate=44100) == expected


def test_no_more_is_taken_than_is_needed(music):
    taken = itertools.count()
    endless = (music[:44100] for _ in taken)
    kzsdk.fingerprint(endless, rate=44100)
    assert next(taken) <= 19


def test_distance_and_verdict_are_those_of_kzfp(clips, kzfp, kzfp_json, tmp_path):
    names = ["music.flac", "music-22050-mono.mp3", "music-8000-mono-alaw.wav", "noise.wav"]
    made = [kzsdk.fingerprint(clips / name) for name in names]
    for name, fingerprint in zip(names, made):
        (tmp_path / name).with_suffix(".xml").write_text(fingerprint.document)
    documents = [(tmp_path / name).with_suffix(".xml") for name in names]
    for i, j in [(0, 1), (0, 2)]:
        (line,) = kzfp_json("compare", documents[i], documents[j])
        assert made[i].distance(made[j]) == pytest.approx(line["document_distance"], abs=1e-3)
        assert made[i].verdict(made[j]) == line["verdict"]
    assert made[0].distance(made[0]) == 0 and made[0].verdict(made[0]) == "same start"
    assert made[0].verdict(made[3]) == "different" and made[0].distance(made[3]) > 100
