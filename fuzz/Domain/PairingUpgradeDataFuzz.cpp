// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/PairingUpgradeData.h"

#include <QDataStream>
#include <QIODevice>

#include <cstdint>
#include <cstdlib>

// Any packet: seven bytes and more are valid and come out again as they went in.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* bytes, std::size_t size)
{
    const QByteArray data(reinterpret_cast<const char*>(bytes), static_cast<qsizetype>(size));
    Domain::PairingUpgradeData packet;
    QDataStream stream(data);
    stream >> packet;
    constexpr qsizetype smallest = 7;
    if (packet.isValid() != (data.size() >= smallest))
        std::abort();
    if (packet.isValid() && packet.toByteArray() != data)
        std::abort();
    if (!QString(packet).endsWith(QString::fromLatin1(packet.data().toHex())))
        std::abort();
    return 0;
}
