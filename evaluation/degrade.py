"""What is done to a clip before it is looked up: one function a kind, with sox, FFmpeg and numpy.

Each function takes the clip as an array (frames, channels) of floats in -1..1, its rate, a seeded
random generator and the file to write without its suffix; it returns the file written. A kind says
how much of the track the clip lasts: `stretch` is the track's seconds a second of the clip.

Levels of noise and speech are ratios of root mean squares over the whole clip. White and pink noise
end at 11025 Hz, whatever the track's rate, and pink noise begins at 20 Hz.
"""

import subprocess

import numpy

NOISE_FROM, NOISE_TO = 20.0, 11025.0
MP3_RATES = (8000, 11025, 12000, 16000, 22050, 24000, 32000, 44100, 48000)


def fed(command, samples):
    data = numpy.ascontiguousarray(samples, dtype="<f4").tobytes()
    subprocess.run([str(part) for part in command], input=data, check=True, capture_output=True)


def sox(samples, rate, output, *effects):
    """`output` is what sox takes for its output file: format options and the file's name."""
    fed(["sox", "-R", "-V1", "-t", "f32", "-r", rate, "-c", samples.shape[1], "-", *output, *effects],
        samples)
    return output[-1]


def plain(samples, rate, target, *effects):
    """Scaled down where it would clip; a FLAC file."""
    peak = float(numpy.abs(samples).max())
    if peak > 0.98:
        samples = samples * (0.98 / peak)
    return sox(samples, rate, ["-C", "1", "-b", "16", f"{target}.flac"], *effects)


def ffmpeg(samples, rate, file, *options):
    fed(["ffmpeg", "-v", "error", "-y", "-f", "f32le", "-ar", rate, "-ac", samples.shape[1], "-i", "-",
         *options, file], samples)
    return file


def mono(samples):
    return samples.mean(axis=1, keepdims=True)


def level(samples):
    return float(numpy.sqrt(numpy.mean(numpy.square(samples))))


def with_effects(*effects):
    return lambda samples, rate, random, target: plain(mono(samples), rate, target, *effects)


def clean(samples, rate, random, target):
    return plain(samples, rate, target)


def mp3(bits, channels, rates):
    def make(samples, rate, random, target):
        chosen = rate if rate in rates else rates[-1]
        clip = mono(samples) if channels == 1 else samples
        return ffmpeg(clip, rate, f"{target}.mp3", "-ar", chosen, "-c:a", "libmp3lame", "-b:a", bits)
    return make


def opus(bits):
    return lambda samples, rate, random, target: ffmpeg(
        samples, rate, f"{target}.opus", "-c:a", "libopus", "-b:a", bits)


def gsm(samples, rate, random, target):
    return sox(0.9 * mono(samples), rate, ["-r", "8000", "-e", "gsm-full-rate", f"{target}.wav"])


def telephone(samples, rate, random, target):
    return sox(0.9 * mono(samples), rate, ["-r", "8000", "-e", "mu-law", f"{target}.wav"],
               "sinc", "300-3400")


def shaped(random, count, rate, slope):
    """Noise whose power falls with frequency to the power of `slope`, of level 1."""
    frequencies = numpy.fft.rfftfreq(count, 1 / rate)
    inside = (frequencies >= (NOISE_FROM if slope else 0.0)) & (frequencies <= NOISE_TO)
    spectrum = numpy.zeros(len(frequencies), complex)
    parts = random.standard_normal((2, int(inside.sum())))
    spectrum[inside] = parts[0] + 1j * parts[1]
    if slope:
        spectrum[inside] *= frequencies[inside] ** (-slope / 2)
    made = numpy.fft.irfft(spectrum, count)
    return (made / level(made))[:, None]


def noise(slope, decibels):
    def make(samples, rate, random, target):
        clip = mono(samples)
        added = shaped(random, len(clip), rate, slope) * level(clip) * 10 ** (-decibels / 20)
        return plain(clip + added, rate, target)
    return make


def speech(decibels):
    """A voice louder than the music by so many decibels; `random.voices` holds them at 22050 Hz."""
    def make(samples, rate, random, target):
        clip = mono(samples)
        voice = random.voices[random.integers(len(random.voices))]
        length = len(clip) / rate
        start = random.integers(max(1, len(voice) - int(length * 22050)))
        voice = voice[start:start + int(length * 22050) + 1]
        times = numpy.arange(len(clip)) * (22050 / rate)
        voice = numpy.interp(times, numpy.arange(len(voice)), voice)[:, None]
        return plain(clip + voice * (level(clip) * 10 ** (decibels / 20) / level(voice)), rate, target)
    return make


def room(random, rate, seconds):
    """A direct sound and a tail of as much energy that falls by 60 dB in so many seconds."""
    count = int(seconds * rate)
    tail = random.standard_normal(count) * 10 ** (-3 * numpy.arange(count) / count)
    tail[0] = 0
    answer = tail / numpy.sqrt(numpy.sum(tail ** 2))
    answer[0] = 1
    return answer


def filtered(clip, response, rate, low, high):
    """Through the room, and only what lies between two frequencies."""
    size = 1 << int(len(clip) + len(response) - 1).bit_length()
    frequencies = numpy.fft.rfftfreq(size, 1 / rate)
    band = 1 / (1 + (low / numpy.maximum(frequencies, 1)) ** 8) / (1 + (frequencies / high) ** 8)
    spectrum = numpy.fft.rfft(clip[:, 0], size) * numpy.fft.rfft(response, size) * band
    return numpy.fft.irfft(spectrum, size)[:len(clip), None]


def microphone(samples, rate, random, target):
    """Across a room of 450 ms, 250 to 5000 Hz, pink noise 10 dB below, a soft limiter."""
    clip = filtered(mono(samples), room(random, rate, 0.45), rate, 250, 5000)
    clip = clip + shaped(random, len(clip), rate, 1) * level(clip) * 10 ** (-10 / 20)
    return plain(numpy.tanh(clip * (0.35 / level(clip))), rate, target)


class Kind:
    """One degradation: what makes it, and what it does to time and pitch."""

    def __init__(self, make, speed=1.0, tempo=1.0, cents=0.0, seconds=14.3):
        self.make = make
        self.speed = speed
        self.tempo = tempo
        self.cents = cents
        self.seconds = seconds

    @property
    def stretch(self):
        return self.speed * self.tempo

    @property
    def truth(self):
        return {"speed": self.speed, "tempo": self.tempo, "pitch": round(2 ** (self.cents / 1200), 6)}


def speed(percent):
    factor = round(1 + percent / 100, 4)
    return Kind(with_effects("speed", factor, "rate", "-h", "trim", "0", "14.3"), speed=factor)


def tempo(percent):
    factor = round(1 + percent / 100, 4)
    return Kind(with_effects("tempo", "-m", factor, "trim", "0", "14.3"), tempo=factor)


def pitch(cents):
    return Kind(with_effects("pitch", cents, "trim", "0", "14.3"), cents=cents)


def briefly(kind):
    return Kind(kind.make, seconds=6.0)


def all_kinds():
    """The kinds by name, those first that are hardest."""
    kinds = {
        "clean": Kind(clean),
        "white_0": Kind(noise(0, 0)),
        "pink_0": Kind(noise(1, 0)),
        "speech_over": Kind(speech(6)),
        "mic": Kind(microphone),
        "telephone": Kind(telephone),
    }
    for percent in (5, -5, 1.7, -1.7, 1, -1, 2, -2, 3, -3, 4.4, -4.4):
        kinds[f"speed{percent:+g}"] = speed(percent)
    for percent in (5, -5, 3, -3):
        kinds[f"tempo{percent:+g}"] = tempo(percent)
    for cents in (100, 50, -50, -70):
        kinds[f"pitch{cents:+g}"] = pitch(cents)
    for decibels in (3, 5, 10, 20):
        kinds[f"pink_{decibels}"] = Kind(noise(1, decibels))
        kinds[f"white_{decibels}"] = Kind(noise(0, decibels))
    kinds |= {
        "speech_under": Kind(speech(-6)),
        "mp3_64": Kind(mp3("64k", 2, MP3_RATES)),
        "mp3_32": Kind(mp3("32k", 1, (22050,))),
        "opus_24": Kind(opus("24k")),
        "gsm": Kind(gsm),
        "compand": Kind(with_effects("compand", "0.01,0.3", "6:-70,-60,-20", "-5", "-90")),
        "quiet": Kind(with_effects("gain", "-20")),
        "clipped": Kind(with_effects("gain", "-n", "12")),
        "bass": Kind(with_effects("gain", "-12", "bass", "10")),
        "lowpass": Kind(with_effects("sinc", "-1000")),
        "reverb": Kind(with_effects("gain", "-6", "reverb", "70")),
    }
    for name in ("clean", "mp3_64", "telephone", "reverb", "white_10", "mic", "pink_0"):
        kinds[f"{name}_6s"] = briefly(kinds[name])
    return kinds
