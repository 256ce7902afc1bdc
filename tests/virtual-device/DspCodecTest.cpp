// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/dsp/DspPacket.h"
#include "virtual-device/dsp/SensorFrame.h"

#include <QTest>

using namespace VirtualDevice;
using namespace DspProtocol;

namespace
{

QByteArray bytes(const char* hex)
{
    return QByteArray::fromHex(hex);
}

} // namespace

class DspCodecTest : public QObject
{
    Q_OBJECT

private slots:
    void requestsAreRead()
    {
        const auto packet = DspPacket::parsed(bytes("0300 0000 07000000 2f6473702e6f7574"));
        QVERIFY(packet);
        QCOMPARE(packet->kind, PacketKind::Load);
        QCOMPARE(packet->serial, 7U);
        QCOMPARE(packet->body, QByteArray("/dsp.out"));
    }

    void theReservedFieldIsIgnored()
    {
        const auto packet = DspPacket::parsed(bytes("0100 ffff 01000000 01000000"));
        QVERIFY(packet);
        QCOMPARE(packet->kind, PacketKind::Attach);
        QCOMPARE(dspWord(packet->body, 0), 1U);
    }

    void aPacketShorterThanItsHeaderIsNone()
    {
        QVERIFY(!DspPacket::parsed(bytes("")));
        QVERIFY(!DspPacket::parsed(bytes("01000000000000")));
        QVERIFY(DspPacket::parsed(bytes("0100000000000000")));
    }

    void repliesAreBuiltByteForByte()
    {
        QCOMPARE(DspPacket::reply(0x01020304, Status::Done, 1).toHex(' '),
                 bytes("8000 0000 04030201 00800000 01000000").toHex(' '));
        QCOMPARE(DspPacket::reply(2, Status::WrongState).toHex(' '),
                 bytes("8000 0000 02000000 1b800080 00000000").toHex(' '));
    }

    void messagesAreBuiltByteForByte()
    {
        QCOMPARE(DspPacket::message(0x00010003, 100, dspData(0x1100B, bytes("09000100"))).toHex(' '),
                 bytes("0001 0000 00000000 03000100"                    // packet, destination
                       "0000000000000000 0000 0000 2000 0300 ffff 6400" // message header
                       "0b100100 04000000 09000100")
                     .toHex(' '));
    }

    void theLengthWordCanBeWrong()
    {
        QCOMPARE(dspData(0x11002, "ab", 5).toHex(), QByteArray("02100100070000006162"));
        QCOMPARE(dspData(0x11002, "ab", -3).toHex(), QByteArray("02100100ffffffff6162"));
    }

    void numbersBeyondTheEndAreZero()
    {
        QCOMPARE(dspWord(bytes("010203"), 0), 0U);
        QCOMPARE(dspWord(bytes("01020304"), 0), 0x04030201U);
        QCOMPARE(dspHalfWord(bytes("0102"), 1), quint16(0));
        QCOMPARE(dspHalfWord(bytes("0102"), 0), quint16(0x0201));
    }

    void aSensorFrameIsLaidOutByteForByte()
    {
        const QByteArray data =
            SensorFrame{.number = 0x0102, .sensors = 2, .types = SensorFrame::Types::Mixed, .slotSize = 7}.data();
        QCOMPARE(data.size(), 4 + 16 * 7 + 32);
        QCOMPARE(data.first(4).toHex(), QByteArray("02017000"));
        QCOMPARE(data.mid(4, 7).toHex(), QByteArray("010064c8000203"));
        QCOMPARE(data.mid(11, 7).toHex(), QByteArray("011f65c7011314"));
        QCOMPARE(data.mid(18, 14 * 7), QByteArray(14 * 7, '\0'));
        QCOMPARE(data.last(32).first(3).toHex(), QByteArray("020304"));
    }

    void sensorTypesFollowTheSlot()
    {
        SensorFrame frame;
        QCOMPARE(frame.typeOf(15), 0);
        frame.types = SensorFrame::Types::ThirtyOne;
        QCOMPARE(frame.typeOf(0), 31);
        frame.types = SensorFrame::Types::TooHigh;
        QCOMPARE(frame.typeOf(0), 32);
    }

    void theLargestSlotsStillFitIntoAMessage()
    {
        QCOMPARE(SensorFrame::naturalSlotSize(1), 65);
        QCOMPARE(SensorFrame::naturalSlotSize(2), 124);
        const QByteArray data = SensorFrame{.slotSize = SensorFrame::naturalSlotSize(2)}.data();
        QVERIFY(DspPacket::message(1, 100, dspData(0x11005, data)).size() <= longestPacket);
    }
};

QTEST_GUILESS_MAIN(DspCodecTest)
#include "DspCodecTest.moc"
