// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/audio/AudioWatcher.h"

#include "virtual-device/audio/MixerState.h"
#include "virtual-device/registry/Registry.h"
#include "virtual-device/sandbox/SandboxPlan.h"
#include "virtual-device/sandbox/StateFolder.h"

#include <QFile>
#include <QSignalSpy>
#include <QTemporaryDir>
#include <QTest>
#include <QThread>
#include <QTimer>

#include <fcntl.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <ctime>
#include <thread>

using namespace std::chrono_literals;
using namespace VirtualDevice;

namespace
{

constexpr qsizetype bufferSize = SoundMatcher::bufferSize;
const QByteArray silence(bufferSize, '\0');

/// The program's audio library: writes buffers to the pipe as they are.
class Writer
{
public:
    explicit Writer(const QString& path) : descriptor(::open(path.toLocal8Bit().constData(), O_WRONLY | O_CLOEXEC)) {}
    ~Writer() { ::close(descriptor); }
    Writer(const Writer&) = delete;
    Writer& operator=(const Writer&) = delete;

    [[nodiscard]] bool write(const QByteArray& bytes) const
    {
        return ::write(descriptor, bytes.constData(), static_cast<std::size_t>(bytes.size())) == bytes.size();
    }

    /// Whether the watcher has taken all of it.
    [[nodiscard]] bool isRead() const
    {
        int left = -1;
        return ::ioctl(descriptor, FIONREAD, &left) == 0 && left == 0;
    }

private:
    int descriptor;
};

} // namespace

class AudioWatcherTest : public QObject
{
    Q_OBJECT

    std::unique_ptr<QTemporaryDir> folder;
    std::unique_ptr<Registry> registry;
    std::unique_ptr<AudioWatcher> watcher;
    QByteArray samples;
    AudioWatcher::Clock::time_point time; ///< the watcher's; stands still unless a test moves it

    [[nodiscard]] qint64 number(const char* name) const { return registry->integer(QString::fromLatin1(name)); }
    [[nodiscard]] bool flag(const char* name) const { return registry->flag(QString::fromLatin1(name)); }
    [[nodiscard]] QString stream() const { return folder->filePath(QStringLiteral("sound/stream")); }
    [[nodiscard]] QString wav() const { return folder->filePath(QStringLiteral("sound.wav")); }

    void writeWav(const QByteArray& content) const
    {
        QFile file(wav());
        QVERIFY(file.open(QIODevice::WriteOnly | QIODevice::Truncate));
        QCOMPARE(file.write(content), content.size());
    }

    /// Both files may have been written within a tick of the kernel's.
    void setNewDate() const
    {
        const timespec date{::time(nullptr) + 5, 0};
        const std::array times{date, date};
        QCOMPARE(::utimensat(AT_FDCWD, wav().toLocal8Bit().constData(), times.data(), 0), 0);
    }

    /// The sound as the audio library plays it: whole buffers, the last one filled up with zeros.
    [[nodiscard]] QByteArray played() const
    {
        const auto over = samples.size() % bufferSize;
        return samples + QByteArray(over == 0 ? 0 : bufferSize - over, '\0');
    }

private slots:
    void init()
    {
        folder = std::make_unique<QTemporaryDir>();
        registry = std::make_unique<Registry>();
        watcher = std::make_unique<AudioWatcher>(*registry, [this] { return time; });
        writeWav(testSound());
        samples = wavSamples(testSound());
        QCOMPARE(samples.size(), 32'000);
        const auto problem = watcher->open(folder->filePath(QStringLiteral("sound")), wav());
        QVERIFY2(!problem, qPrintable(problem.value_or(QString())));
    }

    void cleanup()
    {
        watcher.reset();
        registry.reset();
        folder.reset();
    }

    void theSoundIsHeardAndComparedWithItsFile()
    {
        const Writer program(stream());
        QVERIFY(program.write(silence));
        QTRY_COMPARE(number("audio.buffers"), 1);
        QVERIFY(!flag("audio.playing"));
        QVERIFY(program.write(played()));
        QTRY_COMPARE(number("audio.buffers"), 5);
        QVERIFY(flag("audio.playing"));
        QVERIFY(program.write(silence));
        QTRY_VERIFY(!flag("audio.playing"));
        QCOMPARE(number("audio.sounds"), 1);
        QCOMPARE(number("audio.mismatches"), 0);
    }

    void theLongestSilenceBetweenSoundsIsMeasured()
    {
        const Writer program(stream());
        for (int count = 0; count < 4; ++count) // before the first sound: no gap
            QVERIFY(program.write(silence));
        QVERIFY(program.write(played()));
        QTRY_COMPARE(number("audio.buffers"), 8);
        QCOMPARE(number("audio.gap_ms"), 24); // the rest of the last buffer
        QVERIFY(program.write(silence + silence));
        QTRY_COMPARE(number("audio.gap_ms"), 24 + 2 * 256); // while it lasts
        QVERIFY(program.write(played()));
        QTRY_COMPARE(number("audio.buffers"), 14); // the pipe holds eight, and both its ends are in this thread
        QVERIFY(program.write(silence + played()));
        QTRY_COMPARE(number("audio.sounds"), 3);
        QTRY_COMPARE(number("audio.buffers"), 19);
        QCOMPARE(number("audio.gap_ms"), 24 + 2 * 256);
        QCOMPARE(number("audio.mismatches"), 0);
    }

    void buffersMayComeInPieces()
    {
        const Writer program(stream());
        const QByteArray bytes = played() + silence;
        for (qsizetype at = 0; at < bytes.size(); at += 3000) {
            QVERIFY(program.write(bytes.mid(at, 3000)));
            QTRY_VERIFY(program.isRead());
        }
        QTRY_COMPARE(number("audio.buffers"), 5);
        QCOMPARE(number("audio.mismatches"), 0);
    }

    void aWrongBufferIsAMismatch()
    {
        const Writer program(stream());
        QByteArray bytes = played();
        bytes[bufferSize + 17] = static_cast<char>(bytes[bufferSize + 17] ^ 1);
        QVERIFY(program.write(bytes));
        QTRY_COMPARE(number("audio.buffers"), 4);
        QCOMPARE(number("audio.mismatches"), 1);
    }

    void aStreamThatStopsIsAGapThatGrows()
    {
        const Writer program(stream());
        QVERIFY(program.write(played().first(bufferSize)));
        QTRY_VERIFY(flag("audio.playing"));
        QSignalSpy checks(watcher->findChild<QTimer*>(), &QTimer::timeout);
        time += 256ms + 500ms; // as late as a scheduler may make it
        QTRY_VERIFY(checks.count() >= 2);
        QVERIFY(flag("audio.playing"));
        QCOMPARE(number("audio.gap_ms"), 0);
        time += 1ms;
        QTRY_VERIFY(!flag("audio.playing"));
        QCOMPARE(number("audio.gap_ms"), 501);
        QCOMPARE(number("audio.late_ms"), 501);
        time += 1s;
        QTRY_COMPARE(number("audio.gap_ms"), 1501);
        QVERIFY(program.write(played().mid(bufferSize, bufferSize)));
        QTRY_VERIFY(flag("audio.playing"));
        QCOMPARE(number("audio.gap_ms"), 1501);
        QCOMPARE(number("audio.mismatches"), 0);
    }

    void timeWithoutAStreamAndSilenceAreOneGap()
    {
        const Writer program(stream());
        QVERIFY(program.write(played()));
        QTRY_COMPARE(number("audio.buffers"), 4);
        time += 1256ms;
        QVERIFY(program.write(silence + played()));
        QTRY_COMPARE(number("audio.sounds"), 2);
        QCOMPARE(number("audio.gap_ms"), 24 + 1000 + 256);
    }

    /// Each buffer comes too soon after the last one to be a gap, and the sound has a hole before each.
    void aStreamThatStuttersIsLate()
    {
        const Writer program(stream());
        time += 1h; // before the first sound: nobody waits
        QVERIFY(program.write(silence + played().first(bufferSize)));
        QTRY_COMPARE(number("audio.buffers"), 2);
        QCOMPARE(number("audio.late_ms"), 0);
        int heard = 1;
        for (const auto late : {400ms, 300ms}) {
            time += 256ms + late;
            QVERIFY(program.write(played().mid(heard * bufferSize, bufferSize)));
            ++heard;
            QTRY_COMPARE(number("audio.buffers"), 1 + heard);
            QCOMPARE(number("audio.late_ms"), 400);
        }
        QCOMPARE(number("audio.gap_ms"), 0);
        QVERIFY(!registry->set(QStringLiteral("audio.forget"), true));
        QCOMPARE(number("audio.late_ms"), 0);
    }

    void gapsAndMismatchesCanBeForgotten()
    {
        const Writer program(stream());
        QVERIFY(program.write(played() + silence + QByteArray(bufferSize, 'x')));
        QTRY_COMPARE(number("audio.mismatches"), 1);
        QVERIFY(number("audio.gap_ms") > 0);
        QVERIFY(!registry->set(QStringLiteral("audio.forget"), true));
        QCOMPARE(number("audio.gap_ms"), 0);
        QCOMPARE(number("audio.mismatches"), 0);
        QVERIFY(!flag("audio.forget"));
    }

    void aSoundFileThatWasReplacedIsReadAnew()
    {
        const Writer program(stream());
        QVERIFY(program.write(played() + silence));
        QTRY_COMPARE(number("audio.buffers"), 5);
        QByteArray other = testSound();
        other[100] = static_cast<char>(other[100] ^ 1);
        writeWav(other);
        setNewDate();
        samples = wavSamples(other);
        QVERIFY(program.write(played()));
        QTRY_COMPARE(number("audio.sounds"), 2);
        QCOMPARE(number("audio.mismatches"), 0);
    }

    void aSoundFileReplacedByAPipeHoldsNobodyUp()
    {
        const Writer program(stream());
        QVERIFY(program.write(played() + silence));
        QTRY_COMPARE(number("audio.buffers"), 5);
        QVERIFY(QFile::remove(wav()));
        QCOMPARE(::mkfifo(wav().toLocal8Bit().constData(), 0600), 0);
        setNewDate();
        // Frees whoever waits for a writer, so that the test ends in any case.
        std::atomic<bool> somebodyWaited = false;
        const std::jthread rescue([&somebodyWaited, path = wav().toLocal8Bit()](const std::stop_token& stop) {
            for (int round = 0; round < 50 && !stop.stop_requested(); ++round)
                QThread::msleep(100);
            const int writer = stop.stop_requested() ? -1 : ::open(path.constData(), O_WRONLY | O_NONBLOCK | O_CLOEXEC);
            somebodyWaited = writer >= 0;
            ::close(writer);
        });
        QVERIFY(program.write(silence + played()));
        QTRY_COMPARE(number("audio.buffers"), 10);
        QVERIFY(!somebodyWaited);
        QCOMPARE(number("audio.mismatches"), 4); // nothing is known that it could be
        QVERIFY(QFile::remove(wav()));
        writeWav(testSound());
        QVERIFY(program.write(silence));
        QTRY_COMPARE(number("audio.buffers"), 11);
        QVERIFY(program.write(played()));
        QTRY_COMPARE(number("audio.buffers"), 15);
        QCOMPARE(number("audio.mismatches"), 4);
    }

    void aSoundFileOfEnormousLengthIsNotRead()
    {
        const Writer program(stream());
        QFile file(wav());
        QVERIFY(file.resize(65LL * 1024 * 1024)); // the sound first, then a hole
        setNewDate();
        QVERIFY(program.write(played()));
        QTRY_COMPARE(number("audio.buffers"), 4);
        QCOMPARE(number("audio.mismatches"), 4);
    }

    void aProgramThatEndsIsFollowedByTheNext()
    {
        for (int round = 1; round <= 3; ++round) {
            {
                const Writer program(stream());
                QVERIFY(program.write(played().first(bufferSize + 100))); // ends within a buffer
                QTRY_VERIFY(flag("audio.playing"));
            }
            QTRY_VERIFY(!flag("audio.playing"));
            QCOMPARE(number("audio.sounds"), round);
            time += 1h; // nobody plays, and nobody is missed
            QVERIFY(!watcher->findChild<QTimer*>()->isActive());
        }
        QCOMPARE(number("audio.mismatches"), 0);
        QCOMPARE(number("audio.gap_ms"), 0);
    }

    void theMixerIsWatched()
    {
        const std::string state = folder->filePath(QStringLiteral("sound/mixer")).toStdString();
        QVERIFY((MixerState{30, 30, 1}).write(state));
        QTRY_COMPARE(number("audio.volume_left"), 30);
        QCOMPARE(number("audio.volume_right"), 30);
        QVERIFY((MixerState{60, 0, 2}).write(state));
        QTRY_COMPARE(number("audio.volume_writes"), 2);
        QCOMPARE(number("audio.volume_left"), 60);
        QCOMPARE(number("audio.volume_right"), 0);
    }

    void theSandboxIsLedToThePipeAndTheMixer()
    {
        const auto planFor = [this](const char* presence) {
            (void)registry->set(QStringLiteral("audio.presence"), QString::fromLatin1(presence));
            SandboxPlan plan;
            watcher->contribute(plan, wav()); // any file that exists
            return plan;
        };
        const QStringList output{"SDL_AUDIODRIVER", "SDL_DISKAUDIODELAY", "SDL_DISKAUDIOFILE"};
        SandboxPlan plan = planFor("present");
        QCOMPARE(plan.environment.keys(), QStringList{"ALSA_CONFIG_PATH"} + output);
        QCOMPARE(plan.environment.value("SDL_AUDIODRIVER"), QStringLiteral("disk"));
        QCOMPARE(plan.environment.value("SDL_DISKAUDIODELAY"), QStringLiteral("256"));
        QCOMPARE(plan.environment.value("SDL_DISKAUDIOFILE"), QStringLiteral("/run/sound/stream"));
        QCOMPARE(plan.binds.size(), 2);
        QCOMPARE(plan.binds[0].target, QStringLiteral("/run/sound"));
        QCOMPARE(plan.binds[1].target, QStringLiteral("/run/sound-card/mixer.so"));
        QCOMPARE(planFor("no-mixer").environment.keys(), output);
        QCOMPARE(planFor("no-output").environment.keys(), QStringList{"ALSA_CONFIG_PATH"});
        plan = planFor("missing");
        QVERIFY(plan.environment.isEmpty());
        QVERIFY(plan.binds.isEmpty());
    }

    void aPluginThatWasNotBuiltIsLeftOut()
    {
        SandboxPlan plan;
        watcher->contribute(plan, QStringLiteral("/nowhere/mixer.so"));
        QCOMPARE(plan.binds.size(), 1);
        QVERIFY(!plan.environment.contains(QStringLiteral("ALSA_CONFIG_PATH")));
    }

    void aFolderThatCannotBeMadeIsReported()
    {
        AudioWatcher other(*registry);
        const auto problem = other.open(QStringLiteral("/proc/nowhere"), wav());
        QVERIFY(problem);
        QVERIFY(problem->contains(QStringLiteral("/proc/nowhere")));
    }
};

QTEST_GUILESS_MAIN(AudioWatcherTest)
#include "AudioWatcherTest.moc"
