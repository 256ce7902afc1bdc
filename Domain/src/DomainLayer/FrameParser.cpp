// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/FrameParser.h"

#include <algorithm>

namespace Domain
{

static_assert(FrameChecksum::summedBytes >= Frame::longestPayload);

quint16 Frame::checksumOf(QByteArrayView bytes)
{
    quint16 sum = 0;
    for (const char byte : bytes)
        sum = static_cast<quint16>(sum + static_cast<uchar>(byte));
    return sum;
}

FrameParser::FrameParser()
{
    moveTo(usualCapacity);
}

void FrameParser::makeRoom(qsizetype size)
{
    const qsizetype pending = end - position;
    const auto capacity = static_cast<qsizetype>(buffer.size());
    const bool fits = pending + size + FrameChecksum::summedBytes <= capacity;
    moveTo(fits ? capacity : 2 * pending + size + FrameChecksum::summedBytes);
}

void FrameParser::shrink()
{
    moveTo(usualCapacity);
}

/// What is not parsed yet goes to the front of the buffer, or of another one if that has not the right size.
void FrameParser::moveTo(qsizetype capacity)
{
    const qsizetype pending = end - position;
    const qsizetype expected = wanted - position;
    if (capacity == static_cast<qsizetype>(buffer.size())) {
        std::copy(position, end, buffer.data());
    } else {
        std::vector<char> other(static_cast<std::size_t>(capacity));
        std::copy(position, end, other.data());
        buffer.swap(other);
    }
    position = buffer.data();
    end = position + pending;
    wanted = position + std::max(expected, Frame::headerSize);
    limit = position + capacity - FrameChecksum::summedBytes;
}

} // namespace Domain
