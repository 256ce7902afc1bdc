// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "Domain/src/DomainLayer/BeaconPacket.h"
#include "utilities/VersionNumber.h"

#include <QByteArray>
#include <QMetaType>
#include <QObject>
#include <QVector>

namespace Domain
{

/// The radio microcontroller, called the beacon processor, as its users see it.
///
/// Threads: every operation may be called from any thread. Each returns true when the command was sent or queued and
/// false when it was refused or could not be sent; the microcontroller's answer arrives as a signal. Signals are
/// emitted on the implementation's own thread, so receivers elsewhere get them queued. A command completes without
/// help of any caller's event loop.
class AbstractBeaconProcessor : public QObject
{
    Q_OBJECT

public:
    enum Error : int
    {
        NakReceived = 0,     ///< the microcontroller refused a command
        TimedOut = 1,        ///< no acknowledgement within the timeout
        UnknownMessage = 2,  ///< reply code not known
        EmptyMessage = 3,    ///< message without even a code
        IncorrectLength = 4, ///< reply of the wrong length
        OutOfRangeValue = 5  ///< radio check result above 3
    };
    Q_ENUM(Error)

    /// Transmit power, level * 6 - 18 dBm; sent as one byte.
    enum PowerLevel : quint8
    {
        Minus18dBm = 0,
        Minus12dBm = 1,
        Minus6dBm = 2,
        ZeroDBm = 3
    };
    Q_ENUM(PowerLevel)

    /// 0 to 3, the radio's self-check result, defined by the microcontroller's firmware and passed through unchanged.
    enum RadioCheckResult : quint8
    {
    };

    using QObject::QObject;

    /// A command is with the microcontroller and its acknowledgement is awaited.
    virtual bool isCommandPending() = 0;

    /// `address` below 0x1000000, `channel` 2 to 74, 1 to 32 bytes of data; the third argument is the firmware's.
    virtual bool transmitPacket(unsigned int address, unsigned char channel, unsigned char argument,
                                const QByteArray& data) = 0;
    /// `address` below 0x1000000, four channels 2 to 74, 1 to 5 packets, of which invalid ones are left out.
    virtual bool startTransmittingBeacon(unsigned int address, unsigned char channel1, unsigned char channel2,
                                         unsigned char channel3, unsigned char channel4,
                                         const QVector<Domain::BeaconPacket>& packets) = 0;
    virtual bool stopTransmittingBeacon(unsigned char argument) = 0;
    /// 1 to 5 packets, of which invalid ones are left out.
    virtual bool updateBeacon(const QVector<Domain::BeaconPacket>& packets) = 0;
    virtual bool setAccelMode(unsigned char mode) = 0;
    /// A continuous test carrier at 2400 + `channel` MHz, `channel` 2 to 74.
    virtual bool startTransmittingRfTestPacket(unsigned char channel,
                                               Domain::AbstractBeaconProcessor::PowerLevel level) = 0;
    virtual bool stopTransmittingRfTestPacket() = 0;
    virtual bool checkRadioInterface() = 0;
    virtual bool setPowerAmpEnable(bool enable) = 0;
    virtual bool toggleFramePulseLine() = 0;
    virtual bool requestFirmwareVersion() = 0;
    virtual bool sendPing() = 0;

signals:
    void error(Domain::AbstractBeaconProcessor::Error error);
    void pingResponse();
    void firmwareVersionReceived(Utilities::VersionNumber version);
    void checkRadioReplyReceived(AbstractBeaconProcessor::RadioCheckResult result);
    void transmitPacketComplete();
};

} // namespace Domain
