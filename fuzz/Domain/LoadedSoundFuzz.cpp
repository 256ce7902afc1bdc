// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/LoadedSound.h"

#include <cstdint>
#include <cstdlib>
#include <numeric>

// Any file: what SDL makes of it is whole, and nothing of it lies outside of the file.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* bytes, std::size_t size)
{
    const QByteArray content(reinterpret_cast<const char*>(bytes), static_cast<qsizetype>(size));
    const auto sound = Domain::LoadedSound::fromContent(content);
    if (sound.samples == nullptr)
        return 0;
    if (sound.length > size)
        std::abort();
    // Reads every sample, as the loudspeaker would.
    const auto* const samples = sound.samples.get();
    return std::accumulate(samples, samples + sound.length, 0U) == ~0U ? -1 : 0;
}
