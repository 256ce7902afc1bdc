// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/dsp/DspPacket.h"

#include <QtEndian>

namespace VirtualDevice
{

using namespace DspProtocol;

namespace
{

template <typename Number> Number numberAt(QByteArrayView bytes, qsizetype offset)
{
    if (offset + static_cast<qsizetype>(sizeof(Number)) > bytes.size())
        return 0;
    return qFromLittleEndian<Number>(bytes.data() + offset);
}

template <typename Number> void appendNumber(QByteArray& to, Number number)
{
    std::array<char, sizeof(Number)> bytes{};
    qToLittleEndian(number, bytes.data());
    to.append(bytes.data(), bytes.size());
}

QByteArray header(PacketKind kind, quint32 serial)
{
    QByteArray packet;
    appendDspHalfWord(packet, static_cast<quint16>(kind));
    appendDspHalfWord(packet, 0);
    appendDspWord(packet, serial);
    return packet;
}

} // namespace

quint32 dspWord(QByteArrayView bytes, qsizetype offset)
{
    return numberAt<quint32>(bytes, offset);
}

quint16 dspHalfWord(QByteArrayView bytes, qsizetype offset)
{
    return numberAt<quint16>(bytes, offset);
}

void appendDspWord(QByteArray& to, quint32 number)
{
    appendNumber(to, number);
}

void appendDspHalfWord(QByteArray& to, quint16 number)
{
    appendNumber(to, number);
}

std::optional<DspPacket> DspPacket::parsed(QByteArrayView packet)
{
    if (packet.size() < packetHeaderSize)
        return std::nullopt;
    return DspPacket{static_cast<PacketKind>(dspHalfWord(packet, 0)), dspWord(packet, 4),
                     packet.sliced(packetHeaderSize).toByteArray()};
}

QByteArray DspPacket::reply(quint32 serial, Status status, quint32 value)
{
    QByteArray packet = header(PacketKind::Reply, serial);
    appendDspWord(packet, static_cast<quint32>(status));
    appendDspWord(packet, value);
    return packet;
}

QByteArray DspPacket::message(quint32 queue, quint16 messageId, QByteArrayView data)
{
    QByteArray packet = header(PacketKind::Message, 0);
    appendDspWord(packet, queue);
    packet.append(8, '\0');       // the library's link words
    appendDspHalfWord(packet, 0); // from the DSP
    appendDspHalfWord(packet, 0); // pool
    appendDspHalfWord(packet, static_cast<quint16>(messageHeaderSize + data.size()));
    appendDspHalfWord(packet, static_cast<quint16>(queue & 0xFFFFU));
    appendDspHalfWord(packet, 0xFFFF); // no queue for answers
    appendDspHalfWord(packet, messageId);
    packet.append(data);
    return packet;
}

QByteArray dspData(quint32 type, QByteArrayView data, qint32 lengthError)
{
    QByteArray message;
    appendDspWord(message, type);
    appendDspWord(message, static_cast<quint32>(data.size()) + static_cast<quint32>(lengthError));
    message.append(data);
    return message;
}

} // namespace VirtualDevice
