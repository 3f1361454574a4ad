"""From sound to what a catalogue keeps and looks up: trails and queries."""

from __future__ import annotations

import contextlib
import hashlib
import os
from typing import Any, Callable, Iterator, Optional, Tuple

from kzsdk import _open_files, _samples, _sources
from kzsdk._interface import ffi
from kzsdk.errors import ArgumentError, TooLittleSoundError, check_catalogue
from kzsdk.result import Fingerprint


@contextlib.contextmanager
def _owned(kind: str, free: Callable[[Any], Any]) -> Iterator[Any]:
    """A place for a native handle, which is freed at the end of the with block."""
    reference = ffi.new(kind + "**")
    try:
        yield reference
    finally:
        free(reference)


def _feed(source: _sources.Source, address: Any, feed: Callable[..., int]) -> None:
    for piece in source.pieces():
        check_catalogue(feed(address, _samples.address_of(piece), piece.size))
    source.finish()


def _native_format(layout: _samples.Layout) -> Any:
    return ffi.new("kzcat_format*", [layout.number, layout.rate, layout.channels, 0])


@contextlib.contextmanager
def trail_of(library: Any, source: _sources.Source, documents: bool) -> Iterator[Any]:
    """The trail of sound, which is valid inside the with block."""
    settings = ffi.new("kzcat_builder_settings*")
    check_catalogue(library.kzcat_initialize_builder_settings(settings))
    settings.documents = int(documents)
    with _owned("kzcat_builder", library.kzcat_builder_free) as builder, \
            _owned("kzcat_trail", library.kzcat_trail_free) as trail:
        check_catalogue(library.kzcat_builder_create(_native_format(source.layout), settings,
                                                     builder))
        _feed(source, builder[0], library.kzcat_builder_feed)
        check_catalogue(library.kzcat_builder_finish(builder[0], trail))
        _check_length(library, trail[0])
        yield trail[0]


def _check_length(library: Any, trail: Any) -> None:
    facts = ffi.new("kzcat_trail_facts*")
    check_catalogue(library.kzcat_trail_get_facts(trail, facts))
    if facts.code_count == 0:
        raise TooLittleSoundError(f"too short: {facts.samples / facts.sample_rate:.2f} s of sound, "
                                  "half a second is needed")


@contextlib.contextmanager
def query_of(library: Any, sound: Any, rate: Any, channels: Any,
             format: Optional[str]) -> Iterator[Any]:
    """A finished query, which is valid inside the with block."""
    with _owned("kzcat_query", library.kzcat_query_free) as query:
        if isinstance(sound, Fingerprint):
            _check_bare(rate, channels, format)
            text = sound.document.encode()
            check_catalogue(library.kzcat_query_create_from_document(text, len(text), query))
        else:
            with _sources.open_sound(sound, rate, channels, format) as source:
                native_format = _native_format(source.layout)
                check_catalogue(library.kzcat_query_create(native_format, query))
                _feed(source, query[0], library.kzcat_query_feed)
            check_catalogue(library.kzcat_query_finish(query[0]))
        yield query[0]


def _check_bare(*described: Any) -> None:
    if any(part is not None for part in described):
        raise ArgumentError("a fingerprint has no rate, channels or format: leave them out")


@contextlib.contextmanager
def result_of(library: Any, catalogue: Any, query: Any, options: Any) -> Iterator[Any]:
    """What a catalogue answers to a query, valid inside the with block."""
    with _owned("kzcat_result", library.kzcat_result_free) as result:
        check_catalogue(library.kzcat_recognise(catalogue, query, options, result))
        yield result[0]


@contextlib.contextmanager
def found_track(library: Any, find: Callable[..., int], *arguments: Any) -> Iterator[Any]:
    """A track's record, valid inside the with block."""
    with _owned("kzcat_track", library.kzcat_track_free) as track:
        check_catalogue(find(*arguments, track))
        yield track[0]


def file_facts(path: str) -> Tuple[int, int, bytes]:
    """Size, time of change and SHA-256 of a regular file; of anything else that it has none."""
    _open_files.check_is_none(path)
    if not os.path.isfile(path):
        return -1, -1, b""
    state = os.stat(path)
    digest = hashlib.sha256()
    with open(path, "rb") as file:
        for block in iter(lambda: file.read(1 << 20), b""):
            digest.update(block)
    return state.st_size, state.st_mtime_ns, digest.digest()
