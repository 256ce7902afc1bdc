// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/radio/LineDamage.h"

namespace VirtualDevice
{

namespace
{

bool strikes(quint32 draw, int rate)
{
    return draw % LineDamage::rateBase < static_cast<quint32>(rate);
}

} // namespace

LineDamage::LineDamage(quint32 seed)
{
    setSeed(seed);
}

void LineDamage::setSeed(quint32 seed)
{
    damage.seed(seed);
    bursts.seed(seed ^ 0x55555555U);
    pieces.seed(seed ^ 0xAAAAAAAAU);
}

QByteArray LineDamage::applied(QByteArrayView bytes, const Rates& rates)
{
    QByteArray result;
    result.reserve(bytes.size());
    for (const char byte : bytes) {
        // Always the same number of draws for a byte: a changed rate leaves the other faults where they were.
        const auto drop = static_cast<quint32>(damage());
        const auto insert = static_cast<quint32>(damage());
        const auto flip = static_cast<quint32>(damage());
        const auto duplicate = static_cast<quint32>(damage());
        const auto value = static_cast<quint32>(damage());
        if (strikes(insert, rates.insert))
            result.append(static_cast<char>(value >> 8));
        if (strikes(drop, rates.drop))
            continue;
        const char passed = strikes(flip, rates.flip) ? static_cast<char>(byte ^ (1 << (value & 7U))) : byte;
        result.append(strikes(duplicate, rates.duplicate) ? 2 : 1, passed);
    }
    return result;
}

QByteArray LineDamage::noise(int size)
{
    QByteArray bytes(size, Qt::Uninitialized);
    for (char& byte : bytes)
        byte = static_cast<char>(bursts() & 0xFFU);
    return bytes;
}

int LineDamage::piece(int limit)
{
    return 1 + static_cast<int>(pieces() % static_cast<quint32>(limit));
}

} // namespace VirtualDevice
