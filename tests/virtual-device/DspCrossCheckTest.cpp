// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/Dsp.h"
#include "Domain/src/DomainLayer/DspPort.h"
#include "tests/support/AssertionLine.h"
#include "tests/support/LogCapture.h"
#include "tests/virtual-device/ModelThread.h"
#include "tests/virtual-device/RegistryAccess.h"
#include "virtual-device/dsp/DspModel.h"
#include "virtual-device/dsp/SensorFrame.h"

#include <QElapsedTimer>
#include <QFile>
#include <QScopeGuard>
#include <QTest>
#include <QThread>

#include <atomic>
#include <mutex>
#include <vector>

using namespace VirtualDevice;

namespace
{

const QString image = QStringLiteral("/dsp.out");

/// What the program's DSP object says, in its own thread and in order.
struct Heard
{
    std::mutex mutex;
    std::vector<QString> events; ///< not shared with the copies that `all` gives out
    std::vector<QVector<Domain::WirelessSensorReading>> frames;

    void add(const QString& event)
    {
        const std::lock_guard lock(mutex);
        events.push_back(event);
    }
    [[nodiscard]] QStringList all()
    {
        const std::lock_guard lock(mutex);
        return {events.begin(), events.end()};
    }
    [[nodiscard]] qsizetype frameCount()
    {
        const std::lock_guard lock(mutex);
        return static_cast<qsizetype>(frames.size());
    }
};

} // namespace

/// The program's side of the DSP link, through its library and a real socket, and the DSP of the virtual device,
/// written apart from each other.
class DspCrossCheckTest : public TestSupport::RegistryAccess
{
    Q_OBJECT

    TestSupport::LogCapture log;
    std::unique_ptr<ModelThread<DspModel>> model;
    TestSupport::AssertionLine buttons;
    std::unique_ptr<Domain::DspPort> port;
    std::unique_ptr<Heard> heard;
    std::unique_ptr<Domain::Dsp> dsp;

    void listen()
    {
        using Domain::Dsp;
        const auto direct = Qt::DirectConnection;
        Heard* to = heard.get();
        connect(
            dsp.get(), &Dsp::versionReceived, dsp.get(),
            [to](Utilities::VersionNumber version) {
                to->add(QStringLiteral("version ") + static_cast<QString>(version));
            },
            direct);
        connect(
            dsp.get(), &Dsp::lineNoiseDetected, dsp.get(), [to] { to->add(QStringLiteral("noise")); }, direct);
        connect(
            dsp.get(), &Dsp::startTriggerDetected, dsp.get(),
            [to](quint16 frame, qint32 time) { to->add(QStringLiteral("start %1 %2").arg(frame).arg(time)); }, direct);
        connect(
            dsp.get(), &Dsp::stopTriggerDetected, dsp.get(),
            [to](quint16 frame, qint32 time) { to->add(QStringLiteral("stop %1 %2").arg(frame).arg(time)); }, direct);
        connect(
            dsp.get(), &Dsp::pairingUpgradeDataReceived, dsp.get(),
            [to](const Domain::PairingUpgradeData& packet) { to->add(static_cast<QString>(packet)); }, direct);
        connect(
            dsp.get(), &Dsp::sensorReadingsReceived, dsp.get(),
            [to](const QVector<Domain::WirelessSensorReading>& readings) {
                const std::lock_guard lock(to->mutex);
                to->frames.push_back(readings);
            },
            direct);
    }

    /// A sensor's samples `first`, `first` + `step` and so on below `end`.
    static QByteArray samples(quint16 frame, int slot, int first, int end, int step = 1)
    {
        QByteArray bytes;
        for (int offset = first; offset < end; offset += step)
            bytes.append(static_cast<char>(SensorFrame::sample(frame, slot, offset)));
        return bytes;
    }
    static QVector<QByteArray> channelsOfTypeZero(quint16 frame, int slot)
    {
        return {samples(frame, slot, 0, 54), samples(frame, slot, 54, 60, 3), samples(frame, slot, 55, 60, 3),
                samples(frame, slot, 56, 60, 3)};
    }
    static QVector<QByteArray> channelsOfType31(quint16 frame, int slot)
    {
        return {samples(frame, slot, 0, 3), samples(frame, slot, 3, 5), samples(frame, slot, 5, 6)};
    }

    static void compareHeader(const Domain::WirelessSensorReading& reading, quint16 frame, int slot)
    {
        QCOMPARE(reading.frameNumber(), frame);
        QCOMPARE(int(reading.batteryLevel()), 100 + slot);
        QCOMPARE(int(reading.signalStrength()), 200 - slot);
        QCOMPARE(reading.pin1IsSet(), (slot & 1) != 0);
        QCOMPARE(reading.pin2IsSet(), (slot & 2) != 0);
    }

private slots:
    void init()
    {
        QFile file(image);
        QVERIFY(file.open(QIODevice::WriteOnly));
        registry = std::make_unique<Registry>();
        model = std::make_unique<ModelThread<DspModel>>(*registry);
        std::optional<QString> problem;
        model->call([&] { problem = (**model).open(QStringLiteral("/dev/dsplink")); });
        QVERIFY2(!problem, qPrintable(problem.value_or(QString())));
        log.clear();
        port = std::make_unique<Domain::DspPort>(image);
        heard = std::make_unique<Heard>();
        dsp = std::make_unique<Domain::Dsp>(*port, buttons);
        listen();
        QCOMPARE(text("dsp.state"), QStringLiteral("connected"));
    }

    void cleanup()
    {
        dsp.reset();
        QTRY_COMPARE(text("dsp.state"), QStringLiteral("off"));
        port.reset();
        QCOMPARE(number("dsp.violations"), 0);
        model.reset();
        registry.reset();
        heard.reset();
    }

    void theFirmwareIsLoadedFromItsImage() { QCOMPARE(text("dsp.image"), image); }

    void everyCommandArrivesAsItWasMeant()
    {
        QVERIFY(dsp->setReceiverEnableTest(2));
        QCOMPARE(number("dsp.receiver"), 2);
        QVERIFY(dsp->runHardwareTest(1));
        QCOMPARE(number("dsp.hardware_test"), 1);
        QVERIFY(dsp->setLongRangeAntennaEnable(true));
        QVERIFY(flag("dsp.long_range_antenna"));
        QVERIFY(dsp->setUpsamplingEnable(true));
        QVERIFY(flag("dsp.upsampling"));
        QVERIFY(dsp->configureLineNoiseDetection(Domain::LineNoiseDetectConfig(-5)));
        QCOMPARE(number("dsp.line_noise_detection"), -5);
        QVERIFY(dsp->setTrigger(Domain::DataGatherTrigger(7)));
        QCOMPARE(number("dsp.trigger"), 7);
        QVERIFY(dsp->setDspEnable(true));
        QVERIFY(flag("dsp.enabled"));
    }

    void acquisitionModesArriveAsTheyWereMeant()
    {
        QVERIFY(dsp->setChannels(2, 40, 74, 10));
        QVERIFY(dsp->setBaseAddress(0x123456));
        QVERIFY(dsp->setAcquisitionMode(Domain::Dsp::PairingUpgradeModeA));
        QVERIFY(flag("dsp.pairing_mode"));
        QCOMPARE(number("dsp.pairing_parameter"), 12);
        QVERIFY(!flag("dsp.gathering"));
        QVERIFY(dsp->setAcquisitionMode(Domain::Dsp::DataGatheringMode));
        QVERIFY(!flag("dsp.pairing_mode"));
        QCOMPARE(number("dsp.pairing_parameter"), 8);
        QVERIFY(flag("dsp.gathering"));
        QCOMPARE(text("dsp.channels"), QStringLiteral("2 40 74 10"));
        QCOMPARE(number("dsp.base_address"), 0x123456);
    }

    void whatTheDspSaysArrivesAsItWasMeant()
    {
        set("dsp.version", "2.10");
        QVERIFY(dsp->requestVersion());
        QTRY_COMPARE(heard->all().size(), 1);
        set("dsp.start_trigger", "258 -2");
        set("dsp.stop_trigger", "65535 1000");
        set("dsp.message", "11001");
        set("dsp.line_noise", "quiet");
        QTRY_COMPARE(text("dsp.line_noise"), QStringLiteral("none")); // said
        set("dsp.line_noise", "detected");
        set("dsp.pairing_packet", "123456abcdef05c0ffee");
        const QStringList expected{"version 2.10", "start 258 -2", "stop 65535 1000", "noise",
                                   "Source Address: 0x123456, Destination Address: 0xabcdef, Command: 5, Data: c0ffee"};
        QTRY_COMPARE(heard->all(), expected);
        set("dsp.log", "100%n of it");
        QVERIFY(log.waitFor(QStringLiteral("DSP Log: 100%n of it")));
    }

    void sensorFramesAreDecodedToWhatTheSensorsSent_data()
    {
        QTest::addColumn<int>("ratio");
        QTest::newRow("as sampled") << 1;
        QTest::newRow("upsampled") << 2;
    }

    void sensorFramesAreDecodedToWhatTheSensorsSent()
    {
        QFETCH(const int, ratio);
        constexpr int frames = 20;
        set("dsp.sensors", 15);
        set("dsp.sensor_types", "mixed");
        set("dsp.sensor_ratio", ratio);
        set("dsp.sensor_rate", 100);
        QVERIFY(dsp->setReceiverEnableTest(1));
        QTRY_VERIFY(heard->frameCount() >= frames);
        QVERIFY(dsp->setReceiverEnableTest(0));
        // A message has no room for sixteen upsampled slots of type 0.
        if (ratio == 2)
            QVERIFY(log.waitFor(QStringLiteral("119 too small, required = 120")));
        const std::lock_guard lock(heard->mutex);
        for (quint16 frame = 0; frame < frames; ++frame) {
            const auto& readings = heard->frames[frame];
            QCOMPARE(readings.size(), 16);
            for (int slot = 0; slot < 15; ++slot) {
                const bool isTypeZero = slot % 2 == 0;
                compareHeader(readings[slot], frame, slot);
                QCOMPARE(readings[slot].upsampleRatio(), ratio);
                QCOMPARE(int(readings[slot].sensorType()), isTypeZero ? 0 : 31);
                QCOMPARE(readings[slot].isValid(), !isTypeZero || ratio == 1);
                if (readings[slot].isValid())
                    QCOMPARE(readings[slot].channelData(),
                             isTypeZero ? channelsOfTypeZero(frame, slot) : channelsOfType31(frame, slot));
            }
            QVERIFY(!readings[15].isValid());
        }
    }

    void refusedShortAndMissingAnswersFailTheCommand()
    {
        set("dsp.ack", "nak");
        QVERIFY(!dsp->runHardwareTest(1));
        QVERIFY(log.waitFor(QStringLiteral("Received Nak for DSP command 0x10009")));
        for (const char* manner : {"short", "wrong-id", "off"}) {
            log.clear();
            set("dsp.ack", manner);
            QVERIFY(!dsp->runHardwareTest(1));
            QVERIFY(log.waitFor(QStringLiteral("Timed out waiting for DSP ACK")));
        }
        set("dsp.ack", "late");
        set("dsp.ack_delay", 50);
        QVERIFY(dsp->runHardwareTest(1));
    }

    void anAnswerOvertakesTheSensorsData()
    {
        // A slow listener: the frames that wait would take it far longer than a command may.
        constexpr int backlog = 100;
        std::atomic<int> announced = 0;
        connect(
            port.get(), &Domain::DspPort::readyRead, this, [&] { ++announced; }, Qt::DirectConnection);
        std::atomic<int> handled = 0;
        std::atomic<bool> slow = true;
        const auto end = qScopeGuard([&] {
            slow = false;
            dsp.reset(); // with its thread, before what the thread counts with
        });
        connect(
            dsp.get(), &Domain::Dsp::sensorDataReceived, dsp.get(),
            [&] {
                ++handled;
                if (slow)
                    QThread::msleep(20);
            },
            Qt::DirectConnection);
        set("dsp.sensor_rate", 500);
        QVERIFY(dsp->setReceiverEnableTest(1));
        QTRY_VERIFY_WITH_TIMEOUT(announced - handled > backlog, 20000);
        for (int count = 0; count < 10; ++count) {
            QVERIFY(dsp->runHardwareTest(count));
            QVERIFY(announced - handled > backlog / 2);
        }
        QVERIFY(dsp->setReceiverEnableTest(0));
    }

    void aDspThatGoesAwayFailsCommandsAndNothingElse()
    {
        set("dsp.presence", "missing");
        QTRY_COMPARE(text("dsp.state"), QStringLiteral("off")); // in a thread of its own
        QElapsedTimer clock;
        clock.start();
        QVERIFY(!dsp->runHardwareTest(1));
        QVERIFY2(clock.elapsed() < 20000, qPrintable(QString::number(clock.elapsed())));
    }
};

QTEST_GUILESS_MAIN(DspCrossCheckTest)
#include "DspCrossCheckTest.moc"
