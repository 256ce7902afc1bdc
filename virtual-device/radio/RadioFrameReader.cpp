// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/radio/RadioFrameReader.h"

#include "virtual-device/radio/RadioFrame.h"
#include "virtual-device/radio/RadioProtocol.h"

#include <QtEndian>

namespace VirtualDevice
{

using namespace RadioProtocol;

QList<RadioFrameReader::Event> RadioFrameReader::feed(QByteArrayView bytes)
{
    buffer.append(bytes);
    QList<Event> events;
    while (const auto event = next())
        events.append(*event);
    buffer.remove(0, cursor);
    cursor = 0;
    return events;
}

void RadioFrameReader::clear()
{
    buffer.clear();
    cursor = 0;
    inSync = true;
}

std::optional<RadioFrameReader::Event> RadioFrameReader::next()
{
    while (cursor < buffer.size()) {
        auto event = examined();
        if (!event)
            return std::nullopt;
        if (event->finding == Finding::Frame) {
            skip(event->length + static_cast<qsizetype>(envelopeSize));
            inSync = true;
            return event;
        }
        skip(1);
        if (std::exchange(inSync, false))
            return event;
    }
    return std::nullopt;
}

/// What stands at the cursor; nothing while too little has come to tell.
std::optional<RadioFrameReader::Event> RadioFrameReader::examined()
{
    const QByteArrayView rest = QByteArrayView(buffer).sliced(cursor);
    if (static_cast<quint8>(rest.front()) != startByte)
        return Event{Finding::StrayBytes, {}, 0};
    const auto header = static_cast<qsizetype>(headerSize);
    if (rest.size() < header)
        return std::nullopt;
    const int length = qFromBigEndian<quint16>(rest.data() + 1);
    if (qFromBigEndian<quint16>(rest.data() + 5) != radioChecksum(rest.first(5)))
        return Event{Finding::BadHeaderChecksum, {}, length};
    if (length > static_cast<int>(longestPayload))
        return Event{Finding::LengthOverLimit, {}, length};
    if (rest.size() < length + static_cast<qsizetype>(envelopeSize))
        return std::nullopt;
    const QByteArrayView payload = rest.sliced(header, length);
    if (qFromBigEndian<quint16>(rest.data() + 3) != radioChecksum(payload))
        return Event{Finding::BadDataChecksum, {}, length};
    if (static_cast<quint8>(rest[header + length]) != endByte)
        return Event{Finding::BadEndByte, {}, length};
    return Event{Finding::Frame, payload.toByteArray(), length};
}

} // namespace VirtualDevice
