// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/FrameParser.h"

#include "tests/Domain/Frames.h"

#include <QTest>

using Domain::FrameParser;
using TestSupport::DamageRates;
using TestSupport::frameOf;
using TestSupport::Generator;

namespace
{

/// More than a frame that can still be waited for, and no start byte in it.
const QByteArray silence(200, '\0');

struct Parsed
{
    QList<QByteArray> payloads;
    int refusals = 0;
};

void parse(FrameParser& parser, const QByteArray& bytes, Parsed& parsed)
{
    parser.append(bytes);
    parser.parse([&](FrameParser::Outcome outcome, QByteArrayView payload) {
        if (outcome == FrameParser::Outcome::FrameReceived)
            parsed.payloads.append(payload.toByteArray());
        else
            ++parsed.refusals;
    });
}

QList<QByteArray> payloadsIn(const QByteArray& bytes)
{
    FrameParser parser;
    Parsed parsed;
    parse(parser, bytes, parsed);
    return parsed.payloads;
}

/// The payloads come in order, with nothing but additional ones between them.
bool contains(const QList<QByteArray>& received, const QList<QByteArray>& expected)
{
    auto next = expected.begin();
    for (const auto& payload : received)
        if (next != expected.end() && payload == *next)
            ++next;
    return next == expected.end();
}

} // namespace

class FrameParserTest : public QObject
{
    Q_OBJECT

private slots:
    void everyPayloadLengthUpToTheLimitIsAccepted();
    void randomFramesInRandomPiecesArriveInOrder_data();
    void randomFramesInRandomPiecesArriveInOrder();
    void everyFrameAfterGarbageIsFound_data();
    void everyFrameAfterGarbageIsFound();
    void aFrameAfterOneWithAnyByteFlippedIsFound_data();
    void aFrameAfterOneWithAnyByteFlippedIsFound();
    void aFrameAfterATruncatedOneIsFound_data();
    void aFrameAfterATruncatedOneIsFound();
    void aFrameInsideTheClaimOfAFalseHeaderIsFound();
    void aFrameAtTheVeryEndOfAReadOfAnySizeIsFound();
    void framesAcrossReadsLongerThanTheStorageAreFound();
    void aVisitorMayAppendAndParse();
    void everyRefusalIsReportedOnceAByte();
    void theSumOfTheFirstBytesLeavesOutThoseBehind_data();
    void theSumOfTheFirstBytesLeavesOutThoseBehind();
    void anIntactFrameIsNeverLostToDamageElsewhere_data();
    void anIntactFrameIsNeverLostToDamageElsewhere();
};

void FrameParserTest::everyPayloadLengthUpToTheLimitIsAccepted()
{
    QByteArray stream;
    QList<QByteArray> expected;
    for (int length = 0; length <= 100; ++length) {
        expected.append(QByteArray(length, '\xFF'));
        stream += frameOf(expected.last());
    }
    QCOMPARE(payloadsIn(stream), expected);
    QCOMPARE(payloadsIn(frameOf(QByteArray(101, 'x')) + silence), QList<QByteArray>());
}

void FrameParserTest::randomFramesInRandomPiecesArriveInOrder_data()
{
    QTest::addColumn<unsigned>("seed");
    QTest::addColumn<int>("longestPiece");
    unsigned seed = 1;
    for (const int longestPiece : {1, 2, 7, 46, 300, 4096, 100000})
        QTest::addRow("pieces of up to %d bytes", longestPiece) << seed++ << longestPiece;
}

void FrameParserTest::randomFramesInRandomPiecesArriveInOrder()
{
    QFETCH(const unsigned, seed);
    QFETCH(const int, longestPiece);
    Generator generator(seed);
    const auto payloads = TestSupport::randomPayloads(generator, 2000);
    QByteArray stream;
    for (const auto& payload : payloads)
        stream += frameOf(payload);
    FrameParser parser;
    Parsed parsed;
    for (const auto& piece : TestSupport::randomPieces(generator, stream, longestPiece))
        parse(parser, piece, parsed);
    QVERIFY(parsed.payloads == payloads);
    QCOMPARE(parsed.refusals, 0);
}

void FrameParserTest::everyFrameAfterGarbageIsFound_data()
{
    QTest::addColumn<unsigned>("seed");
    QTest::addColumn<int>("longestGarbage");
    QTest::addColumn<bool>("startBytesOnly");
    QTest::addRow("short") << 11U << 8 << false;
    QTest::addRow("up to a frame") << 12U << 108 << false;
    QTest::addRow("long") << 13U << 3000 << false;
    QTest::addRow("start bytes") << 14U << 300 << true;
}

void FrameParserTest::everyFrameAfterGarbageIsFound()
{
    QFETCH(const unsigned, seed);
    QFETCH(const int, longestGarbage);
    QFETCH(const bool, startBytesOnly);
    Generator generator(seed);
    const auto payloads = TestSupport::randomPayloads(generator, 1000);
    QByteArray stream;
    for (const auto& payload : payloads) {
        const int length = TestSupport::randomBetween(generator, 0, longestGarbage);
        stream += startBytesOnly ? QByteArray(length, '|') : TestSupport::randomBytes(generator, length);
        stream += frameOf(payload);
    }
    FrameParser parser;
    Parsed parsed;
    for (const auto& piece : TestSupport::randomPieces(generator, stream + silence, 200))
        parse(parser, piece, parsed);
    QVERIFY(parsed.payloads == payloads);
}

void FrameParserTest::aFrameAfterOneWithAnyByteFlippedIsFound_data()
{
    QTest::addColumn<QByteArray>("payload");
    QTest::addRow("no payload") << QByteArray();
    QTest::addRow("ping reply") << QByteArray("\x7F");
    QTest::addRow("start bytes") << QByteArray(20, '|');
    QTest::addRow("a frame within") << frameOf("inner").left(11) + "REST";
    QTest::addRow("longest") << QByteArray(100, '\x01');
}

void FrameParserTest::aFrameAfterOneWithAnyByteFlippedIsFound()
{
    QFETCH(const QByteArray, payload);
    const QByteArray good = frameOf(payload);
    for (qsizetype index = 0; index < good.size(); ++index) {
        for (int flip = 1; flip <= 255; ++flip) {
            QByteArray bad = good;
            bad[index] = static_cast<char>(bad[index] ^ flip);
            const auto payloads = payloadsIn(bad + frameOf("next") + silence);
            if (payloads != QList<QByteArray>{"next"})
                QFAIL(qPrintable(QString("byte %1 flipped by %2").arg(index).arg(flip)));
        }
    }
}

void FrameParserTest::aFrameAfterATruncatedOneIsFound_data()
{
    aFrameAfterOneWithAnyByteFlippedIsFound_data();
}

void FrameParserTest::aFrameAfterATruncatedOneIsFound()
{
    QFETCH(const QByteArray, payload);
    const QByteArray good = frameOf(payload);
    for (qsizetype length = 0; length < good.size(); ++length) {
        const auto payloads = payloadsIn(good.left(length) + frameOf("next") + silence);
        if (payloads != QList<QByteArray>{"next"})
            QFAIL(qPrintable(QString("first %1 bytes").arg(length)));
    }
}

void FrameParserTest::aFrameInsideTheClaimOfAFalseHeaderIsFound()
{
    const QByteArray claim = frameOf(QByteArray(), 100, 1).left(7);
    QCOMPARE(payloadsIn(claim + frameOf("one") + frameOf("two") + silence), (QList<QByteArray>{"one", "two"}));
}

void FrameParserTest::aFrameAtTheVeryEndOfAReadOfAnySizeIsFound()
{
    constexpr int storage = 16 * 1024;
    const QByteArray frame = frameOf("last");
    FrameParser parser;
    // Ends that lie before, at and behind the end of what the parser keeps at hand, with old bytes behind them or none.
    for (int size = storage - 250; size < storage + 250; ++size) {
        Parsed parsed;
        parse(parser, QByteArray(size - frame.size(), '\xFF') + frame, parsed);
        parse(parser, frame, parsed);
        QCOMPARE(parsed.payloads, (QList<QByteArray>{"last", "last"}));
    }
}

void FrameParserTest::framesAcrossReadsLongerThanTheStorageAreFound()
{
    Generator generator(17);
    FrameParser parser;
    for (const int size : {300'000, 46, 16 * 1024, 1'000'000, 1, 20'000}) {
        // Pieces pile up unparsed.
        const auto payloads = TestSupport::randomPayloads(generator, 3000);
        QByteArray stream;
        for (const auto& payload : payloads)
            stream += frameOf(payload);
        const QByteArray allButTheEnd = stream.chopped(1);
        for (qsizetype done = 0; done < allButTheEnd.size(); done += size)
            parser.append(allButTheEnd.mid(done, size));
        Parsed parsed;
        parse(parser, {}, parsed);
        QCOMPARE(parsed.payloads.size(), payloads.size() - 1);
        parse(parser, stream.last(1), parsed);
        QVERIFY(parsed.payloads == payloads);
        QCOMPARE(parsed.refusals, 0);
    }
}

void FrameParserTest::aVisitorMayAppendAndParse()
{
    QByteArray rest;
    QList<QByteArray> expected{"one", "two"};
    for (int number = 0; number < 1000; ++number) {
        expected.append(QByteArray::number(number));
        rest += frameOf(expected.last());
    }
    FrameParser parser;
    QList<QByteArray> received;
    const auto take = [&](FrameParser::Outcome /*outcome*/, QByteArrayView payload) {
        received.append(payload.toByteArray());
    };
    parser.append(frameOf("one") + frameOf("two").chopped(1));
    parser.parse([&](FrameParser::Outcome outcome, QByteArrayView payload) {
        take(outcome, payload);
        // More than the storage holds, so that it moves.
        parser.append("\n" + rest);
        parser.parse(take);
    });
    QVERIFY(received == expected);
}

void FrameParserTest::everyRefusalIsReportedOnceAByte()
{
    FrameParser parser;
    Parsed parsed;
    // The last six start bytes still wait for a header's rest.
    parse(parser, QByteArray(100, '|'), parsed);
    QCOMPARE(parsed.refusals, 94);
    parse(parser, silence, parsed);
    QCOMPARE(parsed.refusals, 100);
}

void FrameParserTest::theSumOfTheFirstBytesLeavesOutThoseBehind_data()
{
    QTest::addColumn<QByteArray>("bytes");
    Generator generator(18);
    QTest::addRow("largest") << QByteArray(Domain::FrameChecksum::summedBytes, '\xFF');
    QTest::addRow("random") << TestSupport::randomBytes(generator, Domain::FrameChecksum::summedBytes);
    QTest::addRow("one bit each") << QByteArray(Domain::FrameChecksum::summedBytes, '\x01');
}

void FrameParserTest::theSumOfTheFirstBytesLeavesOutThoseBehind()
{
    QFETCH(const QByteArray, bytes);
    quint16 expected = 0;
    const auto size = static_cast<quint16>(bytes.size());
    for (quint16 length = 0; length <= size; ++length) {
        QCOMPARE(Domain::FrameChecksum::ofFirst(length, bytes.constData()), expected);
        QCOMPARE(Domain::FrameChecksum::ofFirstInLanes(length, bytes.constData()), expected);
        QCOMPARE(Domain::Frame::checksumOf(bytes.first(length)), expected);
        if (length < size)
            expected = static_cast<quint16>(expected + static_cast<uchar>(bytes.at(length)));
    }
}

void FrameParserTest::anIntactFrameIsNeverLostToDamageElsewhere_data()
{
    QTest::addColumn<unsigned>("seed");
    QTest::addColumn<DamageRates>("rates");
    QTest::addRow("0.1 %% altered") << 21U << DamageRates{.altered = 0.001};
    QTest::addRow("1 %% altered") << 22U << DamageRates{.altered = 0.01};
    QTest::addRow("10 %% altered") << 23U << DamageRates{.altered = 0.1};
    QTest::addRow("1 %% dropped") << 24U << DamageRates{.dropped = 0.01};
    QTest::addRow("1 %% inserted") << 25U << DamageRates{.inserted = 0.01};
}

void FrameParserTest::anIntactFrameIsNeverLostToDamageElsewhere()
{
    QFETCH(const unsigned, seed);
    QFETCH(const DamageRates, rates);
    constexpr int batches = 300;
    constexpr int framesEach = 1000;
    Generator generator(seed);
    FrameParser parser;
    for (int batch = 0; batch < batches; ++batch) {
        const auto stream = TestSupport::damaged(generator, TestSupport::randomPayloads(generator, framesEach), rates);
        Parsed parsed;
        for (const auto& piece : TestSupport::randomPieces(generator, stream.bytes + silence, 200))
            parse(parser, piece, parsed);
        QVERIFY(contains(parsed.payloads, stream.intactPayloads));
        QVERIFY(parsed.refusals > 0);
    }
}

QTEST_APPLESS_MAIN(FrameParserTest)
#include "FrameParserTest.moc"
