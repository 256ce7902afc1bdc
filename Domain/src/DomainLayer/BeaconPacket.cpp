// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/BeaconPacket.h"

#include "utilities/Debug.h"

#include <QDataStream>
#include <QSharedData>

namespace Domain
{

namespace
{

constexpr qsizetype wireSize = 2;
constexpr int typeShift = 3;

quint8 byteAt(const QByteArray& bytes, qsizetype index)
{
    return index < bytes.size() ? static_cast<quint8>(bytes.at(index)) : quint8(0);
}

} // namespace

class BeaconPacket::PrivateData : public QSharedData
{
public:
    PrivateData(PacketType packetType, quint8 packetValue) : type(packetType), value(packetValue) {}

    bool valid = true;
    PacketType type;
    quint8 value;
};

BeaconPacket::BeaconPacket() = default;

BeaconPacket::BeaconPacket(PacketType type, unsigned char value) : data(new PrivateData(type, value)) {}

BeaconPacket::BeaconPacket(const QByteArray& bytes)
{
    if (bytes.size() != wireSize) {
        Utilities::Debug::warningMessage(
            __FILE__, __LINE__,
            QStringLiteral("Attempt to create beacon packet from byte array of incorrect length %1. Expected %2")
                .arg(bytes.size())
                .arg(wireSize));
    }
    data = new PrivateData(static_cast<PacketType>(byteAt(bytes, 0) >> typeShift), byteAt(bytes, 1));
}

BeaconPacket::BeaconPacket(const BeaconPacket& other) = default;
BeaconPacket& BeaconPacket::operator=(const BeaconPacket& other) = default;
BeaconPacket::~BeaconPacket() = default;

bool BeaconPacket::isValid() const
{
    return data && data->valid;
}

QByteArray BeaconPacket::toByteArray() const
{
    QByteArray bytes(wireSize, '\0');
    if (data) {
        bytes[0] = static_cast<char>(data->type << typeShift);
        bytes[1] = static_cast<char>(data->value);
    }
    return bytes;
}

QDataStream& operator<<(QDataStream& stream, const BeaconPacket& packet)
{
    stream.writeRawData(packet.toByteArray().constData(), wireSize);
    return stream;
}

QDataStream& operator>>(QDataStream& stream, BeaconPacket& packet)
{
    QByteArray bytes(wireSize, '\0');
    stream.readRawData(bytes.data(), wireSize);
    packet = BeaconPacket(bytes);
    return stream;
}

} // namespace Domain
