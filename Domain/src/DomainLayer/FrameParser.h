// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "Domain/src/DomainLayer/FrameChecksum.h"

#include <QByteArrayView>
#include <QtEndian>

#include <cstring>
#include <vector>

namespace Domain
{

/// The wire frame of the radio microcontroller's line. All 16-bit fields are big-endian.
///
/// | Offset | Size | Field           | Value                                            |
/// |--------|------|-----------------|--------------------------------------------------|
/// | 0      | 1    | start byte      | 0x7C                                             |
/// | 1      | 2    | payload length  | 0 to 100 accepted                                |
/// | 3      | 2    | data checksum   | sum of the payload bytes, modulo 65536           |
/// | 5      | 2    | header checksum | sum of the bytes at offsets 0 to 4, modulo 65536 |
/// | 7      | n    | payload         |                                                  |
/// | 7+n    | 1    | end of packet   | 0x0A                                             |
namespace Frame
{

constexpr char startByte = 0x7C;
constexpr char endOfPacket = 0x0A;
constexpr qsizetype lengthOffset = 1;
constexpr qsizetype dataChecksumOffset = 3;
constexpr qsizetype headerChecksumOffset = 5;
constexpr qsizetype headerSize = 7;
constexpr qsizetype overhead = headerSize + 1;
constexpr qsizetype longestPayload = 100;

/// The 16-bit sum of the bytes, each taken as unsigned.
[[nodiscard]] quint16 checksumOf(QByteArrayView bytes);

[[nodiscard]] inline quint16 fieldAt(const char* bytes)
{
    return qFromBigEndian<quint16>(bytes);
}

} // namespace Frame

/// Finds whole, checked frames in a byte stream that may be damaged anywhere.
///
/// Threads: used by one thread at a time.
///
/// After every refusal the search goes on one byte behind the refused start byte, so no damage hides an intact frame
/// behind it. A partial frame waits for its rest without limit of time.
/// Cost: linear in the bytes appended, however they are divided. Memory: 16 KiB, or for as long as it takes to parse
/// them, what longer `append`s need.
class FrameParser
{
public:
    enum class Outcome
    {
        NeedsMoreBytes,
        FrameReceived,
        InvalidHeaderChecksum,
        PayloadTooLong,
        InvalidDataChecksum,
        MissingEndOfPacket
    };

    FrameParser();
    FrameParser(const FrameParser&) = delete;
    FrameParser& operator=(const FrameParser&) = delete;

    void append(QByteArrayView bytes);

    /// Calls `visit(Outcome, QByteArrayView payload)` for every frame and every refusal, in their order, until more
    /// bytes are needed, which is not told. The payload, empty for a refusal, is valid until the next `append`. The
    /// visitor may append and parse.
    template <typename Visitor> void parse(Visitor&& visit);

private:
    /// Room for many reads, so that what is left of one is seldom moved to the front; little enough to stay in the
    /// cache.
    static constexpr qsizetype usualCapacity = 16 * 1024;

    void makeRoom(qsizetype size);
    void shrink();
    void moveTo(qsizetype capacity);
    [[nodiscard]] static char* startByteIn(char* from, char* stop);
    [[nodiscard]] static Outcome judge(const char* frame, quint16 length, const char* stop);

    std::vector<char> buffer; ///< `position` to `end` is received and not yet parsed
    char* position = nullptr;
    char* end = nullptr;
    char* limit = nullptr;  ///< of what can be appended as it is; behind it is what the summing of a payload may read
    char* wanted = nullptr; ///< the `end` from which on there is something to do
};

inline void FrameParser::append(QByteArrayView bytes)
{
    constexpr qsizetype block = 16;
    const auto size = bytes.size();
    if (limit - end < size)
        makeRoom(size);
    // What one read of the line brings is too little to be worth a call. The last block overlaps the one before it.
    if (size >= block && size <= 4 * block) {
        for (qsizetype offset = 0; offset + block <= size; offset += block)
            std::memcpy(end + offset, bytes.data() + offset, block);
        std::memcpy(end + size - block, bytes.data() + size - block, block);
    } else if (size > 0) {
        std::memcpy(end, bytes.data(), static_cast<std::size_t>(size));
    }
    end += size;
}

inline char* FrameParser::startByteIn(char* from, char* stop)
{
    void* const found = std::memchr(from, Frame::startByte, static_cast<std::size_t>(stop - from));
    return found == nullptr ? stop : static_cast<char*>(found);
}

/// Of a header that is there and the frame of that length.
inline FrameParser::Outcome FrameParser::judge(const char* frame, quint16 length, const char* stop)
{
    const auto* const header = reinterpret_cast<const uchar*>(frame);
    const char* const payload = frame + Frame::headerSize;
    if (header[0] + header[1] + header[2] + header[3] + header[4] !=
        Frame::fieldAt(frame + Frame::headerChecksumOffset)) [[unlikely]]
        return Outcome::InvalidHeaderChecksum;
    if (length > Frame::longestPayload) [[unlikely]]
        return Outcome::PayloadTooLong;
    if (stop <= payload + length)
        return Outcome::NeedsMoreBytes;
    if (FrameChecksum::ofFirst(length, payload) != Frame::fieldAt(frame + Frame::dataChecksumOffset)) [[unlikely]]
        return Outcome::InvalidDataChecksum;
    if (payload[length] != Frame::endOfPacket) [[unlikely]]
        return Outcome::MissingEndOfPacket;
    return Outcome::FrameReceived;
}

template <typename Visitor> void FrameParser::parse(Visitor&& visit)
{
    // The visitor may change the members; between its calls they are worth keeping at hand.
    char* at = position;
    char* stop = end;
    char* need = wanted;
    while (need <= stop) {
        if (*at != Frame::startByte) [[unlikely]] {
            at = startByteIn(at, stop);
            need = at + Frame::headerSize;
            continue;
        }
        const auto length = Frame::fieldAt(at + Frame::lengthOffset);
        const auto outcome = judge(at, length, stop);
        if (outcome == Outcome::NeedsMoreBytes) {
            need = at + length + Frame::overhead;
            break;
        }
        const bool good = outcome == Outcome::FrameReceived;
        const QByteArrayView payload(at + Frame::headerSize, good ? length : 0);
        position = at + (good ? length + Frame::overhead : 1);
        wanted = position + Frame::headerSize;
        visit(outcome, payload);
        at = position;
        stop = end;
        need = wanted;
    }
    position = at;
    wanted = need;
    if (buffer.size() > usualCapacity) [[unlikely]]
        shrink();
}

} // namespace Domain
