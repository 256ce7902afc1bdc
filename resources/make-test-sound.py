#!/usr/bin/env python3
# SPDX-FileCopyrightText: 2026 The ImmunityRig developers
# SPDX-License-Identifier: MIT
"""Writes TestSound.wav beside this script: two seconds of a rising and falling tone, 16 kHz mono 16-bit.

A tone that glides makes every break audible; it starts and ends in silence, so that repeating it does not click.
"""
import math
import pathlib
import struct
import wave

RATE = 16000
SECONDS = 2
AMPLITUDE = 12000
CENTRE_HZ, SWING_HZ = 660, 220
FADE_SECONDS = 0.05


def envelope(t):
    return min(1.0, t / FADE_SECONDS, (SECONDS - t) / FADE_SECONDS)


def samples():
    phase = 0.0
    for index in range(RATE * SECONDS):
        t = index / RATE
        frequency = CENTRE_HZ - SWING_HZ * math.cos(2 * math.pi * t / SECONDS)
        phase += 2 * math.pi * frequency / RATE
        yield round(AMPLITUDE * envelope(t) * math.sin(phase))


with wave.open(str(pathlib.Path(__file__).with_name("TestSound.wav")), "wb") as sound:
    sound.setnchannels(1)
    sound.setsampwidth(2)
    sound.setframerate(RATE)
    sound.writeframes(b"".join(struct.pack("<h", sample) for sample in samples()))
