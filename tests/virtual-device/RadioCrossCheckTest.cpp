// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/BeaconPacket.h"
#include "Domain/src/DomainLayer/BeaconProcessor.h"
#include "Domain/src/DomainLayer/SerialPort.h"
#include "tests/support/LogCapture.h"
#include "tests/support/QueuedSpy.h"
#include "tests/virtual-device/ModelThread.h"
#include "tests/virtual-device/RegistryAccess.h"
#include "virtual-device/radio/RadioModel.h"

#include <QDir>
#include <QFile>
#include <QTest>

using namespace VirtualDevice;
using Domain::BeaconPacket;
using Domain::BeaconProcessor;
using Error = Domain::AbstractBeaconProcessor::Error;
using PowerLevel = Domain::AbstractBeaconProcessor::PowerLevel;

namespace
{

const QString resetLine = QStringLiteral("/sys/class/misc/msp430/reset");

} // namespace

/// The program's side of the radio link and the radio microcontroller of the virtual device, written apart from each
/// other, on one line.
class RadioCrossCheckTest : public TestSupport::RegistryAccess
{
    Q_OBJECT

    TestSupport::LogCapture log;
    std::unique_ptr<ModelThread<RadioModel>> radio;
    std::unique_ptr<Domain::SerialPort> port;
    std::unique_ptr<BeaconProcessor> beacon;
    QList<Domain::AccelReading> readings;

    /// The command was taken, and its end needs nobody's event loop.
    void finished(bool accepted) const
    {
        QVERIFY(accepted);
        QElapsedTimer clock;
        clock.start();
        while (beacon->isCommandPending())
            QVERIFY(clock.elapsed() < 10'000);
    }

private slots:
    void init()
    {
        QVERIFY(QDir().mkpath(QFileInfo(resetLine).path()));
        QFile line(resetLine);
        QVERIFY(line.open(QIODevice::WriteOnly | QIODevice::Truncate));
        registry = std::make_unique<Registry>();
        radio = std::make_unique<ModelThread<RadioModel>>(*registry);
        port = std::make_unique<Domain::SerialPort>(text("radio.device"), Domain::SerialPort::Baud(4098));
        beacon = std::make_unique<BeaconProcessor>(*port);
        QTRY_COMPARE(line.size(), 1); // the pulse
        (*radio)->reset();
        QTRY_COMPARE(number("radio.resets"), 1);
    }

    void cleanup()
    {
        beacon.reset();
        port.reset();
        QCOMPARE(number("radio.violations"), 0);
        radio.reset();
        registry.reset();
    }

    void pingsAreAnswered()
    {
        const TestSupport::QueuedSpy answers(beacon.get(), &BeaconProcessor::pingResponse);
        for (int count = 1; count <= 20; ++count) {
            finished(beacon->sendPing());
            QTRY_COMPARE(answers.size(), count);
        }
        QCOMPARE(number("radio.pings"), 20);
        QCOMPARE(number("radio.frames_bad"), 0);
    }

    void theRadioTransmitsWhatThePanelSays()
    {
        finished(beacon->setPowerAmpEnable(true));
        QVERIFY(flag("radio.amplifier"));
        finished(beacon->startTransmittingRfTestPacket(40, PowerLevel(2)));
        QVERIFY(flag("radio.transmitting"));
        QCOMPARE(number("radio.frequency"), 2440);
        QCOMPARE(number("radio.power_level"), 2);
        finished(beacon->stopTransmittingRfTestPacket());
        QVERIFY(!flag("radio.transmitting"));
        finished(beacon->setPowerAmpEnable(false));
        QVERIFY(!flag("radio.amplifier"));
    }

    void everyOtherCommandArrivesAsItWasMeant()
    {
        const QVector<BeaconPacket> packets{{BeaconPacket::PacketType(31), 0xFF}, {BeaconPacket::PacketType(1), 2}};
        finished(beacon->startTransmittingBeacon(0x123456, 2, 40, 74, 10, packets));
        QVERIFY(flag("radio.beacon"));
        QCOMPARE(text("radio.beacon_address"), QStringLiteral("123456"));
        QCOMPARE(text("radio.beacon_channels"), QStringLiteral("2 40 74 10"));
        QCOMPARE(text("radio.beacon_packets"), QStringLiteral("f8ff0802"));
        finished(beacon->updateBeacon(packets.mid(1)));
        QCOMPARE(text("radio.beacon_packets"), QStringLiteral("0802"));
        finished(beacon->stopTransmittingBeacon(0));
        QVERIFY(!flag("radio.beacon"));
        finished(beacon->setAccelMode(3));
        QCOMPARE(number("radio.accel_mode"), 3);
        finished(beacon->toggleFramePulseLine());
        QCOMPARE(number("radio.frame_pulses"), 1);
        const TestSupport::QueuedSpy complete(beacon.get(), &BeaconProcessor::transmitPacketComplete);
        finished(beacon->transmitPacket(0xFFFFFF, 74, 1, QByteArray(32, 'x')));
        QTRY_COMPARE(complete.size(), 1);
        QCOMPARE(text("radio.packet"), QStringLiteral("ffffff4a01") + QString::fromLatin1(QByteArray(32, 'x').toHex()));
    }

    void repliesArriveAsTheyWereMeant()
    {
        set("radio.version", "3.7");
        set("radio.check", 3);
        const TestSupport::QueuedSpy versions(beacon.get(), &BeaconProcessor::firmwareVersionReceived);
        const TestSupport::QueuedSpy checks(beacon.get(), &BeaconProcessor::checkRadioReplyReceived);
        const TestSupport::QueuedSpy errors(beacon.get(), &BeaconProcessor::error);
        finished(beacon->requestFirmwareVersion());
        QTRY_COMPARE(versions.size(), 1);
        QVERIFY(versions[0][0].value<Utilities::VersionNumber>() == Utilities::VersionNumber(3, 7));
        finished(beacon->checkRadioInterface());
        QTRY_COMPARE(checks.size(), 1);
        set("radio.check", 4);
        finished(beacon->checkRadioInterface());
        QTRY_COMPARE(errors.size(), 1);
        QCOMPARE(errors[0][0].value<Error>(), Error::OutOfRangeValue);
    }

    void accelerometerFramesAreDecoded()
    {
        connect(beacon.get(), &BeaconProcessor::accelReadingReceived, this,
                [this](const Domain::AccelReading& reading) { readings.append(reading); });
        finished(beacon->setAccelMode(2));
        set("radio.accel_rate", 100);
        QTRY_VERIFY(readings.size() >= 20);
        set("radio.accel_rate", 0);
        for (int index = 0; index < 20; ++index) {
            QCOMPARE(readings[index].frameNumber(), index);
            QCOMPARE(static_cast<int>(readings[index].mode()), 2);
            QCOMPARE(readings[index].channelData().size(), 15);
            QCOMPARE(readings[index].channelData()[14], static_cast<char>(index + 14));
        }
    }

    void refusalsErrorsAndTextsReachTheProgram()
    {
        const TestSupport::QueuedSpy errors(beacon.get(), &BeaconProcessor::error);
        set("radio.ack", "nak");
        set("radio.nak_code", 9);
        finished(beacon->sendPing());
        QTRY_COMPARE(errors.size(), 1);
        QCOMPARE(errors[0][0].value<Error>(), Error::NakReceived);
        set("radio.ack", "on");
        set("radio.message", "99");
        QTRY_COMPARE(errors.size(), 2);
        QCOMPARE(errors[1][0].value<Error>(), Error::UnknownMessage);
        set("radio.raw", "7c00000000007c0a");
        QTRY_COMPARE(errors.size(), 3);
        QCOMPARE(errors[2][0].value<Error>(), Error::EmptyMessage);
        set("radio.reply", "wrong-length");
        finished(beacon->sendPing());
        QTRY_COMPARE(errors.size(), 4);
        QCOMPARE(errors[3][0].value<Error>(), Error::IncorrectLength);
    }

    void aSilentRadioTimesOutAndComesBack()
    {
        const TestSupport::QueuedSpy errors(beacon.get(), &BeaconProcessor::error);
        const TestSupport::QueuedSpy answers(beacon.get(), &BeaconProcessor::pingResponse);
        set("radio.ack", "off");
        QVERIFY(beacon->sendPing());
        QTRY_COMPARE_WITH_TIMEOUT(errors.size(), 1, 10'000);
        QCOMPARE(errors[0][0].value<Error>(), Error::TimedOut);
        set("radio.ack", "on");
        finished(beacon->sendPing());
        QTRY_COMPARE(answers.size(), 1);
    }

    void noFrameIsLostToNoiseBetweenFrames()
    {
        const TestSupport::QueuedSpy answers(beacon.get(), &BeaconProcessor::pingResponse);
        for (int count = 1; count <= 20; ++count) {
            set("radio.to_program.burst", 37);
            finished(beacon->sendPing());
            QTRY_COMPARE(answers.size(), count);
        }
    }

    void damageOnTheLineCostsCommandsAndNothingElse()
    {
        for (const char* direction : {"radio.to_program", "radio.to_radio"})
            for (const char* fault : {".drop", ".insert", ".flip", ".duplicate"})
                set(qPrintable(QString::fromLatin1(direction) + QLatin1String(fault)), 500);
        set("radio.to_program.delivery", "split");
        for (int count = 0; count < 6; ++count)
            finished(beacon->sendPing());
        for (const char* direction : {"radio.to_program", "radio.to_radio"})
            for (const char* fault : {".drop", ".insert", ".flip", ".duplicate"})
                set(qPrintable(QString::fromLatin1(direction) + QLatin1String(fault)), 0);
        const TestSupport::QueuedSpy answers(beacon.get(), &BeaconProcessor::pingResponse);
        QTRY_VERIFY_WITH_TIMEOUT((finished(beacon->sendPing()), answers.size() > 0), 15'000);
    }
};

QTEST_GUILESS_MAIN(RadioCrossCheckTest)
#include "RadioCrossCheckTest.moc"
