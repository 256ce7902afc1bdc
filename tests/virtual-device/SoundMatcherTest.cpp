// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/audio/SoundMatcher.h"

#include <QTest>

using namespace VirtualDevice;
using Verdict = SoundMatcher::Verdict;

namespace
{

constexpr qsizetype bufferSize = SoundMatcher::bufferSize;

/// Bytes that are never zero and differ from buffer to buffer.
QByteArray tone(qsizetype size)
{
    QByteArray bytes(size, Qt::Uninitialized);
    for (qsizetype index = 0; index < size; ++index)
        bytes[index] = static_cast<char>(1 + (index + index / bufferSize) % 250);
    return bytes;
}

QByteArray padded(QByteArray bytes)
{
    const auto missing = bufferSize - bytes.size();
    return bytes.append(missing, '\0');
}

const QByteArray silence(bufferSize, '\0');
const QByteArray sound = tone(2 * bufferSize + 100);
const QByteArray one = sound.first(bufferSize);
const QByteArray two = sound.mid(bufferSize, bufferSize);
const QByteArray three = padded(sound.mid(2 * bufferSize));

/// "S" sound, "B" sound that begins, "." silence, "X" mismatch.
QString verdicts(SoundMatcher& matcher, const QList<QByteArray>& buffers)
{
    QString result;
    for (const auto& buffer : buffers) {
        const auto judgement = matcher.judge(buffer);
        if (judgement.verdict == Verdict::Sound)
            result += judgement.begins ? u'B' : u'S';
        else
            result += judgement.verdict == Verdict::Silence ? u'.' : u'X';
    }
    return result;
}

} // namespace

class SoundMatcherTest : public QObject
{
    Q_OBJECT

private slots:
    void streamsAreJudgedBufferByBuffer_data()
    {
        QTest::addColumn<QList<QByteArray>>("buffers");
        QTest::addColumn<QString>("expected");
        using Buffers = QList<QByteArray>;
        QTest::newRow("silence") << Buffers{silence, silence} << "..";
        QTest::newRow("whole sounds") << Buffers{silence, one, two, three, silence, one, two, three} << ".BSS.BSS";
        QTest::newRow("without a gap") << Buffers{one, two, three, one, two, three} << "BSSBSS";
        QTest::newRow("cut and begun again") << Buffers{one, two, silence, one, two, three} << "BS.BSS";
        QTest::newRow("begun again at once") << Buffers{one, two, one, two, three} << "BSBSS";
        QTest::newRow("paused and gone on") << Buffers{one, silence, silence, two, three} << "B..SS";
        QTest::newRow("a hole") << Buffers{one, three, silence} << "BX.";
        QTest::newRow("begun in the middle") << Buffers{silence, two, three} << ".XS";
        QTest::newRow("a damaged buffer") << Buffers{one, two.chopped(1) + '\xfe', three, silence, one} << "BXS.B";
        QTest::newRow("something else before the sound")
            << Buffers{silence, tone(bufferSize - 1) + '\xfe', one, two} << ".XBS";
        QTest::newRow("something else within the sound")
            << Buffers{one, tone(bufferSize - 1).append('\7'), two, three} << "BXXS";
        QTest::newRow("noise behind the end") << Buffers{one, two, three.chopped(1) + '\1', silence} << "BSX.";
    }

    void streamsAreJudgedBufferByBuffer()
    {
        QFETCH(QList<QByteArray>, buffers);
        QFETCH(QString, expected);
        SoundMatcher matcher;
        matcher.setSound(sound);
        QCOMPARE(verdicts(matcher, buffers), expected);
    }

    void theLastBufferSaysHowMuchOfItSounds()
    {
        SoundMatcher matcher;
        matcher.setSound(sound);
        QCOMPARE(matcher.judge(one).soundBytes, bufferSize);
        QCOMPARE(matcher.judge(two).soundBytes, bufferSize);
        QVERIFY(!matcher.isBetweenSounds());
        QCOMPARE(matcher.judge(three).soundBytes, 100);
        QVERIFY(matcher.isBetweenSounds());
    }

    void aSoundThatBeginsSilentlyBeginsWhereItIsHeard()
    {
        SoundMatcher matcher;
        matcher.setSound(silence + silence + one + silence + padded("end"));
        QCOMPARE(verdicts(matcher, {silence, silence, silence, one, silence, padded("end"), silence}),
                 QStringLiteral("...BSS."));
    }

    void withoutASoundOnlySilenceIsRight()
    {
        SoundMatcher matcher;
        QCOMPARE(verdicts(matcher, {silence, one}), QStringLiteral(".X"));
        matcher.setSound(silence);
        QCOMPARE(verdicts(matcher, {silence, one}), QStringLiteral(".X"));
    }

    void aNewProgramBeginsAnew()
    {
        SoundMatcher matcher;
        matcher.setSound(sound);
        QCOMPARE(verdicts(matcher, {one}), QStringLiteral("B"));
        matcher.clear();
        QCOMPARE(verdicts(matcher, {two}), QStringLiteral("X"));
    }

    void theSamplesOfAWavFileAreFound_data()
    {
        QTest::addColumn<QByteArray>("file");
        QTest::addColumn<QByteArray>("samples");
        const QByteArray head = QByteArray("RIFF\x24\0\0\0WAVE", 12);
        const QByteArray format = QByteArray("fmt \4\0\0\0abcd", 12);
        const QByteArray odd = QByteArray("LIST\3\0\0\0abc\0", 12);
        const QByteArray data = QByteArray("data\4\0\0\0\1\2\3\4", 12);
        QTest::newRow("plain") << head + format + data << QByteArray("\1\2\3\4");
        QTest::newRow("behind an odd chunk") << head + format + odd + data << QByteArray("\1\2\3\4");
        QTest::newRow("something behind") << head + data + odd << QByteArray("\1\2\3\4");
        QTest::newRow("cut off") << head + data.chopped(2) << QByteArray("\1\2");
        QTest::newRow("no data") << head + format << QByteArray();
        QTest::newRow("huge chunk") << head + QByteArray("LIST\xff\xff\xff\xff", 8) + data << QByteArray();
        QTest::newRow("no WAV") << QByteArray("RIFF1234AVI data") << QByteArray();
        QTest::newRow("empty") << QByteArray() << QByteArray();
    }

    void theSamplesOfAWavFileAreFound()
    {
        QFETCH(QByteArray, file);
        QFETCH(QByteArray, samples);
        QCOMPARE(wavSamples(file), samples);
    }
};

QTEST_GUILESS_MAIN(SoundMatcherTest)
#include "SoundMatcherTest.moc"
