// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArrayView>

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

} // namespace Frame

/// Finds whole, checked frames in a byte stream that may be damaged anywhere.
///
/// Threads: used by one thread at a time.
///
/// After every refusal the search goes on one byte behind the refused start byte, so no damage hides an intact frame
/// behind it. A partial frame waits for its rest without limit of time.
/// Cost: linear in the bytes appended, however they are divided. Memory: 64 KiB, or for as long as it takes to parse
/// it, a longer `append`.
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

    void append(QByteArrayView bytes);

    /// Goes on to the next frame or refusal. `payload` holds the frame's payload until the next `append` or `advance`.
    [[nodiscard]] Outcome advance() { return end < wanted ? Outcome::NeedsMoreBytes : parse(); }
    [[nodiscard]] QByteArrayView payload() const { return receivedPayload; }

private:
    [[nodiscard]] qsizetype capacity() const { return static_cast<qsizetype>(buffer.size()); }
    void makeRoom(qsizetype size);
    [[nodiscard]] bool findStartByte();
    [[nodiscard]] Outcome parse();
    [[nodiscard]] Outcome parsePayload(quint16 length);
    [[nodiscard]] Outcome waitFor(qsizetype frameBytes);
    [[nodiscard]] Outcome refuse(Outcome reason);

    std::vector<char> buffer; ///< storage; `position` to `end` are filled and not yet parsed
    qsizetype position = 0;
    qsizetype end = 0;
    qsizetype room = 0;   ///< what can be appended as it is
    qsizetype wanted = 1; ///< the `end` from which on there is something to do
    QByteArrayView receivedPayload;
};

} // namespace Domain
