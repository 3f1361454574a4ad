"""Sound that is made with integers only, as tests/support/melody.cpp makes it, and its digests."""

import array
import functools

_HERTZ = (55, 82, 110, 165, 220, 247, 330, 370, 440, 494, 659, 880, 1320)


class Congruential:
    """A linear congruential generator with 64 bits of state."""

    def __init__(self, seed):
        self._state = seed

    def next(self):
        self._state = (self._state * 6364136223846793005 + 1442695040888963407) % 2**64
        return self._state >> 32

    def below(self, bound):
        return self.next() * bound >> 32


def _arch(phase):
    x = (phase >> 16) - 32768
    return x * (32768 - abs(x)) >> 13


def _sums(rate, seconds):
    """The three voices of each frame, before they are brought to a channel's level."""
    phases, steps, levels = [0, 0, 0], [0, 0, 0], [0, 0, 0]
    random = Congruential(7)
    for frame in range(int(rate * seconds)):
        if frame % (rate // 5) == 0:
            voice = frame // (rate // 5) % 3
            steps[voice] = (_HERTZ[random.below(13)] << 32) // rate
            levels[voice] = 1 << 24
        total = 0
        for voice in range(3):
            phases[voice] = (phases[voice] + steps[voice]) % 2**32
            levels[voice] -= levels[voice] // (rate // 4)
            total += _arch(phases[voice]) * levels[voice] >> 26
        yield total


@functools.lru_cache(maxsize=None)
def melody(rate, channels, seconds):
    """Interleaved 16-bit samples."""
    sound = array.array("h")
    for total in _sums(rate, seconds):
        for channel in range(channels):
            value = total * 256 * (256 if channel == 0 else 224) >> 16
            sound.append(max(-32768, min(32767, value)))
    return sound


@functools.lru_cache(maxsize=None)
def noise(rate, seconds, shift, seed):
    random = Congruential(seed)
    signed = (word - 2**32 if word >= 2**31 else word
              for word in (random.next() for _ in range(int(rate * seconds))))
    return array.array("h", (word >> (16 + shift) for word in signed))


def halved_sum(one, other):
    """Both at half level; halves are rounded towards zero, as in C."""
    def half(number):
        return number // 2 if number >= 0 else -(-number // 2)
    return array.array("h", (half(a) + half(b) for a, b in zip(one, other)))


def digest(text):
    """FNV-1a with 64 bits."""
    value = 0xcbf29ce484222325
    for byte in text.encode():
        value = (value ^ byte) * 0x100000001b3 % 2**64
    return f"{value:016x}"
