// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/PairingUpgradeData.h"
#include "Domain/src/DomainLayer/WirelessSensorReading.h"
#include "tests/Domain/DspTestParts.h"

#include <QDataStream>
#include <QRandomGenerator>
#include <QTest>

#include <climits>
#include <memory>

using namespace Domain;
using TestSupport::sourcedTexts;

namespace
{

QByteArray streamed(const WirelessSensorReading& reading)
{
    QByteArray bytes;
    QDataStream stream(&bytes, QIODevice::WriteOnly);
    stream << reading;
    return bytes;
}

PairingUpgradeData parsed(const QByteArray& bytes)
{
    PairingUpgradeData packet;
    QDataStream stream(bytes);
    stream >> packet;
    return packet;
}

QByteArray slotOfType(int type, qsizetype size)
{
    QByteArray slot(size, '\0');
    slot[0] = 1;
    slot[1] = static_cast<char>(type);
    for (qsizetype index = 5; index < size; ++index)
        slot[index] = static_cast<char>(index - 5);
    return slot;
}

WirelessSensorReading readingOf(const QByteArray& slot, int ratio = 1)
{
    return {3, 1000, ratio, slot, 0, static_cast<int>(slot.size())};
}

constexpr PairingUpgradeData::Command command(int number)
{
    return static_cast<PairingUpgradeData::Command>(number);
}

} // namespace

/// Sensor readings and pairing packets as values.
class DspRecordsTest : public QObject
{
    Q_OBJECT

private:
    std::unique_ptr<TestSupport::LogCapture> log;

    QStringList texts() { return sourcedTexts(*log); }

private slots:
    void initTestCase() { log = std::make_unique<TestSupport::LogCapture>(); }
    void init() { (void)texts(); }
    void cleanupTestCase() { log.reset(); }

    // Sensor readings

    void aReadingOfNothingIsInvalidAndHarmless()
    {
        WirelessSensorReading reading;
        QVERIFY(!reading.isValid());
        QCOMPARE(reading.frameNumber(), 0);
        QCOMPARE(reading.upsampleRatio(), 0);
        QCOMPARE(reading.sensorNumber(), 0);
        QCOMPARE(reading.sensorType(), 0);
        QCOMPARE(reading.batteryLevel(), 0);
        QCOMPARE(reading.signalStrength(), 0);
        QVERIFY(!reading.pin1IsSet() && !reading.pin2IsSet());
        QVERIFY(reading.channelData().isEmpty());
        QCOMPARE(streamed(reading), QByteArray("\5\0\0\0\0\0", 6));
        reading.setChannelData({"x"});
        QCOMPARE(reading.channelData(), QVector<QByteArray>{"x"});
        QVERIFY(!reading.isValid());
    }

    void valuesGivenAreValuesKept()
    {
        const WirelessSensorReading reading(0xFFFF, 2, 15, 200, true, false, 99, 255, {"a", "bc"});
        QVERIFY(reading.isValid());
        QCOMPARE(reading.frameNumber(), 0xFFFF);
        QCOMPARE(reading.upsampleRatio(), 2);
        QCOMPARE(reading.sensorNumber(), 15);
        QCOMPARE(reading.sensorType(), 200);
        QVERIFY(reading.pin1IsSet());
        QVERIFY(!reading.pin2IsSet());
        QCOMPARE(reading.batteryLevel(), 99);
        QCOMPARE(reading.signalStrength(), 255);
        QCOMPARE(reading.channelData(), (QVector<QByteArray>{"a", "bc"}));
        const AbstractSensorReading& abstract = reading;
        QCOMPARE(abstract.frameNumber(), 0xFFFF);
        QCOMPARE(abstract.upsampleRatio(), 2);
    }

    void copiesAreIndependent()
    {
        const WirelessSensorReading original(1, 1, 1, 0, false, false, 0, 0, {"old"});
        WirelessSensorReading copy = original;
        copy.setChannelData({"new"});
        QCOMPARE(original.channelData(), QVector<QByteArray>{"old"});
        QCOMPARE(copy.channelData(), QVector<QByteArray>{"new"});
        QVERIFY(copy.isValid());
        copy = original;
        QCOMPARE(copy.channelData(), QVector<QByteArray>{"old"});
    }

    void type0SlotsAreDeinterleaved()
    {
        const auto reading = readingOf(slotOfType(0, 65));
        QVERIFY(reading.isValid());
        QByteArray samples;
        for (char sample = 0; sample < 54; ++sample)
            samples.append(sample);
        QCOMPARE(reading.channelData(),
                 (QVector<QByteArray>{samples, QByteArray("\66\71"), QByteArray("\67\72"), QByteArray("\70\73")}));
        QCOMPARE(texts(), QStringList());
    }

    void upsampledType0SlotsHoldTwiceAsMuch()
    {
        const auto reading = readingOf(slotOfType(0, 125), 2);
        QVERIFY(reading.isValid());
        QCOMPARE(reading.channelData().at(0).size(), 108);
        QCOMPARE(reading.channelData().at(1), QByteArray("\x6c\x6f\x72\x75"));
        QCOMPARE(reading.channelData().at(3), QByteArray("\x6e\x71\x74\x77"));
        QVERIFY(!readingOf(slotOfType(0, 124), 2).isValid());
    }

    void everyTypeUpTo30IsParsedAsType0()
    {
        for (int type = 0; type <= 30; ++type) {
            const auto reading = readingOf(slotOfType(type, 65));
            QVERIFY(reading.isValid());
            QCOMPARE(reading.sensorType(), type);
            QCOMPARE(reading.channelData(), readingOf(slotOfType(0, 65)).channelData());
        }
    }

    void type31SlotsHaveThreeChannelsAtEveryRatio()
    {
        for (const int ratio : {1, 2}) {
            const auto reading = readingOf(slotOfType(31, 11), ratio);
            QVERIFY(reading.isValid());
            QCOMPARE(reading.channelData(),
                     (QVector<QByteArray>{QByteArray("\0\1\2", 3), QByteArray("\3\4"), QByteArray("\5")}));
        }
        QVERIFY(!readingOf(slotOfType(31, 10)).isValid());
        QCOMPARE(texts(), (QStringList{"WirelessSensorReading: Data size 5 too small, required = 6",
                                       "WirelessSensorReading: Could not parse type 31 channel data."}));
    }

    void typesAbove31AreRefusedWithTheirFieldsKept()
    {
        for (const int type : {32, 255}) {
            QByteArray slot = slotOfType(type, 200);
            slot.replace(2, 3, "\x11\x22\x02");
            const auto reading = readingOf(slot);
            QVERIFY(!reading.isValid());
            QCOMPARE(reading.sensorType(), type);
            QCOMPARE(reading.batteryLevel(), 0x11);
            QCOMPARE(reading.signalStrength(), 0x22);
            QVERIFY(!reading.pin1IsSet() && reading.pin2IsSet());
            QVERIFY(reading.channelData().isEmpty());
        }
        QCOMPARE(
            texts(),
            (QStringList{"WirelessSensorReading: Attempt to construct WirelessSensorReading with invalid type 32",
                         "WirelessSensorReading: Attempt to construct WirelessSensorReading with invalid type 255"}));
    }

    void aShortType0SlotIsRefused()
    {
        QVERIFY(!readingOf(slotOfType(0, 64)).isValid());
        QCOMPARE(texts(), (QStringList{"WirelessSensorReading: Data size 59 too small, required = 60",
                                       "WirelessSensorReading: Could not parse type 0 channel data."}));
    }

    void anEmptySlotIsSilent()
    {
        const auto reading = readingOf(QByteArray("\0\37\3\4\3\0\0\0\0\0\0", 11));
        QVERIFY(!reading.isValid());
        QCOMPARE(reading.sensorNumber(), 3);
        QCOMPARE(reading.frameNumber(), 1000);
        QCOMPARE(reading.sensorType(), 0);
        QCOMPARE(reading.batteryLevel(), 0);
        QCOMPARE(texts(), QStringList());
    }

    void flagBitsBeyondThePinsAreIgnored()
    {
        QByteArray slot = slotOfType(31, 11);
        slot[4] = '\xfc';
        QVERIFY(!readingOf(slot).pin1IsSet());
        QVERIFY(!readingOf(slot).pin2IsSet());
        slot[4] = '\x01';
        QVERIFY(readingOf(slot).pin1IsSet());
        slot[4] = '\xfe';
        QVERIFY(readingOf(slot).pin2IsSet());
    }

    void slotsOutsideTheDataAreRefused_data()
    {
        QTest::addColumn<int>("position");
        QTest::addColumn<int>("size");
        QTest::addColumn<QString>("text");
        QTest::newRow("negative position") << -1 << 11 << "Data position is negative";
        QTest::newRow("end beyond the data") << 10 << 11 << "Not enough data in byte array (available 20, required 21)";
        QTest::newRow("sum beyond 32 bits")
            << INT_MAX << INT_MAX << "Not enough data in byte array (available 20, required 4294967294)";
        QTest::newRow("too small") << 0 << 4 << "Sensor data size 4 is too small for a valid reading";
        QTest::newRow("negative size") << 10 << -3 << "Sensor data size -3 is too small for a valid reading";
        QTest::newRow("nothing") << 20 << 0 << "Sensor data size 0 is too small for a valid reading";
    }

    void slotsOutsideTheDataAreRefused()
    {
        QFETCH(const int, position);
        QFETCH(const int, size);
        QFETCH(const QString, text);
        const WirelessSensorReading reading(7, 8, 1, QByteArray(20, '\1'), position, size);
        QVERIFY(!reading.isValid());
        QCOMPARE(reading.sensorNumber(), 7);
        QCOMPARE(reading.frameNumber(), 8);
        QCOMPARE(texts(), QStringList{"WirelessSensorReading: " + text});
    }

    void oddUpsampleRatiosReadNothingOutside()
    {
        for (const int ratio : {INT_MIN, -1, 0, 3, INT_MAX}) {
            const auto reading = readingOf(slotOfType(0, 65), ratio);
            QCOMPARE(reading.isValid(), ratio <= 0);
            for (const auto& channel : reading.channelData())
                QVERIFY(channel.isEmpty());
        }
    }

    void theStreamFormCountsItsBytes()
    {
        const WirelessSensorReading reading(1, 1, 4, 30, true, true, 0x80, 0xFF,
                                            {QByteArray(54, 'a'), "bb", "cc", "dd"});
        QCOMPARE(streamed(reading),
                 QByteArray("\x45\x04\x1e\x80\xff\x03\x36", 7) + QByteArray(54, 'a') + "\2bb\2cc\2dd");
        const WirelessSensorReading large(1, 1, 0, 0, false, true, 0, 0, {QByteArray(300, 'x')});
        QCOMPARE(streamed(large), QByteArray("\x32\0\0\0\0\x02\x2c", 7) + QByteArray(300, 'x')); // modulo 256
    }

    // Pairing packets

    void aDefaultPacketIsInvalidAndZero()
    {
        const PairingUpgradeData packet;
        QVERIFY(!packet.isValid());
        QCOMPARE(packet.sourceAddress(), 0);
        QCOMPARE(packet.destinationAddress(), 0);
        QCOMPARE(packet.command(), command(0));
        QVERIFY(packet.data().isEmpty());
        QCOMPARE(packet.toByteArray(), QByteArray(7, '\0'));
    }

    void sevenBytesAreTheSmallestPacket()
    {
        const auto packet = parsed(QByteArray::fromHex("123456ABCDEF05"));
        QVERIFY(packet.isValid());
        QCOMPARE(packet.sourceAddress(), 0x123456);
        QCOMPARE(packet.destinationAddress(), 0xABCDEF);
        QCOMPARE(packet.command(), command(5));
        QVERIFY(packet.data().isEmpty());
        QCOMPARE(QString(packet),
                 QString("Source Address: 0x123456, Destination Address: 0xabcdef, Command: 5, Data: "));
    }

    void sixBytesLeaveThePacketAsItWas()
    {
        PairingUpgradeData packet(1, 2, command(3), "four");
        const QByteArray bytes(6, '\xff');
        QDataStream stream(bytes);
        stream >> packet;
        QCOMPARE(packet.toByteArray(), PairingUpgradeData(1, 2, command(3), "four").toByteArray());
        QVERIFY(!parsed(bytes).isValid());
        QDataStream deviceless;
        deviceless >> packet;
        const QString text =
            "PairingUpgradeData: Attempt to read pairing/upgrade data from stream of insufficient size";
        QCOMPARE(texts(), (QStringList{text, text, text}));
    }

    void readingStartsWhereTheStreamStands()
    {
        QDataStream stream(QByteArray::fromHex("ffff"
                                               "000001000002030405"));
        quint16 before = 0;
        PairingUpgradeData packet;
        stream >> before >> packet;
        QCOMPARE(packet.sourceAddress(), 1);
        QCOMPARE(packet.data(), QByteArray("\4\5"));
    }

    void theStreamsByteOrderIsThatOfTheLowHalves()
    {
        QDataStream stream(QByteArray::fromHex("123456abcdef05"));
        stream.setByteOrder(QDataStream::LittleEndian);
        PairingUpgradeData packet;
        stream >> packet;
        QCOMPARE(packet.sourceAddress(), 0x125634);
        QCOMPARE(packet.destinationAddress(), 0xABEFCD);
    }

    void addressesBeyond24BitsAreWrittenAsZero()
    {
        for (const int address : {0x1000000, -1, INT_MIN, INT_MAX}) {
            QCOMPARE(PairingUpgradeData(address, 0xFFFFFF, command(255), "d").toByteArray(),
                     QByteArray::fromHex("000000ffffffff64"));
            QCOMPARE(PairingUpgradeData(0, address, command(0), {}).toByteArray(), QByteArray(7, '\0'));
            const QString text =
                QStringLiteral("PairingUpgradeData: Address %1 exceeds max address 16777215").arg(address);
            QCOMPARE(texts(), (QStringList{text, text}));
        }
    }

    void theTextShowsEveryField()
    {
        QCOMPARE(QString(PairingUpgradeData(0xF, 0, command(255), QByteArray("\0\xff%1", 4))),
                 QString("Source Address: 0x00000f, Destination Address: 0x000000, Command: 255, Data: 00ff2531"));
    }

    void copiesOfPacketsAreIndependent()
    {
        const PairingUpgradeData original(1, 2, command(3), "data");
        PairingUpgradeData copy = original;
        QDataStream stream(QByteArray::fromHex("00000900000a0b"));
        stream >> copy;
        QCOMPARE(copy.sourceAddress(), 9);
        QCOMPARE(original.sourceAddress(), 1);
        QCOMPARE(original.data(), QByteArray("data"));
    }

    void packetsRoundTrip()
    {
        QRandomGenerator random(4711);
        for (int round = 0; round < 2000; ++round) {
            QByteArray bytes(random.bounded(7, 200), Qt::Uninitialized);
            for (char& byte : bytes)
                byte = static_cast<char>(random.generate());
            const auto packet = parsed(bytes);
            QVERIFY(packet.isValid());
            QCOMPARE(packet.toByteArray(), bytes);
        }
        QCOMPARE(texts(), QStringList());
    }
};

QTEST_GUILESS_MAIN(DspRecordsTest)
#include "DspRecordsTest.moc"
