// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/FrameParser.h"

#include <QtEndian>

#include <algorithm>
#include <array>
#include <cstring>

namespace Domain
{

namespace
{

/// Room for many reads, so that what is left of one is seldom moved to the front.
constexpr qsizetype usualCapacity = 64 * 1024;

/// Sixteen bytes of the line as eight lanes.
using Lanes [[gnu::vector_size(16)]] = quint16;
constexpr quint16 vectorSize = sizeof(Lanes);

/// The longest payload in whole vectors.
constexpr quint16 summedBytes = (Frame::longestPayload + vectorSize - 1) / vectorSize * vectorSize;

/// All ones, then all zeros: read from `summedBytes - n` on, it keeps the first n bytes.
constexpr auto keepMask = [] {
    std::array<uchar, 2 * summedBytes> mask{};
    std::fill_n(mask.begin(), summedBytes, uchar{0xFF});
    return mask;
}();

Lanes lanesAt(const void* bytes)
{
    Lanes lanes;
    std::memcpy(&lanes, bytes, sizeof lanes);
    return lanes;
}

/// The lanes' sum, modulo 65536, when two of them together do not exceed 16 bits.
quint16 sumOf(const Lanes& lanes)
{
    constexpr quint64 ones = 0x0001000100010001;
    std::array<quint64, 2> halves{};
    std::memcpy(halves.data(), &lanes, sizeof lanes);
    return static_cast<quint16>(((halves[0] + halves[1]) * ones) >> 48);
}

/// The sum of the first `length` of `summedBytes` readable bytes. Lengths on a line follow no pattern, and a loop that
/// ends with the payload costs more by its wrongly predicted end than adding zeros up to a fixed one.
quint16 checksumOfFirst(quint16 length, const char* bytes)
{
    const uchar* const mask = keepMask.data() + (summedBytes - length);
    Lanes sums{};
    for (quint16 offset = 0; offset < summedBytes; offset += vectorSize) {
        const Lanes kept = lanesAt(bytes + offset) & lanesAt(mask + offset);
        sums += (kept & 0xFF) + (kept >> 8);
    }
    return sumOf(sums);
}

quint16 fieldAt(const char* bytes)
{
    return qFromBigEndian<quint16>(bytes);
}

bool isHeaderValid(const char* header)
{
    const auto* const bytes = reinterpret_cast<const uchar*>(header);
    return bytes[0] + bytes[1] + bytes[2] + bytes[3] + bytes[4] == fieldAt(header + Frame::headerChecksumOffset);
}

} // namespace

quint16 Frame::checksumOf(QByteArrayView bytes)
{
    quint16 sum = 0;
    for (const char byte : bytes)
        sum = static_cast<quint16>(sum + static_cast<uchar>(byte));
    return sum;
}

void FrameParser::append(QByteArrayView bytes)
{
    if (capacity() - end < bytes.size() + summedBytes)
        makeRoom(bytes.size());
    std::copy(bytes.begin(), bytes.end(), buffer.data() + end);
    end += bytes.size();
}

/// Behind the bytes there is always as much as the summing of a payload may read.
void FrameParser::makeRoom(qsizetype size)
{
    std::copy(buffer.data() + position, buffer.data() + end, buffer.data());
    wanted -= position;
    end -= position;
    position = 0;
    receivedPayload = {};
    const auto needed = std::max(usualCapacity, end + size + summedBytes);
    if (needed > capacity())
        buffer.resize(static_cast<std::size_t>(needed));
}

inline bool FrameParser::findStartByte()
{
    const char* const unparsed = buffer.data() + position;
    if (*unparsed == Frame::startByte)
        return true;
    const auto* const found = std::memchr(unparsed, Frame::startByte, static_cast<std::size_t>(end - position));
    if (found == nullptr)
        return false;
    position = static_cast<const char*>(found) - buffer.data();
    return true;
}

inline FrameParser::Outcome FrameParser::waitFor(qsizetype frameBytes)
{
    wanted = position + frameBytes;
    return Outcome::NeedsMoreBytes;
}

inline FrameParser::Outcome FrameParser::refuse(Outcome reason)
{
    ++position;
    wanted = position;
    return reason;
}

inline FrameParser::Outcome FrameParser::parsePayload(quint16 length)
{
    const char* const header = buffer.data() + position;
    const char* const payload = header + Frame::headerSize;
    if (checksumOfFirst(length, payload) != fieldAt(header + Frame::dataChecksumOffset))
        return refuse(Outcome::InvalidDataChecksum);
    if (payload[length] != Frame::endOfPacket)
        return refuse(Outcome::MissingEndOfPacket);
    receivedPayload = QByteArrayView(payload, length);
    position += length + Frame::overhead;
    wanted = position;
    return Outcome::FrameReceived;
}

FrameParser::Outcome FrameParser::parse()
{
    if (position == end || !findStartByte()) {
        if (capacity() > usualCapacity)
            buffer = {};
        position = end = 0;
        return waitFor(1);
    }
    if (end - position < Frame::headerSize)
        return waitFor(Frame::headerSize);
    const char* const header = buffer.data() + position;
    if (!isHeaderValid(header))
        return refuse(Outcome::InvalidHeaderChecksum);
    const auto length = fieldAt(header + Frame::lengthOffset);
    if (length > Frame::longestPayload)
        return refuse(Outcome::PayloadTooLong);
    if (end - position < length + Frame::overhead)
        return waitFor(length + Frame::overhead);
    return parsePayload(length);
}

} // namespace Domain
