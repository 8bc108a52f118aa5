#!/usr/bin/env python3
"""tone.py OUTPUT: writes the sound of the theme, a short soft tone, as a WAV file."""
import math
import struct
import sys
import wave

RATE = 44100
SECONDS, RISE, FADE = 0.16, 0.006, 0.035  # all of it, until it is at its loudest, until it has lost two thirds again
PARTIALS = ((784.0, 0.22), (1568.0, 0.05))  # Hz and share of what a sample can hold


def sample(at):
    loud = min(at / RISE, 1) * math.exp(-at / FADE) * min((SECONDS - at) / RISE, 1)
    return round(32767 * loud * sum(part * math.sin(2 * math.pi * hertz * at) for hertz, part in PARTIALS))


with wave.open(sys.argv[1], 'wb') as out:
    out.setnchannels(1)
    out.setsampwidth(2)
    out.setframerate(RATE)
    out.writeframes(b''.join(struct.pack('<h', sample(i / RATE)) for i in range(int(RATE * SECONDS))))
