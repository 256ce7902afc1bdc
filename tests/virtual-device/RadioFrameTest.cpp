// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/radio/RadioFrame.h"

#include "virtual-device/radio/RadioFrameReader.h"
#include "virtual-device/radio/RadioProtocol.h"

#include <QTest>

#include <random>

using namespace VirtualDevice;
using Finding = RadioFrameReader::Finding;
using Event = RadioFrameReader::Event;

namespace
{

QByteArray bytes(const char* hex)
{
    return QByteArray::fromHex(hex);
}

/// What the reader makes of a stream, the frames' payloads and the names of the findings in order.
QStringList read(RadioFrameReader& reader, const QByteArray& stream)
{
    static const QStringList names{"frame", "stray", "header sum", "length", "data sum", "end byte"};
    QStringList result;
    for (const auto& event : reader.feed(stream))
        result.append(event.finding == Finding::Frame ? QString::fromLatin1(event.payload.toHex(' '))
                                                      : names[static_cast<int>(event.finding)]);
    return result;
}

} // namespace

class RadioFrameTest : public QObject
{
    Q_OBJECT

private slots:
    void framesAreBuiltAndReadByteForByte_data()
    {
        QTest::addColumn<QByteArray>("payload");
        QTest::addColumn<QByteArray>("frame");
        QTest::newRow("empty") << bytes("") << bytes("7c 0000 0000 007c 0a");
        QTest::newRow("ping") << bytes("7e") << bytes("7c 0001 007e 00fb 7e 0a");
        QTest::newRow("acknowledgement") << bytes("fe") << bytes("7c 0001 00fe 017b fe 0a");
        QTest::newRow("refusal") << bytes("ff05") << bytes("7c 0002 0104 0083 ff05 0a");
        QTest::newRow("start of the RF test") << bytes("602802") << bytes("7c 0003 008a 0109 602802 0a");
        QTest::newRow("version reply") << bytes("710105") << bytes("7c 0003 0077 00f6 710105 0a");
        QTest::newRow("text") << bytes("7b4869") << bytes("7c 0003 012c 00ac 7b4869 0a");
        QTest::newRow("payload of start and end bytes") << bytes("7c0a7c") << bytes("7c 0003 0102 0082 7c0a7c 0a");
        QTest::newRow("100 bytes of 0xff")
            << QByteArray(100, '\xff') << bytes("7c 0064 639c 01df") + QByteArray(100, '\xff') + bytes("0a");
    }

    void framesAreBuiltAndReadByteForByte()
    {
        QFETCH(QByteArray, payload);
        QFETCH(QByteArray, frame);
        QCOMPARE(radioFrame(payload).toHex(' '), frame.toHex(' '));
        RadioFrameReader reader;
        const QList<Event> expected{{Finding::Frame, payload, static_cast<int>(payload.size())}};
        QVERIFY(reader.feed(frame) == expected);
    }

    void everythingThatIsNoFrameIsReportedOnceAndTheNextFrameArrives_data()
    {
        QTest::addColumn<QByteArray>("stream");
        QTest::addColumn<QStringList>("findings");
        const QByteArray ping = bytes("7c 0001 007e 00fb 7e 0a");
        QTest::newRow("noise before") << bytes("00 11 22 33") + ping << QStringList{"stray", "7e"};
        QTest::newRow("header sum") << bytes("7c 0001 007e 00fc 7e 0a") + ping << QStringList{"header sum", "7e"};
        QTest::newRow("data sum") << bytes("7c 0001 007e 00fb 7d 0a") + ping << QStringList{"data sum", "7e"};
        QTest::newRow("end byte") << bytes("7c 0001 007e 00fb 7e 0b") + ping << QStringList{"end byte", "7e"};
        QTest::newRow("101 bytes claimed") << bytes("7c 0065 0000 00e1") + ping << QStringList{"length", "7e"};
        QTest::newRow("65535 bytes claimed") << bytes("7c ffff 0000 027a") + ping << QStringList{"length", "7e"};
        QTest::newRow("start bytes only") << QByteArray(20, '\x7c') + ping << QStringList{"header sum", "7e"};
        QTest::newRow("a frame inside a damaged one")
            << bytes("7c 0009 0000 0085") + ping + bytes("0a") + ping << QStringList{"data sum", "7e", "stray", "7e"};
        QTest::newRow("a lost byte") << bytes("7c 0003 008a 0109 6028 0a") + ping << QStringList{"data sum", "7e"};
        QTest::newRow("noise twice") << bytes("55") + ping + bytes("55 55") + ping
                                     << QStringList{"stray", "7e", "stray", "7e"};
    }

    void everythingThatIsNoFrameIsReportedOnceAndTheNextFrameArrives()
    {
        QFETCH(QByteArray, stream);
        QFETCH(QStringList, findings);
        RadioFrameReader reader;
        QCOMPARE(read(reader, stream), findings);
        RadioFrameReader byteByByte;
        QStringList found;
        for (const char byte : stream)
            found += read(byteByByte, QByteArray(1, byte));
        QCOMPARE(found, findings);
    }

    void anUnfinishedFrameWaitsUntilItIsForgotten()
    {
        RadioFrameReader reader;
        QCOMPARE(read(reader, bytes("7c 0001 007e 00")), QStringList{});
        reader.clear();
        QCOMPARE(read(reader, bytes("7c 0001 007e 00fb 7e 0a")), QStringList{"7e"});
    }

    void randomFramesInRandomPiecesArriveInOrder()
    {
        std::mt19937 random(7);
        QByteArray stream;
        QStringList payloads;
        for (int frame = 0; frame < 500; ++frame) {
            QByteArray payload(static_cast<int>(random() % 101), Qt::Uninitialized);
            for (char& byte : payload)
                byte = static_cast<char>(random());
            payloads.append(QString::fromLatin1(payload.toHex(' ')));
            stream += radioFrame(payload);
        }
        RadioFrameReader reader;
        QStringList found;
        for (qsizetype at = 0; at < stream.size();) {
            const auto size = static_cast<qsizetype>(1 + random() % 50);
            found += read(reader, stream.mid(at, size));
            at += size;
        }
        QCOMPARE(found, payloads);
    }

    void everyCommandHasOneShape()
    {
        QSet<int> codes;
        for (const auto& shape : RadioProtocol::commandShapes)
            codes.insert(static_cast<int>(shape.command));
        const QSet<int> expected{0x02, 0x20, 0x21, 0x22, 0x30, 0x60, 0x61, 0x62, 0x64, 0x65, 0x70, 0x7E};
        QCOMPARE(codes, expected);
        QCOMPARE(codes.size(), static_cast<qsizetype>(RadioProtocol::commandShapes.size()));
    }
};

QTEST_GUILESS_MAIN(RadioFrameTest)
#include "RadioFrameTest.moc"
