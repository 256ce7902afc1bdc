// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QtGlobal>

#include <algorithm>
#include <array>
#include <cstring>

#ifdef __SSE2__
#include <emmintrin.h>
#endif

/// The sum of a received payload's bytes, each taken as unsigned, in as little time as the machine allows: sixteen
/// bytes at a time, and always as many of them as the longest payload has. Lengths on a line follow no pattern, and a
/// loop that ends with the payload costs more by its wrongly predicted end than adding zeros up to a fixed one.
///
/// Threads: pure functions. Bytes behind the payload are read, up to `summedBytes` in all, and do not count.
namespace Domain::FrameChecksum
{

/// Sixteen bytes of the line as eight lanes.
using Lanes [[gnu::vector_size(16)]] = quint16;
constexpr quint16 vectorSize = sizeof(Lanes);

/// The longest payload, a hundred bytes, in whole vectors.
constexpr quint16 summedBytes = 7 * vectorSize;

/// All ones, then all zeros: read from `summedBytes - n` on, it keeps the first n bytes.
inline constexpr auto keepMask = [] {
    std::array<char, 2 * summedBytes> mask{};
    std::fill_n(mask.begin(), summedBytes, char(-1));
    return mask;
}();

/// The first `length` of the bytes, at most `summedBytes`, on any machine with vectors.
[[nodiscard]] inline quint16 ofFirstInLanes(quint16 length, const char* bytes)
{
    const char* const mask = keepMask.data() + (summedBytes - length);
    Lanes sums{};
    for (quint16 offset = 0; offset < summedBytes; offset += vectorSize) {
        Lanes read;
        Lanes kept;
        std::memcpy(&read, bytes + offset, sizeof read);
        std::memcpy(&kept, mask + offset, sizeof kept);
        kept &= read;
        sums += (kept & 0xFF) + (kept >> 8);
    }
    // Two halves of four lanes; the product's highest lane is the sum of all of them.
    constexpr quint64 ones = 0x0001000100010001;
    std::array<quint64, 2> halves{};
    std::memcpy(halves.data(), &sums, sizeof sums);
    return static_cast<quint16>(((halves[0] + halves[1]) * ones) >> 48);
}

/// The same with the instruction that some machines have for it.
[[nodiscard]] inline quint16 ofFirst(quint16 length, const char* bytes)
{
#ifdef __SSE2__
    const char* const mask = keepMask.data() + (summedBytes - length);
    __m128i sums = _mm_setzero_si128();
    for (quint16 offset = 0; offset < summedBytes; offset += vectorSize) {
        const __m128i read = _mm_loadu_si128(reinterpret_cast<const __m128i*>(bytes + offset));
        const __m128i kept = _mm_and_si128(read, _mm_loadu_si128(reinterpret_cast<const __m128i*>(mask + offset)));
        sums = _mm_add_epi64(sums, _mm_sad_epu8(kept, _mm_setzero_si128()));
    }
    constexpr int upperHalf = 4;
    return static_cast<quint16>(_mm_cvtsi128_si32(sums) + _mm_extract_epi16(sums, upperHalf));
#else
    return ofFirstInLanes(length, bytes);
#endif
}

} // namespace Domain::FrameChecksum
