// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/XmlConfigurationData.h"
#include "Domain/src/DomainLayer/Audio.h"
#include "Domain/src/DomainLayer/AudioFeed.h"
#include "tests/Domain/SoundFixture.h"
#include "tests/support/LoggedTexts.h"

#include <QBuffer>
#include <QDir>
#include <QFile>
#include <QMetaMethod>
#include <QSignalSpy>
#include <QTest>
#include <QThread>

#include <SDL.h>
#include <dlfcn.h>
#include <sys/stat.h>

#include <atomic>
#include <semaphore>

using DataSource::XmlConfigurationData;
using Domain::AbstractAudio;
using Domain::Audio;
using TestSupport::LogCapture;
using TestSupport::loggedTexts;
using TestSupport::noise;
using TestSupport::SoundFixture;
using TestSupport::Wave;

namespace
{

const QString unreadable = "Domain/src/DomainLayer/Audio.cpp, 270, Attempt to play sound in unreadable file.";

QString unloadable(const QString& path)
{
    return QStringLiteral("Domain/src/DomainLayer/Audio.cpp, 285, Unable to open sound file %1").arg(path);
}

std::atomic<int> loads = 0;
std::atomic<int> pauses = 0;
/// While set, every load waits for a release: a slow card.
std::atomic<bool> loadsAreSlow = false;
std::counting_semaphore<> slowLoads(0);
std::atomic<int> waitingLoads = 0;
std::atomic<bool> initialisationFails = false;
/// What the latest audio object has asked SDL for.
Uint32 initialisedSubsystems = 0;
SDL_AudioSpec openedSpec{};
bool obtainedSpecWanted = true;

} // namespace

extern "C" SDL_AudioSpec* SDL_LoadWAV_RW(SDL_RWops* source, int freeSource, SDL_AudioSpec* spec, Uint8** buffer,
                                         Uint32* length)
{
    using Function = SDL_AudioSpec* (*)(SDL_RWops*, int, SDL_AudioSpec*, Uint8**, Uint32*);
    static const auto real = reinterpret_cast<Function>(::dlsym(RTLD_NEXT, "SDL_LoadWAV_RW"));
    if (loadsAreSlow) {
        ++waitingLoads;
        slowLoads.acquire();
        --waitingLoads;
    }
    ++loads;
    return real(source, freeSource, spec, buffer, length);
}

extern "C" void SDL_PauseAudio(int isPaused)
{
    static const auto real = reinterpret_cast<void (*)(int)>(::dlsym(RTLD_NEXT, "SDL_PauseAudio"));
    pauses += isPaused != 0 ? 1 : 0;
    real(isPaused);
}

extern "C" int SDL_Init(Uint32 subsystems)
{
    static const auto real = reinterpret_cast<int (*)(Uint32)>(::dlsym(RTLD_NEXT, "SDL_Init"));
    initialisedSubsystems = subsystems;
    return initialisationFails ? -1 : real(subsystems);
}

extern "C" int SDL_OpenAudio(SDL_AudioSpec* desired, SDL_AudioSpec* obtained)
{
    using Function = int (*)(SDL_AudioSpec*, SDL_AudioSpec*);
    static const auto real = reinterpret_cast<Function>(::dlsym(RTLD_NEXT, "SDL_OpenAudio"));
    openedSpec = *desired;
    obtainedSpecWanted = obtained != nullptr;
    return real(desired, obtained);
}

/// What is heard is what SDL's disk driver has written.
class AudioPlaybackTest : public QObject
{
    Q_OBJECT

private slots:
    void init();
    void cleanup();

    void signalsAndSlotsAreDeclared();
    void deviceIsOpenedForSixteenKilohertzMonoAndPaused();
    void feedHandsOverEveryByteAndThenPauses();
    void feedLeavesTheRestOfAShortChunkAlone();
    void soundsOfEverySizeAreHeardByteForByte_data();
    void soundsOfEverySizeAreHeardByteForByte();
    void playingEndsAfterTheLastByte();
    void completeIsNeverEmitted();
    void playOnlyEmitsAudioSet();
    void loadingHappensOnTheAudioThread();
    void sameSoundAgainStartsFromItsBeginning();
    void openFileIsRewound();
    void secondSoundReplacesTheFirst();
    void stopCutsTheSound();
    void stopEmitsNothing();
    void pauseAndResumeLoseNothing();
    void resumeAfterTheEndPausesAgain();
    void otherFormatIsHandedOverAsItIs();
    void unplayableFiles_data();
    void unplayableFiles();
    void unplayableFileStopsWhatPlays();
    void fileUnlinkedAfterOpening();
    void fileReplacedByAPipeDoesNotHang();
    void fileReplacedWhileItPlaysIsHeardNextTime();
    void fileTruncatedWhileItPlaysIsHeardToItsEnd();
    void closedFileIsUnreadable();
    void fileOpenForWritingOnlyIsUnreadable();
    void deviceThatIsNoFileIsUnreadable();
    void percentSignsInTheNameAreLoggedAsTheyAre();
    void nameBeyondAsciiIsPlayed();
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

private:
    /// An open file with these samples.
    QFile* wave(const QByteArray& samples, const QString& name = "sound.wav");
    void restart();
    void waitForTheEnd() const { QTRY_VERIFY_WITH_TIMEOUT(!audio->isPlaying(), 20000); }
    void playToTheEnd(QIODevice* sound);
    /// Waits until the audio's thread has worked off what was asked of it so far.
    void flush() const;
    /// Not by asking the device again and again: a short sound might end between two questions.
    void waitForTheStart() const { flush(); }

    std::unique_ptr<SoundFixture> sound;
    std::unique_ptr<LogCapture> log;
    std::unique_ptr<XmlConfigurationData> configuration;
    std::unique_ptr<Audio> audio;
    std::vector<std::unique_ptr<QFile>> files;
};

void AudioPlaybackTest::init()
{
    sound = std::make_unique<SoundFixture>();
    log = std::make_unique<LogCapture>();
    configuration = std::make_unique<XmlConfigurationData>(sound->path("configuration"));
    audio = std::make_unique<Audio>(*configuration);
    loggedTexts(*log);
    loads = 0;
}

void AudioPlaybackTest::cleanup()
{
    loadsAreSlow = false;
    audio.reset();
    files.clear();
    configuration.reset();
    log.reset();
    sound.reset();
}

void AudioPlaybackTest::restart()
{
    audio.reset();
    audio = std::make_unique<Audio>(*configuration);
}

QFile* AudioPlaybackTest::wave(const QByteArray& samples, const QString& name)
{
    files.push_back(std::make_unique<QFile>(sound->makeFile(name, Wave{samples}.file())));
    if (!files.back()->open(QIODevice::ReadOnly))
        qFatal("Cannot open %s", qPrintable(name));
    return files.back().get();
}

void AudioPlaybackTest::flush() const
{
    QMetaObject::invokeMethod(
        audio.get(), [] {}, Qt::BlockingQueuedConnection);
}

void AudioPlaybackTest::playToTheEnd(QIODevice* device)
{
    audio->play(device);
    flush();
    waitForTheEnd();
}

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
    QCOMPARE(initialisedSubsystems & ~SDL_INIT_NOPARACHUTE, SDL_INIT_AUDIO);
    QCOMPARE(openedSpec.freq, 16000);
    QCOMPARE(openedSpec.format, AUDIO_S16LSB);
    QCOMPARE(int(openedSpec.channels), 1);
    QCOMPARE(int(openedSpec.samples), 4096);
    QVERIFY(openedSpec.callback == Domain::audioFeed);
    // SDL converts to what the hardware can do.
    QVERIFY(!obtainedSpecWanted);
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
    pauses = 0;
    for (const int expected : {40, 40, 20}) {
        Domain::audioFeed(&feed, stream.data(), 40);
        heard.append(reinterpret_cast<const char*>(stream.data()), expected);
    }
    QCOMPARE(heard, samples);
    QCOMPARE(feed.remaining, 0U);
    QCOMPARE(pauses.load(), 0);
    stream.fill(0xAA);
    Domain::audioFeed(&feed, stream.data(), 40);
    QCOMPARE(pauses.load(), 1);
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
    QVERIFY(audio->isPlaying());
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

void AudioPlaybackTest::playOnlyEmitsAudioSet()
{
    loadsAreSlow = true;
    QSignalSpy set(audio.get(), &Audio::audioSet);
    QFile* const file = wave(noise(1000, 1));
    audio->play(file);
    QCOMPARE(set.count(), 1);
    QCOMPARE(set.front().front().value<QIODevice*>(), file);
    QVERIFY(!audio->isPlaying());
    slowLoads.release();
    flush();
}

void AudioPlaybackTest::loadingHappensOnTheAudioThread()
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
            loadsOnTheThread = loads.load();
        },
        Qt::BlockingQueuedConnection);
    QCOMPARE(loadsOnTheThread.load(), 1);
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
    const QByteArray samples = noise(400 * SoundFixture::bufferSize, 1);
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

void AudioPlaybackTest::unplayableFiles_data()
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
    QTest::addRow("13 bits") << QByteArray(whole).replace(34, 2, QByteArray("\x0d\x00", 2));
    QTest::addRow("length beyond everything") << QByteArray(whole).replace(40, 4, QByteArray(4, '\xff'));
    QTest::addRow("other container") << QByteArray(whole).replace(8, 4, "AVI ");
}

void AudioPlaybackTest::unplayableFiles()
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

void AudioPlaybackTest::unplayableFileStopsWhatPlays()
{
    audio->play(wave(noise(4000 * SoundFixture::bufferSize, 1)));
    waitForTheStart();
    QFile bad(sound->makeFile("bad.wav", "bad"));
    QVERIFY(bad.open(QIODevice::ReadOnly));
    playToTheEnd(&bad);
    QVERIFY(!audio->isPlaying());
}

void AudioPlaybackTest::fileUnlinkedAfterOpening()
{
    QFile* const file = wave(noise(1000, 1));
    QVERIFY(QFile::remove(file->fileName()));
    playToTheEnd(file);
    QCOMPARE(loggedTexts(*log), QStringList{unloadable(file->fileName())});
    QVERIFY(!audio->isPlaying());
    QCOMPARE(sound->sounds().size(), 0);
}

void AudioPlaybackTest::fileReplacedByAPipeDoesNotHang()
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

void AudioPlaybackTest::fileReplacedWhileItPlaysIsHeardNextTime()
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

void AudioPlaybackTest::fileTruncatedWhileItPlaysIsHeardToItsEnd()
{
    const QByteArray samples = noise(100 * SoundFixture::bufferSize, 1);
    audio->play(wave(samples));
    waitForTheStart();
    QVERIFY(QFile::resize(sound->path("sound.wav"), 10));
    waitForTheEnd();
    audio.reset();
    QCOMPARE(sound->sounds().join(), samples);
}

void AudioPlaybackTest::closedFileIsUnreadable()
{
    QFile file(wave(noise(1000, 1))->fileName());
    playToTheEnd(&file);
    QCOMPARE(loggedTexts(*log), QStringList{unreadable});
    QCOMPARE(loads.load(), 0);
}

void AudioPlaybackTest::fileOpenForWritingOnlyIsUnreadable()
{
    QFile file(sound->path("new.wav"));
    QVERIFY(file.open(QIODevice::WriteOnly));
    playToTheEnd(&file);
    QCOMPARE(loggedTexts(*log), QStringList{unreadable});
}

void AudioPlaybackTest::deviceThatIsNoFileIsUnreadable()
{
    QByteArray content = Wave{noise(1000, 1)}.file();
    QBuffer buffer(&content);
    QVERIFY(buffer.open(QIODevice::ReadOnly));
    playToTheEnd(&buffer);
    audio->play(nullptr);
    flush();
    QCOMPARE(loggedTexts(*log), QStringList(2, unreadable));
}

void AudioPlaybackTest::percentSignsInTheNameAreLoggedAsTheyAre()
{
    QFile file(sound->makeFile("100%s %n.wav", "bad"));
    QVERIFY(file.open(QIODevice::ReadOnly));
    playToTheEnd(&file);
    QCOMPARE(loggedTexts(*log), QStringList{unloadable(file.fileName())});
}

void AudioPlaybackTest::nameBeyondAsciiIsPlayed()
{
    const QByteArray samples = noise(SoundFixture::bufferSize, 1);
    playToTheEnd(wave(samples, QStringLiteral("m\u00fcsik \u20ac\n.wav")));
    audio.reset();
    QCOMPARE(sound->sounds().join(), samples);
}

void AudioPlaybackTest::requestsDuringASlowLoadAreAnsweredByIt()
{
    loadsAreSlow = true;
    const QByteArray samples = noise(10 * SoundFixture::bufferSize, 1);
    QFile* const file = wave(samples);
    audio->play(file);
    QTRY_COMPARE(waitingLoads.load(), 1);
    for (int request = 0; request < 5; ++request)
        audio->play(file);
    loadsAreSlow = false;
    slowLoads.release();
    flush();
    waitForTheEnd();
    QCOMPARE(loads.load(), 1);
    audio.reset();
    QCOMPARE(sound->sounds(), QList<QByteArray>{samples});
}

void AudioPlaybackTest::requestsForDifferentSoundsAreAllLoaded()
{
    loadsAreSlow = true;
    QFile* const first = wave(noise(1000, 1), "first.wav");
    QFile* const second = wave(noise(1000, 2), "second.wav");
    for (QFile* const file : {first, second, first, first, second})
        audio->play(file);
    QTRY_COMPARE(waitingLoads.load(), 1);
    loadsAreSlow = false;
    slowLoads.release();
    flush();
    // The second request in a row for the first sound is the only one that changes nothing.
    QCOMPARE(loads.load(), 4);
}

void AudioPlaybackTest::failedLoadAnswersNothing()
{
    loadsAreSlow = true;
    QFile file(sound->makeFile("bad.wav", "bad"));
    QVERIFY(file.open(QIODevice::ReadOnly));
    audio->play(&file);
    audio->play(&file);
    QTRY_COMPARE(waitingLoads.load(), 1);
    loadsAreSlow = false;
    slowLoads.release();
    flush();
    QCOMPARE(loggedTexts(*log), QStringList(2, unloadable(file.fileName())));
}

void AudioPlaybackTest::stopDuringALoadLeavesNothingToPlay()
{
    loadsAreSlow = true;
    audio->play(wave(noise(4000 * SoundFixture::bufferSize, 1)));
    QTRY_COMPARE(waitingLoads.load(), 1);
    audio->stop();
    loadsAreSlow = false;
    slowLoads.release();
    flush();
    QVERIFY(!audio->isPlaying());
    audio.reset();
    QCOMPARE(sound->sounds().size(), 0);
    QCOMPARE(loggedTexts(*log), QStringList());
}

void AudioPlaybackTest::playAfterAStopDuringALoadIsHeard()
{
    loadsAreSlow = true;
    const QByteArray samples = noise(3 * SoundFixture::bufferSize, 1);
    QFile* const file = wave(samples);
    audio->play(file);
    QTRY_COMPARE(waitingLoads.load(), 1);
    audio->stop();
    audio->play(file);
    loadsAreSlow = false;
    slowLoads.release();
    flush();
    waitForTheEnd();
    QCOMPARE(loads.load(), 2);
    audio.reset();
    QCOMPARE(sound->sounds(), QList<QByteArray>{samples});
}

void AudioPlaybackTest::fileDeletedBeforeItsTurnIsUnreadable()
{
    loadsAreSlow = true;
    audio->play(wave(noise(1000, 1)));
    QTRY_COMPARE(waitingLoads.load(), 1);
    auto doomed = std::make_unique<QFile>(sound->makeFile("doomed.wav", Wave{noise(1000, 2)}.file()));
    QVERIFY(doomed->open(QIODevice::ReadOnly));
    audio->play(doomed.get());
    doomed.reset();
    loadsAreSlow = false;
    slowLoads.release();
    flush();
    QCOMPARE(loggedTexts(*log), QStringList{unreadable});
}

void AudioPlaybackTest::stopsAndPlaysFromTwoThreadsWithoutADevice()
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

void AudioPlaybackTest::withoutADeviceNothingPlays()
{
    audio.reset();
    SoundFixture::chooseNoOutput();
    loggedTexts(*log);
    restart();
    QCOMPARE(loggedTexts(*log), QStringList{"Domain/src/DomainLayer/Audio.cpp, 91, Unable to open audio"});
    QCOMPARE(sound->mixer(), "30 30 2");
    playToTheEnd(wave(noise(1000, 1)));
    QCOMPARE(loads.load(), 1);
    QVERIFY(!audio->isPlaying());
    QCOMPARE(loggedTexts(*log), QStringList());
}

void AudioPlaybackTest::withoutSdlNothingPlays()
{
    audio.reset();
    initialisationFails = true;
    restart();
    initialisationFails = false;
    QCOMPARE(loggedTexts(*log), QStringList{"Domain/src/DomainLayer/Audio.cpp, 74, Unable to initialize SDL"});
    playToTheEnd(wave(noise(1000, 1)));
    QCOMPARE(loads.load(), 1);
    QVERIFY(!audio->isPlaying());
}

void AudioPlaybackTest::destructionWhilePlaying()
{
    for (int round = 0; round < 10; ++round) {
        audio->play(wave(noise(100 * SoundFixture::bufferSize, 1)));
        waitForTheStart();
        restart();
        QVERIFY(!audio->isPlaying());
    }
}

void AudioPlaybackTest::destructionWhileLoading()
{
    loadsAreSlow = true;
    audio->play(wave(noise(1000, 1)));
    QTRY_COMPARE(waitingLoads.load(), 1);
    std::unique_ptr<QThread> releaser(QThread::create([] {
        QThread::msleep(50);
        slowLoads.release();
    }));
    releaser->start();
    audio.reset();
    QCOMPARE(loads.load(), 1);
    releaser->wait();
}

void AudioPlaybackTest::destructionWithRequestsWaiting()
{
    for (int round = 0; round < 20; ++round) {
        for (int request = 0; request < 10; ++request)
            audio->play(wave(noise(1000, 1), QStringLiteral("%1.wav").arg(request)));
        restart();
        files.clear();
    }
}

QTEST_GUILESS_MAIN(AudioPlaybackTest)
#include "AudioPlaybackTest.moc"
