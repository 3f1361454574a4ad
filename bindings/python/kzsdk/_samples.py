"""Samples in memory: bytes, arrays, anything with a buffer."""

from __future__ import annotations

import operator
import re
from typing import TYPE_CHECKING, Any, NamedTuple, Optional, Tuple, Union

from kzsdk import _native
from kzsdk.errors import ArgumentError

if TYPE_CHECKING:
    import array

    import numpy
    Samples = Union[bytes, bytearray, memoryview, "array.array[Any]", "numpy.ndarray[Any, Any]"]
else:
    Samples = Any

#: Names of sample formats: the number in the library, and the bytes of a sample.
FORMATS = {
    "uint8": (9, 1),  # as in WAV files: silent at 128
    "int16": (2, 2),
    "int24": (5, 3),
    "int32": (6, 4),
    "float32": (7, 4),  # full scale is 1
    "float64": (8, 8),
    "alaw": (3, 1),
    "ulaw": (4, 1),
    "pcm8": (1, 1),  # the extraction interface's own, whose lower half is folded up
}
_NAMES = {number: name for name, (number, _) in FORMATS.items()}

#: By the letters of the struct module and the bytes of an element.
_BUFFERS = {("B", 1): "uint8", ("h", 2): "int16", ("i", 4): "int32", ("l", 4): "int32",
            ("f", 4): "float32", ("d", 8): "float64"}

_MOST_CHANNELS = 65535
_USUAL_CHANNELS = 64


class Layout(NamedTuple):
    """How samples lie in a stream of them."""

    format: str
    rate: int
    channels: int

    @property
    def number(self) -> int:
        """That of the format in the library."""
        return FORMATS[self.format][0]

    @property
    def frame_bytes(self) -> int:
        return FORMATS[self.format][1] * self.channels


class Piece(NamedTuple):
    """Samples that follow each other in memory; plain bytes do not say what they are."""

    data: Any
    size: int
    format: Optional[str] = None
    channels: Optional[int] = None
    frames: int = 0


def format_name(number: int) -> str:
    return _NAMES[number]


def is_plain(sound: Any) -> bool:
    """Whether it is bytes that do not say what they hold."""
    return isinstance(sound, (bytes, bytearray)) or (
        isinstance(sound, memoryview) and sound.format in ("B", "b", "c") and sound.ndim == 1)


def is_array(sound: Any) -> bool:
    if hasattr(sound, "__array__") or isinstance(sound, memoryview):
        return True
    try:
        memoryview(sound)
    except TypeError:
        return False
    return True


def piece_of(sound: Any) -> Piece:
    """Looks at samples, and copies them only where they do not follow each other in memory."""
    if is_plain(sound):
        view = memoryview(sound)
        return Piece(view if view.c_contiguous else view.tobytes(), view.nbytes)
    return _piece_of_array(sound)


def _view_of(sound: Any) -> memoryview:
    dtype: Any = getattr(sound, "dtype", None)
    if getattr(dtype, "isnative", True) is False:
        sound = sound.astype(dtype.newbyteorder("="))
    try:
        return memoryview(sound)
    except (TypeError, ValueError, BufferError):
        pass
    if not hasattr(sound, "__array__"):
        raise TypeError(
            f"{type(sound).__name__} is not sound: pass a path, bytes, an array of samples, or an "
            "iterator of such pieces")
    import numpy
    array: Any = numpy.asarray(sound)
    return memoryview(array)


def _piece_of_array(sound: Any) -> Piece:
    view = _view_of(sound)
    name = _BUFFERS.get((view.format.lstrip("@="), view.itemsize))
    if name is None or re.match("[<>!]", view.format):
        shown = getattr(sound, "dtype", f"'{view.format}'")
        raise TypeError(
            f"samples of type {shown} cannot be used: convert them to int16, int32 or float32, as "
            "with samples.astype('float32'); full scale of floats is 1")
    shape: Tuple[int, ...] = view.shape or ()
    if view.ndim not in (1, 2):
        raise ArgumentError(
            f"samples of shape {shape} cannot be used: pass (frames,) or (frames, channels)")
    channels = shape[1] if view.ndim == 2 else 1
    if not 1 <= channels <= _MOST_CHANNELS:
        raise ArgumentError(f"samples of shape {shape} have {channels} channels: pass "
                            f"(frames, channels), with 1 to {_MOST_CHANNELS} of them")
    data = view if view.c_contiguous else view.tobytes()
    return Piece(data, view.nbytes, name, channels, shape[0])


def _whole_number(value: Any, name: str) -> int:
    try:
        return operator.index(value)
    except TypeError:
        pass
    if isinstance(value, float) and value.is_integer():
        return int(value)
    raise TypeError(f"{name}={value!r} is not a whole number")


def check_format(name: str) -> str:
    if name not in FORMATS:
        raise ArgumentError(f"there is no sample format {name!r}: use one of " + ", ".join(FORMATS))
    return name


def checked_layout(rate: Any, channels: Any, format: str) -> Layout:
    """Raises for numbers that no library takes; which rates one takes is for that one to say."""
    layout = Layout(check_format(format), _whole_number(rate, "rate"),
                    _whole_number(channels, "channels"))
    if not 1 <= layout.rate <= 4_000_000:
        raise ArgumentError(f"a rate of {layout.rate} Hz cannot be used: pass 1 to 4000000")
    if not 1 <= layout.channels <= _MOST_CHANNELS:
        raise ArgumentError(f"{layout.channels} channels cannot be used: pass 1 to "
                            f"{_MOST_CHANNELS}")
    return layout


def layout_of(piece: Piece, rate: Any, channels: Any, format: Optional[str]) -> Layout:
    """What is known of samples, by themselves or by what was said about them."""
    if rate is None:
        raise ArgumentError(
            "samples do not say how fast they follow each other: pass rate=, in hertz")
    if piece.format is None:
        if channels is None:
            raise ArgumentError("bytes do not say how many channels they hold: pass channels=")
        return checked_layout(rate, channels, format or "int16")
    _check_shape(piece, channels)
    if format is not None and format != piece.format:
        raise ArgumentError(f"format={format!r} is for bytes; this array has {piece.format} "
                            "samples")
    return checked_layout(rate, piece.channels, piece.format)


def _check_shape(piece: Piece, channels: Any) -> None:
    shape = (piece.frames, piece.channels)
    if channels is not None and channels != piece.channels:
        raise ArgumentError(f"an array of shape {shape} has {piece.channels} channels, and "
                            f"channels={channels} was passed: leave it out, or reshape the array")
    many = piece.channels is not None and piece.channels > max(_USUAL_CHANNELS, piece.frames)
    if channels is None and many:
        raise ArgumentError(f"an array of shape {shape} looks as if its axes were exchanged: pass "
                            f"samples.T, or channels={piece.channels} if that is what it has")


def check_belongs(piece: Piece, layout: Layout) -> None:
    """Raises when an array is not what a stream was created for."""
    wanted = (layout.format, layout.channels)
    if piece.format is not None and (piece.format, piece.channels) != wanted:
        raise ArgumentError(
            f"an array of {piece.format} samples with {piece.channels} channels was fed to a "
            f"stream of {layout.format} samples with {layout.channels}: convert or reshape it")


def check_whole(piece: Piece, layout: Layout) -> None:
    if piece.size % layout.frame_bytes != 0:
        raise ArgumentError(
            f"{piece.size} bytes are no whole number of frames of {layout.frame_bytes} bytes "
            f"({layout.channels} channels of {layout.format}): look for a header, or a wrong "
            "number of channels")


def address_of(piece: Piece) -> Any:
    return _native.samples(piece.data)
