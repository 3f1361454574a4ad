"""The catalogues' files that this process has open, which must not be opened as sound.

A process has the locks of a file, not a descriptor: when it closes any descriptor of a file, it
gives up all locks that it has on it, and another writer may come in between.
"""

from __future__ import annotations

import os
from typing import Callable, Dict, Optional

from kzsdk._texts import path_bytes
from kzsdk.errors import ArgumentError

_ENDINGS = ("", "-wal", "-shm", "-journal", ".idx")

#: Real paths. Every change is a single operation: a lock could be held when the process forks, or
#: when the garbage collector frees a handle.
_open: Dict[object, str] = {}


def register(path: str) -> Callable[[], object]:
    """Notes that a catalogue is open; returns the call that ends this."""
    registration = object()
    _open[registration] = os.path.realpath(path)
    return lambda: _open.pop(registration, None)


def check_is_none(path: str) -> None:
    """Raises when a path leads to a file of an open catalogue, by whatever name."""
    path_bytes(path)  # which refuses what cannot be a path
    catalogues = list(_open.values())
    if not catalogues:
        return
    real, state = os.path.realpath(path), _state_of(path)
    for catalogue in catalogues:
        for own in (catalogue + ending for ending in _ENDINGS):
            if real == own or _is_same(state, _state_of(own)):
                raise ArgumentError(f"{path}: belongs to the catalogue {catalogue}, which is open: "
                                    "pass a sound file")


def _state_of(path: str) -> Optional[os.stat_result]:
    try:
        return os.stat(path)
    except OSError:
        return None


def _is_same(one: Optional[os.stat_result], other: Optional[os.stat_result]) -> bool:
    return one is not None and other is not None and os.path.samestat(one, other)
