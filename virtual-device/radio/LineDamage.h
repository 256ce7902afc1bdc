// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QByteArrayView>

#include <random>

namespace VirtualDevice
{

/// What a disturbed serial line does to the bytes on it, by chance that can be repeated: the damage depends only on the
/// seed, on how many bytes have passed since the seed was set and on the rates, never on how the bytes were delivered.
/// One thread.
class LineDamage
{
public:
    /// How often each fault strikes, per 100,000 bytes.
    struct Rates
    {
        int drop = 0;
        int insert = 0; ///< a random byte before the one that is struck
        int flip = 0;   ///< one bit
        int duplicate = 0;
    };
    static constexpr quint32 rateBase = 100'000;

    explicit LineDamage(quint32 seed = 1);

    void setSeed(quint32 seed);
    [[nodiscard]] QByteArray applied(QByteArrayView bytes, const Rates& rates);
    /// Random bytes; drawn apart from the damage, so that a burst leaves the damage after it as it would have been.
    [[nodiscard]] QByteArray noise(int size);
    /// A number from 1 to `limit`, for cutting deliveries.
    [[nodiscard]] int piece(int limit);

private:
    std::mt19937 damage; // the engine's sequence is fixed by the language standard, that of a distribution is not
    std::mt19937 bursts;
    std::mt19937 pieces;
};

} // namespace VirtualDevice
