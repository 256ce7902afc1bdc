// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/FrameParser.h"

#include <QtEndian>

#include <cstring>
#include <utility>

namespace Domain
{

namespace
{

/// A buffer that one large read has left behind is given back.
constexpr qsizetype keptCapacity = 64 * 1024;

} // namespace

quint16 Frame::checksumOf(QByteArrayView bytes)
{
    unsigned sum = 0;
    for (const char byte : bytes)
        sum += static_cast<uchar>(byte);
    return static_cast<quint16>(sum);
}

void FrameParser::append(QByteArray bytes)
{
    if (available() == 0) {
        buffer = std::move(bytes);
    } else {
        buffer.remove(0, position);
        if (buffer.capacity() > keptCapacity)
            buffer.squeeze();
        buffer.append(bytes);
    }
    position = 0;
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

QByteArrayView FrameParser::at(qsizetype offset, qsizetype size) const
{
    return {buffer.constData() + position + offset, size};
}

quint16 FrameParser::fieldAt(qsizetype offset) const
{
    return qFromBigEndian<quint16>(buffer.constData() + position + offset);
}

FrameParser::Outcome FrameParser::seekStartByte()
{
    const auto* const unparsed = buffer.constData() + position;
    const auto* const found =
        available() == 0 ? nullptr : std::memchr(unparsed, Frame::startByte, static_cast<std::size_t>(available()));
    if (found == nullptr) {
        buffer.clear();
        position = 0;
        return Outcome::NeedsMoreBytes;
    }
    position = static_cast<const char*>(found) - buffer.constData();
    state = State::ReadingHeader;
    return readHeader();
}

FrameParser::Outcome FrameParser::readHeader()
{
    if (available() < Frame::headerSize)
        return Outcome::NeedsMoreBytes;
    if (Frame::checksumOf(at(0, Frame::headerChecksumOffset)) != fieldAt(Frame::headerChecksumOffset))
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
    const auto payload = at(Frame::headerSize, payloadLength);
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
