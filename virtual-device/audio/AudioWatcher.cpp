// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/audio/AudioWatcher.h"

#include "virtual-device/audio/MixerState.h"
#include "virtual-device/registry/Registry.h"
#include "virtual-device/sandbox/SandboxPlan.h"

#include <QDir>
#include <QFile>
#include <QFileInfo>
#include <QScopeGuard>
#include <QSocketNotifier>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

namespace VirtualDevice
{

using namespace std::chrono_literals;
using Verdict = SoundMatcher::Verdict;

namespace
{

constexpr qint64 bufferTime = SoundMatcher::bufferSize / SoundMatcher::bytesPerMillisecond;
constexpr qint64 schedulersWhim = 500; ///< ms that a buffer may be late without having been a gap
constexpr auto stallCheck = 100ms;

QString visible(const char* name)
{
    return QStringLiteral("%1/%2").arg(QLatin1String(AudioWatcher::visibleFolder), QLatin1String(name));
}

QByteArray mixerConfiguration()
{
    return QStringLiteral("ctl_type.immunityrig { lib \"%1\" }\nctl.default { type immunityrig state \"%2\" }\n")
        .arg(QLatin1String(AudioWatcher::visiblePlugin), visible("mixer"))
        .toUtf8();
}

/// What a file of that name holds; nothing where it is no ordinary file, such as a pipe, which must hold nobody up, or
/// where it is longer than any sound.
QByteArray contentOf(const QString& path)
{
    constexpr qint64 longestFile = 64 * 1024 * 1024;
    const int descriptor = ::open(QFile::encodeName(path).constData(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    if (descriptor < 0)
        return {};
    const auto close = qScopeGuard([descriptor] { ::close(descriptor); });
    struct stat status
    {
    };
    if (::fstat(descriptor, &status) != 0 || !S_ISREG(status.st_mode) || status.st_size > longestFile)
        return {};
    QFile file;
    return file.open(descriptor, QIODevice::ReadOnly) ? file.read(longestFile) : QByteArray();
}

} // namespace

AudioWatcher::AudioWatcher(Registry& controls, std::function<Clock::time_point()> clock, QObject* parent)
    : QObject(parent), registry(controls), now(std::move(clock)), stallTimer(this), mixerWatcher(this)
{
    connect(&stallTimer, &QTimer::timeout, this, &AudioWatcher::checkStall);
    connect(&mixerWatcher, &QFileSystemWatcher::directoryChanged, this, &AudioWatcher::readMixer);
    connect(&registry, &Registry::changed, this, [this](const QString& name, const QJsonValue& value) {
        if (name == u"audio.forget" && value.toBool())
            forget();
    });
}

AudioWatcher::~AudioWatcher()
{
    close();
}

std::optional<QString> AudioWatcher::open(const QString& soundFolder, const QString& expectedSound)
{
    close();
    folder = soundFolder;
    soundFile = expectedSound;
    if (auto problem = layOut())
        return problem;
    if (!openPipe())
        return QStringLiteral("%1: %2").arg(folder, qt_error_string(errno));
    mixerWatcher.addPath(folder);
    readMixer();
    return std::nullopt;
}

std::optional<QString> AudioWatcher::layOut()
{
    const QByteArray name = (folder + QStringLiteral("/stream")).toLocal8Bit();
    QFile::remove(QString::fromLocal8Bit(name));
    if (!QDir().mkpath(folder) || ::mkfifo(name.constData(), 0600) != 0)
        return QStringLiteral("%1: %2").arg(QString::fromLocal8Bit(name), qt_error_string(errno));
    QFile configuration(folder + QStringLiteral("/alsa.conf"));
    if (!configuration.open(QIODevice::WriteOnly) || configuration.write(mixerConfiguration()) < 0)
        return QStringLiteral("%1: %2").arg(configuration.fileName(), configuration.errorString());
    return std::nullopt;
}

void AudioWatcher::close()
{
    closePipe();
    stallTimer.stop();
    if (!mixerWatcher.directories().isEmpty())
        mixerWatcher.removePaths(mixerWatcher.directories());
}

void AudioWatcher::contribute(SandboxPlan& plan, const QString& pluginFile) const
{
    const QString presence = registry.text(QStringLiteral("audio.presence"));
    if (presence == u"missing")
        return;
    plan.add(folder, QLatin1String(visibleFolder), SandboxBind::Kind::Writable);
    if (presence != u"no-output") {
        plan.environment.insert(QStringLiteral("SDL_AUDIODRIVER"), QStringLiteral("disk"));
        plan.environment.insert(QStringLiteral("SDL_DISKAUDIOFILE"), visible("stream"));
        plan.environment.insert(QStringLiteral("SDL_DISKAUDIODELAY"), QString::number(bufferTime));
    }
    if (presence != u"no-mixer" && QFileInfo::exists(pluginFile)) {
        plan.add(pluginFile, QLatin1String(visiblePlugin), SandboxBind::Kind::ReadOnly);
        plan.environment.insert(QStringLiteral("ALSA_CONFIG_PATH"), visible("alsa.conf"));
    }
}

/// The new end is opened before the old one goes: a program that is just starting must never find the pipe without a
/// reader.
bool AudioWatcher::openPipe()
{
    const QByteArray name = (folder + QStringLiteral("/stream")).toLocal8Bit();
    const int fresh = ::open(name.constData(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    closePipe();
    pipe = fresh;
    if (pipe < 0)
        return false;
    notifier = std::make_unique<QSocketNotifier>(pipe, QSocketNotifier::Read);
    connect(notifier.get(), &QSocketNotifier::activated, this, &AudioWatcher::readAvailable);
    return true;
}

void AudioWatcher::closePipe()
{
    if (notifier) { // it may be the sender of the very call that led here
        notifier->setEnabled(false);
        notifier.release()->deleteLater();
    }
    if (pipe >= 0)
        ::close(pipe);
    pipe = -1;
}

void AudioWatcher::readAvailable()
{
    QByteArray chunk(4 * SoundMatcher::bufferSize, Qt::Uninitialized);
    const auto count = ::read(pipe, chunk.data(), static_cast<std::size_t>(chunk.size()));
    if (count == 0)
        return programEnded();
    if (count < 0)
        return;
    partial.append(chunk.constData(), count);
    while (partial.size() >= SoundMatcher::bufferSize) {
        heard(QByteArrayView(partial).first(SoundMatcher::bufferSize));
        partial.remove(0, SoundMatcher::bufferSize);
    }
}

/// A pipe whose writer has gone stays readable for ever; a fresh end waits for the next program.
void AudioWatcher::programEnded()
{
    stallTimer.stop();
    partial.clear();
    matcher.clear();
    hasSounded = false;
    registry.publish(QStringLiteral("audio.playing"), false);
    (void)openPipe();
}

/// Milliseconds for which the next buffer is due.
qint64 AudioWatcher::lateness() const
{
    return std::chrono::duration_cast<std::chrono::milliseconds>(now() - lastArrival).count() - bufferTime;
}

void AudioWatcher::heard(QByteArrayView buffer)
{
    if (hasSounded) {
        const auto late = lateness();
        stalled += late > schedulersWhim ? late : 0;
        extendLateness(late);
    }
    lastArrival = now();
    if (matcher.isBetweenSounds())
        adoptSound();
    registry.count(QStringLiteral("audio.buffers"));
    judge(matcher.judge(buffer));
}

void AudioWatcher::adoptSound()
{
    const QDateTime date = QFileInfo(soundFile).lastModified();
    if (date == soundDate)
        return;
    matcher.setSound(wavSamples(contentOf(soundFile)));
    soundDate = date;
}

void AudioWatcher::judge(const SoundMatcher::Judgement& judgement)
{
    const bool sounds = judgement.verdict != Verdict::Silence;
    if (judgement.verdict == Verdict::Mismatch)
        registry.count(QStringLiteral("audio.mismatches"));
    if (judgement.begins)
        registry.count(QStringLiteral("audio.sounds"));
    publishGap();
    if (sounds) {
        hasSounded = true;
        silentBytes = 0;
        stalled = 0;
        stallTimer.start(stallCheck);
    }
    if (hasSounded)
        silentBytes += SoundMatcher::bufferSize - judgement.soundBytes;
    publishGap();
    registry.publish(QStringLiteral("audio.playing"), sounds);
}

void AudioWatcher::publishGap()
{
    extendGap(silentBytes / SoundMatcher::bytesPerMillisecond + stalled);
}

void AudioWatcher::extendGap(qint64 milliseconds)
{
    if (!hasSounded || milliseconds <= longestGap)
        return;
    longestGap = milliseconds;
    registry.publish(QStringLiteral("audio.gap_ms"), longestGap);
}

void AudioWatcher::extendLateness(qint64 milliseconds)
{
    if (milliseconds <= greatestLateness)
        return;
    greatestLateness = milliseconds;
    registry.publish(QStringLiteral("audio.late_ms"), greatestLateness);
}

/// Makes a gap visible while it lasts: nobody knows whether the stream will ever go on.
void AudioWatcher::checkStall()
{
    const qint64 late = lateness();
    if (late <= schedulersWhim)
        return;
    registry.publish(QStringLiteral("audio.playing"), false);
    extendLateness(late);
    extendGap(silentBytes / SoundMatcher::bytesPerMillisecond + stalled + late);
}

void AudioWatcher::readMixer()
{
    const auto state = MixerState::read((folder + QStringLiteral("/mixer")).toStdString());
    if (!state)
        return;
    registry.publish(QStringLiteral("audio.volume_left"), static_cast<qint64>(state->left));
    registry.publish(QStringLiteral("audio.volume_right"), static_cast<qint64>(state->right));
    registry.publish(QStringLiteral("audio.volume_writes"), static_cast<qint64>(state->writes));
}

void AudioWatcher::forget()
{
    longestGap = 0;
    greatestLateness = 0;
    registry.publish(QStringLiteral("audio.gap_ms"), 0);
    registry.publish(QStringLiteral("audio.late_ms"), 0);
    registry.publish(QStringLiteral("audio.mismatches"), 0);
    registry.publish(QStringLiteral("audio.forget"), false);
}

} // namespace VirtualDevice
