// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/WirelessSensorReading.h"

#include "utilities/Debug.h"

#include <QByteArrayView>
#include <QDataStream>
#include <QSharedData>

#include <algorithm>

namespace Domain
{

using Utilities::Debug;

namespace
{

constexpr qsizetype slotHeaderSize = 5;
constexpr uchar lastType0 = 30;
constexpr uchar type31 = 31;
constexpr qsizetype expectedChannels = 4;
constexpr uchar pin1Bit = 1;
constexpr uchar pin2Bit = 2;

// Type 0, for an upsample ratio of 1.
constexpr qint64 fastChannelSize = 54;
constexpr qint64 slowChannels = 3;
constexpr qint64 slowSamples = 2;
constexpr qint64 type0Size = fastChannelSize + slowChannels * slowSamples;

constexpr qint64 type31Size = 6;

bool isWithin(const QByteArray& data, qint64 position, qint64 size)
{
    if (position < 0) {
        Debug::warningMessage(__FILE__, __LINE__, QStringLiteral("Data position is negative"));
        return false;
    }
    // A position and a size from outside may overflow in 32 bits.
    if (position + size > data.size()) {
        Debug::warningMessage(__FILE__, __LINE__,
                              QStringLiteral("Not enough data in byte array (available %1, required %2)")
                                  .arg(data.size())
                                  .arg(position + size));
        return false;
    }
    return true;
}

bool isLongEnough(QByteArrayView data, qint64 required)
{
    if (data.size() >= required)
        return true;
    Debug::warningMessage(__FILE__, __LINE__,
                          QStringLiteral("Data size %1 too small, required = %2").arg(data.size()).arg(required));
    return false;
}

bool parseType0(QByteArrayView data, int upsampleRatio, QVector<QByteArray>& channels)
{
    if (!isLongEnough(data, type0Size * upsampleRatio))
        return false;
    const qint64 ratio = std::max(upsampleRatio, 0);
    channels.append(data.first(fastChannelSize * ratio).toByteArray());
    const char* const triplets = data.data() + fastChannelSize * ratio;
    for (qint64 channel = 0; channel < slowChannels; ++channel) {
        QByteArray samples(slowSamples * ratio, Qt::Uninitialized);
        char* sample = samples.data();
        for (qint64 triplet = 0; triplet < slowSamples * ratio; ++triplet)
            sample[triplet] = triplets[slowChannels * triplet + channel];
        channels.append(std::move(samples));
    }
    return true;
}

bool parseType31(QByteArrayView data, QVector<QByteArray>& channels)
{
    if (!isLongEnough(data, type31Size))
        return false;
    channels.append(data.sliced(0, 3).toByteArray());
    channels.append(data.sliced(3, 2).toByteArray());
    channels.append(data.sliced(5, 1).toByteArray());
    return true;
}

} // namespace

struct WirelessSensorReading::PrivateData : QSharedData
{
    [[nodiscard]] bool parse(const QByteArray& data, qint64 position, qint64 size);
    [[nodiscard]] bool parseChannels(QByteArrayView data);

    bool valid = false;
    quint16 frameNumber = 0;
    int upsampleRatio = 0;
    uchar sensorNumber = 0;
    uchar sensorType = 0;
    bool pin1IsSet = false;
    bool pin2IsSet = false;
    uchar batteryLevel = 0;
    uchar signalStrength = 0;
    QVector<QByteArray> channelData;
};

bool WirelessSensorReading::PrivateData::parse(const QByteArray& data, qint64 position, qint64 size)
{
    if (!isWithin(data, position, size))
        return false;
    if (size < slotHeaderSize) {
        Debug::warningMessage(__FILE__, __LINE__,
                              QStringLiteral("Sensor data size %1 is too small for a valid reading").arg(size));
        return false;
    }
    const auto slot = QByteArrayView(data).sliced(position, size);
    if (slot[0] == 0)
        return false;
    sensorType = static_cast<uchar>(slot[1]);
    batteryLevel = static_cast<uchar>(slot[2]);
    signalStrength = static_cast<uchar>(slot[3]);
    pin1IsSet = (slot[4] & pin1Bit) != 0;
    pin2IsSet = (slot[4] & pin2Bit) != 0;
    channelData.reserve(expectedChannels);
    return parseChannels(slot.sliced(slotHeaderSize));
}

bool WirelessSensorReading::PrivateData::parseChannels(QByteArrayView data)
{
    if (sensorType > type31) {
        Debug::warningMessage(
            __FILE__, __LINE__,
            QStringLiteral("Attempt to construct WirelessSensorReading with invalid type %1").arg(sensorType));
        return false;
    }
    const bool isType0 = sensorType <= lastType0;
    if (isType0 ? parseType0(data, upsampleRatio, channelData) : parseType31(data, channelData))
        return true;
    Debug::warningMessage(__FILE__, __LINE__,
                          QStringLiteral("Could not parse type %1 channel data.").arg(isType0 ? 0 : 31));
    return false;
}

WirelessSensorReading::WirelessSensorReading() = default;
WirelessSensorReading::~WirelessSensorReading() = default;
WirelessSensorReading::WirelessSensorReading(const WirelessSensorReading& other) = default;
WirelessSensorReading& WirelessSensorReading::operator=(const WirelessSensorReading& other) = default;

WirelessSensorReading::WirelessSensorReading(quint16 frameNumber, int upsampleRatio, uchar sensorNumber,
                                             uchar sensorType, bool pin1IsSet, bool pin2IsSet, uchar batteryLevel,
                                             uchar signalStrength, const QVector<QByteArray>& channelData)
    : privateData(new PrivateData)
{
    PrivateData& fields = *privateData;
    fields.valid = true;
    fields.frameNumber = frameNumber;
    fields.upsampleRatio = upsampleRatio;
    fields.sensorNumber = sensorNumber;
    fields.sensorType = sensorType;
    fields.pin1IsSet = pin1IsSet;
    fields.pin2IsSet = pin2IsSet;
    fields.batteryLevel = batteryLevel;
    fields.signalStrength = signalStrength;
    fields.channelData = channelData;
}

WirelessSensorReading::WirelessSensorReading(uchar sensorNumber, quint16 frameNumber, int upsampleRatio,
                                             const QByteArray& data, int position, int size)
    : privateData(new PrivateData)
{
    PrivateData& fields = *privateData;
    fields.sensorNumber = sensorNumber;
    fields.frameNumber = frameNumber;
    fields.upsampleRatio = upsampleRatio;
    fields.valid = fields.parse(data, position, size);
}

bool WirelessSensorReading::isValid() const
{
    return privateData && privateData->valid;
}

quint16 WirelessSensorReading::frameNumber() const
{
    return privateData ? privateData->frameNumber : quint16{0};
}

int WirelessSensorReading::upsampleRatio() const
{
    return privateData ? privateData->upsampleRatio : 0;
}

uchar WirelessSensorReading::sensorNumber() const
{
    return privateData ? privateData->sensorNumber : uchar{0};
}

uchar WirelessSensorReading::sensorType() const
{
    return privateData ? privateData->sensorType : uchar{0};
}

bool WirelessSensorReading::pin1IsSet() const
{
    return privateData && privateData->pin1IsSet;
}

bool WirelessSensorReading::pin2IsSet() const
{
    return privateData && privateData->pin2IsSet;
}

uchar WirelessSensorReading::batteryLevel() const
{
    return privateData ? privateData->batteryLevel : uchar{0};
}

uchar WirelessSensorReading::signalStrength() const
{
    return privateData ? privateData->signalStrength : uchar{0};
}

const QVector<QByteArray>& WirelessSensorReading::channelData() const
{
    static const QVector<QByteArray> none;
    return privateData ? privateData->channelData : none;
}

void WirelessSensorReading::setChannelData(const QVector<QByteArray>& channelData)
{
    if (!privateData)
        privateData = new PrivateData;
    privateData->channelData = channelData;
}

QDataStream& operator<<(QDataStream& stream, const WirelessSensorReading& reading)
{
    const auto& channels = reading.channelData();
    qsizetype count = slotHeaderSize + channels.size();
    for (const QByteArray& channel : channels)
        count += channel.size();
    const int flags = (reading.pin1IsSet() ? pin1Bit : 0) | (reading.pin2IsSet() ? pin2Bit : 0);
    stream << static_cast<qint8>(count) << static_cast<qint8>(reading.sensorNumber())
           << static_cast<qint8>(reading.sensorType()) << static_cast<qint8>(reading.batteryLevel())
           << static_cast<qint8>(reading.signalStrength()) << static_cast<qint8>(flags);
    for (const QByteArray& channel : channels) {
        stream << static_cast<qint8>(channel.size());
        stream.writeRawData(channel.constData(), static_cast<int>(channel.size()));
    }
    return stream;
}

} // namespace Domain
