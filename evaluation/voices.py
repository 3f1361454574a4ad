"""Synthetic speech to lay over music: espeak-ng in several languages, voices, paces and pitches."""

import hashlib
import subprocess
import wave

import numpy

COUNT = 40  # recordings a half
RATE = 22050  # of espeak-ng

SENTENCES = {
    "en": [
        "The train to the coast leaves from platform seven in about twenty minutes, so we still have time.",
        "Could you tell me what this song is called? I heard it yesterday in the bakery around the corner.",
        "After the rain had stopped, the children ran out into the garden and looked for snails.",
        "He said that nobody had ever asked him before, and that he would have to think about it.",
        "We close at nine tonight. Please take your belongings with you, and thank you for your visit.",
        "If the bridge is open, it is quicker by bicycle; otherwise you had better go through the old town.",
    ],
    "de": [
        "Morgen wird es im Norden windig, im Süden bleibt es trocken und meist freundlich.",
        "Hast du den Schlüssel gefunden, oder sollen wir noch einmal beim Nachbarn klingeln?",
        "Am Abend saßen sie lange auf der Treppe und erzählten sich von der Reise.",
        "Der Zug hält heute nicht an allen Stationen, bitte achten Sie auf die Durchsagen.",
    ],
    "fr": [
        "Le marché commence à huit heures, mais les meilleurs fruits partent très tôt le matin.",
        "Je ne sais plus où j'ai posé mes lunettes, peut-être sur la table de la cuisine.",
        "Il faisait si froid que même la fontaine de la place était couverte de glace.",
        "Elle lui a répondu qu'elle viendrait dimanche, si le temps le permettait.",
    ],
    "es": [
        "La biblioteca abre a las diez, y los sábados hay cuentos para los más pequeños.",
        "No me acuerdo del nombre, pero la melodía la conozco desde que era niño.",
        "Después de comer salimos a pasear por el puerto y vimos llegar los barcos.",
        "¿Quieres que te espere aquí, o prefieres que vaya a buscarte a la estación?",
    ],
}


def say(text, voice, pace, pitch, file):
    subprocess.run(["espeak-ng", "-v", voice, "-s", str(pace), "-p", str(pitch), "-w", str(file), text],
                   check=True, capture_output=True)


def load(file):
    with wave.open(str(file), "rb") as opened:
        return numpy.frombuffer(opened.readframes(opened.getnframes()), "<i2").astype("f4") / 32768


def recordings(folder, half):
    """COUNT recordings of 25 s or more, the same every time, others for each half."""
    folder.mkdir(parents=True, exist_ok=True)
    made = []
    for number in range(COUNT):
        seed = int.from_bytes(hashlib.sha256(f"voice {half} {number}".encode()).digest()[:8], "big")
        random = numpy.random.Generator(numpy.random.PCG64(seed))
        language = list(SENTENCES)[number % len(SENTENCES)]
        speaker = f"{language}+{'mf'[number // 4 % 2]}{random.integers(1, 5)}"
        lines = SENTENCES[language]
        text = " ".join(lines[place] for _ in range(3) for place in random.permutation(len(lines)))
        file = folder / f"{half}-{number:02}.wav"
        if not file.exists():
            say(text, speaker, random.integers(140, 190), random.integers(25, 75), file)
        made.append(load(file)[RATE // 4:])
    return made
