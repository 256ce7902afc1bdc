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
    for (auto outcome = parser.advance(); outcome != FrameParser::Outcome::NeedsMoreBytes; outcome = parser.advance()) {
        if (outcome == FrameParser::Outcome::FrameReceived)
            parsed.payloads.append(parser.payload().toByteArray());
        else
            ++parsed.refusals;
    }
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
    void everyRefusalIsReportedOnceAByte();
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
    constexpr int storage = 64 * 1024;
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
    constexpr int batches = 60;
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
