// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "Domain/src/DomainLayer/BeaconProcessor.h"
#include "Domain/src/DomainLayer/SerialPort.h"
#include "tests/Domain/Frames.h"
#include "tests/Domain/Pty.h"
#include "tests/Domain/RadioPeer.h"

#include <QDir>
#include <QFile>
#include <QTest>

namespace TestSupport
{

inline constexpr int generousMs = 20000;

inline void makeResetLine()
{
    QDir().mkpath("/sys/class/misc/msp430");
    QFile reset("/sys/class/misc/msp430/reset");
    QVERIFY(reset.open(QIODevice::WriteOnly));
}

/// A processor on a real line with a microcontroller, and what its signals told, in order.
class Radio : public QObject
{
public:
    Radio() : port(pty.name(), Domain::SerialPort::Baud115200), processor(port), peer(pty) { record(); }

    [[nodiscard]] bool tells(const QStringList& expected) const
    {
        return QTest::qWaitFor([&] { return events == expected; }, generousMs);
    }
    [[nodiscard]] bool takes(const QList<QByteArray>& commands) const
    {
        return QTest::qWaitFor([&] { return peer.commands() == commands; }, generousMs);
    }
    [[nodiscard]] bool becomesIdle()
    {
        return QTest::qWaitFor([&] { return !processor.isCommandPending(); }, generousMs);
    }
    /// The microcontroller says something, asked or not, and its frame is handled.
    void says(const QByteArray& message) const { pty.write(frameOf(message)); }
    /// Everything said before has been handled when this returns true.
    [[nodiscard]] bool settles()
    {
        const auto told = events.size();
        says("\x03");
        const bool settled =
            QTest::qWaitFor([&] { return events.mid(told).contains("transmitPacketComplete"); }, generousMs);
        events.removeOne("transmitPacketComplete");
        return settled;
    }

    QStringList events; ///< first: the port's end serves what is still queued
    Pty pty;
    Domain::SerialPort port;
    Domain::BeaconProcessor processor;
    RadioPeer peer;

private:
    void record()
    {
        using Processor = Domain::BeaconProcessor;
        connect(&processor, &Processor::error, this, [this](auto code) { events << QString("error %1").arg(code); });
        connect(&processor, &Processor::pingResponse, this, [this] { events << "pingResponse"; });
        connect(&processor, &Processor::transmitPacketComplete, this, [this] { events << "transmitPacketComplete"; });
        connect(&processor, &Processor::firmwareVersionReceived, this,
                [this](const QString& version) { events << "version " + version; });
        connect(&processor, &Processor::checkRadioReplyReceived, this,
                [this](auto result) { events << QString("radio %1").arg(int(result)); });
        connect(&processor, &Processor::accelReadingCreateStart, this, [this] { events << "start"; });
        connect(&processor, &Processor::accelReadingCreateStop, this, [this] { events << "stop"; });
        connect(&processor, &Processor::accelReadingReceived, this, [this](const Domain::AccelReading& reading) {
            events << QString("accel %1 %2 %3")
                          .arg(reading.frameNumber())
                          .arg(int(reading.mode()))
                          .arg(QString(reading.channelData().toHex()));
        });
    }
};

} // namespace TestSupport
