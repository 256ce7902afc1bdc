// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <cstdint>

namespace Domain
{

/// What of the loaded sound has not been handed to the audio device yet. The address is the audio callback's user
/// data, so whoever else changes it locks the callback out.
struct AudioFeed
{
    std::uint32_t remaining = 0;            ///< bytes
    const std::uint8_t* position = nullptr; ///< the next of them
};

/// SDL's audio callback: hands over the next `length` bytes of the `AudioFeed` at `userData`. The rest of a last, short
/// chunk stays as SDL prepared it (silence); the first call after the last byte pauses the device and touches nothing.
///
/// Threads: SDL's audio thread, under SDL's audio lock.
void audioFeed(void* userData, unsigned char* stream, int length);

} // namespace Domain
