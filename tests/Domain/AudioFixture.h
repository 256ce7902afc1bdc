// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "DataSource/src/XmlConfigurationData.h"
#include "Domain/src/DomainLayer/Audio.h"
#include "tests/Domain/SoundFixture.h"
#include "tests/support/LoggedTexts.h"

#include <QFile>
#include <QObject>

#include <SDL.h>

#include <atomic>
#include <memory>
#include <semaphore>
#include <vector>

namespace TestSupport
{

/// What the player has asked SDL for, and what the programs with this fixture make of it.
struct SdlCalls
{
    static inline std::atomic<int> loads = 0;
    static inline std::atomic<int> pauses = 0;
    /// While set, every load waits for a release: a slow card.
    static inline std::atomic<bool> loadsAreSlow = false;
    static inline std::counting_semaphore<> slowLoads{0};
    static inline std::atomic<int> waitingLoads = 0;
    static inline std::atomic<bool> initialisationFails = false;
    /// By the latest player.
    static inline Uint32 initialisedSubsystems = 0;
    static inline SDL_AudioSpec openedSpec{};
    static inline bool obtainedSpecWanted = true;
};

/// A fresh player for every test function; what is heard is what SDL's disk driver has written.
class AudioFixture : public QObject
{
    Q_OBJECT

protected:
    /// Logged by the player: the device is no file that can be read; the file cannot be loaded.
    static const QString unreadable;
    static QString unloadable(const QString& path);

    /// An open file with these samples.
    QFile* wave(const QByteArray& samples, const QString& name = "sound.wav");
    void restart();
    void waitForTheEnd() const;
    void playToTheEnd(QIODevice* device);
    /// Waits until the audio's thread has worked off what was asked of it so far.
    void flush() const;
    /// Not by asking the device again and again: a short sound might end between two questions.
    void waitForTheStart() const { flush(); }
    /// Plays, and returns when the load waits for its release.
    void playSlowly(QIODevice* device);
    /// Lets the load that waits, and all that come after it, go on, and waits for them.
    void releaseLoads();

    std::unique_ptr<SoundFixture> sound;
    std::unique_ptr<LogCapture> log;
    std::unique_ptr<Domain::Audio> audio;
    std::vector<std::unique_ptr<QFile>> files;

private slots:
    void init();
    void cleanup();

private:
    std::unique_ptr<DataSource::XmlConfigurationData> configuration;
};

} // namespace TestSupport
