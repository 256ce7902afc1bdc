// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/Domain/AudioFixture.h"

#include <QBuffer>
#include <QDir>
#include <QTest>

#include <sys/stat.h>

using TestSupport::AudioFixture;
using TestSupport::CompressedWave;
using TestSupport::loggedTexts;
using TestSupport::noise;
using TestSupport::SdlCalls;
using TestSupport::SoundFixture;
using TestSupport::Wave;

/// What a sound file may be, become and be called.
class AudioFilesTest : public AudioFixture
{
    Q_OBJECT

private slots:
    void unplayableFiles_data();
    void unplayableFiles();
    void compressedFiles_data();
    void compressedFiles();
    void unplayableFileStopsWhatPlays();
    void chunksBeforeTheFormatArePassedOver();
    void fileThatIsTooLargeIsNotRead();
    void fileUnlinkedAfterOpening();
    void fileReplacedByAPipeDoesNotHang();
    void fileReplacedWhileItPlaysIsHeardNextTime();
    void fileTruncatedWhileItPlaysIsHeardToItsEnd();
    void closedFileIsUnreadable();
    void fileOpenForWritingOnlyIsUnreadable();
    void deviceThatIsNoFileIsUnreadable();
    void percentSignsInTheNameAreLoggedAsTheyAre();
    void nameBeyondAsciiIsPlayed();
};

void AudioFilesTest::unplayableFiles_data()
{
    QTest::addColumn<QByteArray>("content");
    const QByteArray whole = Wave{noise(1000, 1)}.file();
    QTest::addRow("empty") << QByteArray();
    QTest::addRow("text") << QByteArray("This is no sound.\n").repeated(100);
    QTest::addRow("random") << noise(5000, 3);
    QTest::addRow("one byte") << QByteArray("R");
    QTest::addRow("header cut short") << whole.left(30);
    QTest::addRow("no data chunk") << whole.left(36);
    QTest::addRow("data cut short") << whole.chopped(1);
    QTest::addRow("data missing") << whole.left(44);
    QTest::addRow("unknown encoding") << QByteArray(whole).replace(20, 2, QByteArray("\x55\x00", 2));
    QTest::addRow("format cut short") << QByteArray(whole).replace(16, 4, QByteArray("\x0e\0\0\0", 4)).remove(34, 2);
    QTest::addRow("13 bits") << QByteArray(whole).replace(34, 2, QByteArray("\x0d\x00", 2));
    QTest::addRow("length beyond everything") << QByteArray(whole).replace(40, 4, QByteArray(4, '\xff'));
    QTest::addRow("other container") << QByteArray(whole).replace(8, 4, "AVI ");
}

void AudioFilesTest::unplayableFiles()
{
    QFETCH(const QByteArray, content);
    QFile file(sound->makeFile("bad.wav", content));
    QVERIFY(file.open(QIODevice::ReadOnly));
    playToTheEnd(&file);
    QCOMPARE(loggedTexts(*log), QStringList{unloadable(file.fileName())});
    QVERIFY(!audio->isPlaying());
    // And the next one is heard.
    const QByteArray samples = noise(1000, 4);
    playToTheEnd(wave(samples));
    audio.reset();
    QCOMPARE(sound->sounds().size(), 1);
    QVERIFY(sound->sounds().front().startsWith(samples));
}

/// The library would decode them by sizes that come from the file, and divide by one of them.
void AudioFilesTest::compressedFiles_data()
{
    QTest::addColumn<QByteArray>("content");
    for (const quint16 encoding : {quint16(2), quint16(0x11)}) {
        const auto row = [encoding](const char* name, CompressedWave wave) {
            wave.encoding = encoding;
            QTest::addRow("%s, encoding %d", name, encoding) << wave.file();
        };
        row("sound", {});
        row("block align 0", {.blockAlign = 0});
        row("block align 1, 65535 samples a block", {.blockAlign = 1, .samplesPerBlock = 0xFFFF});
        row("no samples in a block", {.samplesPerBlock = 0});
        row("no extension", {.formatSize = 18});
        row("no channels", {.channels = 0});
        row("three channels", {.channels = 3});
    }
}

void AudioFilesTest::compressedFiles()
{
    unplayableFiles();
}

void AudioFilesTest::unplayableFileStopsWhatPlays()
{
    audio->play(wave(noise(4000 * SoundFixture::bufferSize, 1)));
    waitForTheStart();
    QFile bad(sound->makeFile("bad.wav", "bad"));
    QVERIFY(bad.open(QIODevice::ReadOnly));
    playToTheEnd(&bad);
    QVERIFY(!audio->isPlaying());
}

void AudioFilesTest::chunksBeforeTheFormatArePassedOver()
{
    const QByteArray samples = noise(SoundFixture::bufferSize, 1);
    const QByteArray content = Wave{samples}.file().insert(12, QByteArray("LIST\5\0\0\0notes", 13));
    QFile file(sound->makeFile("list.wav", content));
    QVERIFY(file.open(QIODevice::ReadOnly));
    playToTheEnd(&file);
    audio.reset();
    QCOMPARE(sound->sounds().join(), samples);
}

/// On a damaged medium a file may be of any size.
void AudioFilesTest::fileThatIsTooLargeIsNotRead()
{
    QFile* const file = wave(noise(1000, 1));
    QVERIFY(QFile::resize(file->fileName(), 64 * 1024 * 1024 + 1));
    playToTheEnd(file);
    QCOMPARE(loggedTexts(*log), QStringList{unloadable(file->fileName())});
    QCOMPARE(SdlCalls::loads.load(), 0);
    QVERIFY(QFile::resize(file->fileName(), 64 * 1024 * 1024));
    playToTheEnd(file);
    QCOMPARE(SdlCalls::loads.load(), 1);
}

void AudioFilesTest::fileUnlinkedAfterOpening()
{
    QFile* const file = wave(noise(1000, 1));
    QVERIFY(QFile::remove(file->fileName()));
    playToTheEnd(file);
    QCOMPARE(loggedTexts(*log), QStringList{unloadable(file->fileName())});
    QVERIFY(!audio->isPlaying());
    QCOMPARE(sound->sounds().size(), 0);
}

void AudioFilesTest::fileReplacedByAPipeDoesNotHang()
{
    QFile* const file = wave(noise(1000, 1));
    QVERIFY(QFile::remove(file->fileName()));
    QCOMPARE(::mkfifo(qPrintable(file->fileName()), 0600), 0);
    playToTheEnd(file);
    QVERIFY(QFile::remove(file->fileName()));
    QVERIFY(QDir().mkdir(file->fileName()));
    playToTheEnd(file);
    QCOMPARE(loggedTexts(*log), QStringList(2, unloadable(file->fileName())));
}

void AudioFilesTest::fileReplacedWhileItPlaysIsHeardNextTime()
{
    const QByteArray old = noise(100 * SoundFixture::bufferSize, 1);
    const QByteArray replacement = noise(2 * SoundFixture::bufferSize, 2);
    QFile* const file = wave(old);
    audio->play(file);
    waitForTheStart();
    sound->makeFile("sound.wav", Wave{replacement}.file());
    waitForTheEnd();
    playToTheEnd(file);
    audio.reset();
    QCOMPARE(sound->sounds().join(), old + replacement);
}

void AudioFilesTest::fileTruncatedWhileItPlaysIsHeardToItsEnd()
{
    const QByteArray samples = noise(100 * SoundFixture::bufferSize, 1);
    audio->play(wave(samples));
    waitForTheStart();
    QVERIFY(QFile::resize(sound->path("sound.wav"), 10));
    waitForTheEnd();
    audio.reset();
    QCOMPARE(sound->sounds().join(), samples);
}

void AudioFilesTest::closedFileIsUnreadable()
{
    QFile file(wave(noise(1000, 1))->fileName());
    playToTheEnd(&file);
    QCOMPARE(loggedTexts(*log), QStringList{unreadable});
    QCOMPARE(SdlCalls::loads.load(), 0);
}

void AudioFilesTest::fileOpenForWritingOnlyIsUnreadable()
{
    QFile file(sound->path("new.wav"));
    QVERIFY(file.open(QIODevice::WriteOnly));
    playToTheEnd(&file);
    QCOMPARE(loggedTexts(*log), QStringList{unreadable});
}

void AudioFilesTest::deviceThatIsNoFileIsUnreadable()
{
    QByteArray content = Wave{noise(1000, 1)}.file();
    QBuffer buffer(&content);
    QVERIFY(buffer.open(QIODevice::ReadOnly));
    playToTheEnd(&buffer);
    audio->play(nullptr);
    flush();
    QCOMPARE(loggedTexts(*log), QStringList(2, unreadable));
}

void AudioFilesTest::percentSignsInTheNameAreLoggedAsTheyAre()
{
    QFile file(sound->makeFile("100%s %n.wav", "bad"));
    QVERIFY(file.open(QIODevice::ReadOnly));
    playToTheEnd(&file);
    QCOMPARE(loggedTexts(*log), QStringList{unloadable(file.fileName())});
}

void AudioFilesTest::nameBeyondAsciiIsPlayed()
{
    const QByteArray samples = noise(SoundFixture::bufferSize, 1);
    playToTheEnd(wave(samples, QStringLiteral("m\u00fcsik \u20ac\n.wav")));
    audio.reset();
    QCOMPARE(sound->sounds().join(), samples);
}

QTEST_GUILESS_MAIN(AudioFilesTest)
#include "AudioFilesTest.moc"
