"""What cannot be used is refused, in a sentence that says what would do."""

import pathlib
import warnings

import numpy
import pytest
import sounds

import kzsdk
from kzsdk import _native, _samples, _sources

RATE = 8000
FRAMES = numpy.zeros(RATE, numpy.int16)


@pytest.mark.parametrize("sound, arguments, error, sentence", [
    (FRAMES, {}, kzsdk.ArgumentError, "do not say how fast they follow each other: pass rate="),
    (FRAMES, {"rate": 0}, kzsdk.ArgumentError, "a rate of 0 Hz cannot be used"),
    (FRAMES, {"rate": -1}, kzsdk.ArgumentError, "pass 1 to 4000000"),
    (FRAMES, {"rate": 4_000_001}, kzsdk.ArgumentError, "pass 1 to 4000000"),
    (FRAMES, {"rate": 44100.5}, TypeError, "rate=44100.5 is not a whole number"),
    (FRAMES, {"rate": "44100"}, TypeError, "rate='44100' is not a whole number"),
    (FRAMES, {"rate": 44101}, kzsdk.ArgumentError, "The algorithm does not take the stream's rate"),
    (FRAMES, {"rate": RATE, "channels": 2}, kzsdk.ArgumentError, "channels=2 was passed"),
    (FRAMES, {"rate": RATE, "format": "float32"}, kzsdk.ArgumentError, "this array has int16"),
    (FRAMES, {"rate": RATE, "algorithm": "best"}, kzsdk.ArgumentError, "use 'fixed' or 'float'"),
    (b"\0\0", {"rate": RATE}, kzsdk.ArgumentError, "how many channels they hold: pass channels="),
    (b"\0\0", {"rate": RATE, "channels": 0}, kzsdk.ArgumentError, "0 channels cannot be used"),
    (b"\0\0", {"rate": RATE, "channels": 1, "format": "i2"}, kzsdk.ArgumentError,
     "use one of uint8"),
    (b"\0\0\0", {"rate": RATE, "channels": 1}, kzsdk.ArgumentError, "3 bytes are no whole number"),
    (numpy.zeros((2, RATE)), {"rate": RATE}, kzsdk.ArgumentError, "pass samples.T"),
    (numpy.zeros((2, 2, 2)), {"rate": RATE}, kzsdk.ArgumentError,
     r"pass \(frames,\) or \(frames, channels\)"),
    (numpy.zeros((5, 0)), {"rate": RATE}, kzsdk.ArgumentError, "have 0 channels"),
    (numpy.zeros(()), {"rate": RATE}, kzsdk.ArgumentError, r"samples of shape \(\)"),
    (FRAMES.astype(numpy.int64), {"rate": RATE}, TypeError, "samples of type int64 cannot be used"),
    (FRAMES.astype(numpy.float16), {"rate": RATE}, TypeError, "with samples.astype"),
    (FRAMES.astype(bool), {"rate": RATE}, TypeError, "samples of type bool"),
    (FRAMES.astype(complex), {"rate": RATE}, TypeError, "samples of type complex128"),
    (numpy.array(["a"]), {"rate": RATE}, TypeError, "cannot be used"),
    (7, {"rate": RATE}, TypeError, "int is not sound: pass a path, bytes, an array"),
    (None, {"rate": RATE}, TypeError, "NoneType is not sound"),
    ([1, 2, 3], {"rate": RATE}, TypeError, "int is not sound"),
    ([], {"rate": RATE}, kzsdk.TooLittleSoundError, "the iterator gave no sound"),
    (b"", {"rate": RATE, "channels": 1}, kzsdk.TooLittleSoundError, "no sound, 14.22 s needed"),
    (FRAMES[:0], {"rate": RATE}, kzsdk.TooLittleSoundError, "no sound, 14.22 s needed"),
    ("song.wav", {"rate": RATE}, kzsdk.ArgumentError, "song.wav: a sound file has a rate"),
    ("no/song.wav", {}, kzsdk.SoundFileError, "no/song.wav: cannot be opened"),
    (pathlib.Path("/"), {}, kzsdk.SoundFileError, "is a directory, a sound file is needed"),
    ("a\0b", {}, kzsdk.ArgumentError, "has a null character in it"),
])
def test_what_is_wrong_is_said(sound, arguments, error, sentence):
    with pytest.raises(error, match=sentence):
        kzsdk.fingerprint(sound, **arguments)


def test_pieces_must_be_alike():
    for pieces in ([FRAMES, FRAMES.astype(numpy.float32)], [FRAMES, FRAMES.reshape(-1, 2)]):
        with pytest.raises(kzsdk.ArgumentError, match="convert or reshape it"):
            kzsdk.fingerprint(pieces, rate=RATE)


def test_samples_are_looked_at_once(monkeypatch):
    """What is spread over memory is copied then."""
    looked_at, piece_of = [], _samples.piece_of
    monkeypatch.setattr(_samples, "piece_of", lambda sound: looked_at.append(1) or piece_of(sound))
    samples = sounds.noise(RATE, 3, 1, 1)
    spread = numpy.stack([samples, samples], axis=1)[:, 0]
    assert not spread.flags.c_contiguous
    with kzsdk.Catalogue(None) as catalogue:
        added = catalogue.add(spread, rate=RATE, title="A tune")
        assert looked_at == [1]
        assert catalogue.add(samples, rate=RATE, title="The same") == kzsdk.Added(added.track, False)


def test_many_channels_are_taken_when_meant():
    with pytest.raises(kzsdk.TooLittleSoundError, match="silence|needed"):
        kzsdk.fingerprint(numpy.zeros((2, RATE), numpy.int16), rate=RATE, channels=RATE)


def test_files_that_are_no_sound_say_why(clips, tmp_path):
    text = tmp_path / "notes.txt"
    text.write_text("no sound\n" * 100)
    for path, sentence in [(text, "is not a sound file .* pass headerless audio as samples"),
                           (clips / "empty.wav", "is empty, a sound file is needed"),
                           (clips / "no-sound.mp4", "no-sound.mp4: ")]:
        with pytest.raises(kzsdk.SoundFileError, match=sentence) as caught:
            kzsdk.fingerprint(path)
        assert caught.value.name == "KZSOUND_ERROR_FILE"
        assert isinstance(caught.value, kzsdk.Error)
    too_short = "short.wav: 9.10 s of sound, 14.22 s needed"
    with pytest.raises(kzsdk.TooLittleSoundError, match=too_short):
        kzsdk.fingerprint(clips / "short.wav")


def test_damage_is_a_warning(clips):
    with kzsdk.Catalogue(None) as catalogue:
        damaged = "broken.wav: is damaged .* what comes before was used"
        with pytest.warns(kzsdk.DamagedSoundWarning, match=damaged):
            catalogue.add(clips / "broken.wav")
        assert len(catalogue) == 1
        with warnings.catch_warnings():
            warnings.simplefilter("error")
            catalogue.add(clips / "music.flac")
            with pytest.raises(kzsdk.DamagedSoundWarning):
                catalogue.match(clips / "broken.wav")


def test_a_file_named_like_standard_input_is_read(clips, tmp_path, monkeypatch):
    (tmp_path / "-").write_bytes((clips / "music.flac").read_bytes())
    monkeypatch.chdir(tmp_path)
    assert kzsdk.fingerprint("-") == kzsdk.fingerprint(clips / "music.flac")


@pytest.mark.parametrize("arguments, sentence", [
    (("/nowhere/music.kzc",), "/nowhere/music.kzc"),
    (("nowhere.kzc", "read"), "there is no such file"),
    (("x.kzc", "append"), "there is no access 'append': use one of read, write, create"),
    ((None, "read"), "."), (("\0",), "has a null character in it")])
def test_catalogues_that_cannot_be_opened(arguments, sentence, tmp_path, monkeypatch):
    monkeypatch.chdir(tmp_path)
    with pytest.raises((kzsdk.Error, ValueError), match=sentence):
        kzsdk.Catalogue(*arguments)


def test_samples_need_a_name_and_half_a_second():
    with kzsdk.Catalogue(None) as catalogue:
        with pytest.raises(kzsdk.ArgumentError, match="pass title= or source="):
            catalogue.add(FRAMES, rate=RATE)
        with pytest.raises(kzsdk.TooLittleSoundError, match="0.12 s of sound, half a second"):
            catalogue.add(FRAMES[:1000], rate=RATE, title="Too short")
        with pytest.raises(kzsdk.ArgumentError, match="pass 0 to 1000"):
            catalogue.recognise(FRAMES, rate=RATE, candidates=1001)
        with pytest.raises(kzsdk.ArgumentError, match="there is no plan 'fast'"):
            kzsdk.Catalogue(None, plan="fast")
        assert len(catalogue) == 0


def test_texts_are_kept_whole():
    noise = sounds.noise(RATE, 3, 1, 1)
    with kzsdk.Catalogue(None) as catalogue:
        title = "ü" * 5000
        catalogue.add(noise, rate=RATE, title=title, source="named by Latin-1 \udce9")
        (track,) = catalogue
        assert track.title == title and track.sources[0].uri == "named by Latin-1 \udce9"
        catalogue.remove(track.sources[0].uri)
        catalogue.add(noise, rate=RATE, title="caf\udce9")
        assert next(iter(catalogue)).title == "café", "as kzfp takes the name of such a file"
        for text in ({"title": "a\0b"}, {"tags": {"a\0b": "c"}}, {"source": "a\0b"}):
            with pytest.raises(kzsdk.ArgumentError, match="has a null character in it"):
                catalogue.add(noise, rate=RATE, **{"title": "A title", **text})
        assert len(catalogue) == 1


class TestWithoutTheReader:
    """What is done where the package has no reader of its own."""

    @pytest.fixture(autouse=True)
    def _no_reader(self, monkeypatch):
        monkeypatch.setattr(_native, "sound", lambda: None)

    def test_soundfile_reads_what_it_can(self, clips, kzfp):
        soundfile = pytest.importorskip("soundfile")
        assert _sources.reader() == f"soundfile {soundfile.__version__}"
        for name in ("music.flac", "music.ogg", "music-24bit.wav"):
            assert kzsdk.fingerprint(clips / name).document == kzfp(clips / name).strip()
        with pytest.raises(kzsdk.SoundFileError, match="has a rate of 37800 Hz"):
            kzsdk.fingerprint(clips / "music-37800.wav")
        with pytest.raises(kzsdk.SoundFileError, match="music.wma: cannot be read"):
            kzsdk.fingerprint(clips / "music.wma")
        with kzsdk.Catalogue(None) as catalogue:
            catalogue.add(clips / "music-tagged.mp3")
            assert catalogue.match(clips / "music.flac")[0].source.endswith("music-tagged.mp3")

    def test_without_soundfile_samples_are_needed(self, clips, monkeypatch):
        monkeypatch.setitem(__import__("sys").modules, "soundfile", None)
        assert _sources.reader() == ""
        with pytest.raises(kzsdk.SoundFileError, match="built without its reader of sound files"):
            kzsdk.fingerprint(clips / "music.flac")


def test_the_readers_are_those_of_kzfp(kzfp):
    versions = kzfp("--version")
    assert kzsdk.sound_reader and all(part in versions for part in kzsdk.sound_reader.split(", "))
