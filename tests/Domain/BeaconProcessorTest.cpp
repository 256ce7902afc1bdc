// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/BeaconProcessor.h"

#include "tests/Domain/Radio.h"
#include "tests/support/LogCapture.h"

#include <QTest>

#include <array>
#include <functional>

using Domain::AbstractBeaconProcessor;
using Domain::BeaconPacket;
using Domain::BeaconProcessor;
using TestSupport::LogCapture;
using TestSupport::Pty;
using TestSupport::Radio;

namespace
{

using Operation = std::function<bool(BeaconProcessor&)>;
using Packets = QVector<BeaconPacket>;

BeaconPacket packet(int type, int value)
{
    return {static_cast<BeaconPacket::PacketType>(type), static_cast<uchar>(value)};
}

Packets packets(int count)
{
    Packets all;
    for (int index = 0; index < count; ++index)
        all.append(packet(index + 1, 0x10 + index));
    return all;
}

} // namespace

Q_DECLARE_METATYPE(Operation)

class BeaconProcessorTest : public QObject
{
    Q_OBJECT

private slots:
    void init();
    void cleanup() { log.reset(); }

    void theErrorTypeIsKnownByNameOnceAProcessorStands();
    void everyCommandHasItsBytes_data();
    void everyCommandHasItsBytes();
    void argumentsAreCheckedBeforeSending_data();
    void argumentsAreCheckedBeforeSending();
    void invalidBeaconPacketsAreLeftOut();
    void aBeaconOfInvalidPacketsIsStillSent();
    void everyReplyHasItsSignal_data();
    void everyReplyHasItsSignal();
    void aReplyOfTheWrongLengthIsAnError_data();
    void aReplyOfTheWrongLengthIsAnError();
    void anEmptyMessageIsAnError();
    void anUnknownMessageIsAnErrorAndLoggedInHexadecimal();
    void aRadioCheckAboveThreeIsOutOfRange_data();
    void aRadioCheckAboveThreeIsOutOfRange();
    void textIsLoggedAsReceived_data();
    void textIsLoggedAsReceived();
    void errorTravelsInAQueuedConnectionByName();
    void lastErrorIs(Domain::AbstractBeaconProcessor::Error error) { lastError = error; }

private:
    std::unique_ptr<LogCapture> log;
    AbstractBeaconProcessor::Error lastError = AbstractBeaconProcessor::NakReceived;
};

void BeaconProcessorTest::init()
{
    TestSupport::makeResetLine();
    log = std::make_unique<LogCapture>();
}

/// The first of all: whatever connects to the signal makes the type known, too.
void BeaconProcessorTest::theErrorTypeIsKnownByNameOnceAProcessorStands()
{
    const Pty pty;
    Domain::SerialPort port(pty.name(), Domain::SerialPort::Baud115200);
    const BeaconProcessor processor(port);
    QVERIFY(QMetaType::fromName("Domain::AbstractBeaconProcessor::Error").isValid());
}

void BeaconProcessorTest::everyCommandHasItsBytes_data()
{
    QTest::addColumn<Operation>("operation");
    QTest::addColumn<QByteArray>("hex");
    const auto row = [](const char* name, const QByteArray& hex, const Operation& operation) {
        QTest::addRow("%s", name) << operation << hex;
    };
    row("transmitPacket", "02 abcdef 02 99 000102",
        [](auto& p) { return p.transmitPacket(0xABCDEF, 2, 0x99, QByteArray("\x00\x01\x02", 3)); });
    row("startTransmittingBeacon", "20 010203 02 03 4a 28 0810 1011",
        [](auto& p) { return p.startTransmittingBeacon(0x010203, 2, 3, 74, 40, packets(2)); });
    row("stopTransmittingBeacon", "21 7f", [](auto& p) { return p.stopTransmittingBeacon(0x7F); });
    row("updateBeacon", "22 0810", [](auto& p) { return p.updateBeacon(packets(1)); });
    row("setAccelMode", "30 ff", [](auto& p) { return p.setAccelMode(0xFF); });
    row("startTransmittingRfTestPacket", "60 28 03",
        [](auto& p) { return p.startTransmittingRfTestPacket(40, AbstractBeaconProcessor::ZeroDBm); });
    row("any power level", "60 28 c8", [](auto& p) {
        return p.startTransmittingRfTestPacket(40, static_cast<AbstractBeaconProcessor::PowerLevel>(200));
    });
    row("stopTransmittingRfTestPacket", "61", [](auto& p) { return p.stopTransmittingRfTestPacket(); });
    row("checkRadioInterface", "62", [](auto& p) { return p.checkRadioInterface(); });
    row("setPowerAmpEnable on", "64 01", [](auto& p) { return p.setPowerAmpEnable(true); });
    row("setPowerAmpEnable off", "64 00", [](auto& p) { return p.setPowerAmpEnable(false); });
    row("toggleFramePulseLine", "65", [](auto& p) { return p.toggleFramePulseLine(); });
    row("requestFirmwareVersion", "70", [](auto& p) { return p.requestFirmwareVersion(); });
    row("sendPing", "7e", [](auto& p) { return p.sendPing(); });
}

void BeaconProcessorTest::everyCommandHasItsBytes()
{
    QFETCH(const Operation, operation);
    QFETCH(const QByteArray, hex);
    Radio radio;
    QVERIFY(!radio.processor.isCommandPending());
    QVERIFY(operation(radio.processor));
    QVERIFY(radio.processor.isCommandPending());
    QTRY_COMPARE(radio.peer.commands(), QList<QByteArray>{QByteArray::fromHex(hex)});
    radio.says("\xFE");
    QVERIFY(radio.becomesIdle());
    QCOMPARE(log->texts(), QStringList());
}

void BeaconProcessorTest::argumentsAreCheckedBeforeSending_data()
{
    QTest::addColumn<Operation>("operation");
    QTest::addColumn<QString>("refusal");
    const auto row = [](const char* name, const QString& refusal, const Operation& operation) {
        QTest::addRow("%s", name) << operation << refusal;
    };
    const auto packetTo = [](unsigned address, int channel, int size) {
        return [=](BeaconProcessor& p) {
            return p.transmitPacket(address, static_cast<uchar>(channel), 0, QByteArray(size, 'x'));
        };
    };
    row("packet to the highest address", {}, packetTo(0xFFFFFF, 2, 1));
    row("packet beyond it", "Attempt to send to invalid address 16777216", packetTo(0x1000000, 2, 1));
    row("packet on channel 1", "Attempt to send on invalid channel 1", packetTo(0, 1, 1));
    row("packet on channel 2", {}, packetTo(0, 2, 1));
    row("packet on channel 74", {}, packetTo(0, 74, 1));
    row("packet on channel 75", "Attempt to send on invalid channel 75", packetTo(0, 75, 1));
    row("packet of no data", "Attempt to send packet with invalid size 0", packetTo(0, 2, 0));
    row("packet of 32 bytes", {}, packetTo(0, 2, 32));
    row("packet of 33 bytes", "Attempt to send packet with invalid size 33", packetTo(0, 2, 33));

    const auto beacon = [](unsigned address, std::array<uchar, 4> c, int count) {
        return [=](BeaconProcessor& p) {
            return p.startTransmittingBeacon(address, c[0], c[1], c[2], c[3], packets(count));
        };
    };
    row("beacon at the highest address", {}, beacon(0xFFFFFF, {2, 74, 2, 74}, 1));
    row("beacon beyond it", "Attempt to send to invalid address ", beacon(0x1000000, {2, 2, 2, 2}, 1));
    row("beacon, channel 1 first", "Attempt to send on invalid channel 1 2 3 4", beacon(0, {1, 2, 3, 4}, 1));
    row("beacon, channel 75 second", "Attempt to send on invalid channel 2 75 3 4", beacon(0, {2, 75, 3, 4}, 1));
    row("beacon, channel 0 third", "Attempt to send on invalid channel 2 3 0 4", beacon(0, {2, 3, 0, 4}, 1));
    row("beacon, channel 255 fourth", "Attempt to send on invalid channel 2 3 4 255", beacon(0, {2, 3, 4, 255}, 1));
    row("beacon of no packets", "Attempt to send an invalid number of packets 0", beacon(0, {2, 2, 2, 2}, 0));
    row("beacon of 5 packets", {}, beacon(0, {2, 2, 2, 2}, 5));
    row("beacon of 6 packets", "Attempt to send an invalid number of packets 6", beacon(0, {2, 2, 2, 2}, 6));

    const auto update = [](int count) { return [=](BeaconProcessor& p) { return p.updateBeacon(packets(count)); }; };
    row("update of no packets", "Attempt to send an invalig number of packets 0", update(0));
    row("update of 5 packets", {}, update(5));
    row("update of 6 packets", "Attempt to send an invalig number of packets 6", update(6));

    const auto carrier = [](int channel) {
        return [=](BeaconProcessor& p) {
            return p.startTransmittingRfTestPacket(static_cast<uchar>(channel), AbstractBeaconProcessor::ZeroDBm);
        };
    };
    row("carrier on channel 1", "Attempt to send on invalid channel 1", carrier(1));
    row("carrier on channel 2", {}, carrier(2));
    row("carrier on channel 74", {}, carrier(74));
    row("carrier on channel 75", "Attempt to send on invalid channel 75", carrier(75));
}

void BeaconProcessorTest::argumentsAreCheckedBeforeSending()
{
    QFETCH(const Operation, operation);
    QFETCH(const QString, refusal);
    Radio radio;
    QCOMPARE(operation(radio.processor), refusal.isEmpty());
    QCOMPARE(radio.processor.isCommandPending(), refusal.isEmpty());
    if (refusal.isEmpty()) {
        QTRY_COMPARE(radio.peer.commands().size(), 1);
        QCOMPARE(log->texts(), QStringList());
        return;
    }
    QVERIFY(log->waitFor(", " + refusal));
    QVERIFY(log->texts().front().startsWith("Domain/src/DomainLayer/BeaconProcessor"));
    QVERIFY(radio.settles());
    QCOMPARE(radio.peer.commands(), QList<QByteArray>());
    QCOMPARE(radio.events, QStringList());
}

void BeaconProcessorTest::invalidBeaconPacketsAreLeftOut()
{
    Radio radio;
    const Packets mixed{BeaconPacket(), packet(1, 0x10), BeaconPacket(), packet(2, 0x11)};
    QVERIFY(radio.processor.updateBeacon(mixed));
    QVERIFY(radio.takes({QByteArray::fromHex("22 0810 1011")}));
    QVERIFY(log->waitFor(", Beacon packet at index 0 is invalid."));
    QVERIFY(log->waitFor(", Beacon packet at index 2 is invalid."));
    QCOMPARE(log->lines().size(), std::size_t(2));
}

void BeaconProcessorTest::aBeaconOfInvalidPacketsIsStillSent()
{
    Radio radio;
    QVERIFY(radio.processor.startTransmittingBeacon(1, 2, 3, 4, 5, {BeaconPacket(), BeaconPacket()}));
    QVERIFY(radio.takes({QByteArray::fromHex("20 000001 02 03 04 05")}));
}

void BeaconProcessorTest::everyReplyHasItsSignal_data()
{
    QTest::addColumn<QByteArray>("hex");
    QTest::addColumn<QStringList>("events");
    QTest::addRow("transmit complete") << QByteArray("03") << QStringList{"transmitPacketComplete"};
    QTest::addRow("accelerometer") << QByteArray("31 fffe 83 000102030405060708090a0b0c0dff")
                                   << QStringList{"start", "stop", "accel 65534 131 000102030405060708090a0b0c0dff"};
    QTest::addRow("radio check 0") << QByteArray("63 00") << QStringList{"radio 0"};
    QTest::addRow("radio check 3") << QByteArray("63 03") << QStringList{"radio 3"};
    QTest::addRow("firmware version") << QByteArray("71 0c 05") << QStringList{"version 12.5"};
    QTest::addRow("ping reply") << QByteArray("7f") << QStringList{"pingResponse"};
}

void BeaconProcessorTest::everyReplyHasItsSignal()
{
    QFETCH(const QByteArray, hex);
    QFETCH(const QStringList, events);
    Radio radio;
    radio.says(QByteArray::fromHex(hex));
    QVERIFY(radio.tells(events));
    QVERIFY(radio.settles());
    QCOMPARE(radio.events, events);
    QCOMPARE(log->texts(), QStringList());
}

void BeaconProcessorTest::aReplyOfTheWrongLengthIsAnError_data()
{
    QTest::addColumn<int>("code");
    QTest::addColumn<int>("length");
    QTest::addColumn<QString>("text");
    struct Row
    {
        int code;
        const char* name;
        int expected;
    };
    for (const auto& [code, name, expected] :
         {Row{0xFE, "ACK", 0}, Row{0xFF, "NAK", 1}, Row{0x03, "tx complete", 0}, Row{0x31, "accel data", 18},
          Row{0x63, "check radio", 1}, Row{0x71, "fw version", 2}, Row{0x7F, "ping reply", 0}}) {
        for (const int length : {0, expected - 1, expected + 1, 99}) {
            if (length >= 0 && length != expected)
                QTest::addRow("%s of %d", name, length)
                    << code << length
                    << QString("Incorrect %1 length.  Expected: %2 Got: %3").arg(name).arg(expected).arg(length);
        }
    }
}

void BeaconProcessorTest::aReplyOfTheWrongLengthIsAnError()
{
    QFETCH(const int, code);
    QFETCH(const int, length);
    QFETCH(const QString, text);
    Radio radio;
    radio.says(static_cast<char>(code) + QByteArray(length, '\1'));
    QVERIFY(radio.tells({"error 4"}));
    QVERIFY(radio.settles());
    QCOMPARE(radio.events, QStringList{"error 4"});
    QVERIFY(log->waitFor(", " + text));
    QCOMPARE(log->lines().size(), std::size_t(1));
}

void BeaconProcessorTest::anEmptyMessageIsAnError()
{
    Radio radio;
    radio.says({});
    QVERIFY(radio.tells({"error 3"}));
    QVERIFY(log->waitFor(", Received empty message"));
    QVERIFY(radio.settles());
    QCOMPARE(radio.events, QStringList{"error 3"});
    QCOMPARE(log->lines().size(), std::size_t(1));
}

void BeaconProcessorTest::anUnknownMessageIsAnErrorAndLoggedInHexadecimal()
{
    Radio radio;
    radio.says(QByteArray::fromHex("ab00cd25"));
    QVERIFY(radio.tells({"error 2"}));
    QVERIFY(log->waitFor(", Received unknown message ab00cd25"));
    for (int code = 0; code <= 0xFF; ++code) {
        if (!QByteArray::fromHex("03316371 7b7ffeff").contains(static_cast<char>(code)))
            radio.says(QByteArray(1, static_cast<char>(code)));
    }
    QVERIFY(radio.tells(QStringList(249, "error 2")));
    QVERIFY(radio.settles());
    QCOMPARE(radio.events.size(), 249);
}

void BeaconProcessorTest::aRadioCheckAboveThreeIsOutOfRange_data()
{
    QTest::addColumn<int>("value");
    QTest::addColumn<QString>("shown");
    QTest::addRow("just above") << 4 << "\x04";
    QTest::addRow("letter") << int('A') << "A";
    QTest::addRow("percent sign") << int('%') << "%";
    QTest::addRow("Latin-1 letter") << 0xE9 << QStringLiteral("\u00e9");
}

void BeaconProcessorTest::aRadioCheckAboveThreeIsOutOfRange()
{
    QFETCH(const int, value);
    QFETCH(const QString, shown);
    Radio radio;
    radio.says(QByteArray("\x63") + static_cast<char>(value));
    QVERIFY(radio.tells({"error 5"}));
    QVERIFY(radio.settles());
    QCOMPARE(radio.events, QStringList{"error 5"});
    QVERIFY2(log->waitFor(", Received check radio response with out of range value " + shown),
             qPrintable(log->texts().value(0)));
}

void BeaconProcessorTest::textIsLoggedAsReceived_data()
{
    QTest::addColumn<QByteArray>("text");
    QTest::addColumn<QString>("logged");
    QTest::addRow("plain") << QByteArray("started") << "started";
    QTest::addRow("up to a zero byte") << QByteArray("one\0two", 7) << "one";
    QTest::addRow("percent signs") << QByteArray("100% %s%n %m") << "100% %s%n %m";
    QTest::addRow("Latin-1") << QByteArray("caf\xE9") << QStringLiteral("caf\u00e9");
}

void BeaconProcessorTest::textIsLoggedAsReceived()
{
    QFETCH(const QByteArray, text);
    QFETCH(const QString, logged);
    Radio radio;
    radio.says("\x7B" + text);
    QVERIFY(log->waitFor(", " + logged));
    QCOMPARE(log->lines().front().priority, 4);
    QVERIFY(radio.settles());
    QCOMPARE(radio.events, QStringList());
}

void BeaconProcessorTest::errorTravelsInAQueuedConnectionByName()
{
    Radio radio;
    QVERIFY(connect(&radio.processor, SIGNAL(error(Domain::AbstractBeaconProcessor::Error)), this,
                    SLOT(lastErrorIs(Domain::AbstractBeaconProcessor::Error)), Qt::QueuedConnection));
    radio.says(QByteArray("\x63\x04", 2));
    QTRY_COMPARE(lastError, AbstractBeaconProcessor::OutOfRangeValue);
}

QTEST_GUILESS_MAIN(BeaconProcessorTest)
#include "BeaconProcessorTest.moc"
