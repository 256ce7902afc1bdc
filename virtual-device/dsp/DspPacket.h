// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/dsp/DspProtocol.h"

#include <QByteArray>
#include <QByteArrayView>

#include <optional>

namespace VirtualDevice
{

/// One packet of `/dev/dsplink`, as the DSP's side reads and writes it: kind (2 bytes), reserved (2), serial (4), then
/// the body; little-endian. No state; any thread.
struct DspPacket
{
    DspProtocol::PacketKind kind{};
    quint32 serial = 0;
    QByteArray body;

    /// Nothing when the packet is shorter than its header.
    [[nodiscard]] static std::optional<DspPacket> parsed(QByteArrayView packet);
    [[nodiscard]] static QByteArray reply(quint32 serial, DspProtocol::Status status, quint32 value = 0);
    /// A message of the firmware for a queue of the program: `data` behind the 20-byte message header.
    [[nodiscard]] static QByteArray message(quint32 queue, quint16 messageId, QByteArrayView data);
};

/// Type and length words in front of the data, as every message of the firmware has them.
[[nodiscard]] QByteArray dspData(quint32 type, QByteArrayView data, qint32 lengthError = 0);

/// The little-endian number at an offset; 0 where the bytes end before it.
[[nodiscard]] quint32 dspWord(QByteArrayView bytes, qsizetype offset);
[[nodiscard]] quint16 dspHalfWord(QByteArrayView bytes, qsizetype offset);
void appendDspWord(QByteArray& to, quint32 number);
void appendDspHalfWord(QByteArray& to, quint16 number);

} // namespace VirtualDevice
