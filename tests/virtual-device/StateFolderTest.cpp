// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/sandbox/StateFolder.h"

#include "tests/support/Repetition.h"
#include "virtual-device/audio/SoundMatcher.h"

#include <QDir>
#include <QFile>
#include <QTemporaryDir>
#include <QTest>
#include <QtEndian>

class StateFolderTest : public QObject
{
    Q_OBJECT

private slots:
    void laysOutWhatTheProgramExpects();
    void keepsWhatIsThereAlready();
    void folderThatCannotBeMadeIsReported();
    void testSoundIsSixteenKilohertzMonoSixteenBit();
    void testSoundCanBeHeard();
    void noPartOfTheTestSoundIsLikeAnother();
};

void StateFolderTest::laysOutWhatTheProgramExpects()
{
    const QTemporaryDir folder;
    QCOMPARE(VirtualDevice::prepareState(folder.path()), std::nullopt);
    for (const char* name : {"mnt/boot", "mnt/data", "mnt/sysdata", "etc/sounds"})
        QVERIFY2(QDir(folder.filePath(name)).isEmpty() == (QString(name) != "etc/sounds"), name);
    for (const char* name : {"dsp.out", "etc/sounds/TestSound.wav"})
        QVERIFY2(QFile(folder.filePath(name)).size() > 0, name);
}

void StateFolderTest::keepsWhatIsThereAlready()
{
    const QTemporaryDir folder;
    QFile image(folder.filePath("dsp.out"));
    QVERIFY(image.open(QIODevice::WriteOnly));
    image.write("mine");
    image.close();
    QCOMPARE(VirtualDevice::prepareState(folder.path()), std::nullopt);
    QVERIFY(image.open(QIODevice::ReadOnly));
    QCOMPARE(image.readAll(), "mine");
}

void StateFolderTest::folderThatCannotBeMadeIsReported()
{
    const QTemporaryDir folder;
    QFile inTheWay(folder.filePath("mnt"));
    QVERIFY(inTheWay.open(QIODevice::WriteOnly));
    QCOMPARE(VirtualDevice::prepareState(folder.path()), folder.path() + "/mnt/boot: cannot be made");
}

void StateFolderTest::testSoundIsSixteenKilohertzMonoSixteenBit()
{
    const QByteArray sound = VirtualDevice::testSound();
    const auto word = [&](qsizetype offset) { return qFromLittleEndian<quint32>(sound.constData() + offset); };
    const auto half = [&](qsizetype offset) { return qFromLittleEndian<quint16>(sound.constData() + offset); };
    QCOMPARE(sound.left(4), "RIFF");
    QCOMPARE(word(4), quint32(sound.size() - 8));
    QCOMPARE(sound.mid(8, 8), "WAVEfmt ");
    QCOMPARE(word(16), 16U);     // length of the format
    QCOMPARE(half(20), 1);       // plain samples
    QCOMPARE(half(22), 1);       // channels
    QCOMPARE(word(24), 16'000U); // samples a second
    QCOMPARE(word(28), 32'000U); // bytes a second
    QCOMPARE(half(32), 2);       // bytes a sample
    QCOMPARE(half(34), 16);      // bits a sample
    QCOMPARE(sound.mid(36, 4), "data");
    QCOMPARE(word(40), quint32(sound.size() - 44));
    QCOMPARE(word(40), 32'000U);
}

void StateFolderTest::testSoundCanBeHeard()
{
    const QByteArray sound = VirtualDevice::testSound();
    int loudest = 0;
    for (qsizetype offset = 44; offset < sound.size(); offset += 2)
        loudest = std::max(loudest, std::abs(int(qFromLittleEndian<qint16>(sound.constData() + offset))));
    QVERIFY(loudest > 10'000);
}

void StateFolderTest::noPartOfTheTestSoundIsLikeAnother()
{
    const QByteArray samples = VirtualDevice::testSound().mid(44);
    QVERIFY(!TestSupport::hasRepeatedBuffer(samples, VirtualDevice::SoundMatcher::bufferSize));
}

QTEST_GUILESS_MAIN(StateFolderTest)
#include "StateFolderTest.moc"
