"""Sound that comes piece by piece, to a fingerprint."""

from __future__ import annotations

from dataclasses import dataclass
from typing import Any, Optional

from kzsdk import _native, _samples
from kzsdk._handle import Handle
from kzsdk._interface import ffi
from kzsdk.errors import ArgumentError, TooLittleSoundError, check_stream
from kzsdk.result import Fingerprint

_ALGORITHMS = {"fixed": 1, "float": 2}
_PHASES = ("complete", "nothing fed", "silent", "too short", "failed")
_NEEDED = 14.22  # seconds, as KZ_FPX_MILLISECONDS_NEEDED


@dataclass(frozen=True)
class StreamState:
    """What a stream has taken so far."""

    phase: str  #: "complete", "nothing fed", "silent", "too short" or "failed"
    percent: int  #: of the sound that is needed, 0 to 100
    frames: int  #: samples of each channel
    silence: float  #: seconds of leading silence, which is skipped
    sound: float  #: seconds of what followed
    missing: float  #: seconds of sound that are still needed, about


def algorithm_number(name: str) -> int:
    if name not in _ALGORITHMS:
        raise ArgumentError(f"there is no algorithm {name!r}: use 'fixed' or 'float'")
    return _ALGORITHMS[name]


class Stream:
    """Takes sound in pieces of any length until a fingerprint is complete.

    >>> with Stream(rate=8000, channels=1) as stream:
    ...     complete = stream.feed(bytes(16000))    # a second of silence
    ...     complete, stream.progress, stream.state.frames
    (False, 0, 8000)

    The same sound gives the same fingerprint, however it is cut. Several threads may use a stream:
    they take turns.
    """

    def __init__(self, rate: int, channels: int = 1, format: str = "int16",
                 algorithm: str = "fixed") -> None:
        """``format`` is that of bytes, and of the arrays that are fed: "int16", "float32", ..."""
        self._layout = _samples.checked_layout(rate, channels, format)
        library = _native.sdk()
        settings = ffi.new("kz_stream_settings*")
        check_stream(library.kz_stream_initialize_settings(settings))
        settings.algorithm = algorithm_number(algorithm)
        settings.format = self._layout.number
        settings.sample_rate = self._layout.rate
        settings.channels = self._layout.channels
        created = ffi.new("kz_stream**")
        check_stream(library.kz_stream_create(settings, created))
        self._library = library
        self._handle = Handle("stream", created[0], library.kz_stream_free, shared=False)

    def feed(self, sound: _samples.Samples) -> bool:
        """Takes what follows; true once the fingerprint is complete, and nothing more is taken.

        Bytes may be cut anywhere, also inside a sample. An array has the stream's own type of
        samples, and the shape (frames,) or (frames, channels).
        """
        piece = _samples.piece_of(sound)
        _samples.check_belongs(piece, self._layout)
        complete = ffi.new("uint8_t*")
        with self._handle.use() as stream:
            check_stream(self._library.kz_stream_feed(stream, _samples.address_of(piece),
                                                      piece.size, ffi.NULL, complete))
        return bool(complete[0])

    def finish(self) -> bool:
        """Ends the sound; true when the fingerprint is complete."""
        complete = ffi.new("uint8_t*")
        with self._handle.use() as stream:
            check_stream(self._library.kz_stream_finish(stream, complete))
        return bool(complete[0])

    @property
    def complete(self) -> bool:
        """Whether there is a fingerprint."""
        return self.state.phase == "complete"

    @property
    def progress(self) -> int:
        """How much of the sound that is needed has come, in percent."""
        return self.state.percent

    @property
    def state(self) -> StreamState:
        """What has come so far, and what is missing."""
        state = ffi.new("kz_stream_state*")
        with self._handle.use() as stream:
            check_stream(self._library.kz_stream_get_state(stream, state))
        return StreamState(_PHASES[state.phase], state.percent, state.frames,
                           state.silence_milliseconds / 1000, state.sound_milliseconds / 1000,
                           state.missing_milliseconds / 1000)

    def fingerprint(self) -> Fingerprint:
        """The fingerprint; TooLittleSoundError says what it lacks when it is not complete."""
        with self._handle.use() as stream:
            text = ffi.new("char**")
            status = self._library.kz_stream_get_document(stream, text)
            if status != self._library.KZ_QV_ERROR_INCOMPLETE:
                check_stream(status)
                return self._result(stream, _native.text(text[0]))
        raise TooLittleSoundError(too_little(self.state), "KZ_QV_ERROR_INCOMPLETE", status)

    def _result(self, stream: Any, document: str) -> Fingerprint:
        values, count = ffi.new("int16_t[30]"), ffi.new("uint32_t*")
        check_stream(self._library.kz_stream_get_values(stream, values, 30, count))
        seconds, duration = ffi.new("double*"), ffi.new("uint32_t*")
        check_stream(self._library.kz_stream_get_signal_offset(stream, ffi.NULL, seconds, ffi.NULL))
        check_stream(self._library.kz_stream_get_times(stream, ffi.NULL, duration))
        return Fingerprint(tuple(values[0:count[0]]), seconds[0], duration[0] / 1000,
                           document.rstrip("\r\n"))

    @property
    def closed(self) -> bool:
        return self._handle.closed

    def close(self) -> None:
        """Frees the stream. What another thread is doing with it is finished first."""
        self._handle.close()

    def __enter__(self) -> Stream:
        return self

    def __exit__(self, *_: Any) -> None:
        self.close()


def too_little(state: StreamState) -> str:
    """Why there is no fingerprint."""
    if state.phase == "nothing fed":
        text = "no sound"
    elif state.phase == "silent":
        text = f"nothing but silence in {state.silence + state.sound:.1f} s"
    else:
        text = f"{state.sound:.2f} s of sound"
        if state.silence >= 0.1:
            text += f" after {state.silence:.1f} s of silence"
    return f"{text}, {_NEEDED} s needed"


def stream_for(layout: _samples.Layout, algorithm: Optional[str]) -> Stream:
    return Stream(layout.rate, layout.channels, layout.format, algorithm or "fixed")
