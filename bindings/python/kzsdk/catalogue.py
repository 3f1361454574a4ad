"""Catalogues: keep what recordings sound like, and name clips of them."""

from __future__ import annotations

import os
from typing import Any, Callable, Iterator, List, Mapping, Optional, Tuple, Union

from kzsdk import _feeding, _native, _open_files, _sources
from kzsdk._fingerprint import Sound
from kzsdk._handle import Handle
from kzsdk._interface import ffi
from kzsdk._texts import path_bytes, tag_bytes
from kzsdk.errors import ArgumentError, NotFoundError, check_catalogue
from kzsdk.result import Fingerprint
from kzsdk.tracks import Added, Answer, Fault, Match, Track, answer_of, track_of

_ACCESS = {"read": 1, "write": 2, "create": 3}
_PLANS = {"measured": 0, "scan": 1, "parts": 2}

#: Receives the tracks done and those in all; false stops the work.
Progress = Callable[[int, int], Optional[bool]]


def _number_of(numbers: Mapping[str, int], name: str, what: str) -> int:
    if name not in numbers:
        raise ArgumentError(f"there is no {what} {name!r}: use one of " + ", ".join(numbers))
    return numbers[name]


class Catalogue:
    """A file of tracks, by what they sound like; or such tables on a PostgreSQL server.

    >>> import array, random
    >>> tune = array.array("h", random.Random(1).choices(range(-9000, 9000), k=160000))
    >>> with Catalogue(None) as catalogue:          # in memory
    ...     added = catalogue.add(tune, rate=8000, title="A tune")
    ...     match = catalogue.match(tune[40000:120000], rate=8000)[0]
    ...     match.title, round(match.offset)
    ('A tune', 5)

    What was added is on disk when ``add`` returns. Several threads may use a catalogue at once:
    looking up runs in parallel, everything else takes turns. Do not use one after a fork.
    """

    def __init__(self, path: Union[str, os.PathLike[str], None], access: str = "create", *,
                 plan: str = "measured", index_file: bool = True, partial: bool = False) -> None:
        """Opens a catalogue.

        ``path`` names a file, or is the address of a server, "postgresql://..."; None makes an
        empty catalogue in memory. ``access`` is "read", "write", or "create" to make it when it is
        not there. The other arguments are those of ``kzcat_settings``.
        """
        library = _native.cat()
        self._library = library
        settings = ffi.new("kzcat_settings*")
        check_catalogue(library.kzcat_initialize_settings(settings))
        settings.plan = _number_of(_PLANS, plan, "plan")
        settings.index_file = int(index_file)
        settings.partial = int(partial)
        number = _number_of(_ACCESS, access, "access")
        name = ffi.NULL if path is None else path_bytes(path)
        self._handle = self._open(name, number, settings)

    def _open(self, name: Any, access: int, settings: Any) -> Handle:
        opened = ffi.new("kzcat_catalogue**")
        is_file = name != ffi.NULL and not self._library.kzcat_is_server_address(name)
        # Noted first, so that threads refuse the file as sound from before it has locks.
        # One that is in the middle of opening it as sound has looked already.
        forget = _open_files.register(os.fsdecode(name)) if is_file else lambda: None
        try:
            check_catalogue(self._library.kzcat_open(name, access, settings, opened))
        except BaseException:
            forget()
            raise
        return Handle("catalogue", opened[0], self._library.kzcat_close, shared=True, freed=forget)

    def add(self, sound: Sound, *, title: Optional[str] = None, artist: Optional[str] = None,
            tags: Optional[Mapping[str, str]] = None, source: Optional[str] = None,
            rate: Optional[int] = None, channels: Optional[int] = None,
            format: Optional[str] = None, documents: bool = False) -> Added:
        """Adds a recording: the path of a sound file, or samples as ``kzsdk.fingerprint`` takes.

        Tags come from the file, unless they are passed; without any title, the file's name is it.
        ``source`` is what the catalogue knows the recording by: the path, or the title of samples.
        ``documents``: fingerprints are to be looked up in it too.
        """
        self._handle.check_open()
        path = _sources.path_of(sound)
        own = {"title": title, "artist": artist}
        wanted = {**(tags or {}), **{name: text for name, text in own.items() if text is not None}}
        uri = source or path or wanted.get("title")
        if not uri:
            raise ArgumentError("samples have no name of their own: pass title= or source=")
        facts = (-1, -1, b"") if path is None else _feeding.file_facts(path)
        with _sources.open_sound(sound, rate, channels, format) as opened:
            kept = [(name, text) for name, text in opened.tags if name not in wanted]
            kept += wanted.items()
            if path is not None and "title" not in dict(kept):
                kept.append(("title", os.path.splitext(os.path.basename(path))[0]))
            with _feeding.trail_of(self._library, opened, documents) as trail:
                return self._add(trail, uri, facts, kept)

    def _add(self, trail: Any, uri: str, facts: Tuple[int, int, bytes],
             tags: List[Tuple[str, str]]) -> Added:
        # cffi keeps what a record points to only as long as somebody holds it.
        texts = [[ffi.new("char[]", tag_bytes(text)) for text in tag]
                 for tag in tags]
        records = ffi.new("kzcat_tag[]", texts) if texts else ffi.NULL
        name, digest = ffi.new("char[]", path_bytes(uri)), ffi.new("uint8_t[]", facts[2])
        track = ffi.new("kzcat_new_track*")
        track.trail, track.tags, track.tag_count = trail, records, len(texts)
        track.source = [name, facts[0], facts[1], digest if facts[2] else ffi.NULL]
        added = ffi.new("kzcat_added*")
        with self._handle.use() as catalogue:
            check_catalogue(self._library.kzcat_add(catalogue, track, 1, added))
        return Added(added.track, bool(added.is_new))

    def match(self, sound: Union[Sound, Fingerprint], *, rate: Optional[int] = None,
              channels: Optional[int] = None, format: Optional[str] = None, speeds: bool = True,
              passages: bool = False) -> List[Match]:
        """The tracks that a clip is from, the best first; empty when it was not recognised.

        A clip of 6 s or more is a sound file, samples, or a ``Fingerprint``, which finds the tracks
        that were added with ``documents``. ``speeds``: also at other speeds, up to 6 % either way.
        ``passages``: the clip may hold several tracks one after the other.
        """
        return list(self.recognise(sound, rate=rate, channels=channels, format=format,
                                   speeds=speeds, passages=passages).matches)

    def recognise(self, sound: Union[Sound, Fingerprint], *, rate: Optional[int] = None,
                  channels: Optional[int] = None, format: Optional[str] = None,
                  speeds: bool = True, passages: bool = False, candidates: int = 2) -> Answer:
        """All that there is to say about a clip, also when no track was recognised.

        ``candidates`` best tracks are reported whatever their score, up to 1000. The rest is as in
        ``match``.
        """
        self._handle.check_open()
        options = ffi.new("kzcat_match_options*")
        check_catalogue(self._library.kzcat_initialize_match_options(options))
        if not 0 <= candidates <= 1000:
            raise ArgumentError(f"candidates={candidates} cannot be used: pass 0 to 1000")
        options.speeds, options.passages = int(speeds), int(passages)
        options.candidates = candidates
        with _feeding.query_of(self._library, sound, rate, channels, format) as query:
            with self._handle.use() as catalogue:
                with _feeding.result_of(self._library, catalogue, query, options) as result:
                    return answer_of(self._library, result)

    def __iter__(self) -> Iterator[Track]:
        """All tracks, in the order of their ids; some may be added and removed meanwhile."""
        after = 0
        while True:
            try:
                track = self._found(self._library.kzcat_get_next_track, after)
            except NotFoundError:
                return
            yield track
            after = track.id

    def __len__(self) -> int:
        facts = ffi.new("kzcat_facts*")
        with self._handle.use() as catalogue:
            check_catalogue(self._library.kzcat_get_facts(catalogue, 0, facts))
        return int(facts.tracks)

    def __bool__(self) -> bool:
        return True  # also when it is empty

    def track(self, track: int) -> Track:
        """The track of an id; NotFoundError when there is none."""
        return self._found(self._library.kzcat_get_track, track)

    def find(self, source: Union[str, os.PathLike[str]]) -> Track:
        """The track that came from a source; NotFoundError when there is none."""
        return self._found(self._library.kzcat_find_source, path_bytes(source))

    def _found(self, find: Callable[..., int], *arguments: Any) -> Track:
        with self._handle.use() as catalogue:
            with _feeding.found_track(self._library, find, catalogue, *arguments) as track:
                return track_of(self._library, track)

    def remove(self, track: Union[int, Track, str, os.PathLike[str]]) -> None:
        """Removes a track, by its id; or a source, and its track when that was the last one."""
        with self._handle.use() as catalogue:
            if isinstance(track, (int, Track)):
                number = track.id if isinstance(track, Track) else track
                check_catalogue(self._library.kzcat_remove_track(catalogue, number))
            else:
                uri = path_bytes(track)
                check_catalogue(self._library.kzcat_remove_source(catalogue, uri))

    def verify(self, progress: Optional[Progress] = None) -> List[Fault]:
        """Reads everything, and returns what is wrong: nothing, in a catalogue that is whole.

        ``progress`` may return False to stop; CatalogueError is raised then. It must not use the
        catalogue.
        """
        faults: List[Fault] = []
        raised: List[BaseException] = []

        def take(_context: Any, track: int, text: Any) -> None:
            faults.append(Fault(track or None, _native.text(text)))

        def go_on(_context: Any, done: int, total: int) -> int:
            return 0 if progress is not None and progress(done, total) is False else 1

        def stop(_kind: Any, error: BaseException, _trace: Any) -> None:
            raised.append(error)  # Ctrl-C too; the callback then returns 0, which stops the work

        report = ffi.callback("kzcat_fault", take, onerror=stop)
        advance = ffi.callback("kzcat_progress", go_on, error=0, onerror=stop)
        with self._handle.use_with_callbacks() as catalogue:
            status = self._library.kzcat_verify(catalogue, report, advance, ffi.NULL, ffi.NULL)
        if raised:
            raise raised[0]
        check_catalogue(status)
        return faults

    @property
    def closed(self) -> bool:
        return self._handle.closed

    def close(self) -> None:
        """Closes the catalogue. What other threads are doing with it is finished first."""
        self._handle.close()

    def __enter__(self) -> Catalogue:
        return self

    def __exit__(self, *_: Any) -> None:
        self.close()
