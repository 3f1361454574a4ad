"""Threads: calls beside each other, handles closed meanwhile, and the interpreter's lock."""

import gc
import sys
import threading
import time

import pytest
import sounds

import kzsdk
from kzsdk._handle import Handle
from kzsdk._interface import ffi

RATE = 8000
ROUNDS = 12


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


def close_under(handle, *works):
    """Repeats all works at once, and closes what they use in the middle of that."""
    done = threading.Semaphore(0)

    def repeat(work):
        try:
            while True:
                work()
                done.release()
        except kzsdk.ClosedError:
            pass

    def close():
        for _ in works:
            done.acquire()
        handle.close()

    run_all(*(lambda work=work: repeat(work) for work in works), close)
    assert handle.closed


class Counted:
    """A handle without a library, which counts how often it is freed."""

    def __init__(self, shared):
        self.freed = []
        self._free = ffi.callback("kzcat_status(kzcat_catalogue**)", self._take)
        address = ffi.cast("kzcat_catalogue*", 4096)
        self.handle = Handle("thing", address, self._free, shared)

    def _take(self, reference):
        self.freed.append(int(ffi.cast("uintptr_t", reference[0])))
        return 0


@pytest.mark.parametrize("shared", [True, False])
def test_a_handle_is_freed_by_its_last_user(shared):
    counted = Counted(shared)
    with counted.handle.use() as address:
        counted.handle.close()
        assert counted.freed == [] and int(ffi.cast("uintptr_t", address)) == 4096
        with pytest.raises(kzsdk.ClosedError):
            counted.handle.use().__enter__()
        assert counted.freed == []
    assert counted.freed == [4096]
    counted.handle.close()
    del counted.handle
    gc.collect()
    assert counted.freed == [4096]


def test_a_handle_that_is_forgotten_is_freed():
    counted = Counted(shared=True)
    del counted.handle
    gc.collect()
    assert counted.freed == [4096]


def test_users_of_an_exclusive_handle_take_turns():
    counted, inside, most = Counted(shared=False), [], []

    def use():
        for _ in range(200):
            with counted.handle.use():
                inside.append(1)
                most.append(len(inside))
                time.sleep(0)
                inside.pop()

    run_all(use, use, use)
    assert len(most) == 600 and max(most) == 1


def test_a_thread_that_waits_for_its_turn_sees_the_close():
    counted, waits = Counted(shared=False), threading.Event()
    raised = []

    def wait():
        waits.set()
        with pytest.raises(kzsdk.ClosedError) as caught, counted.handle.use():
            pass
        raised.append(caught.value)

    thread = threading.Thread(target=wait)
    with counted.handle.use():
        thread.start()
        waits.wait()
        counted.handle.close()
    thread.join()
    assert len(raised) == 1 and counted.freed == [4096]


def test_calls_that_call_back_do_not_hide_each_other():
    counted = Counted(shared=True)

    def visit():
        with counted.handle.use_with_callbacks():
            pass

    with counted.handle.use_with_callbacks():
        run_all(visit)
        with pytest.raises(kzsdk.Error, match="must not use the thing that calls it"):
            counted.handle.use().__enter__()
    with counted.handle.use():
        pass


def test_progress_may_not_verify_while_two_threads_do(tune):
    raised = []
    with kzsdk.Catalogue(None) as catalogue:
        catalogue.add(tune, rate=RATE, title="A tune")

        def progress(done, total):
            with pytest.raises(kzsdk.Error, match="must not use the catalogue") as caught:
                len(catalogue)
            raised.append(caught.value)

        run_all(*[lambda: [catalogue.verify(progress) for _ in range(5)]] * 2)
    assert len(raised) >= 10


def test_a_stream_is_closed_while_it_is_fed(tune):
    for _ in range(ROUNDS):
        stream = kzsdk.Stream(RATE)
        close_under(stream, lambda: stream.feed(tune[:RATE]), lambda: stream.state,
                    lambda: stream.progress)


def test_a_catalogue_is_closed_while_it_is_used(tune):
    clip = tune[RATE * 4:RATE * 10]
    for _ in range(ROUNDS):
        catalogue = kzsdk.Catalogue(None)
        catalogue.add(tune, rate=RATE, title="A tune")
        close_under(catalogue, lambda: catalogue.match(clip, rate=RATE),
                    lambda: catalogue.add(clip, rate=RATE, title="A clip"),
                    lambda: list(catalogue), catalogue.verify)


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
