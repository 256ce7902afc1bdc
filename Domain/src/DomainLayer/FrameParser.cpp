// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/FrameParser.h"

#include <QtEndian>

#include <algorithm>
#include <cstring>

namespace Domain
{

namespace
{

/// Room for many reads, so that what is left of one is seldom moved to the front.
constexpr qsizetype usualCapacity = 64 * 1024;

using Word = quint64;
constexpr qsizetype wordSize = sizeof(Word);

Word wordAt(const char* bytes)
{
    return qFromLittleEndian<Word>(bytes);
}

/// The eight bytes of a word added up in four lanes of 16 bits.
Word lanesOf(Word word)
{
    constexpr Word lowBytes = 0x00FF00FF00FF00FF;
    return (word & lowBytes) + ((word >> 8) & lowBytes);
}

/// The lanes' sum, modulo 65536.
quint16 sumOfLanes(Word lanes)
{
    constexpr Word ones = 0x0001000100010001;
    return static_cast<quint16>((lanes * ones) >> 48);
}

} // namespace

/// Eight bytes at a time: most of what the parser does is adding up.
quint16 Frame::checksumOf(QByteArrayView bytes)
{
    // A lane holds 255 * 2 for each of so many words.
    constexpr qsizetype block = 128 * wordSize;
    quint16 sum = 0;
    const char* next = bytes.data();
    qsizetype left = bytes.size();
    while (left >= wordSize) {
        Word lanes = 0;
        for (const char* const end = next + std::min(left, block) / wordSize * wordSize; next != end; next += wordSize)
            lanes += lanesOf(wordAt(next));
        sum = static_cast<quint16>(sum + sumOfLanes(lanes));
        left = bytes.data() + bytes.size() - next;
    }
    for (; left > 0; --left)
        sum = static_cast<quint16>(sum + static_cast<uchar>(*next++));
    return sum;
}

void FrameParser::append(QByteArrayView bytes)
{
    makeRoom(bytes.size());
    std::copy(bytes.begin(), bytes.end(), buffer.data() + end);
    end += bytes.size();
}

void FrameParser::makeRoom(qsizetype size)
{
    if (buffer.size() - end >= size)
        return;
    std::copy(unparsed(), unparsed() + available(), buffer.data());
    end = available();
    position = 0;
    buffer.resize(std::max(usualCapacity, end + size));
    receivedPayload = {};
}

FrameParser::Outcome FrameParser::advance()
{
    switch (state) {
    case State::SeekingStartByte:
        return seekStartByte();
    case State::ReadingHeader:
        return readHeader();
    case State::ReadingPayload:
        break;
    }
    return readPayload();
}

quint16 FrameParser::fieldAt(qsizetype offset) const
{
    return qFromBigEndian<quint16>(unparsed() + offset);
}

FrameParser::Outcome FrameParser::seekStartByte()
{
    if (available() > 0 && *unparsed() != Frame::startByte) {
        const auto* const found = std::memchr(unparsed(), Frame::startByte, static_cast<std::size_t>(available()));
        position = found == nullptr ? end : static_cast<const char*>(found) - buffer.constData();
    }
    if (available() == 0) {
        position = end = 0;
        if (buffer.size() > usualCapacity)
            buffer = QByteArray();
        return Outcome::NeedsMoreBytes;
    }
    state = State::ReadingHeader;
    return readHeader();
}

FrameParser::Outcome FrameParser::readHeader()
{
    if (available() < Frame::headerSize)
        return Outcome::NeedsMoreBytes;
    const auto* const bytes = reinterpret_cast<const uchar*>(unparsed());
    if (bytes[0] + bytes[1] + bytes[2] + bytes[3] + bytes[4] != fieldAt(Frame::headerChecksumOffset))
        return refuse(Outcome::InvalidHeaderChecksum);
    payloadLength = fieldAt(Frame::lengthOffset);
    dataChecksum = fieldAt(Frame::dataChecksumOffset);
    if (payloadLength > Frame::longestPayload)
        return refuse(Outcome::PayloadTooLong);
    state = State::ReadingPayload;
    return readPayload();
}

FrameParser::Outcome FrameParser::readPayload()
{
    if (available() < payloadLength + Frame::overhead)
        return Outcome::NeedsMoreBytes;
    const QByteArrayView payload(unparsed() + Frame::headerSize, payloadLength);
    if (Frame::checksumOf(payload) != dataChecksum)
        return refuse(Outcome::InvalidDataChecksum);
    if (*payload.end() != Frame::endOfPacket)
        return refuse(Outcome::MissingEndOfPacket);
    receivedPayload = payload;
    position += payloadLength + Frame::overhead;
    state = State::SeekingStartByte;
    return Outcome::FrameReceived;
}

FrameParser::Outcome FrameParser::refuse(Outcome reason)
{
    ++position;
    state = State::SeekingStartByte;
    return reason;
}

} // namespace Domain
