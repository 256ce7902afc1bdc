// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "Domain/src/DomainLayer/AbstractSensorReading.h"

#include <QByteArray>
#include <QSharedDataPointer>
#include <QVector>

class QDataStream;

namespace Domain
{

/// One wireless sensor's slot of a sensor-data message: header fields and one byte array for each channel, the samples
/// raw as received. A value, copied cheaply; a default-constructed one holds nothing and is invalid.
///
/// Slot (S bytes, S = a sixteenth of the readings block):
///
/// | Offset | Size  | Field                                                    |
/// |--------|-------|----------------------------------------------------------|
/// | 0      | 1     | presence: 0 = empty slot, nothing else of it is read     |
/// | 1      | 1     | sensor type                                              |
/// | 2      | 1     | battery level, raw                                       |
/// | 3      | 1     | signal strength, raw                                     |
/// | 4      | 1     | flags: bit 0 pin 1, bit 1 pin 2                          |
/// | 5      | S - 5 | channel data                                             |
///
/// | Sensor type | Channel data (r = upsample ratio)                                                          |
/// |-------------|--------------------------------------------------------------------------------------------|
/// | 0 to 30     | at least 60 r bytes: 54 r of channel 0, then 2 r triplets, one byte each of channels 1 to 3 |
/// | 31          | at least 6 bytes: 3 of channel 0, 2 of channel 1, 1 of channel 2                           |
/// | 32 to 255   | rejected                                                                                   |
///
/// Threads: a value; its shared data are counted atomically, so copies may go to other threads.
///
/// Errors: a slot that cannot be read is logged and gives an invalid reading that keeps the fields read so far.
class WirelessSensorReading : public AbstractSensorReading
{
public:
    WirelessSensorReading();
    /// Valid, with the values as given.
    WirelessSensorReading(quint16 frameNumber, int upsampleRatio, uchar sensorNumber, uchar sensorType, bool pin1IsSet,
                          bool pin2IsSet, uchar batteryLevel, uchar signalStrength,
                          const QVector<QByteArray>& channelData);
    /// Reads the slot of `size` bytes at `position` of `data`.
    WirelessSensorReading(uchar sensorNumber, quint16 frameNumber, int upsampleRatio, const QByteArray& data,
                          int position, int size);
    ~WirelessSensorReading() override;
    WirelessSensorReading(const WirelessSensorReading& other);
    WirelessSensorReading& operator=(const WirelessSensorReading& other);

    [[nodiscard]] quint16 frameNumber() const override;
    [[nodiscard]] int upsampleRatio() const override;

    [[nodiscard]] bool isValid() const;
    /// Slot index, 0 to 15.
    [[nodiscard]] uchar sensorNumber() const;
    [[nodiscard]] uchar sensorType() const;
    [[nodiscard]] bool pin1IsSet() const;
    [[nodiscard]] bool pin2IsSet() const;
    [[nodiscard]] uchar batteryLevel() const;
    [[nodiscard]] uchar signalStrength() const;
    /// Good until the reading is changed or destroyed.
    [[nodiscard]] const QVector<QByteArray>& channelData() const;

    void setChannelData(const QVector<QByteArray>& channelData);

private:
    struct PrivateData;
    QSharedDataPointer<PrivateData> privateData; ///< null in a default-constructed reading
};

/// Signed 8-bit items: count of the bytes that follow (modulo 256), sensor number, type, battery level, signal
/// strength, pin flags; then for each channel its length (modulo 256) and its bytes.
QDataStream& operator<<(QDataStream& stream, const WirelessSensorReading& reading);

} // namespace Domain
