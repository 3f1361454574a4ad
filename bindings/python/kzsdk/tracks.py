"""What a catalogue holds and answers, as values."""

from __future__ import annotations

from dataclasses import dataclass
from datetime import datetime, timezone
from typing import Any, Optional, Tuple

from kzsdk import _native
from kzsdk._interface import ffi
from kzsdk.errors import check_catalogue


@dataclass(frozen=True)
class TrackSource:
    """A file or other place that a track came from."""

    uri: str  #: the path as it was added
    size: Optional[int]  #: of the file, in bytes
    mtime_ns: Optional[int]  #: when it was changed last, in nanoseconds since 1970
    sha256: Optional[bytes] = None


@dataclass(frozen=True)
class Track:
    """A track of a catalogue."""

    id: int
    duration: float  #: seconds
    tags: Tuple[Tuple[str, str], ...]  #: names and values; several may have one name
    sources: Tuple[TrackSource, ...]
    added: datetime
    answers_documents: bool  #: whether fingerprints are looked up in it too

    def tag(self, name: str) -> Optional[str]:
        """The first tag of this name."""
        return next((value for own, value in self.tags if own == name), None)

    @property
    def title(self) -> Optional[str]:
        return self.tag("title")

    @property
    def artist(self) -> Optional[str]:
        return self.tag("artist")


@dataclass(frozen=True)
class Added:
    """What became of sound that was added."""

    track: int  #: the track's id
    is_new: bool  #: false when a track with the same sound was there: it has one source more now


@dataclass(frozen=True)
class Match:
    """A track in which a clip was found."""

    track: int  #: its id
    source: str  #: the path as it was added first; empty when the track has gone since
    title: Optional[str]
    artist: Optional[str]
    score: float  #: how sure, higher is surer
    threshold: float  #: that the score had to reach
    offset: float  #: seconds of the track at which the clip begins
    speed: float  #: pitch and tempo changed alike: 1.05 is 5 % faster
    tempo: float  #: the clip runs this much faster, whatever its pitch
    pitch: float  #: the clip's frequencies are this many times the track's
    clip_begin: float  #: seconds of the clip where what was found begins
    clip_end: float  #: and ends
    by: str  #: "trail" (sound) or "document" (a fingerprint)
    weak: bool  #: a fingerprint that agrees, but not closely: a hint


@dataclass(frozen=True)
class Answer:
    """All that a catalogue says about a clip."""

    verdict: str  #: "match", "no match", "not sure" or "too quiet"
    matches: Tuple[Match, ...]  #: tracks that reached their threshold, the best first
    candidates: Tuple[Match, ...]  #: the best tracks, whatever their score
    clip_seconds: float  #: of the clip; 0 for a fingerprint, which does not say
    left_out: int  #: tracks that were not looked through, because they are damaged
    shards: int  #: servers that have tracks of the catalogue; 1 for a file
    shards_answered: int  #: how many of them the answer is from


@dataclass(frozen=True)
class Fault:
    """Something that is wrong with a catalogue."""

    track: Optional[int]  #: its id; None when no single track is concerned
    text: str


def _source_of(source: Any) -> TrackSource:
    return TrackSource(
        _native.text(source.uri), None if source.size < 0 else source.size,
        None if source.mtime_ns < 0 else source.mtime_ns,
        None if source.hash == ffi.NULL else bytes(ffi.buffer(source.hash, 32)))


def track_of(library: Any, address: Any) -> Track:
    """Copies a native track."""
    facts = ffi.new("kzcat_track_facts*")
    check_catalogue(library.kzcat_track_get_facts(address, facts))
    tag, source = ffi.new("kzcat_tag*"), ffi.new("kzcat_source*")
    tags, sources = [], []
    for place in range(facts.tag_count):
        check_catalogue(library.kzcat_track_get_tag(address, place, tag))
        tags.append((_native.text(tag.name), _native.text(tag.value)))
    for place in range(facts.source_count):
        check_catalogue(library.kzcat_track_get_source(address, place, source))
        sources.append(_source_of(source))
    return Track(facts.track, facts.samples / facts.sample_rate, tuple(tags), tuple(sources),
                 datetime.fromtimestamp(facts.added, timezone.utc), bool(facts.answers_documents))


def _match_of(library: Any, match: Any) -> Match:
    return Match(match.track, _native.text(match.source), _native.optional_text(match.title),
                 _native.optional_text(match.artist), match.score, match.threshold, match.offset,
                 match.speed, match.tempo, match.pitch, match.clip_begin, match.clip_end,
                 "trail" if match.by == library.KZCAT_BY_TRAIL else "document", bool(match.weak))


def answer_of(library: Any, result: Any) -> Answer:
    """Copies a native result."""
    summary, match = ffi.new("kzcat_summary*"), ffi.new("kzcat_match*")
    check_catalogue(library.kzcat_result_get_summary(result, summary))

    def all_of(get: Any, count: int) -> Tuple[Match, ...]:
        matches = []
        for place in range(count):
            check_catalogue(get(result, place, match))
            matches.append(_match_of(library, match))
        return tuple(matches)

    return Answer(_native.text(library.kzcat_verdict_text(summary.verdict)),
                  all_of(library.kzcat_result_get_match, summary.match_count),
                  all_of(library.kzcat_result_get_candidate, summary.candidate_count),
                  summary.clip_seconds, summary.left_out, summary.shards, summary.shards_answered)
