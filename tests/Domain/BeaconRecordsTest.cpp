// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/AccelReading.h"
#include "Domain/src/DomainLayer/BeaconPacket.h"
#include "tests/support/LogCapture.h"

#include <QDataStream>
#include <QTest>

#include <thread>
#include <vector>

using Domain::AbstractAccelerometer;
using Domain::AccelReading;
using Domain::BeaconPacket;
using TestSupport::LogCapture;

namespace
{

BeaconPacket packetOf(int type, int value)
{
    return {static_cast<BeaconPacket::PacketType>(type), static_cast<uchar>(value)};
}

template <typename Record> QByteArray streamed(const Record& record)
{
    QByteArray bytes;
    QDataStream stream(&bytes, QIODevice::WriteOnly);
    stream << record;
    return bytes;
}

} // namespace

class BeaconRecordsTest : public QObject
{
    Q_OBJECT

private slots:
    void defaultPacketIsInvalidAndTwoZeroBytes();
    void packetOfTypeAndValueIsValid();
    void packetKeepsFiveBitsOfItsType_data();
    void packetKeepsFiveBitsOfItsType();
    void packetFromTwoBytesIgnoresTheLowThreeBits();
    void packetFromBytesOfAnotherLengthIsLoggedAndStillValid_data();
    void packetFromBytesOfAnotherLengthIsLoggedAndStillValid();
    void packetCopiesShareTheirData();
    void packetStreamsAsTwoRawBytes();
    void packetFromAnExhaustedStreamIsZeroFilled();
    void packetFromAStreamWithoutADeviceIsZeroFilled();
    void defaultReadingIsEmpty();
    void readingKeepsWhatItWasBuiltFrom();
    void readingWithFifteenChannelBytesStreamsAsEighteen();
    void readingFollowsTheByteOrderOfItsStream();
    void readingDetachesBeforeAChange();
    void anyModePassesThrough();
    void copiesMayLiveInManyThreads();
};

void BeaconRecordsTest::defaultPacketIsInvalidAndTwoZeroBytes()
{
    const BeaconPacket packet;
    QVERIFY(!packet.isValid());
    QCOMPARE(packet.toByteArray(), QByteArray(2, '\0'));
}

void BeaconRecordsTest::packetOfTypeAndValueIsValid()
{
    QVERIFY(packetOf(0, 0).isValid());
    QCOMPARE(packetOf(1, 0x42).toByteArray(), QByteArray("\x08\x42", 2));
}

void BeaconRecordsTest::packetKeepsFiveBitsOfItsType_data()
{
    QTest::addColumn<int>("type");
    QTest::addColumn<QByteArray>("bytes");
    QTest::addRow("0") << 0 << QByteArray("\x00\xFF", 2);
    QTest::addRow("31") << 31 << QByteArray("\xF8\xFF", 2);
    QTest::addRow("32") << 32 << QByteArray("\x00\xFF", 2);
    QTest::addRow("33") << 33 << QByteArray("\x08\xFF", 2);
    QTest::addRow("255") << 255 << QByteArray("\xF8\xFF", 2);
}

void BeaconRecordsTest::packetKeepsFiveBitsOfItsType()
{
    QFETCH(const int, type);
    QTEST(packetOf(type, 0xFF).toByteArray(), "bytes");
}

void BeaconRecordsTest::packetFromTwoBytesIgnoresTheLowThreeBits()
{
    LogCapture log;
    const BeaconPacket packet(QByteArray("\xF9\x10", 2));
    QVERIFY(packet.isValid());
    QCOMPARE(packet.toByteArray(), QByteArray("\xF8\x10", 2));
    QCOMPARE(log.texts(), QStringList());
}

void BeaconRecordsTest::packetFromBytesOfAnotherLengthIsLoggedAndStillValid_data()
{
    QTest::addColumn<QByteArray>("bytes");
    QTest::addColumn<QByteArray>("kept");
    QTest::addRow("none") << QByteArray() << QByteArray("\x00\x00", 2);
    QTest::addRow("one") << QByteArray("\x08", 1) << QByteArray("\x08\x00", 2);
    QTest::addRow("three") << QByteArray("\x08\x10\x20", 3) << QByteArray("\x08\x10", 2);
}

void BeaconRecordsTest::packetFromBytesOfAnotherLengthIsLoggedAndStillValid()
{
    QFETCH(const QByteArray, bytes);
    LogCapture log;
    const BeaconPacket packet(bytes);
    QVERIFY(packet.isValid());
    QTEST(packet.toByteArray(), "kept");
    const auto text =
        QStringLiteral(", Attempt to create beacon packet from byte array of incorrect length %1. Expected 2");
    QVERIFY(log.waitFor(text.arg(bytes.size())));
    QVERIFY(log.texts().front().startsWith("Domain/src/DomainLayer/BeaconPacket"));
    QCOMPARE(log.lines().size(), std::size_t(1));
}

void BeaconRecordsTest::packetCopiesShareTheirData()
{
    BeaconPacket target;
    {
        const BeaconPacket source = packetOf(3, 4);
        const BeaconPacket copy(source); // NOLINT(performance-unnecessary-copy-initialization)
        target = copy;
    }
    QVERIFY(target.isValid());
    QCOMPARE(target.toByteArray(), QByteArray("\x18\x04", 2));
    target = BeaconPacket();
    QVERIFY(!target.isValid());
}

void BeaconRecordsTest::packetStreamsAsTwoRawBytes()
{
    QCOMPARE(streamed(packetOf(31, 0x10)), QByteArray("\xF8\x10", 2));
    QDataStream stream(QByteArray("\xF8\x10\x08\x11", 4));
    BeaconPacket first;
    BeaconPacket second;
    stream >> first >> second;
    QVERIFY(first.isValid() && second.isValid());
    QCOMPARE(first.toByteArray(), QByteArray("\xF8\x10", 2));
    QCOMPARE(second.toByteArray(), QByteArray("\x08\x11", 2));
}

void BeaconRecordsTest::packetFromAnExhaustedStreamIsZeroFilled()
{
    QDataStream stream(QByteArray("\x08", 1));
    BeaconPacket packet = packetOf(31, 0xAA);
    stream >> packet;
    QCOMPARE(packet.toByteArray(), QByteArray("\x08\x00", 2));
    QCOMPARE(stream.status(), QDataStream::ReadPastEnd);
}

void BeaconRecordsTest::packetFromAStreamWithoutADeviceIsZeroFilled()
{
    QDataStream stream;
    BeaconPacket packet = packetOf(31, 0xAA);
    stream >> packet;
    QCOMPARE(packet.toByteArray(), QByteArray("\x00\x00", 2));
}

void BeaconRecordsTest::defaultReadingIsEmpty()
{
    const AccelReading reading;
    QCOMPARE(reading.frameNumber(), quint16(0));
    QCOMPARE(int(reading.mode()), 0);
    QCOMPARE(reading.channelData(), QByteArray());
    QCOMPARE(reading.size(), 3);
    QCOMPARE(streamed(reading), QByteArray(3, '\0'));
}

void BeaconRecordsTest::readingKeepsWhatItWasBuiltFrom()
{
    AccelReading reading(0xFFFE, AbstractAccelerometer::AccelMode(2));
    QCOMPARE(reading.frameNumber(), quint16(0xFFFE));
    QCOMPARE(int(reading.mode()), 2);
    QCOMPARE(reading.channelData(), QByteArray());
    reading.setChannelData("abc");
    reading.setChannelData("de");
    QCOMPARE(reading.channelData(), QByteArray("de"));
    QCOMPARE(reading.size(), 5);
}

void BeaconRecordsTest::readingWithFifteenChannelBytesStreamsAsEighteen()
{
    const QByteArray channels("\x00\x01\x02\x03\x04\x05\x06\x07\x08\x09\x0A\x0B\x0C\x0D\xFF", 15);
    AccelReading reading(0x0102, AbstractAccelerometer::AccelMode(0x83));
    reading.setChannelData(channels);
    QCOMPARE(reading.size(), 18);
    QCOMPARE(streamed(reading), QByteArray("\x01\x02\x83", 3) + channels);
}

void BeaconRecordsTest::readingFollowsTheByteOrderOfItsStream()
{
    QByteArray bytes;
    QDataStream stream(&bytes, QIODevice::WriteOnly);
    stream.setByteOrder(QDataStream::LittleEndian);
    stream << AccelReading(0x0102, AbstractAccelerometer::AccelMode(3));
    QCOMPARE(bytes, QByteArray("\x02\x01\x03", 3));
}

void BeaconRecordsTest::readingDetachesBeforeAChange()
{
    AccelReading original(1, AbstractAccelerometer::AccelMode(1));
    original.setChannelData("first");
    AccelReading copy(original);
    copy.setChannelData("second");
    QCOMPARE(original.channelData(), QByteArray("first"));
    original = copy;
    QCOMPARE(original.channelData(), QByteArray("second"));
}

void BeaconRecordsTest::anyModePassesThrough()
{
    for (int mode = 0; mode <= 0xFF; ++mode)
        QCOMPARE(int(AccelReading(0, AbstractAccelerometer::AccelMode(mode)).mode()), mode);
}

void BeaconRecordsTest::copiesMayLiveInManyThreads()
{
    AccelReading reading(1, AbstractAccelerometer::AccelMode(1));
    reading.setChannelData("shared");
    const BeaconPacket packet = packetOf(1, 2);
    std::vector<std::thread> threads;
    std::atomic<int> wrong = 0;
    for (int index = 0; index < 4; ++index)
        threads.emplace_back([reading, packet, &wrong] {
            for (int round = 0; round < 2000; ++round) {
                AccelReading copy(reading);
                copy.setChannelData("own");
                const BeaconPacket same(packet); // NOLINT(performance-unnecessary-copy-initialization)
                wrong += reading.channelData() != "shared" || !same.isValid();
            }
        });
    for (auto& thread : threads)
        thread.join();
    QCOMPARE(wrong.load(), 0);
}

QTEST_GUILESS_MAIN(BeaconRecordsTest)
#include "BeaconRecordsTest.moc"
