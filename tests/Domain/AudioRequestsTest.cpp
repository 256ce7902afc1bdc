// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/Domain/AudioFixture.h"

#include <QSignalSpy>
#include <QTest>
#include <QThread>

using Domain::Audio;
using TestSupport::AudioFixture;
using TestSupport::loggedTexts;
using TestSupport::noise;
using TestSupport::SdlCalls;
using TestSupport::SoundFixture;
using TestSupport::Wave;

/// Requests from one thread, loads on another, and their end.
class AudioRequestsTest : public AudioFixture
{
    Q_OBJECT

private slots:
    void playOnlyEmitsAudioSet();
    void loadingHappensOnTheAudioThread();
    void requestsDuringASlowLoadAreAnsweredByIt();
    void requestsForDifferentSoundsAreAllLoaded();
    void failedLoadAnswersNothing();
    void stopDuringALoadLeavesNothingToPlay();
    void playAfterAStopDuringALoadIsHeard();
    void fileDeletedBeforeItsTurnIsUnreadable();
    void stopsAndPlaysFromTwoThreadsWithoutADevice();
    void withoutADeviceNothingPlays();
    void withoutSdlNothingPlays();
    void destructionWhilePlaying();
    void destructionWhileLoading();
    void destructionWithRequestsWaiting();
};

void AudioRequestsTest::playOnlyEmitsAudioSet()
{
    SdlCalls::loadsAreSlow = true;
    QSignalSpy set(audio.get(), &Audio::audioSet);
    QFile* const file = wave(noise(1000, 1));
    audio->play(file);
    QCOMPARE(set.count(), 1);
    QCOMPARE(set.front().front().value<QIODevice*>(), file);
    QVERIFY(!audio->isPlaying());
    SdlCalls::slowLoads.release();
    flush();
}

void AudioRequestsTest::loadingHappensOnTheAudioThread()
{
    QVERIFY(audio->thread() != QThread::currentThread());
    // Nothing is captured: Qt hands a call's own data over out of the thread sanitizer's sight.
    static std::atomic<Audio*> player;
    static std::atomic<QFile*> file;
    static std::atomic<int> loadsOnTheThread;
    player = audio.get();
    file = wave(noise(100000, 1));
    // On that thread itself the load happens within the call.
    QMetaObject::invokeMethod(
        audio.get(),
        [] {
            player.load()->play(file);
            loadsOnTheThread = SdlCalls::loads.load();
        },
        Qt::BlockingQueuedConnection);
    QCOMPARE(loadsOnTheThread.load(), 1);
}

void AudioRequestsTest::requestsDuringASlowLoadAreAnsweredByIt()
{
    const QByteArray samples = noise(10 * SoundFixture::bufferSize, 1);
    QFile* const file = wave(samples);
    playSlowly(file);
    for (int request = 0; request < 5; ++request)
        audio->play(file);
    releaseLoads();
    waitForTheEnd();
    QCOMPARE(SdlCalls::loads.load(), 1);
    audio.reset();
    QCOMPARE(sound->sounds(), QList<QByteArray>{samples});
}

void AudioRequestsTest::requestsForDifferentSoundsAreAllLoaded()
{
    QFile* const first = wave(noise(1000, 1), "first.wav");
    QFile* const second = wave(noise(1000, 2), "second.wav");
    playSlowly(first);
    for (QFile* const file : {second, first, first, second})
        audio->play(file);
    releaseLoads();
    // The second request in a row for the first sound is the only one that changes nothing.
    QCOMPARE(SdlCalls::loads.load(), 4);
}

void AudioRequestsTest::failedLoadAnswersNothing()
{
    QFile file(sound->makeFile("bad.wav", Wave{noise(1000, 1), 16000, 1, 13}.file()));
    QVERIFY(file.open(QIODevice::ReadOnly));
    playSlowly(&file);
    audio->play(&file);
    releaseLoads();
    QCOMPARE(loggedTexts(*log), QStringList(2, unloadable(file.fileName())));
}

void AudioRequestsTest::stopDuringALoadLeavesNothingToPlay()
{
    playSlowly(wave(noise(4000 * SoundFixture::bufferSize, 1)));
    audio->stop();
    releaseLoads();
    QVERIFY(!audio->isPlaying());
    audio.reset();
    QCOMPARE(sound->sounds().size(), 0);
    QCOMPARE(loggedTexts(*log), QStringList());
}

void AudioRequestsTest::playAfterAStopDuringALoadIsHeard()
{
    const QByteArray samples = noise(3 * SoundFixture::bufferSize, 1);
    QFile* const file = wave(samples);
    playSlowly(file);
    audio->stop();
    audio->play(file);
    releaseLoads();
    waitForTheEnd();
    QCOMPARE(SdlCalls::loads.load(), 2);
    audio.reset();
    QCOMPARE(sound->sounds(), QList<QByteArray>{samples});
}

void AudioRequestsTest::fileDeletedBeforeItsTurnIsUnreadable()
{
    playSlowly(wave(noise(1000, 1)));
    auto doomed = std::make_unique<QFile>(sound->makeFile("doomed.wav", Wave{noise(1000, 2)}.file()));
    QVERIFY(doomed->open(QIODevice::ReadOnly));
    audio->play(doomed.get());
    doomed.reset();
    releaseLoads();
    QCOMPARE(loggedTexts(*log), QStringList{unreadable});
}

void AudioRequestsTest::stopsAndPlaysFromTwoThreadsWithoutADevice()
{
    audio.reset();
    SoundFixture::chooseNoOutput();
    restart();
    QFile* const first = wave(noise(20000, 1), "first.wav");
    QFile* const second = wave(noise(20000, 2), "second.wav");
    for (int round = 0; round < 300; ++round) {
        audio->play(round % 2 == 0 ? first : second);
        audio->stop();
        audio->pause();
        audio->resume();
    }
    flush();
    audio->stop();
    QVERIFY(!audio->isPlaying());
}

void AudioRequestsTest::withoutADeviceNothingPlays()
{
    audio.reset();
    SoundFixture::chooseNoOutput();
    loggedTexts(*log);
    restart();
    QCOMPARE(loggedTexts(*log), QStringList{"Domain/src/DomainLayer/Audio.cpp, 91, Unable to open audio"});
    QCOMPARE(sound->mixer(), "30 30 2");
    playToTheEnd(wave(noise(1000, 1)));
    QCOMPARE(SdlCalls::loads.load(), 1);
    QVERIFY(!audio->isPlaying());
    QCOMPARE(loggedTexts(*log), QStringList());
}

void AudioRequestsTest::withoutSdlNothingPlays()
{
    audio.reset();
    SdlCalls::initialisationFails = true;
    restart();
    SdlCalls::initialisationFails = false;
    QCOMPARE(loggedTexts(*log), QStringList{"Domain/src/DomainLayer/Audio.cpp, 74, Unable to initialize SDL"});
    playToTheEnd(wave(noise(1000, 1)));
    QCOMPARE(SdlCalls::loads.load(), 1);
    QVERIFY(!audio->isPlaying());
}

void AudioRequestsTest::destructionWhilePlaying()
{
    for (int round = 0; round < 10; ++round) {
        audio->play(wave(noise(100 * SoundFixture::bufferSize, 1)));
        waitForTheStart();
        restart();
        QVERIFY(!audio->isPlaying());
    }
}

void AudioRequestsTest::destructionWhileLoading()
{
    playSlowly(wave(noise(1000, 1)));
    std::unique_ptr<QThread> releaser(QThread::create([] {
        QThread::msleep(50);
        SdlCalls::slowLoads.release();
    }));
    releaser->start();
    audio.reset();
    QCOMPARE(SdlCalls::loads.load(), 1);
    releaser->wait();
}

void AudioRequestsTest::destructionWithRequestsWaiting()
{
    for (int round = 0; round < 20; ++round) {
        for (int request = 0; request < 10; ++request)
            audio->play(wave(noise(1000, 1), QStringLiteral("%1.wav").arg(request)));
        restart();
        files.clear();
    }
}

QTEST_GUILESS_MAIN(AudioRequestsTest)
#include "AudioRequestsTest.moc"
