"""Catalogues: the golden answers, those of kzfp on files, and looking after tracks."""

import array
import contextlib
import hashlib
import json
import os
import shutil
import sqlite3
import struct

import numpy
import pytest
import sounds

import kzsdk

RATE = 11025
TRACKS = ["music.flac", "speech.wav", "noise.wav"]
CLIPS = ["music-22050-mono.mp3", "music-8000-mono-alaw.wav", "music.opus", "music-96000.wav",
         "short.wav", "speech.wav", "sweep.wav", "silence.wav"]


@pytest.fixture(scope="module")
def tune():
    return sounds.melody(RATE, 1, 40)


@pytest.fixture()
def catalogue(tune):
    """In memory, with one tune."""
    with kzsdk.Catalogue(None) as made:
        made.add(tune, rate=RATE, title="A tune", artist="Nobody", tags={"album": "None"})
        yield made


def exact(match):
    numbers = (match.score, match.threshold, match.offset, match.speed, match.tempo, match.pitch,
               match.clip_begin, match.clip_end)
    return " ".join([str(match.track), *(struct.pack(">d", number).hex() for number in numbers)])


def test_answers_are_the_golden_ones_to_the_bit(tree, tune):
    lines = (tree / "tests/whole/golden/catalogue.txt").read_text().splitlines()
    golden = {line.split()[1]: line.split(" | ")[1:] for line in lines if line.startswith("answer")}
    clip = tune[RATE * 11:RATE * 23]
    asked = {"clean": (RATE, clip), "faster": (RATE * 103 // 100, clip),
             "noisy": (RATE, sounds.halved_sum(clip, sounds.noise(RATE, 12, 1, 3))),
             "stranger": (RATE, sounds.noise(RATE, 12, 0, 4)),
             "silence": (RATE, array.array("h", bytes(2 * len(clip))))}
    with kzsdk.Catalogue(None, plan="scan") as catalogue:
        for rate in (RATE, 14000, 8500):
            catalogue.add(tune, rate=rate, source=str(rate))
        catalogue.add(sounds.noise(RATE, 40, 2, 2), rate=RATE, source="noise")
        for name, (rate, sound) in asked.items():
            answer = catalogue.recognise(sound, rate=rate)
            assert [exact(found) for found in answer.candidates] == golden[name], name


def test_answers_are_those_of_kzfp_on_files(clips, kzfp_json, tmp_path):
    path = tmp_path / "music.kzc"
    with kzsdk.Catalogue(path) as catalogue:
        for name in TRACKS:
            assert catalogue.add(clips / name).is_new
        answers = {name: catalogue.recognise(clips / name) for name in CLIPS}
    lines = kzfp_json("match", path, *(clips / name for name in CLIPS))
    assert sum(bool(line["matches"]) for line in lines) >= 5
    for name, line in zip(CLIPS, lines):
        answer = answers[name]
        assert answer.verdict == line["verdict"], name
        assert len(answer.matches) == len(line["matches"]), name
        for mine, its in zip(answer.matches, line["matches"]):
            assert (mine.track, mine.source, mine.title, mine.artist) == (
                its["track"], its["source"], its["title"], its["artist"])
            for field in ("score", "threshold", "offset", "speed", "clip_begin", "clip_end"):
                assert getattr(mine, field) == pytest.approx(its[field], abs=1e-4), (name, field)


def test_tracks_are_those_that_kzfp_adds(clips, kzfp_json, kzfp, tmp_path):
    names = ["music-tagged.mp3", "music.opus", "speech.wav"]
    with kzsdk.Catalogue(tmp_path / "mine.kzc") as mine:
        for name in names:
            mine.add(clips / name)
    kzfp("add", tmp_path / "its.kzc", *(clips / name for name in names))
    with kzsdk.Catalogue(tmp_path / "its.kzc", "read") as its, \
            kzsdk.Catalogue(tmp_path / "mine.kzc", "read") as mine:
        for own, other in zip(mine, its):
            assert (own.duration, sorted(own.tags), own.sources) == (
                other.duration, sorted(other.tags), other.sources)
    own, its = (trails(kzfp("export", tmp_path / name, "-")) for name in ("mine.kzc", "its.kzc"))
    assert len(own) == 3 and own == its


def trails(exported):
    """What is stored of each track's sound, from the lines of an export."""
    tracks = [json.loads(line) for line in exported.splitlines()]
    return [track["trail"] for track in tracks if "trail" in track]


def test_a_track_has_what_was_added(catalogue, clips):
    (track,) = catalogue
    assert (track.title, track.artist, track.tag("album")) == ("A tune", "Nobody", "None")
    assert track.sources == (kzsdk.TrackSource("A tune", None, None),)
    assert track.duration == pytest.approx(40, abs=0.01) and not track.answers_documents
    path = clips / "music.flac"
    track = catalogue.track(catalogue.add(path, title="Mine").track)
    assert track.title == "Mine" and track.sources[0].size == path.stat().st_size
    assert track.sources[0].sha256 == hashlib.sha256(path.read_bytes()).digest()
    assert catalogue.find(path) == track and len(catalogue) == 2


def test_arrays_and_pieces_are_the_same_sound(tune):
    samples = numpy.frombuffer(tune, numpy.int16)
    stereo = numpy.stack([samples, samples], axis=1)
    with kzsdk.Catalogue(None) as catalogue:
        first = catalogue.add(tune, rate=RATE, source="a")
        for same in (samples, (samples / 32768).astype(numpy.float32), stereo):
            assert catalogue.add(same, rate=RATE, source="b") == kzsdk.Added(first.track, False)
        pieces = (samples[i:i + 777] for i in range(0, len(samples), 777))
        assert not catalogue.add(pieces, rate=RATE, source="c").is_new
        clip = samples[RATE * 20:RATE * 30]
        expected = catalogue.match(clip, rate=RATE)
        assert expected[0].offset == pytest.approx(20, abs=0.2) and expected[0].title is None
        assert catalogue.match(clip.tobytes(), rate=RATE, channels=1) == expected
        assert catalogue.match(iter([clip[:999], clip[999:]]), rate=RATE) == expected


def test_fingerprints_are_looked_up_by_their_documents(tune):
    with kzsdk.Catalogue(None) as catalogue:
        catalogue.add(tune, rate=RATE, title="A tune", documents=True)
        clip = kzsdk.fingerprint(tune[RATE * 10:RATE * 26], rate=RATE)
        (match,) = catalogue.match(clip)
        assert (match.by, match.title) == ("document", "A tune")
        assert match.offset == pytest.approx(10, abs=0.5)
        assert next(iter(catalogue)).answers_documents
        with pytest.raises(kzsdk.ArgumentError, match="a fingerprint has no rate"):
            catalogue.match(clip, rate=RATE)


def test_other_speeds_are_looked_for_when_wanted(catalogue, tune):
    clip, rate = tune[RATE * 11:RATE * 23], RATE * 95 // 100
    (match,) = catalogue.match(clip, rate=rate)
    assert match.speed == pytest.approx(0.95, abs=0.002)
    assert catalogue.match(clip, rate=rate, speeds=False) == []


def test_passages_are_told_apart_when_wanted(catalogue, tune):
    noise = sounds.noise(RATE, 40, 1, 5)
    other = catalogue.add(noise, rate=RATE, title="Noise")
    mixed = tune[RATE * 2:RATE * 20] + noise[RATE * 5:RATE * 25]
    found = catalogue.match(mixed, rate=RATE, passages=True)
    assert [match.track for match in found] == [1, other.track]
    assert found[1].clip_begin == pytest.approx(18, abs=2)
    assert len(catalogue.match(mixed, rate=RATE)) < 2


def test_a_stranger_gives_no_match_but_candidates(catalogue):
    noise = sounds.noise(RATE, 12, 0, 4)
    answer = catalogue.recognise(noise, rate=RATE, candidates=1)
    assert catalogue.match(noise, rate=RATE) == []
    assert (answer.verdict, answer.matches, len(answer.candidates)) == ("no match", (), 1)
    assert answer.clip_seconds == pytest.approx(12, abs=0.01) and answer.shards == 1


def test_tracks_and_sources_are_removed(catalogue, tune):
    catalogue.add(tune, rate=RATE, source="another name")
    catalogue.remove("A tune")
    (track,) = catalogue
    assert [source.uri for source in track.sources] == ["another name"]
    other = catalogue.add(sounds.noise(RATE, 5, 1, 5), rate=RATE, title="Noise")
    catalogue.remove(track)
    catalogue.remove(other.track)
    assert len(catalogue) == 0 and list(catalogue) == [] and catalogue
    for missing in (7, "A tune"):
        with pytest.raises(kzsdk.NotFoundError):
            catalogue.remove(missing)
    with pytest.raises(LookupError):
        catalogue.track(7)
    with pytest.raises(LookupError):
        catalogue.find("nowhere")


def test_what_was_added_is_there_afterwards(tune, tmp_path):
    path = tmp_path / "a b ü.kzc"
    with kzsdk.Catalogue(str(path)) as catalogue:
        catalogue.add(tune, rate=RATE, title="Ünicode ♫", source="söurce")
    with kzsdk.Catalogue(path, "read", index_file=False) as catalogue:
        (track,) = catalogue
        assert track.title == "Ünicode ♫" and catalogue.find("söurce").id == track.id
        with pytest.raises(kzsdk.ReadOnlyError) as caught:
            catalogue.remove(track)
        assert caught.value.name == "KZCAT_ERROR_READ_ONLY" and str(caught.value)


def test_verify_reports_and_may_be_stopped(catalogue, tune, clips, tmp_path):
    seen = []
    assert catalogue.verify(lambda done, total: seen.append((done, total))) == []
    assert seen[-1][0] == seen[-1][1] == 1
    with pytest.raises(kzsdk.CatalogueError) as caught:
        catalogue.verify(lambda done, total: False)
    assert caught.value.name == "KZCAT_ERROR_CANCELLED"


def test_an_error_in_a_progress_function_is_raised(catalogue):
    def interrupted(done, total):
        raise KeyboardInterrupt
    with pytest.raises(KeyboardInterrupt):
        catalogue.verify(interrupted)
    with pytest.raises(kzsdk.Error, match="must not use the catalogue that calls it"):
        catalogue.verify(lambda done, total: bool(len(catalogue)))
    assert len(catalogue) == 1


def test_faults_name_the_track(clips, tmp_path):
    path = tmp_path / "damaged.kzc"
    with kzsdk.Catalogue(path, index_file=False) as catalogue:
        catalogue.add(clips / "music.flac")
    damage(path)
    with kzsdk.Catalogue(path, "read", index_file=False) as catalogue:
        faults = catalogue.verify()
    assert faults and all(isinstance(fault, kzsdk.Fault) and fault.text for fault in faults)
    assert 1 in [fault.track for fault in faults]


def damage(path):
    """Changes a byte in the middle of the only trail."""
    with contextlib.closing(sqlite3.connect(path)) as base, base:
        ((codes,),) = base.execute("select codes from trail").fetchall()
        middle = len(codes) // 2
        changed = codes[:middle] + bytes([codes[middle] ^ 255]) + codes[middle + 1:]
        base.execute("update trail set codes = ?", (changed,))


def test_a_catalogue_is_not_added_to_itself(tmp_path, tune):
    path = tmp_path / "music.kzc"
    link = tmp_path / "link.wav"
    refused = f"belongs to the catalogue {path}, which is open"
    with kzsdk.Catalogue(path) as catalogue:
        catalogue.add(tune, rate=RATE, title="A tune")
        link.symlink_to(path)
        for own in (path, link, tmp_path / "music.kzc-wal"):
            with pytest.raises(kzsdk.ArgumentError, match=refused):
                catalogue.add(own)
            with pytest.raises(kzsdk.ArgumentError, match=refused):
                catalogue.match(own)
        shutil.copy(path, tmp_path / "other.wav")
        with pytest.raises(kzsdk.SoundFileError, match="is not a sound file"):
            catalogue.add(tmp_path / "other.wav")


def test_open_catalogues_are_never_opened_as_sound(tmp_path, monkeypatch):
    """Whoever asks: the process would give up their locks."""
    monkeypatch.chdir(tmp_path)
    first, second = kzsdk.Catalogue("first.kzc"), kzsdk.Catalogue("second.kzc")
    again = kzsdk.Catalogue("first.kzc")
    os.link("first.kzc", "hard.wav")
    monkeypatch.chdir("/")
    for path in (tmp_path / "first.kzc", tmp_path / "hard.wav"):
        for use in (kzsdk.fingerprint, second.add, second.match):
            with pytest.raises(kzsdk.ArgumentError, match="first.kzc, which is open"):
                use(path)
    first.close()
    with pytest.raises(kzsdk.ArgumentError, match="which is open"):
        kzsdk.fingerprint(tmp_path / "first.kzc")
    again.close()
    with pytest.raises(kzsdk.SoundFileError, match="is not a sound file"):
        kzsdk.fingerprint(tmp_path / "first.kzc")
    second.close()


def test_catalogues_that_did_not_open_leave_no_trace(clips, tmp_path):
    (tmp_path / "song.flac").write_bytes((clips / "music.flac").read_bytes())
    with pytest.raises(kzsdk.CannotOpenError):
        kzsdk.Catalogue(tmp_path / "song.flac")
    assert len(kzsdk.fingerprint(tmp_path / "song.flac").values) == 30


def test_locks_outlive_attempts_to_read_the_file_as_sound(tmp_path):
    """With its locks gone, another process would be let in beside the one that writes."""
    path = tmp_path / "music.kzc"
    with kzsdk.Catalogue(path):
        before = locks_of(path)
        with pytest.raises(kzsdk.ArgumentError):
            kzsdk.fingerprint(path)
        assert before and locks_of(path) == before


def locks_of(path):
    """This process's locks on the files of a catalogue."""
    files = {str(file.stat().st_ino) for file in path.parent.glob(path.name + "*")}
    lines = [line.split()[1:6] for line in open("/proc/locks", encoding="ascii")]
    return [line for line in lines
            if line[3] == str(os.getpid()) and line[4].rpartition(":")[2] in files]


def test_a_closed_catalogue_says_so(tune):
    catalogue = kzsdk.Catalogue(None)
    tracks = iter(catalogue)
    catalogue.close()
    catalogue.close()
    assert catalogue.closed
    for use in (lambda: catalogue.add(tune, rate=RATE, title="x"), lambda: len(catalogue),
                lambda: catalogue.match(tune, rate=RATE), lambda: next(tracks), catalogue.verify,
                lambda: catalogue.remove(1), lambda: catalogue.find("x")):
        with pytest.raises(kzsdk.ClosedError, match="the catalogue was closed"):
            use()
