// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/Dsp.h"
#include "Domain/src/DomainLayer/DspPort.h"
#include "tests/Domain/DspTestParts.h"

#include <QRandomGenerator>
#include <QTest>
#include <QThread>

#include <atomic>
#include <memory>
#include <mutex>
#include <vector>

using namespace Domain;
using TestSupport::DspPeer;
using TestSupport::sourcedTexts;

namespace
{

QByteArray little16(quint16 number)
{
    return DspPeer::words({number}).first(2);
}

QByteArray sensorData(quint16 frame, const QByteArray& readings, const QByteArray& diagnostic)
{
    return little16(frame) + little16(static_cast<quint16>(readings.size())) + readings + diagnostic;
}

/// What the wire says of one slot, decoded here once more from its table alone.
struct ExpectedSlot
{
    bool valid = false;
    int type = 0;
    int battery = 0;
    int strength = 0;
    int pins = 0;
    QList<QByteArray> channels;
};

ExpectedSlot decodedSlot(const QByteArray& slot, int ratio)
{
    ExpectedSlot expected;
    if (slot.size() < 5 || slot.at(0) == 0)
        return expected;
    const auto byte = [&](int index) { return static_cast<int>(static_cast<uchar>(slot.at(index))); };
    expected.type = byte(1);
    expected.battery = byte(2);
    expected.strength = byte(3);
    expected.pins = byte(4) & 3;
    const QByteArray rest = slot.mid(5);
    if (expected.type < 31 && rest.size() >= 60 * ratio) {
        expected.valid = true;
        expected.channels = {rest.left(54 * ratio), {}, {}, {}};
        for (int index = 54 * ratio; index < 60 * ratio; ++index)
            expected.channels[1 + index % 3].append(rest.at(index));
    } else if (expected.type == 31 && rest.size() >= 6) {
        expected.valid = true;
        expected.channels = {rest.left(3), rest.mid(3, 2), rest.mid(5, 1)};
    }
    return expected;
}

} // namespace

/// What the DSP sends, over the port, the host library and a real socket.
class DspReceiveTest : public QObject
{
    Q_OBJECT

private:
    std::unique_ptr<TestSupport::LogCapture> log;
    std::unique_ptr<DspPeer> peer;
    std::unique_ptr<DspPort> port;
    std::unique_ptr<TestSupport::AssertionLine> buttons;
    std::unique_ptr<Dsp> dsp;

    mutable std::mutex mutex;
    std::vector<QString> events; ///< the signals in their order; not shared with the copies that `seen` gives out
    QVector<WirelessSensorReading> readings;
    PairingUpgradeData packet;
    QThread* emitter = nullptr;

    void note(const QString& event)
    {
        const std::lock_guard lock(mutex);
        events.push_back(event);
        emitter = QThread::currentThread();
    }

    template <typename Signal> void watch(Signal signal, const char* name)
    {
        connect(
            dsp.get(), signal, this, [this, name] { note(QLatin1String(name)); }, Qt::DirectConnection);
    }

    void watchAll()
    {
        const auto direct = Qt::DirectConnection;
        watch(&Dsp::messageReadStart, "read");
        watch(&Dsp::sensorDataReceived, "sensor data");
        watch(&Dsp::rfDiagnosticDataEmitted, "diagnostic emitted");
        watch(&Dsp::wirelessSensorReadingsGenerated, "generated");
        watch(&Dsp::lineNoiseDetected, "line noise");
        connect(
            dsp.get(), &Dsp::versionReceived, this,
            [this](const Utilities::VersionNumber& version) {
                note(QStringLiteral("version %1").arg(QString(version)));
            },
            direct);
        connect(
            dsp.get(), &Dsp::startTriggerDetected, this,
            [this](quint16 frame, qint32 time) { note(QStringLiteral("start %1 %2").arg(frame).arg(time)); }, direct);
        connect(
            dsp.get(), &Dsp::stopTriggerDetected, this,
            [this](quint16 frame, qint32 time) { note(QStringLiteral("stop %1 %2").arg(frame).arg(time)); }, direct);
        connect(
            dsp.get(), &Dsp::diagnosticDataReceived, this,
            [this](quint16 frame, const QByteArray& data) {
                note(QStringLiteral("diagnostic %1 %2").arg(frame).arg(QString::fromLatin1(data.toHex())));
            },
            direct);
        connect(
            dsp.get(), &Dsp::pairingUpgradeDataReceived, this,
            [this](const PairingUpgradeData& data) {
                note(QStringLiteral("pairing"));
                const std::lock_guard lock(mutex);
                packet = data;
            },
            direct);
        connect(
            dsp.get(), &Dsp::sensorReadingsReceived, this,
            [this](const QVector<WirelessSensorReading>& all) {
                note(QStringLiteral("readings %1").arg(all.size()));
                const std::lock_guard lock(mutex);
                readings = all;
            },
            direct);
    }

    QStringList seen() const
    {
        const std::lock_guard lock(mutex);
        return {events.begin(), events.end()};
    }

    /// Sends one message and returns the signals that it caused, the start of reading left out. A second message marks
    /// the end.
    QStringList signalsOf(quint32 type, const QByteArray& data)
    {
        return signalsOfMessage(DspPeer::dspMessage(type, data));
    }

    QStringList signalsOfMessage(const QByteArray& message)
    {
        {
            const std::lock_guard lock(mutex);
            events.clear();
        }
        const QString end = QStringLiteral("stop 65535 -1");
        if (!peer->sendMessage(message) || !peer->sendDsp(0x11008, QByteArray(6, '\xff')))
            return {QStringLiteral("the peer could not send")};
        if (!QTest::qWaitFor([&] { return seen().contains(end); }, 20000))
            return {QStringLiteral("no answer")};
        QStringList caused = seen();
        caused.removeAll(QStringLiteral("read"));
        caused.removeLast();
        return caused;
    }

private slots:
    void initTestCase()
    {
        TestSupport::writeFirmware();
        log = std::make_unique<TestSupport::LogCapture>();
        peer = std::make_unique<DspPeer>();
        port = std::make_unique<DspPort>(QStringLiteral("/dsp.out"));
        buttons = std::make_unique<TestSupport::AssertionLine>();
        dsp = std::make_unique<Dsp>(*port, *buttons);
        watchAll();
    }

    void init() { (void)sourcedTexts(*log); }

    void cleanupTestCase()
    {
        peer.reset();
        dsp.reset();
        buttons.reset();
        port.reset();
        log.reset();
    }

    void signalsComeFromTheWorker()
    {
        QCOMPARE(signalsOf(0x11000, "\1\2"), QStringList{"version 1.2"});
        QCOMPARE(emitter, dsp->thread());
    }

    void theStartOfReadingComesBeforeTheRead()
    {
        std::atomic<qint64> waiting = -1;
        const auto connection = connect(
            dsp.get(), &Dsp::messageReadStart, this,
            [&] {
                if (waiting < 0)
                    waiting = port->bytesAvailable();
            },
            Qt::DirectConnection);
        (void)signalsOf(0x11000, "\1\2");
        disconnect(connection);
        QCOMPARE(waiting.load(), 10);
        QCOMPARE(seen(), (QStringList{"read", "version 1.2", "read", "stop 65535 -1"}));
    }

    void theVersionIsMajorThenMinor()
    {
        QCOMPARE(signalsOf(0x11000, QByteArray("\1\2", 2)), QStringList{"version 1.2"});
        QCOMPARE(signalsOf(0x11000, QByteArray("\xff\0more", 6)), QStringList{"version 255.0"});
        QCOMPARE(sourcedTexts(*log), QStringList());
        QCOMPARE(signalsOf(0x11000, QByteArray("\1", 1)), QStringList());
        QCOMPARE(signalsOf(0x11000, {}), QStringList());
        QCOMPARE(sourcedTexts(*log),
                 (QStringList{"Dsp: Received version data command with data size = 1.  expected 2",
                              "Dsp: Received version data command with data size = 0.  expected 2"}));
    }

    void aDiscardedMessageIsIgnored()
    {
        QCOMPARE(signalsOf(0x11001, {}), QStringList());
        QCOMPARE(signalsOf(0x11001, "whatever"), QStringList());
        QCOMPARE(sourcedTexts(*log), QStringList());
    }

    void logStringsAreLoggedUpToTheirFirstZero()
    {
        QCOMPARE(signalsOf(0x11002, QByteArray("hello\0rest", 10)), QStringList());
        (void)signalsOf(0x11002, "no end");
        (void)signalsOf(0x11002, {});
        (void)signalsOf(0x11002, QByteArray("\0", 1));
        QCOMPARE(sourcedTexts(*log),
                 (QStringList{"Dsp: DSP Log: hello", "Dsp: DSP Log: no end", "Dsp: DSP Log: ", "Dsp: DSP Log: "}));
    }

    void logStringsAreNoFormats()
    {
        (void)signalsOf(0x11002, "100% %s %n %1 %m");
        (void)signalsOf(0x11002, "\xb5\xe4");
        QCOMPARE(sourcedTexts(*log),
                 (QStringList{"Dsp: DSP Log: 100% %s %n %1 %m", "Dsp: DSP Log: " + QString::fromLatin1("\xb5\xe4")}));
    }

    void pairingPacketsAreBigEndian()
    {
        QCOMPARE(signalsOf(0x11003, QByteArray::fromHex("123456abcdef0500ff")), QStringList{"pairing"});
        const std::lock_guard lock(mutex);
        QVERIFY(packet.isValid());
        QCOMPARE(QString(packet),
                 QString("Source Address: 0x123456, Destination Address: 0xabcdef, Command: 5, Data: 00ff"));
    }

    void aShortPairingPacketIsHandedOutInvalid()
    {
        QCOMPARE(signalsOf(0x11003, QByteArray(6, '\1')), QStringList{"pairing"});
        const std::lock_guard lock(mutex);
        QVERIFY(!packet.isValid());
        QCOMPARE(
            sourcedTexts(*log),
            QStringList{"PairingUpgradeData: Attempt to read pairing/upgrade data from stream of insufficient size"});
    }

    void anEmptyPairingPacketIsOnlyLogged()
    {
        QCOMPARE(signalsOf(0x11003, {}), QStringList());
        QCOMPARE(sourcedTexts(*log), QStringList{"Dsp: Pairing/upgrade packet size 0 too small"});
    }

    void lineNoiseIsANonZeroFirstByte()
    {
        QCOMPARE(signalsOf(0x11006, QByteArray("\1", 1)), QStringList{"line noise"});
        QCOMPARE(signalsOf(0x11006, QByteArray("\x80\0", 2)), QStringList{"line noise"});
        QCOMPARE(signalsOf(0x11006, QByteArray("\0\1", 2)), QStringList());
        QCOMPARE(signalsOf(0x11006, {}), QStringList());
        QCOMPARE(sourcedTexts(*log), QStringList());
    }

    void triggersCarryFrameAndTime()
    {
        QCOMPARE(signalsOf(0x11007, QByteArray::fromHex("3412"
                                                        "78563412")),
                 QStringList{"start 4660 305419896"});
        QCOMPARE(signalsOf(0x11007, QByteArray::fromHex("ffff"
                                                        "feffffff"
                                                        "00")),
                 QStringList{"start 65535 -2"});
        QCOMPARE(signalsOf(0x11008, QByteArray::fromHex("0100"
                                                        "00000080")),
                 QStringList{"stop 1 -2147483648"});
        QCOMPARE(sourcedTexts(*log), QStringList());
    }

    void shortTriggersAreLogged()
    {
        QCOMPARE(signalsOf(0x11007, QByteArray(5, '\1')), QStringList());
        QCOMPARE(signalsOf(0x11008, QByteArray(5, '\1')), QStringList());
        QCOMPARE(signalsOf(0x11007, {}), QStringList());
        QCOMPARE(sourcedTexts(*log),
                 (QStringList{"Dsp: Received start trigger command with insufficent data. got 5 need 6",
                              "Dsp: Received stop trigger command with insufficent data. got 5 need 6",
                              "Dsp: Received start trigger command with insufficent data. got 0 need 6"}));
    }

    void answersToNobodyAreQuiet()
    {
        QCOMPARE(signalsOf(0x1100B, QByteArray(4, '\0')), QStringList());
        QCOMPARE(signalsOf(0x1100C, QByteArray(4, '\0')), QStringList());
        QCOMPARE(sourcedTexts(*log), QStringList());
    }

    void unknownMessagesAreLoggedWithTheirFirstBytes()
    {
        QStringList expected;
        for (const quint32 type : {0x11009U, 0x1100AU, 0x1100DU, 0U, 0x10FFFU, 0xFFFFFFFFU}) {
            QCOMPARE(signalsOf(type, QByteArray::fromHex("00ff10")), QStringList());
            expected += QStringLiteral("Dsp: Received unknown message %1 with data 00ff10 (first 16 bytes) from DSP")
                            .arg(QString::number(type, 16));
        }
        (void)signalsOf(0xA, QByteArray::fromHex("000102030405060708090a0b0c0d0e0f1011"));
        expected +=
            "Dsp: Received unknown message a with data 000102030405060708090a0b0c0d0e0f (first 16 bytes) from DSP";
        (void)signalsOf(0xB, {});
        expected += "Dsp: Received unknown message b with data  (first 16 bytes) from DSP";
        QCOMPARE(sourcedTexts(*log), expected);
    }

    void messagesShorterThanTheirHeaderAreUnknown()
    {
        const QByteArray start = DspPeer::words({0x11007, 6});
        for (int size = 1; size < 8; ++size)
            QCOMPARE(signalsOfMessage(start.first(size)), QStringList());
        const QStringList texts = sourcedTexts(*log);
        QCOMPARE(texts.size(), 7);
        QCOMPARE(texts.at(0), "Dsp: Received unknown message 7 with data  (first 16 bytes) from DSP");
        QCOMPARE(texts.at(1), "Dsp: Received unknown message 1007 with data  (first 16 bytes) from DSP");
        // With the type whole it is a start trigger without its data.
        QCOMPARE(texts.at(6), "Dsp: Received start trigger command with insufficent data. got 0 need 6");
        QCOMPARE(signalsOfMessage({}), QStringList());
    }

    void sensorDataBecomeSixteenReadings()
    {
        QByteArray readingsBlock(1040, '\0');
        const QByteArray diagnostic = QByteArray::fromHex("00112233445566778899aabbccddeeff").repeated(2);
        readingsBlock[0] = 1;                                         // slot 0: type 0
        readingsBlock.replace(65 * 15, 5, QByteArray("\1\37\3\4\3")); // slot 15: type 31
        const QStringList stages = signalsOf(0x11004, sensorData(0xBEEF, readingsBlock, diagnostic));
        QCOMPARE(stages, (QStringList{"sensor data", "diagnostic 48879 " + QString::fromLatin1(diagnostic.toHex()),
                                      "diagnostic emitted", "generated", "readings 16"}));
        const std::lock_guard lock(mutex);
        for (int slot = 0; slot < 16; ++slot) {
            QCOMPARE(readings.at(slot).sensorNumber(), slot);
            QCOMPARE(readings.at(slot).frameNumber(), 0xBEEF);
            QCOMPARE(readings.at(slot).upsampleRatio(), 1);
            QCOMPARE(readings.at(slot).isValid(), slot == 0 || slot == 15);
        }
        QList<qsizetype> channelSizes;
        for (const auto& channel : readings.first().channelData())
            channelSizes.append(channel.size());
        QCOMPARE(channelSizes, (QList<qsizetype>{54, 2, 2, 2}));
        QCOMPARE(readings.last().sensorType(), 31);
        QCOMPARE(readings.last().batteryLevel(), 3);
        QCOMPARE(readings.last().signalStrength(), 4);
        QVERIFY(readings.last().pin1IsSet() && readings.last().pin2IsSet());
        QCOMPARE(sourcedTexts(*log), QStringList());
    }

    void upsampledSlotsNeedTwiceTheData()
    {
        QByteArray block(1040, '\0');
        block[0] = 1;
        (void)signalsOf(0x11005, sensorData(1, block, QByteArray(32, '\0')));
        QCOMPARE(sourcedTexts(*log), (QStringList{"WirelessSensorReading: Data size 60 too small, required = 120",
                                                  "WirelessSensorReading: Could not parse type 0 channel data."}));
        block = QByteArray(16 * 124, '\0'); // 125 bytes a slot would pass what one message can carry
        block[0] = 1;
        const QByteArray largest = sensorData(1, block, QByteArray(32, '\0'));
        QCOMPARE(largest.size(), 2020);
        (void)signalsOf(0x11005, largest);
        QCOMPARE(sourcedTexts(*log), (QStringList{"WirelessSensorReading: Data size 119 too small, required = 120",
                                                  "WirelessSensorReading: Could not parse type 0 channel data."}));
        const std::lock_guard lock(mutex);
        QCOMPARE(readings.size(), 16);
        QVERIFY(!readings.first().isValid());
        QCOMPARE(readings.first().upsampleRatio(), 2);
    }

    void wrongReadingsLengthsAreDroppedWhole_data()
    {
        QTest::addColumn<QByteArray>("data");
        QTest::addColumn<QString>("text");
        const auto wrong = [](int stated, int size) {
            return QStringLiteral("Dsp: Received sensor data with incorrect readings length %1.  Data size = %2")
                .arg(stated)
                .arg(size);
        };
        QTest::newRow("empty") << QByteArray() << wrong(0, 0);
        QTest::newRow("three bytes") << QByteArray("\0\0\x10", 3) << wrong(16, 3);
        QTest::newRow("35 bytes") << QByteArray(35, '\0') << wrong(0, 35);
        QTest::newRow("35 bytes that say 0xFFFF") << QByteArray(35, '\xff') << wrong(65535, 35);
        QTest::newRow("one too few") << sensorData(0, QByteArray(16, '\0'), QByteArray(31, '\0')) << wrong(16, 51);
        QTest::newRow("one too many") << sensorData(0, QByteArray(16, '\0'), QByteArray(33, '\0')) << wrong(16, 53);
        QTest::newRow("not sixteen equal slots")
            << sensorData(0, QByteArray(24, '\0'), QByteArray(32, '\0'))
            << "Dsp: Received sensor data with readings length 24 that is not evenly divisible by 16.";
    }

    void wrongReadingsLengthsAreDroppedWhole()
    {
        QFETCH(const QByteArray, data);
        QFETCH(const QString, text);
        QCOMPARE(signalsOf(0x11004, data), QStringList{"sensor data"});
        QCOMPARE(sourcedTexts(*log), QStringList{text});
    }

    void noReadingsAtAllAreSixteenInvalidOnes()
    {
        const QStringList stages = signalsOf(0x11004, QByteArray(36, '\0'));
        QCOMPARE(stages.last(), "readings 16");
        QCOMPARE(stages.size(), 5);
        QCOMPARE(sourcedTexts(*log),
                 QStringList(16, "WirelessSensorReading: Sensor data size 0 is too small for a valid reading"));
    }

    void aBadSlotStopsNoOther()
    {
        QByteArray block;
        for (int slot = 0; slot < 16; ++slot)
            block += QByteArray("\1", 1) + static_cast<char>(slot % 2 == 0 ? 31 : 32) + QByteArray(9, '\7');
        QCOMPARE(signalsOf(0x11004, sensorData(9, block, QByteArray(32, '\0'))).last(), "readings 16");
        QCOMPARE(
            sourcedTexts(*log),
            QStringList(8, "WirelessSensorReading: Attempt to construct WirelessSensorReading with invalid type 32"));
        const std::lock_guard lock(mutex);
        for (int slot = 0; slot < 16; ++slot) {
            QCOMPARE(readings.at(slot).isValid(), slot % 2 == 0);
            QCOMPARE(readings.at(slot).batteryLevel(), 7);
        }
    }

    void randomFramesDecodeToWhatTheTablesSay()
    {
        QRandomGenerator random(20261121);
        for (int frame = 0; frame < 300; ++frame) {
            const int ratio = random.bounded(1, 3);
            const int slotSize = random.bounded(0, 125);
            QByteArray block(16 * slotSize, Qt::Uninitialized);
            for (char& byte : block)
                byte = static_cast<char>(random.generate());
            for (int slot = 0; slotSize >= 2 && slot < 16; ++slot) // mostly types that exist
                block[slot * slotSize + 1] = static_cast<char>(random.bounded(0, 34));
            const auto number = static_cast<quint16>(random.generate());
            QCOMPARE(signalsOf(ratio == 1 ? 0x11004 : 0x11005, sensorData(number, block, QByteArray(32, 'd'))).last(),
                     "readings 16");
            const std::lock_guard lock(mutex);
            for (int slot = 0; slot < 16; ++slot) {
                const auto expected = decodedSlot(block.mid(slot * slotSize, slotSize), ratio);
                const auto& reading = readings.at(slot);
                QCOMPARE(reading.isValid(), expected.valid);
                QCOMPARE(reading.sensorType(), expected.type);
                QCOMPARE(reading.batteryLevel(), expected.battery);
                QCOMPARE(reading.signalStrength(), expected.strength);
                QCOMPARE((reading.pin1IsSet() ? 1 : 0) + (reading.pin2IsSet() ? 2 : 0), expected.pins);
                QCOMPARE(reading.channelData(), expected.channels);
                QCOMPARE(reading.frameNumber(), number);
                QCOMPARE(reading.upsampleRatio(), ratio);
            }
        }
    }

    void everyMessageOfABurstIsHandled()
    {
        {
            const std::lock_guard lock(mutex);
            events.clear();
        }
        for (int number = 0; number < 1000; ++number)
            QVERIFY(peer->sendDsp(0x11006, QByteArray(1, '\1')));
        QTRY_COMPARE_WITH_TIMEOUT(seen().count(QStringLiteral("line noise")), 1000, 20000);
        QCOMPARE(seen().count(QStringLiteral("read")), 1000);
    }
};

QTEST_GUILESS_MAIN(DspReceiveTest)
#include "DspReceiveTest.moc"
