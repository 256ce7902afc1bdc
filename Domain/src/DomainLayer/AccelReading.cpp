// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/AccelReading.h"

#include <QDataStream>
#include <QSharedData>

namespace Domain
{

namespace
{

constexpr int headerSize = 3;

}

class AccelReading::PrivateData : public QSharedData
{
public:
    quint16 frameNumber = 0;
    AbstractAccelerometer::AccelMode mode{};
    QByteArray channelData;
};

AccelReading::AccelReading() : data(new PrivateData) {}

AccelReading::AccelReading(quint16 frameNumber, AbstractAccelerometer::AccelMode mode) : data(new PrivateData)
{
    data->frameNumber = frameNumber;
    data->mode = mode;
}

AccelReading::AccelReading(const AccelReading& other) = default;
AccelReading& AccelReading::operator=(const AccelReading& other) = default;
AccelReading::~AccelReading() = default;

quint16 AccelReading::frameNumber() const
{
    return data->frameNumber;
}

AbstractAccelerometer::AccelMode AccelReading::mode() const
{
    return data->mode;
}

QByteArray AccelReading::channelData() const
{
    return data->channelData;
}

void AccelReading::setChannelData(const QByteArray& bytes)
{
    data->channelData = bytes;
}

int AccelReading::size() const
{
    return headerSize + static_cast<int>(data->channelData.size());
}

QDataStream& operator<<(QDataStream& stream, const AccelReading& reading)
{
    stream << reading.frameNumber() << quint8(reading.mode());
    const QByteArray channelData = reading.channelData();
    stream.writeRawData(channelData.constData(), static_cast<int>(channelData.size()));
    return stream;
}

} // namespace Domain
