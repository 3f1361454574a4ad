"""Streams: sound piece by piece."""

import numpy
import pytest
import sounds

import kzsdk

RATE = 8000


@pytest.fixture(scope="module")
def tune():
    return sounds.melody(RATE, 1, 15)


def test_progress_goes_from_nothing_to_all(tune):
    with kzsdk.Stream(RATE, 1) as stream:
        assert (stream.progress, stream.complete, stream.state.phase) == (0, False, "nothing fed")
        seen = []
        for start in range(0, len(tune), RATE):
            complete = stream.feed(tune[start:start + RATE])
            seen.append(stream.progress)
            if complete:
                break
        complete = stream.finish()
        assert complete and stream.complete and stream.progress == 100
    assert seen == sorted(seen) and 0 < seen[7] < 100


def test_cuts_inside_samples_leave_no_trace(tune):
    data = tune.tobytes()
    expected = kzsdk.fingerprint(tune, rate=RATE)
    for length in (1001, 65537):
        with kzsdk.Stream(rate=RATE, channels=1) as stream:
            for start in range(0, len(data), length):
                stream.feed(data[start:start + length])
            stream.finish()
            assert stream.fingerprint() == expected


def test_nothing_is_taken_once_it_is_complete(tune):
    with kzsdk.Stream(RATE) as stream:
        assert stream.feed(tune) or stream.finish()
        before = stream.fingerprint(), stream.state
        assert stream.feed(bytes(16000)) is True
        assert (stream.fingerprint(), stream.state) == before


def test_state_says_what_is_missing(tune):
    with kzsdk.Stream(RATE) as stream:
        stream.feed(bytes(2 * RATE * 10))
        stream.feed(tune[:RATE * 5])
        assert stream.finish() is False
        state = stream.state
        assert state.phase == "too short" and state.frames == RATE * 15
        assert state.silence == pytest.approx(10, abs=0.2)
        assert state.missing == pytest.approx(14.22 - 5, abs=0.3)
        too_short = r"[45]\.\d\d s of sound after \d+\.\d s of silence, 14\.22 s needed"
        with pytest.raises(kzsdk.TooLittleSoundError, match=too_short):
            stream.fingerprint()


def test_silence_and_nothing_are_told_apart():
    with kzsdk.Stream(RATE) as stream:
        with pytest.raises(kzsdk.TooLittleSoundError, match="no sound, 14.22 s needed"):
            stream.fingerprint()
        stream.feed(bytes(2 * RATE * 20))
        stream.finish()
        with pytest.raises(kzsdk.TooLittleSoundError, match=r"nothing but silence in 20\.0 s"):
            stream.fingerprint()


def test_a_finished_stream_takes_no_more(tune):
    with kzsdk.Stream(RATE) as stream:
        stream.finish()
        with pytest.raises(kzsdk.Error) as caught:
            stream.feed(tune)
        assert caught.value.name == "KZ_STREAM_ERROR_FINISHED" and caught.value.status != 0


def test_arrays_must_be_what_the_stream_is_for(tune):
    with kzsdk.Stream(RATE, 2, "float32") as stream:
        stream.feed(numpy.zeros((10, 2), numpy.float32))
        for wrong in (numpy.zeros((10, 2), numpy.int16), numpy.zeros(10, numpy.float32)):
            with pytest.raises(kzsdk.ArgumentError, match="convert or reshape it"):
                stream.feed(wrong)
        assert stream.state.frames == 10


def test_a_closed_stream_says_so(tune):
    stream = kzsdk.Stream(RATE)
    stream.close()
    stream.close()
    assert stream.closed
    for use in (lambda: stream.feed(tune), stream.finish, stream.fingerprint, lambda: stream.state,
                lambda: stream.progress, lambda: stream.complete):
        with pytest.raises(kzsdk.ClosedError, match="the stream was closed"):
            use()
