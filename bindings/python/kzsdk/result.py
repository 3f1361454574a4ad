"""The 30 numbers of a piece of sound."""

from __future__ import annotations

from dataclasses import dataclass, field
from typing import Tuple

from kzsdk.errors import ArgumentError

#: Mean absolute difference of the values from which on two starts are taken to differ.
LARGEST_DISTANCE = 100.0


@dataclass(frozen=True)
class Fingerprint:
    """What 14.22 s of sound are condensed into.

    >>> a = Fingerprint((1000,) * 30, 0.0, 14.21, "")
    >>> b = Fingerprint((1012,) * 30, 0.0, 14.21, "")
    >>> a.distance(b), a.verdict(b)
    (12.0, 'same start')
    """

    values: Tuple[int, ...]  #: 30 numbers: the means of 15 bands, then their spreads
    offset: float  #: seconds of leading silence, which was skipped
    duration: float  #: seconds of sound that the values describe
    document: str = field(repr=False)  #: the query document, XML

    def distance(self, other: Fingerprint) -> float:
        """Mean absolute difference of the values: 0 for the same, hundreds for other tunes."""
        if len(self.values) != len(other.values):
            raise ArgumentError(f"fingerprints of {len(self.values)} and {len(other.values)} "
                                "values cannot be compared")
        pairs = zip(self.values, other.values)
        return sum(abs(mine - its) for mine, its in pairs) / len(self.values)

    def verdict(self, other: Fingerprint) -> str:
        """``"same start"`` or ``"different"``, by the limit of ``kzfp compare``.

        It is about the first 14 s of sound: docs/comparing.md says how often it is wrong.
        """
        return "same start" if self.distance(other) < LARGEST_DISTANCE else "different"
