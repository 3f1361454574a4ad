"""From sound to a fingerprint, in one call."""

from __future__ import annotations

import os
from typing import Any, Iterable, Optional, Union

from kzsdk import _samples, _sources
from kzsdk.errors import TooLittleSoundError
from kzsdk.result import Fingerprint
from kzsdk.stream import algorithm_number, stream_for

#: What the fixed-point algorithm takes; files of other rates are converted, as kzfp does.
_FIXED_RATES = (8000, 11025, 16000, 22050, 24000, 32000, 44100, 48000)

Sound = Union[str, "os.PathLike[str]", _samples.Samples, Iterable[_samples.Samples]]


def fingerprint(sound: Sound, *, rate: Optional[int] = None, channels: Optional[int] = None,
                format: Optional[str] = None, algorithm: str = "fixed") -> Fingerprint:
    """Makes the fingerprint of the first 14.22 s of sound after leading silence.

    ``sound`` is the path of a sound file; an array of int16, int32, float32 or float64 samples of
    shape (frames,) or (frames, channels), full scale of floats being 1; bytes; or an iterator of
    arrays or bytes, from which no more is taken than is needed. Samples need ``rate``, in hertz;
    bytes need ``channels`` too, and hold int16 samples unless ``format`` names another type.

    >>> import array, random
    >>> noise = array.array("h", random.Random(1).choices(range(-9000, 9000), k=120000))
    >>> len(fingerprint(noise, rate=8000).values)
    30

    Raises TooLittleSoundError, SoundFileError or ArgumentError, which say what would help.
    """
    rates = _FIXED_RATES if algorithm_number(algorithm) == 1 else None
    path = _sources.path_of(sound)
    named = "" if path is None else f"{path}: "
    with _sources.open_sound(sound, rate, channels, format, rates, floats=False) as source:
        with stream_for(source.layout, algorithm) as stream:
            for piece in source.pieces():
                if stream.feed(piece.data):
                    break
            stream.finish()
            source.finish()
            try:
                return stream.fingerprint()
            except TooLittleSoundError as error:
                raise TooLittleSoundError(named + str(error), error.name, error.status) from None
