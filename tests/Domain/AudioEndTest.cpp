// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/XmlConfigurationData.h"
#include "Domain/src/DomainLayer/Audio.h"
#include "tests/Domain/SoundFixture.h"

#include <QDir>
#include <QFile>
#include <QTest>

#include <fcntl.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <array>
#include <atomic>
#include <memory>
#include <thread>

using TestSupport::noise;
using TestSupport::SoundFixture;
using TestSupport::Wave;

namespace
{

/// A sound device that takes samples, or takes none, as its owner reads: a pipe in place of the disk driver's file.
class PipeDevice
{
public:
    explicit PipeDevice(const QString& path)
    {
        if (::mkfifo(qPrintable(path), 0600) != 0)
            qFatal("Cannot make %s", qPrintable(path));
        descriptor = ::open(qPrintable(path), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
        ::fcntl(descriptor, F_SETPIPE_SZ, static_cast<int>(SoundFixture::bufferSize));
    }
    ~PipeDevice() { ::close(descriptor); }
    Q_DISABLE_COPY_MOVE(PipeDevice)

    /// Whoever writes now waits.
    [[nodiscard]] bool isFull() const
    {
        int waiting = 0;
        return ::ioctl(descriptor, FIONREAD, &waiting) == 0 && waiting >= SoundFixture::bufferSize;
    }

    /// Takes all that is there; false when the other end has been closed.
    [[nodiscard]] bool drain() const
    {
        std::array<char, SoundFixture::bufferSize> bytes{};
        ssize_t count = 0;
        do
            count = ::read(descriptor, bytes.data(), bytes.size());
        while (count > 0);
        return count < 0;
    }

private:
    int descriptor = -1;
};

qsizetype threads()
{
    return QDir("/proc/self/task").entryList(QDir::Dirs | QDir::NoDotAndDotDot).size();
}

} // namespace

/// The end of a player whose device takes no samples any more. SDL cannot be used again after it: one case, and a
/// program of its own.
class AudioEndTest : public QObject
{
    Q_OBJECT

private slots:
    void deviceThatTakesNoSamplesDoesNotHoldTheEndUp();
};

void AudioEndTest::deviceThatTakesNoSamplesDoesNotHoldTheEndUp()
{
    const SoundFixture sound;
    const PipeDevice device(sound.path("output"));
    DataSource::XmlConfigurationData configuration(sound.path("configuration"));
    const auto before = threads();
    auto audio = std::make_unique<Domain::Audio>(configuration);
    QFile file(sound.makeFile("sound.wav", Wave{noise(100 * SoundFixture::bufferSize, 1)}.file()));
    QVERIFY(file.open(QIODevice::ReadOnly));
    audio->play(&file);
    QTRY_VERIFY(audio->isPlaying());
    QTRY_VERIFY(device.isFull());

    std::atomic<bool> ended = false;
    std::thread end([&] {
        audio.reset();
        ended = true;
    });
    const bool endedAlone = QTest::qWaitFor([&] { return ended.load(); }, 20'000);
    const bool stillFull = device.isFull();
    // What was left behind comes to its own end when the device does take samples.
    const bool isClosed = QTest::qWaitFor([&] { return !device.drain(); }, 20'000);
    end.join();
    QVERIFY(endedAlone);
    QVERIFY(stillFull);
    QVERIFY(isClosed);
    QTRY_VERIFY(threads() <= before);
}

QTEST_GUILESS_MAIN(AudioEndTest)
#include "AudioEndTest.moc"
