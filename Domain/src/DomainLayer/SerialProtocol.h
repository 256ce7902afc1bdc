// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QIODevice>
#include <QObject>

#include <memory>

namespace Domain
{

/// Turns the byte stream of a device into whole, checked messages for the radio microcontroller and back; `Frame` has
/// the wire format. Opens the device and pulses the microcontroller's reset line once, when it is made.
///
/// Threads: lives on the thread that made it, where it receives. `sendMessage` may be called from wherever the device
/// may be written, and by as many threads at a time as may write to it (a `SerialPort`: any).
///
/// Errors: logged. Damaged frames are dropped byte by byte until an intact one is found. A device that cannot be opened
/// is kept: what is sent fails.
class SerialProtocol : public QObject
{
    Q_OBJECT

public:
    /// The device is not owned and is neither closed nor deleted; it must outlive this object.
    explicit SerialProtocol(QIODevice& device);
    ~SerialProtocol() override;

    /// Sends one frame with a single write. The length field holds 16 bits, whatever the payload's size is.
    [[nodiscard]] bool sendMessage(const QByteArray& payload);

public slots:
    /// Parses everything that the device has to read.
    void processData();

signals:
    /// A verified payload, without header and end byte.
    void messageReceived(const QByteArray& message);

private:
    class PrivateData;

    void parse(QByteArrayView bytes);
    void deliver(QByteArrayView payload);

    std::unique_ptr<PrivateData> data;
};

} // namespace Domain
