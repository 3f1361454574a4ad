"""Texts on their way to the libraries, which end at a null character."""

from __future__ import annotations

import os
from typing import Union

from kzsdk.errors import ArgumentError


def _checked(data: bytes, text: object) -> bytes:
    if b"\0" in data:
        raise ArgumentError(f"{text!r} has a null character in it: leave it out")
    return data


def path_bytes(path: Union[str, bytes, os.PathLike[str]]) -> bytes:
    """A path or source in the bytes of the system."""
    return _checked(os.fsencode(path), path)


def tag_bytes(text: str) -> bytes:
    """UTF-8. A file's name that is none is taken for Latin-1, as kzfp does."""
    try:
        data = text.encode()
    except UnicodeEncodeError:
        data = os.fsencode(text).decode("latin-1").encode()
    return _checked(data, text)
