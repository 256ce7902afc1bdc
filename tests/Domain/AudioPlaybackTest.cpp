// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/AudioFeed.h"
#include "tests/Domain/AudioFixture.h"

#include <QMetaMethod>
#include <QSignalSpy>
#include <QTest>
#include <QThread>

using Domain::AbstractAudio;
using Domain::Audio;
using TestSupport::AudioFixture;
using TestSupport::loggedTexts;
using TestSupport::noise;
using TestSupport::SdlCalls;
using TestSupport::SoundFixture;
using TestSupport::Wave;

/// From the open device to what is heard; files and requests have programs of their own.
class AudioPlaybackTest : public AudioFixture
{
    Q_OBJECT

private slots:
    void signalsAndSlotsAreDeclared();
    void deviceIsOpenedForSixteenKilohertzMonoAndPaused();
    void feedHandsOverEveryByteAndThenPauses();
    void feedLeavesTheRestOfAShortChunkAlone();
    void soundsOfEverySizeAreHeardByteForByte_data();
    void soundsOfEverySizeAreHeardByteForByte();
    void playingEndsAfterTheLastByte();
    void completeIsNeverEmitted();
    void sameSoundAgainStartsFromItsBeginning();
    void openFileIsRewound();
    void secondSoundReplacesTheFirst();
    void stopCutsTheSound();
    void stopEmitsNothing();
    void pauseAndResumeLoseNothing();
    void resumeAfterTheEndPausesAgain();
    void otherFormatIsHandedOverAsItIs();
};

void AudioPlaybackTest::signalsAndSlotsAreDeclared()
{
    const QMetaObject& meta = Audio::staticMetaObject;
    for (const char* const slot : {"play(QIODevice*)", "pause()", "resume()", "stop()", "playAudio(QIODevice*)"})
        QVERIFY2(meta.indexOfSlot(slot) >= meta.methodOffset(), slot);
    QVERIFY(meta.indexOfSignal("audioSet(QIODevice*)") >= meta.methodOffset());
    QVERIFY(AbstractAudio::staticMetaObject.indexOfSignal("complete()") >= 0);
}

void AudioPlaybackTest::deviceIsOpenedForSixteenKilohertzMonoAndPaused()
{
    QCOMPARE(SdlCalls::initialisedSubsystems & ~SDL_INIT_NOPARACHUTE, SDL_INIT_AUDIO);
    QCOMPARE(SdlCalls::openedSpec.freq, 16000);
    QCOMPARE(SdlCalls::openedSpec.format, AUDIO_S16LSB);
    QCOMPARE(int(SdlCalls::openedSpec.channels), 1);
    QCOMPARE(int(SdlCalls::openedSpec.samples), 4096);
    QVERIFY(SdlCalls::openedSpec.callback == Domain::audioFeed);
    // SDL converts to what the hardware can do.
    QVERIFY(!SdlCalls::obtainedSpecWanted);
    QVERIFY(!audio->isPlaying());
    QVERIFY(audio->thread()->isRunning());
    QCOMPARE(audio->thread()->priority(), QThread::InheritPriority);
}

void AudioPlaybackTest::feedHandsOverEveryByteAndThenPauses()
{
    const QByteArray samples = noise(100, 1);
    Domain::AudioFeed feed{100, reinterpret_cast<const std::uint8_t*>(samples.constData())};
    QByteArray heard;
    std::array<unsigned char, 40> stream{};
    SdlCalls::pauses = 0;
    for (const int expected : {40, 40, 20}) {
        Domain::audioFeed(&feed, stream.data(), 40);
        heard.append(reinterpret_cast<const char*>(stream.data()), expected);
    }
    QCOMPARE(heard, samples);
    QCOMPARE(feed.remaining, 0U);
    QCOMPARE(SdlCalls::pauses.load(), 0);
    stream.fill(0xAA);
    Domain::audioFeed(&feed, stream.data(), 40);
    QCOMPARE(SdlCalls::pauses.load(), 1);
    QVERIFY(std::all_of(stream.begin(), stream.end(), [](unsigned char byte) { return byte == 0xAA; }));
}

void AudioPlaybackTest::feedLeavesTheRestOfAShortChunkAlone()
{
    const QByteArray samples = noise(10, 1);
    Domain::AudioFeed feed{10, reinterpret_cast<const std::uint8_t*>(samples.constData())};
    std::array<unsigned char, 40> stream{};
    stream.fill(0xAA);
    Domain::audioFeed(&feed, stream.data(), 40);
    QCOMPARE(QByteArray(reinterpret_cast<const char*>(stream.data()), 40), samples + QByteArray(30, '\xAA'));
}

void AudioPlaybackTest::soundsOfEverySizeAreHeardByteForByte_data()
{
    QTest::addColumn<int>("size");
    for (const int size : {2, 8190, 8192, 8194, 100000})
        QTest::addRow("%d", size) << size;
}

void AudioPlaybackTest::soundsOfEverySizeAreHeardByteForByte()
{
    QFETCH(const int, size);
    const QByteArray samples = noise(size, 7);
    playToTheEnd(wave(samples));
    audio.reset();
    const auto heard = sound->sounds();
    QCOMPARE(heard.size(), 1);
    QVERIFY(heard.front().startsWith(samples));
    QCOMPARE(heard.front().mid(size), QByteArray(heard.front().size() - size, '\0'));
    QVERIFY(heard.front().size() - size < SoundFixture::bufferSize);
    QCOMPARE(loggedTexts(*log), QStringList());
}

void AudioPlaybackTest::playingEndsAfterTheLastByte()
{
    const QByteArray samples = noise(200 * SoundFixture::bufferSize, 7);
    audio->play(wave(samples));
    waitForTheStart();
    // The driver has written a buffer before the device can be asked: all of them must be there once it says no.
    waitForTheEnd();
    audio.reset();
    QCOMPARE(sound->sounds(), QList<QByteArray>{samples});
}

void AudioPlaybackTest::completeIsNeverEmitted()
{
    const QSignalSpy complete(audio.get(), &AbstractAudio::complete);
    playToTheEnd(wave(noise(10000, 1)));
    audio->stop();
    QCoreApplication::processEvents();
    QCOMPARE(complete.count(), 0);
}

void AudioPlaybackTest::sameSoundAgainStartsFromItsBeginning()
{
    const QByteArray samples = noise(3 * SoundFixture::bufferSize, 7);
    QFile* const file = wave(samples);
    playToTheEnd(file);
    playToTheEnd(file);
    audio.reset();
    QCOMPARE(sound->sounds().join(), samples + samples);
}

void AudioPlaybackTest::openFileIsRewound()
{
    QFile* const file = wave(noise(100, 1));
    QVERIFY(file->seek(60));
    playToTheEnd(file);
    QCOMPARE(file->pos(), 0);
}

void AudioPlaybackTest::secondSoundReplacesTheFirst()
{
    const QByteArray first = noise(4000 * SoundFixture::bufferSize, 1);
    const QByteArray second = noise(3 * SoundFixture::bufferSize, 2);
    audio->play(wave(first, "first.wav"));
    QTRY_VERIFY_WITH_TIMEOUT(!sound->sounds().isEmpty(), 20000);
    playToTheEnd(wave(second, "second.wav"));
    audio.reset();
    const QByteArray heard = sound->sounds().join();
    QVERIFY(heard.endsWith(second));
    const QByteArray before = heard.chopped(second.size());
    QVERIFY(!before.isEmpty());
    QVERIFY(before.size() < first.size());
    QVERIFY(first.startsWith(before));
}

void AudioPlaybackTest::stopCutsTheSound()
{
    const QByteArray samples = noise(4000 * SoundFixture::bufferSize, 1);
    audio->play(wave(samples));
    QTRY_VERIFY_WITH_TIMEOUT(!sound->sounds().isEmpty(), 20000);
    audio->stop();
    QVERIFY(!audio->isPlaying());
    // Nothing is left to resume.
    audio->resume();
    waitForTheEnd();
    audio.reset();
    QCOMPARE(sound->sounds().size(), 1);
    QVERIFY(sound->sounds().front().size() < samples.size());
    QVERIFY(samples.startsWith(sound->sounds().front()));
}

void AudioPlaybackTest::stopEmitsNothing()
{
    const QSignalSpy set(audio.get(), &Audio::audioSet);
    const QSignalSpy complete(audio.get(), &AbstractAudio::complete);
    audio->stop();
    audio->stop();
    QCOMPARE(set.count() + complete.count(), 0);
}

void AudioPlaybackTest::pauseAndResumeLoseNothing()
{
    const QByteArray samples = noise(1200 * SoundFixture::bufferSize, 1);
    audio->play(wave(samples));
    QTRY_VERIFY_WITH_TIMEOUT(!sound->sounds().isEmpty(), 20000);
    audio->pause();
    QVERIFY(!audio->isPlaying());
    const auto paused = sound->output().size();
    QTRY_VERIFY_WITH_TIMEOUT(sound->output().size() > paused + 5 * SoundFixture::bufferSize, 20000);
    audio->resume();
    QVERIFY(audio->isPlaying());
    waitForTheEnd();
    audio.reset();
    QCOMPARE(sound->sounds().size(), 2);
    QCOMPARE(sound->sounds().join(), samples);
}

void AudioPlaybackTest::resumeAfterTheEndPausesAgain()
{
    playToTheEnd(wave(noise(1000, 1)));
    audio->resume();
    waitForTheEnd();
}

void AudioPlaybackTest::otherFormatIsHandedOverAsItIs()
{
    const QByteArray samples = noise(2 * SoundFixture::bufferSize, 1);
    QFile file(sound->makeFile("other.wav", Wave{samples, 44100, 2, 8}.file()));
    QVERIFY(file.open(QIODevice::ReadOnly));
    playToTheEnd(&file);
    // The file's format takes nothing from the device's: the next sound is heard as before.
    const QByteArray next = noise(SoundFixture::bufferSize, 2);
    playToTheEnd(wave(next));
    audio.reset();
    QCOMPARE(sound->sounds().join(), samples + next);
}

QTEST_GUILESS_MAIN(AudioPlaybackTest)
#include "AudioPlaybackTest.moc"
