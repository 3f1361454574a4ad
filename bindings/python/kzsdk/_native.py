"""The native libraries, found and loaded when they are first needed.

Each is looked for in the folder that the environment variable KZSDK_LIBRARY_PATH names, then inside
the package, where a wheel has them, then where the system keeps its libraries. A named folder may
have some of them only, but not none: that is a mistake in its name.
"""

from __future__ import annotations

import functools
import os
from typing import Any, Optional

from kzsdk._interface import ffi

_OWN_FOLDER = os.path.join(os.path.dirname(os.path.abspath(__file__)), "_libraries")
_SDK, _CAT, _SOUND = _LIBRARIES = ("libkzsdk.so.1", "libkzcat.so.1", "libkzsound.so")


def _in_named_folder(name: str) -> Optional[str]:
    """A library's path in the folder that the user named; None where that has no such file."""
    folder = os.environ.get("KZSDK_LIBRARY_PATH")
    if not folder:
        return None
    if not any(os.path.exists(os.path.join(folder, library)) for library in _LIBRARIES):
        raise OSError(f"KZSDK_LIBRARY_PATH names {folder}, which has none of the libraries")
    place = os.path.join(folder, name)
    return place if os.path.exists(place) else None


def _in_package(name: str) -> Optional[str]:
    place = os.path.join(_OWN_FOLDER, name)
    return place if os.path.exists(place) else None


def _load(name: str, cure: str) -> Any:
    try:
        return ffi.dlopen(_in_named_folder(name) or _in_package(name) or name)
    except OSError as error:
        raise ImportError(
            f"{name} cannot be loaded ({error}); {cure}, or name the folder that it is in with "
            "KZSDK_LIBRARY_PATH"
        ) from None


def _check_version(name: str, version: str, major: int, minor: int) -> None:
    has = [int(number) for number in version.split(".")[:2]]
    if has[0] != major or has[1] < minor:
        raise ImportError(
            f"{name} is version {version}, and this package needs {major}.{minor} or a later "
            f"{major}.x: install both from the same release"
        )


@functools.lru_cache(maxsize=None)
def sdk() -> Any:
    """libkzsdk, which makes fingerprints."""
    library = _load(_SDK, "install the library (Debian: libkzsdk1)")
    version = text(library.kzsdk_get_version())
    _check_version("libkzsdk", version, library.KZSDK_VERSION_MAJOR, library.KZSDK_VERSION_MINOR)
    return library


@functools.lru_cache(maxsize=None)
def cat() -> Any:
    """libkzcat, which keeps tracks and names clips."""
    sdk()  # which it is linked with: the one that is loaded already serves it
    library = _load(_CAT, "install the library (Debian: libkzcat1)")
    version = text(library.kzcat_get_version())
    _check_version("libkzcat", version, library.KZCAT_VERSION_MAJOR, library.KZCAT_VERSION_MINOR)
    return library


@functools.lru_cache(maxsize=None)
def sound() -> Any:
    """libkzsound, which reads sound files; None where it is missing."""
    try:
        return _load(_SOUND, "")
    except ImportError:
        return None


def sound_trouble() -> str:
    """Why libkzsound, which is there, cannot be loaded; empty when it is missing."""
    try:
        place = _in_named_folder(_SOUND) or _in_package(_SOUND)
        if place is not None:
            ffi.dlopen(place)
    except OSError as error:
        return f"the reader of sound files cannot be loaded ({error})"
    return ""


def text(address: Any) -> str:
    """A text of the library; what is not UTF-8 in it is shown as the system shows paths."""
    data: bytes = ffi.string(address)
    return data.decode("utf-8", "surrogateescape")


def optional_text(address: Any) -> str | None:
    return None if address == ffi.NULL else text(address)


def name_of(library: Any, prefix: str, status: int) -> str:
    """The name of a status: "KZCAT_ERROR_BUSY"; its number when it has none."""
    for name in dir(library):
        if name.startswith(prefix) and "_ERROR_" in name and getattr(library, name) == status:
            return name
    return f"0x{status:08x}"


def samples(data: Any) -> Any:
    """The bytes of an object in memory, without a copy; null when there are none."""
    view = ffi.from_buffer(data)
    return view if len(view) > 0 else ffi.NULL
