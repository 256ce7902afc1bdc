// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/PairingUpgradeData.h"

#include "utilities/Debug.h"

#include <QDataStream>
#include <QIODevice>
#include <QSharedData>

#include <limits>

namespace Domain
{

using Utilities::Debug;

namespace
{

constexpr qint64 headerSize = 7;
constexpr quint32 maximumAddress = 0xFFFFFF;

int readAddress(QDataStream& stream)
{
    quint8 high = 0;
    quint16 low = 0;
    stream >> high >> low;
    return (high << 16) | low;
}

void writeAddress(QDataStream& stream, int address)
{
    auto number = static_cast<quint32>(address);
    if (number > maximumAddress) {
        Debug::warningMessage(__FILE__, __LINE__,
                              QStringLiteral("Address %1 exceeds max address %2").arg(address).arg(maximumAddress));
        number = 0;
    }
    stream << static_cast<quint8>(number >> 16U) << static_cast<quint16>(number & 0xFFFFU);
}

QByteArray readRest(QDataStream& stream, qint64 size)
{
    const int length = static_cast<int>(qMin<qint64>(size, std::numeric_limits<int>::max()));
    QByteArray data(length, Qt::Uninitialized);
    data.resize(qMax(stream.readRawData(data.data(), length), 0));
    return data;
}

} // namespace

struct PairingUpgradeData::PrivateData : QSharedData
{
    bool headerValid = false;
    bool dataValid = false;
    int sourceAddress = 0;
    int destinationAddress = 0;
    Command command{};
    QByteArray data;
};

PairingUpgradeData::PairingUpgradeData() : privateData(new PrivateData) {}

PairingUpgradeData::PairingUpgradeData(int sourceAddress, int destinationAddress, Command command,
                                       const QByteArray& data)
    : privateData(new PrivateData)
{
    privateData->headerValid = true;
    privateData->dataValid = true;
    privateData->sourceAddress = sourceAddress;
    privateData->destinationAddress = destinationAddress;
    privateData->command = command;
    privateData->data = data;
}

PairingUpgradeData::~PairingUpgradeData() = default;
PairingUpgradeData::PairingUpgradeData(const PairingUpgradeData& other) = default;
PairingUpgradeData& PairingUpgradeData::operator=(const PairingUpgradeData& other) = default;

bool PairingUpgradeData::isValid() const
{
    return privateData->headerValid && privateData->dataValid;
}

int PairingUpgradeData::sourceAddress() const
{
    return privateData->sourceAddress;
}

int PairingUpgradeData::destinationAddress() const
{
    return privateData->destinationAddress;
}

PairingUpgradeData::Command PairingUpgradeData::command() const
{
    return privateData->command;
}

QByteArray PairingUpgradeData::data() const
{
    return privateData->data;
}

QByteArray PairingUpgradeData::toByteArray() const
{
    QByteArray bytes;
    QDataStream stream(&bytes, QIODevice::WriteOnly);
    stream << *this;
    return bytes;
}

PairingUpgradeData::operator QString() const
{
    const auto address = [](int number) {
        return QStringLiteral("%1").arg(static_cast<quint32>(number), 6, 16, QLatin1Char('0'));
    };
    return QStringLiteral("Source Address: 0x%1, Destination Address: 0x%2, Command: %3, Data: ")
               .arg(address(sourceAddress()), address(destinationAddress()))
               .arg(static_cast<int>(command())) +
           QString::fromLatin1(data().toHex());
}

QDataStream& operator<<(QDataStream& stream, const PairingUpgradeData& packet)
{
    writeAddress(stream, packet.sourceAddress());
    writeAddress(stream, packet.destinationAddress());
    stream << static_cast<quint8>(packet.command());
    const QByteArray data = packet.data();
    stream.writeRawData(data.constData(), static_cast<int>(data.size()));
    return stream;
}

QDataStream& operator>>(QDataStream& stream, PairingUpgradeData& packet)
{
    const QIODevice* const device = stream.device();
    const qint64 left = device != nullptr ? device->size() - device->pos() : 0;
    if (left < headerSize) {
        Debug::warningMessage(__FILE__, __LINE__,
                              QStringLiteral("Attempt to read pairing/upgrade data from stream of insufficient size"));
        return stream;
    }
    PairingUpgradeData::PrivateData& fields = *packet.privateData;
    fields.sourceAddress = readAddress(stream);
    fields.destinationAddress = readAddress(stream);
    quint8 command = 0;
    stream >> command;
    fields.command = static_cast<PairingUpgradeData::Command>(command);
    fields.headerValid = true;
    fields.data = readRest(stream, left - headerSize);
    fields.dataValid = true;
    return stream;
}

} // namespace Domain
