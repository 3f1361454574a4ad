"""Threads: calls beside each other, handles closed meanwhile, and the interpreter's lock."""

import sys
import threading

import pytest
import sounds

import kzsdk

RATE = 8000
ROUNDS = 20


@pytest.fixture(scope="module")
def tune():
    return sounds.melody(RATE, 1, 15)


def run_all(*works):
    """Runs all at once; raises what one of them raised."""
    raised = []

    def guarded(work):
        try:
            work()
        except BaseException as error:  # of whatever kind: it is raised below
            raised.append(error)

    threads = [threading.Thread(target=guarded, args=(work,)) for work in works]
    for thread in threads:
        thread.start()
    for thread in threads:
        thread.join()
    if raised:
        raise raised[0]


def until_closed(begun, work):
    """Repeats what is done until the handle is closed under it."""
    def loop():
        begun.wait()
        try:
            while True:
                work()
        except kzsdk.ClosedError:
            pass
    return loop


def test_a_stream_is_closed_while_it_is_fed(tune):
    for _ in range(ROUNDS):
        stream = kzsdk.Stream(RATE)
        begun = threading.Barrier(4)

        def close():
            begun.wait()
            stream.close()

        run_all(until_closed(begun, lambda: stream.feed(tune[:RATE])),
                until_closed(begun, lambda: stream.state),
                until_closed(begun, lambda: stream.progress),
                close)
        assert stream.closed


def test_a_catalogue_is_closed_while_it_is_used(tune):
    clip = tune[RATE * 4:RATE * 10]
    for _ in range(ROUNDS):
        catalogue = kzsdk.Catalogue(None)
        catalogue.add(tune, rate=RATE, title="A tune")
        begun = threading.Barrier(5)

        def close():
            begun.wait()
            catalogue.close()

        run_all(until_closed(begun, lambda: catalogue.match(clip, rate=RATE)),
                until_closed(begun, lambda: catalogue.add(clip, rate=RATE, title="A clip")),
                until_closed(begun, lambda: list(catalogue)),
                until_closed(begun, catalogue.verify),
                close)
        assert catalogue.closed


def test_threads_that_match_at_once_agree(tune):
    with kzsdk.Catalogue(None) as catalogue:
        catalogue.add(tune, rate=RATE, title="A tune")
        clip = tune[RATE * 4:RATE * 12]
        expected = catalogue.match(clip, rate=RATE)
        answers = []
        run_all(*[lambda: answers.extend(catalogue.match(clip, rate=RATE) for _ in range(5))] * 4)
    assert len(expected) == 1 and answers == [expected] * 20


def test_threads_take_turns_with_a_stream(tune):
    """All samples are alike: whoever comes first, the same sound comes."""
    piece = tune[:400]
    with kzsdk.Stream(RATE) as stream:
        run_all(*[lambda: [stream.feed(piece) for _ in range(50)]] * 4)
        assert stream.state.frames == 4 * 50 * 400


def test_other_threads_run_during_a_call(tune):
    """With so long an interval, another thread runs only when a call lets go of the lock."""
    sound = tune.tobytes() * 4
    ready, wake, ran = threading.Event(), threading.Event(), []

    def other():
        ready.set()
        wake.wait()
        ran.extend(range(100))

    interval = sys.getswitchinterval()
    thread = threading.Thread(target=other)
    with kzsdk.Catalogue(None) as catalogue:
        thread.start()
        ready.wait()
        try:
            sys.setswitchinterval(1000)
            wake.set()
            catalogue.recognise(sound, rate=RATE, channels=1)
            seen = len(ran)
        finally:
            sys.setswitchinterval(interval)
        thread.join()
    assert seen == 100
