"""Names the track that some seconds of sound come from, and makes fingerprints of sound.

    import kzsdk
    with kzsdk.Catalogue("music.kzc") as catalogue:
        catalogue.add("song.flac")
        print(catalogue.match("clip.wav"))

``sound_reader`` is what sound files are read with: the program's own readers ("libsndfile 1.2.0,
FFmpeg 5.1.9"), else the package soundfile; empty when there is neither.
"""

from typing import Any

from kzsdk import _sources
from kzsdk._fingerprint import Sound, fingerprint
from kzsdk._version import __version__
from kzsdk.catalogue import Catalogue
from kzsdk.errors import (ArgumentError, BusyError, CannotOpenError, CatalogueError, ClosedError,
                          DamagedError, DamagedSoundWarning, Error, NotFoundError,
                          OutOfMemoryError, ReadOnlyError, SoundFileError, TooLittleSoundError)
from kzsdk.result import Fingerprint
from kzsdk.stream import Stream, StreamState
from kzsdk.tracks import Added, Answer, Fault, Match, Track, TrackSource

sound_reader: str

__all__ = [
    "Added", "Answer", "ArgumentError", "BusyError", "CannotOpenError", "Catalogue",
    "CatalogueError", "ClosedError", "DamagedError", "DamagedSoundWarning", "Error", "Fault",
    "Fingerprint", "Match", "NotFoundError", "OutOfMemoryError", "ReadOnlyError", "Sound",
    "SoundFileError", "Stream", "StreamState", "TooLittleSoundError", "Track", "TrackSource",
    "__version__", "fingerprint", "sound_reader",
]


def __getattr__(name: str) -> Any:
    # Found out when it is asked for: that loads FFmpeg's libraries.
    if name == "sound_reader":
        globals()["sound_reader"] = _sources.reader()
        return globals()["sound_reader"]
    raise AttributeError(f"module {__name__!r} has no attribute {name!r}")
