// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QSharedDataPointer>

class QDataStream;

namespace Domain
{

/// One entry of the beacon that the radio microcontroller transmits: a type and a value.
///
/// An implicitly shared value: copies may live in different threads.
///
/// Wire form, 2 bytes:
///
/// | Offset | Content                                          |
/// |--------|--------------------------------------------------|
/// | 0      | bits 7 to 3: low 5 bits of the type; others zero |
/// | 1      | value                                            |
///
/// A packet from bytes of another length is logged and still valid: its bytes are the first two, a missing one zero.
class BeaconPacket
{
public:
    /// 0 to 31, defined by the microcontroller's firmware: every value passes through unchanged, cut to 5 bits on the
    /// wire only.
    enum PacketType : quint8
    {
    };

    /// Invalid; on the wire two zero bytes.
    BeaconPacket();
    BeaconPacket(PacketType type, unsigned char value);
    explicit BeaconPacket(const QByteArray& bytes);
    BeaconPacket(const BeaconPacket& other);
    BeaconPacket& operator=(const BeaconPacket& other);
    ~BeaconPacket();

    [[nodiscard]] bool isValid() const;
    [[nodiscard]] QByteArray toByteArray() const;

private:
    class PrivateData;

    QSharedDataPointer<PrivateData> data;
};

/// The 2 bytes of the wire form without a length. What a stream cannot give is read as zero.
QDataStream& operator<<(QDataStream& stream, const BeaconPacket& packet);
QDataStream& operator>>(QDataStream& stream, BeaconPacket& packet);

} // namespace Domain
