"""What can go wrong, in the library's own sentences."""

from __future__ import annotations

from typing import Any

from kzsdk import _native


class Error(Exception):
    """The base of all errors of this package.

    ``name`` is that of the library's status, such as ``"KZCAT_ERROR_BUSY"``, and ``status`` its
    number; empty and 0 for errors that are noticed before the library is called.
    """

    def __init__(self, message: str, name: str = "", status: int = 0) -> None:
        super().__init__(message)
        self.name = name
        self.status = status


class ArgumentError(Error, ValueError):
    """A rate, a shape, a number of channels or another argument cannot be used."""


class ClosedError(Error, ValueError):
    """The stream or catalogue was closed."""


class OutOfMemoryError(Error, MemoryError):
    """Memory is short."""


class SoundFileError(Error):
    """A sound file cannot be read."""


class TooLittleSoundError(Error):
    """There is too little sound, or nothing but silence."""


class CatalogueError(Error):
    """A catalogue cannot do what it was asked for."""


class CannotOpenError(CatalogueError):
    """The catalogue is missing, may not be opened, or is none."""


class ReadOnlyError(CatalogueError):
    """The catalogue was opened for reading, or may not be written."""


class BusyError(CatalogueError):
    """Another writer holds the catalogue: try again later."""


class DamagedError(CatalogueError):
    """The catalogue is damaged: ``Catalogue.verify()`` says where."""


class NotFoundError(CatalogueError, LookupError):
    """There is no such track or source."""


class DamagedSoundWarning(UserWarning):
    """A sound file is damaged; what can be read of it was used."""


_OF_CATALOGUES = {
    "KZCAT_ERROR_MEMORY": OutOfMemoryError,
    "KZCAT_ERROR_INVALID_ARGUMENT": ArgumentError,
    "KZCAT_ERROR_FORMAT": ArgumentError,
    "KZCAT_ERROR_CANNOT_OPEN": CannotOpenError,
    "KZCAT_ERROR_READ_ONLY": ReadOnlyError,
    "KZCAT_ERROR_BUSY": BusyError,
    "KZCAT_ERROR_DAMAGED": DamagedError,
    "KZCAT_ERROR_NOT_FOUND": NotFoundError,
}

_OF_STREAMS = {
    "KZ_STREAM_ERROR_MEMORY": OutOfMemoryError,
    "KZ_STREAM_ERROR_FAILED": OutOfMemoryError,
    "KZ_STREAM_ERROR_ALGORITHM": ArgumentError,
    "KZ_STREAM_ERROR_FORMAT": ArgumentError,
    "KZ_STREAM_ERROR_RATE": ArgumentError,
    "KZ_STREAM_ERROR_CHANNELS": ArgumentError,
    "KZ_STREAM_ERROR_INVALID_ARGUMENT": ArgumentError,
}


def check_stream(status: int) -> None:
    """Raises what a status of libkzsdk stands for."""
    if status != 0:
        library = _native.sdk()
        name = _native.name_of(library, "KZ_", status)
        message = _native.text(library.kz_status_text(status))
        raise _OF_STREAMS.get(name, Error)(message, name, status)


def check_catalogue(status: int) -> None:
    """Raises what a status of libkzcat stands for."""
    if status != 0:
        library = _native.cat()
        name = _native.name_of(library, "KZCAT_", status)
        message = _native.text(library.kzcat_get_error_text())
        raise _OF_CATALOGUES.get(name, CatalogueError)(message, name, status)


def check_sound(status: int, path: Any) -> None:
    """Raises what a status of libkzsound stands for."""
    if status != 0:
        library = _native.sound()
        name = _native.name_of(library, "KZSOUND_", status)
        message = f"{path}: {_native.text(library.kzsound_get_error_text())}"
        kind = OutOfMemoryError if name == "KZSOUND_ERROR_MEMORY" else SoundFileError
        raise kind(message, name, status)
