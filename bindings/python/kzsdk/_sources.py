"""Sound from wherever it is: files, samples in memory, iterators of pieces."""

from __future__ import annotations

import itertools
import os
import warnings
from typing import Any, Iterator, List, Optional, Sequence, Tuple

from kzsdk import _native, _open_files, _samples
from kzsdk._interface import ffi
from kzsdk._texts import path_bytes
from kzsdk.errors import (ArgumentError, DamagedSoundWarning, SoundFileError, TooLittleSoundError,
                          check_sound)

Tags = List[Tuple[str, str]]

_BLOCK = 4096  # frames of a file that are read at a time


class Source:
    """Sound that is taken from start to end, as long as it is wanted."""

    layout: _samples.Layout
    tags: Tags = []

    def pieces(self) -> Iterator[_samples.Piece]:
        """Samples in their order; a piece is valid until the next one is taken."""
        raise NotImplementedError

    def finish(self) -> None:
        """Warns when what was taken is not what it should be."""

    def close(self) -> None:
        """Closes the file."""

    def __enter__(self) -> Source:
        return self

    def __exit__(self, *_: Any) -> None:
        self.close()


class SoundFile(Source):
    """A sound file, read as kzfp does."""

    def __init__(self, path: str, rates: Optional[Sequence[int]], floats: bool) -> None:
        self._path = path
        self._library = _native.sound()
        self._reference = ffi.new("kzsound_file**")
        numbers = ffi.new("uint32_t[]", rates) if rates else ffi.NULL
        request = ffi.new("kzsound_request*", [numbers, len(rates or ()), int(floats)])
        check_sound(self._library.kzsound_open(path_bytes(path), request, self._reference), path)
        facts = ffi.new("kzsound_facts*")
        check_sound(self._library.kzsound_get_facts(self._reference[0], facts), path)
        self.layout = _samples.Layout(_samples.format_name(facts.format), facts.sample_rate,
                                      facts.channels)
        self.tags = [self._tag(place) for place in range(facts.tag_count)]

    def _tag(self, place: int) -> Tuple[str, str]:
        name, value = ffi.new("char**"), ffi.new("char**")
        status = self._library.kzsound_get_tag(self._reference[0], place, name, value)
        check_sound(status, self._path)
        return _native.text(name[0]), _native.text(value[0])

    def pieces(self) -> Iterator[_samples.Piece]:
        block = bytearray(_BLOCK * self.layout.frame_bytes)
        size = ffi.new("uint64_t*")
        while True:
            status = self._library.kzsound_read(self._reference[0], ffi.from_buffer(block),
                                                len(block), size)
            check_sound(status, self._path)
            if size[0] == 0:
                return
            yield _samples.Piece(memoryview(block)[:size[0]], size[0])

    def finish(self) -> None:
        trouble = _native.text(self._library.kzsound_get_trouble(self._reference[0]))
        if trouble:
            warnings.warn(f"{self._path}: {trouble}", DamagedSoundWarning, stacklevel=4)

    def close(self) -> None:
        self._library.kzsound_free(self._reference)

    def __del__(self) -> None:
        if getattr(self, "_reference", None) is not None:
            self.close()


class SoundfileFile(Source):
    """A sound file, read with the package soundfile where the library's own reader is missing."""

    _FLOATS = ("FLOAT", "DOUBLE", "VORBIS", "OPUS", "MPEG_LAYER_I", "MPEG_LAYER_II",
               "MPEG_LAYER_III")

    def __init__(self, path: str, rates: Optional[Sequence[int]]) -> None:
        import soundfile
        try:
            self._file = soundfile.SoundFile(path)
        except (RuntimeError, OSError) as error:
            raise SoundFileError(f"{path}: cannot be read ({error})") from None
        if rates and self._file.samplerate not in rates:
            rate = self._file.samplerate
            self._file.close()
            raise SoundFileError(
                f"{path}: has a rate of {rate} Hz, which the fixed-point algorithm does not take: "
                "install the package with its own reader, which converts rates, or pass "
                "algorithm='float'")
        form = "float32" if self._file.subtype in self._FLOATS else "int16"
        self.layout = _samples.Layout(form, self._file.samplerate, self._file.channels)
        self.tags = [(name, value) for name, value in self._file.copy_metadata().items()
                     if name in ("title", "artist", "album", "date", "genre", "tracknumber")]

    def pieces(self) -> Iterator[_samples.Piece]:
        while True:
            block = self._file.read(_BLOCK, dtype=self.layout.format, always_2d=True)
            if len(block) == 0:
                return
            yield _samples.piece_of(block)

    def close(self) -> None:
        self._file.close()


class Pieces(Source):
    """Samples in memory, in one piece or in many."""

    def __init__(self, pieces: Iterator[_samples.Piece], rate: Any, channels: Any,
                 format: Optional[str]) -> None:
        first = next(pieces, None)
        if first is None:
            raise TooLittleSoundError("the iterator gave no sound")
        self.layout = _samples.layout_of(first, rate, channels, format)
        self._rest = itertools.chain([first], pieces)

    def pieces(self) -> Iterator[_samples.Piece]:
        for piece in self._rest:
            _samples.check_belongs(piece, self.layout)
            yield piece


def reader() -> str:
    """What sound files are read with; empty when nothing is there."""
    library = _native.sound()
    if library is not None:
        return _native.text(library.kzsound_get_readers())
    try:
        import soundfile
    except (ImportError, OSError):
        return ""
    return f"soundfile {soundfile.__version__}"


def path_of(sound: Any) -> Optional[str]:
    """The path that was passed as sound; None when it is something else."""
    return os.fsdecode(sound) if isinstance(sound, (str, os.PathLike)) else None


def _open_file(path: str, rates: Optional[Sequence[int]], floats: bool) -> Source:
    _open_files.check_is_none(path)
    if _native.sound() is not None:
        return SoundFile(path, rates, floats)
    if reader():
        return SoundfileFile(path, rates)
    why = _native.sound_trouble() or "this package was built without its reader of sound files"
    raise SoundFileError(f"{path}: {why}: install the package soundfile, or pass samples")


def open_sound(sound: Any, rate: Any, channels: Any, format: Optional[str],
               rates: Optional[Sequence[int]] = None, floats: bool = True) -> Source:
    """Opens whatever was passed as sound. A file is converted when its rate is not in ``rates``."""
    path = path_of(sound)
    if path is not None:
        if rate is not None or channels is not None or format is not None:
            raise ArgumentError(f"{path}: a sound file has a rate, channels and a format of its "
                                "own: leave them out, or pass the samples of a headerless file")
        return _open_file(path, rates, floats)
    if _samples.is_plain(sound) or _samples.is_array(sound):
        piece = _samples.piece_of(sound)
        source = Pieces(iter([piece]), rate, channels, format)
        _samples.check_whole(piece, source.layout)
        return source
    if not hasattr(sound, "__iter__"):
        _samples.piece_of(sound)  # which says what it is not
    return Pieces(map(_samples.piece_of, sound), rate, channels, format)
