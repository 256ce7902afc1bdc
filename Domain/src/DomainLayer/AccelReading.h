// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "Domain/src/DomainLayer/AbstractAccelerometer.h"

#include <QByteArray>
#include <QMetaType>
#include <QSharedDataPointer>

class QDataStream;

namespace Domain
{

/// One frame of accelerometer samples as the radio microcontroller reports it.
///
/// An implicitly shared value: copies may live in different threads and detach before a change.
///
/// Wire form, `size()` bytes:
///
/// | Offset | Size | Content                           |
/// |--------|------|-----------------------------------|
/// | 0      | 2    | frame number, big-endian          |
/// | 2      | 1    | mode                              |
/// | 3      | n    | channel data, raw, uninterpreted  |
class AccelReading
{
public:
    /// Frame 0 in mode 0, without channel data.
    AccelReading();
    AccelReading(quint16 frameNumber, AbstractAccelerometer::AccelMode mode);
    AccelReading(const AccelReading& other);
    AccelReading& operator=(const AccelReading& other);
    ~AccelReading();

    [[nodiscard]] quint16 frameNumber() const;
    [[nodiscard]] AbstractAccelerometer::AccelMode mode() const;
    [[nodiscard]] QByteArray channelData() const;
    void setChannelData(const QByteArray& bytes);

    /// Length of the wire form in bytes.
    [[nodiscard]] int size() const;

private:
    class PrivateData;

    QSharedDataPointer<PrivateData> data;
};

/// The wire form without a length; the frame number in the stream's byte order, big-endian by default.
QDataStream& operator<<(QDataStream& stream, const AccelReading& reading);

} // namespace Domain

Q_DECLARE_METATYPE(Domain::AccelReading)
