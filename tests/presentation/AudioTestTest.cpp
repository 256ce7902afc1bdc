// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/AudioTest.h"

#include "DataSource/src/XmlConfigurationData.h"
#include "Domain/src/DomainLayer/Audio.h"
#include "tests/Domain/SoundFixture.h"

#include <QFile>
#include <QMetaMethod>
#include <QSignalSpy>
#include <QTest>
#include <QThread>
#include <QTimer>

#include <semaphore>

using DataSource::XmlConfigurationData;
using Domain::Audio;
using Presentation::AudioTest;
using TestSupport::noise;
using TestSupport::SoundFixture;
using TestSupport::Wave;

namespace
{

const QString soundPath = "/etc/sounds/TestSound.wav";

QStringList debugOutput;

/// Out here rather than captured: Qt hands a call's own data over to another thread out of the thread sanitizer's
/// sight.
std::binary_semaphore entered(0);
std::binary_semaphore release(0);

void keepDebugOutput(QtMsgType type, const QMessageLogContext& /*context*/, const QString& text)
{
    if (type == QtDebugMsg)
        debugOutput.append(text);
}

/// Sees the timers go off.
class TimerWatch : public QObject
{
public:
    TimerWatch() { QCoreApplication::instance()->installEventFilter(this); }

    bool eventFilter(QObject* receiver, QEvent* event) override
    {
        const auto* const timer = qobject_cast<QTimer*>(receiver);
        if (timer != nullptr && event->type() == QEvent::Timer) {
            ++ticks;
            isEverySecond = isEverySecond && timer->interval() == 1000 && !timer->isSingleShot() &&
                            timer->timerType() == Qt::PreciseTimer;
        }
        return false;
    }

    int ticks = 0;
    bool isEverySecond = true;
};

} // namespace

/// With the real player on SDL's disk driver.
class AudioTestTest : public QObject
{
    Q_OBJECT

private slots:
    void init();
    void cleanup();

    void slotsAreDeclaredInOrder();
    void missingFileIsReportedAndNothingPlays();
    void unreadableFileIsReportedAndNothingPlays();
    void presentFileIsReported();
    void timerRunsEverySecondInEveryState();
    void nothingPlaysBeforeTheStart();
    void soundStartsAgainWhenItHasEnded();
    void soundStartsAgainAfterAnInterruption();
    void playingSoundIsNotStartedAgain();
    void afterStopTheSoundIsHeardToItsEndAndNotAgain();
    void destructionWaitsForThePlayersThread();

private:
    void makeSound(qsizetype buffers);
    /// As if a second had passed.
    static void tick(AudioTest& test) { QMetaObject::invokeMethod(&test, "checkPlaying", Qt::DirectConnection); }
    void flush() const;

    QByteArray samples;
    std::unique_ptr<SoundFixture> sound;
    std::unique_ptr<XmlConfigurationData> configuration;
    std::unique_ptr<Audio> audio;
};

void AudioTestTest::init()
{
    QFile::remove(soundPath);
    sound = std::make_unique<SoundFixture>();
    configuration = std::make_unique<XmlConfigurationData>(sound->path("configuration"));
    audio = std::make_unique<Audio>(*configuration);
    debugOutput.clear();
    qInstallMessageHandler(keepDebugOutput);
}

void AudioTestTest::cleanup()
{
    qInstallMessageHandler(nullptr);
    audio.reset();
    configuration.reset();
    sound.reset();
    QFile::remove(soundPath);
}

void AudioTestTest::makeSound(qsizetype buffers)
{
    samples = noise(buffers * SoundFixture::bufferSize, 5);
    QFile file(soundPath);
    QVERIFY(file.open(QIODevice::WriteOnly));
    file.write(Wave{samples}.file());
}

void AudioTestTest::flush() const
{
    QMetaObject::invokeMethod(
        audio.get(), [] {}, Qt::BlockingQueuedConnection);
}

void AudioTestTest::slotsAreDeclaredInOrder()
{
    const QMetaObject& meta = AudioTest::staticMetaObject;
    QStringList names;
    for (int index = meta.methodOffset(); index < meta.methodCount(); ++index)
        names.append(meta.method(index).methodSignature());
    QCOMPARE(names, (QStringList{"checkPlaying()", "playAudio()"}));
}

void AudioTestTest::missingFileIsReportedAndNothingPlays()
{
    const QSignalSpy played(audio.get(), &Audio::audioSet);
    AudioTest test(*audio);
    QCOMPARE(debugOutput,
             (QStringList{"Audio file exists = false", "Attempting to open audio file.  Success = false"}));
    debugOutput.clear();
    test.start();
    QCOMPARE(debugOutput, QStringList{"Error: attempt to play unreadable audio file."});
    // The file is opened once only.
    makeSound(1);
    tick(test);
    QCOMPARE(played.count(), 0);
}

void AudioTestTest::unreadableFileIsReportedAndNothingPlays()
{
    makeSound(1);
    QVERIFY(QFile::setPermissions(soundPath, QFileDevice::Permissions()));
    const QSignalSpy played(audio.get(), &Audio::audioSet);
    AudioTest test(*audio);
    QCOMPARE(debugOutput, (QStringList{"Audio file exists = true", "Attempting to open audio file.  Success = false"}));
    debugOutput.clear();
    test.start();
    QCOMPARE(debugOutput, QStringList{"Error: attempt to play unreadable audio file."});
    // The file is opened once only.
    QVERIFY(QFile::setPermissions(soundPath, QFile::ReadOwner));
    tick(test);
    QCOMPARE(played.count(), 0);
}

void AudioTestTest::presentFileIsReported()
{
    makeSound(1);
    const AudioTest test(*audio);
    QCOMPARE(debugOutput, (QStringList{"Audio file exists = true", "Attempting to open audio file.  Success = true"}));
}

void AudioTestTest::timerRunsEverySecondInEveryState()
{
    makeSound(1);
    TimerWatch watch;
    AudioTest test(*audio);
    QTRY_VERIFY_WITH_TIMEOUT(watch.ticks >= 1, 20000);
    test.start();
    int before = watch.ticks;
    QTRY_VERIFY_WITH_TIMEOUT(watch.ticks > before, 20000);
    test.stop();
    before = watch.ticks;
    QTRY_VERIFY_WITH_TIMEOUT(watch.ticks > before, 20000);
    QVERIFY(watch.isEverySecond);
}

void AudioTestTest::nothingPlaysBeforeTheStart()
{
    makeSound(1);
    const QSignalSpy played(audio.get(), &Audio::audioSet);
    AudioTest test(*audio);
    tick(test);
    QCOMPARE(played.count(), 0);
}

void AudioTestTest::soundStartsAgainWhenItHasEnded()
{
    makeSound(3);
    QSignalSpy played(audio.get(), &Audio::audioSet);
    {
        AudioTest test(*audio);
        test.start();
        QCOMPARE(played.count(), 1);
        // By the test's own timer.
        QTRY_VERIFY_WITH_TIMEOUT(played.count() >= 3, 20000);
        test.stop();
        flush();
        QTRY_VERIFY_WITH_TIMEOUT(!audio->isPlaying(), 20000);
    }
    audio.reset();
    QCOMPARE(sound->sounds().join(), samples.repeated(played.count()));
    // The same open file every time.
    for (const auto& arguments : played)
        QCOMPARE(arguments.front().value<QIODevice*>(), played.front().front().value<QIODevice*>());
}

void AudioTestTest::soundStartsAgainAfterAnInterruption()
{
    makeSound(4000);
    AudioTest test(*audio);
    test.start();
    QTRY_VERIFY(audio->isPlaying());
    audio->stop();
    QVERIFY(!audio->isPlaying());
    QTRY_VERIFY_WITH_TIMEOUT(audio->isPlaying(), 20000);
}

void AudioTestTest::playingSoundIsNotStartedAgain()
{
    makeSound(4000);
    const QSignalSpy played(audio.get(), &Audio::audioSet);
    AudioTest test(*audio);
    test.start();
    QTRY_VERIFY(audio->isPlaying());
    for (int count = 0; count < 10; ++count)
        tick(test);
    QCOMPARE(played.count(), 1);
}

void AudioTestTest::afterStopTheSoundIsHeardToItsEndAndNotAgain()
{
    makeSound(400);
    {
        AudioTest test(*audio);
        test.start();
        QTRY_VERIFY(audio->isPlaying());
        test.stop();
        QVERIFY(audio->isPlaying());
        QTRY_VERIFY_WITH_TIMEOUT(!audio->isPlaying(), 20000);
        tick(test);
        flush();
        QVERIFY(!audio->isPlaying());
    }
    audio.reset();
    QCOMPARE(sound->sounds(), QList<QByteArray>{samples});
}

void AudioTestTest::destructionWaitsForThePlayersThread()
{
    makeSound(1);
    QMetaObject::invokeMethod(audio.get(), [] {
        entered.release();
        release.acquire();
    });
    entered.acquire();
    auto test = std::make_unique<AudioTest>(*audio);
    test->start();
    std::unique_ptr<QThread> releaser(QThread::create([] {
        QThread::msleep(50);
        release.release();
    }));
    releaser->start();
    test.reset();
    // The file was still there when the player's turn came: it found and played it.
    QVERIFY(!release.try_acquire());
    QTRY_VERIFY(!audio->isPlaying());
    releaser->wait();
    audio.reset();
    QCOMPARE(sound->sounds().join(), samples);
}

QTEST_GUILESS_MAIN(AudioTestTest)
#include "AudioTestTest.moc"
