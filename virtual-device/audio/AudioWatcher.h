// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/audio/SoundMatcher.h"

#include <QDateTime>
#include <QFileSystemWatcher>
#include <QObject>
#include <QString>
#include <QTimer>

#include <chrono>
#include <functional>
#include <memory>
#include <optional>

class QSocketNotifier;

namespace VirtualDevice
{

class Registry;
struct SandboxPlan;

/// The loudspeaker and its volume control: listens to what the program plays and reads what it sets.
///
/// The program's audio library writes the samples to a named pipe (its "disk" driver), a buffer of 4096 samples every
/// 256 ms, silence included; the watcher compares them with the sound file and measures the silence between sounds.
/// The mixer is a plug-in of the program's ALSA library with a state file (MixerPlugin.cpp). Reports are the `audio.`
/// rows of the control table.
///
/// `audio.gap_ms` counts from the first sound of a program on: silent bytes at 32 a millisecond, and, where the stream
/// itself falls silent for longer than a scheduler's whim, the time without it. `audio.late_ms` is the most that a
/// buffer has been late in the same time, whims included: a stream that stutters shows there. Lives in
/// the thread that makes it, which must run an event loop.
class AudioWatcher : public QObject
{
    Q_OBJECT

public:
    /// Where the sandbox sees the folder and the mixer's plug-in.
    static constexpr auto visibleFolder = "/run/sound";
    static constexpr auto visiblePlugin = "/run/sound-card/mixer.so";

    using Clock = std::chrono::steady_clock;

    /// `now` is the time by which a stream is late.
    explicit AudioWatcher(Registry& registry, std::function<Clock::time_point()> now = Clock::now,
                          QObject* parent = nullptr);
    ~AudioWatcher() override;

    /// Lays out `folder` and listens. `soundFile` is what should be heard; it is read anew when it has changed. Returns
    /// what went wrong.
    [[nodiscard]] std::optional<QString> open(const QString& folder, const QString& soundFile);
    void close();

    /// The binds and the environment that lead the program's sound here, as `audio.presence` says now. Without the
    /// plug-in's file there is no mixer.
    void contribute(SandboxPlan& plan, const QString& pluginFile) const;

private:
    [[nodiscard]] std::optional<QString> layOut();
    [[nodiscard]] bool openPipe();
    void closePipe();
    void readAvailable();
    void programEnded();
    [[nodiscard]] qint64 lateness() const;
    void heard(QByteArrayView buffer);
    void adoptSound();
    void judge(const SoundMatcher::Judgement& judgement);
    void extendGap(qint64 milliseconds);
    void publishGap();
    void extendLateness(qint64 milliseconds);
    void checkStall();
    void readMixer();
    void forget();

    Registry& registry;
    std::function<Clock::time_point()> now;
    QString folder;
    QString soundFile;
    QDateTime soundDate;
    int pipe = -1;
    std::unique_ptr<QSocketNotifier> notifier;
    QByteArray partial; ///< of a buffer
    SoundMatcher matcher;
    bool hasSounded = false;
    qint64 silentBytes = 0;      ///< since the last sound
    qint64 stalled = 0;          ///< ms without a stream since the last sound
    qint64 longestGap = 0;       ///< ms
    qint64 greatestLateness = 0; ///< ms
    Clock::time_point lastArrival;
    QTimer stallTimer;
    QFileSystemWatcher mixerWatcher;
};

} // namespace VirtualDevice
