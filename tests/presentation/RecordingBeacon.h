// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "Domain/src/DomainLayer/AbstractBeaconProcessor.h"
#include "Domain/src/DomainLayer/AbstractDsp.h"

#include <QStringList>

#include <functional>

namespace TestSupport
{

/// Both recorders write to one journal, so that it shows the order of the commands across them.
using Journal = QStringList;

/// A beacon processor of the panel's own kind: notes each command, and holds it pending until it has been looked at
/// `looksPerCommand` times, which stands for the time that the microcontroller takes. Every completion is noted, too
/// ("done"), so that a journal shows whether the panel waited.
class RecordingBeacon : public Domain::AbstractBeaconProcessor
{
    Q_OBJECT

public:
    explicit RecordingBeacon(Journal& commands);

    bool accepts = true;       ///< what the commands return
    bool staysPending = false; ///< no pending command ends any more
    int looks = 0;             ///< calls of isCommandPending() so far
    std::function<void()> onLook;

    bool isCommandPending() override;
    bool transmitPacket(unsigned int, unsigned char, unsigned char, const QByteArray&) override;
    bool startTransmittingBeacon(unsigned int, unsigned char, unsigned char, unsigned char, unsigned char,
                                 const QVector<Domain::BeaconPacket>&) override;
    bool stopTransmittingBeacon(unsigned char) override;
    bool updateBeacon(const QVector<Domain::BeaconPacket>&) override;
    bool setAccelMode(unsigned char) override;
    bool startTransmittingRfTestPacket(unsigned char channel, PowerLevel level) override;
    bool stopTransmittingRfTestPacket() override;
    bool checkRadioInterface() override;
    bool setPowerAmpEnable(bool enable) override;
    bool toggleFramePulseLine() override;
    bool requestFirmwareVersion() override;
    bool sendPing() override;

private:
    static constexpr int looksPerCommand = 3;

    bool note(const QString& command);

    Journal& journal;
    int looksLeft = 0;
    bool pending = false;
};

/// A DSP that acknowledges everything, or nothing.
class RecordingDsp : public Domain::AbstractDsp
{
    Q_OBJECT

public:
    explicit RecordingDsp(Journal& commands);

    bool acknowledges = true;

    bool requestVersion() override;
    bool setReceiverEnableTest(qint32 type) override;
    bool runHardwareTest(qint32 testId) override;

private:
    bool note(const QString& command);

    Journal& journal;
};

} // namespace TestSupport
