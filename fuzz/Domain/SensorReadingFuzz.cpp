// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/WirelessSensorReading.h"

#include <QDataStream>
#include <QIODevice>

#include <cstdint>
#include <cstdlib>
#include <cstring>

// Any slot at any place of any data: what is valid has the shape of its type, what streams has the stated length.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* bytes, std::size_t size)
{
    int place[3]{}; // position, size, upsample ratio
    if (size < sizeof place)
        return 0;
    std::memcpy(place, bytes, sizeof place);
    const QByteArray data(reinterpret_cast<const char*>(bytes) + sizeof place,
                          static_cast<qsizetype>(size - sizeof place));
    const Domain::WirelessSensorReading reading(1, 2, place[2], data, place[0], place[1]);

    const qsizetype channels = reading.channelData().size();
    if (channels != (reading.isValid() ? (reading.sensorType() == 31 ? 3 : 4) : 0))
        std::abort();
    qsizetype expected = 6 + channels;
    for (const QByteArray& channel : reading.channelData())
        expected += channel.size();
    QByteArray streamed;
    QDataStream stream(&streamed, QIODevice::WriteOnly);
    stream << reading;
    if (streamed.size() != expected || expected > data.size() + 6 + 4)
        std::abort();
    return 0;
}
