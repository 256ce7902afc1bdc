// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/presentation/RecordingBeacon.h"

namespace TestSupport
{

RecordingBeacon::RecordingBeacon(Journal& commands) : journal(commands) {}

bool RecordingBeacon::isCommandPending()
{
    ++looks;
    if (onLook)
        onLook();
    if (pending && !staysPending && --looksLeft <= 0) {
        pending = false;
        journal.append(QStringLiteral("done"));
    }
    return pending;
}

/// A command that is accepted or fails to go out is pending; one after it waits in the queue.
bool RecordingBeacon::note(const QString& command)
{
    journal.append(command);
    pending = true;
    looksLeft = looksPerCommand;
    if (!accepts)
        staysPending = true;
    return accepts;
}

bool RecordingBeacon::transmitPacket(unsigned int, unsigned char, unsigned char, const QByteArray&)
{
    return note(QStringLiteral("transmit packet"));
}

bool RecordingBeacon::startTransmittingBeacon(unsigned int, unsigned char, unsigned char, unsigned char, unsigned char,
                                              const QVector<Domain::BeaconPacket>&)
{
    return note(QStringLiteral("start beacon"));
}

bool RecordingBeacon::stopTransmittingBeacon(unsigned char)
{
    return note(QStringLiteral("stop beacon"));
}

bool RecordingBeacon::updateBeacon(const QVector<Domain::BeaconPacket>&)
{
    return note(QStringLiteral("update beacon"));
}

bool RecordingBeacon::setAccelMode(unsigned char)
{
    return note(QStringLiteral("accelerometer mode"));
}

bool RecordingBeacon::startTransmittingRfTestPacket(unsigned char channel, PowerLevel level)
{
    return note(QStringLiteral("start %1 %2").arg(channel).arg(level));
}

bool RecordingBeacon::stopTransmittingRfTestPacket()
{
    return note(QStringLiteral("stop"));
}

bool RecordingBeacon::checkRadioInterface()
{
    return note(QStringLiteral("check radio"));
}

bool RecordingBeacon::setPowerAmpEnable(bool enable)
{
    return note(enable ? QStringLiteral("amplifier on") : QStringLiteral("amplifier off"));
}

bool RecordingBeacon::toggleFramePulseLine()
{
    return note(QStringLiteral("frame pulse"));
}

bool RecordingBeacon::requestFirmwareVersion()
{
    return note(QStringLiteral("version"));
}

bool RecordingBeacon::sendPing()
{
    return note(QStringLiteral("ping"));
}

RecordingDsp::RecordingDsp(Journal& commands) : journal(commands) {}

bool RecordingDsp::note(const QString& command)
{
    journal.append(command);
    return acknowledges;
}

bool RecordingDsp::requestVersion()
{
    return note(QStringLiteral("dsp version"));
}

bool RecordingDsp::setReceiverEnableTest(qint32 type)
{
    return note(QStringLiteral("dsp receiver %1").arg(type));
}

bool RecordingDsp::runHardwareTest(qint32 testId)
{
    return note(QStringLiteral("dsp hardware test %1").arg(testId));
}

} // namespace TestSupport
