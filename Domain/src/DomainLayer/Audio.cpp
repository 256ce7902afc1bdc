// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/Audio.h"

#include "DataSource/src/AbstractConfigurationData.h"
#include "Domain/src/DomainLayer/AudioFeed.h"
#include "Domain/src/DomainLayer/LoadedSound.h"
#include "Domain/src/DomainLayer/PlayRequests.h"
#include "Domain/src/DomainLayer/WorkerThread.h"
#include "utilities/Debug.h"
#include "utilities/SourceWarnings.h"

#include <QFile>

#include <SDL.h>
#include <alsa/asoundlib.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <future>
#include <mutex>
#include <system_error>
#include <thread>
#include <utility>

namespace Domain
{

namespace
{

using DataSource::AbstractConfigurationData;

/// Line numbers that monitoring matches in the log.
constexpr int initialisationFailedLine = 74;
constexpr int openFailedLine = 91;
constexpr int volumeTooLowLine = 109;
constexpr int volumeTooHighLine = 116;
constexpr int unreadableSoundLine = 270;
constexpr int unloadableSoundLine = 285;

constexpr int minimumVolume = 0;
constexpr int maximumVolume = 6;
constexpr int defaultVolume = 3;
constexpr int mixerLevelsPerStep = 10;

/// A healthy device plays what it has been given, three buffers (768 ms) at most.
constexpr std::chrono::milliseconds longestClose{800};

constexpr int sampleRate = 16000;
constexpr Uint16 samplesPerBuffer = 4096;

const Utilities::SourceWarnings warn(QStringLiteral(__FILE__));

/// Keeps SDL's audio callback out. Without an open device there is no callback, and this locks nothing.
class CallbackLock
{
public:
    CallbackLock() { SDL_LockAudio(); }
    ~CallbackLock() { SDL_UnlockAudio(); }
    Q_DISABLE_COPY_MOVE(CallbackLock)
};

void writeMixerLevel(snd_hctl_t* control, int level)
{
    if (snd_hctl_load(control) < 0)
        return;
    snd_hctl_elem_t* const volume = snd_hctl_last_elem(control);
    if (volume == nullptr)
        return;
    snd_ctl_elem_value_t* value = nullptr;
    snd_ctl_elem_value_alloca(&value);
    snd_ctl_elem_value_set_integer(value, 0, level);
    snd_ctl_elem_value_set_integer(value, 1, level);
    snd_hctl_elem_write(volume, value);
}

/// SDL waits for its own thread, without a limit, and that waits for the device to take samples. Returns false when the
/// device has not been closed in time: then a thread that nobody waits for goes on closing it, and keeps what the
/// callback might still use.
bool closeDevice(const std::shared_ptr<AudioFeed>& feed)
{
    std::packaged_task<void()> close([feed] { SDL_CloseAudio(); });
    const auto closed = close.get_future();
    try {
        std::thread(std::move(close)).detach();
    } catch (const std::system_error&) { // the machine has no thread left
        SDL_CloseAudio();
        return true;
    }
    return closed.wait_for(longestClose) == std::future_status::ready;
}

} // namespace

class Audio::PrivateData
{
public:
    explicit PrivateData(AbstractConfigurationData& settings) : configuration(settings) {}

    void openDevice();
    void setDeviceVolume(int volume) const;
    void setSound(LoadedSound sound);
    void startSound(LoadedSound sound, const QIODevice* device, unsigned int stopsBefore);

    AbstractConfigurationData& configuration;
    bool initialised = false;
    SDL_AudioSpec spec{};
    LoadedSound::Samples soundBuffer;
    const std::shared_ptr<AudioFeed> feed = std::make_shared<AudioFeed>();
    /// Held by all who change the sound, outside the callback lock, which guards nothing while no device is open.
    std::mutex mutex;
    /// How often the sound has been stopped; raised under the mutex.
    std::atomic<unsigned int> stops = 0;
    PlayRequests requests;
    WorkerThread thread;
};

void Audio::PrivateData::openDevice()
{
    // SDL's parachute would catch the process's crash signals.
    initialised = SDL_Init(SDL_INIT_AUDIO | SDL_INIT_NOPARACHUTE) >= 0;
    if (!initialised) {
        warn(initialisationFailedLine, QStringLiteral("Unable to initialize SDL"));
        return;
    }
    spec.freq = sampleRate;
    spec.format = AUDIO_S16LSB;
    spec.channels = 1;
    spec.samples = samplesPerBuffer;
    spec.callback = audioFeed;
    spec.userdata = feed.get();
    if (SDL_OpenAudio(&spec, nullptr) < 0)
        warn(openFailedLine, QStringLiteral("Unable to open audio"));
}

void Audio::PrivateData::setDeviceVolume(int volume) const
{
    if (volume < minimumVolume)
        warn(volumeTooLowLine, QStringLiteral("Volume less than min of %1. Got %2").arg(minimumVolume).arg(volume));
    if (volume > maximumVolume)
        warn(volumeTooHighLine, QStringLiteral("Volume greater than max of %1. Got %2").arg(maximumVolume).arg(volume));
    const int level = std::clamp(volume, minimumVolume, maximumVolume) * mixerLevelsPerStep;
    // A failed open leaves no handle, and every further call on it would end the process.
    snd_hctl_t* control = nullptr;
    if (snd_hctl_open(&control, "default", 0) < 0)
        return;
    writeMixerLevel(control, level);
    snd_hctl_close(control);
}

/// Puts a sound, or none, in place of the present one. The caller holds the mutex.
void Audio::PrivateData::setSound(LoadedSound sound)
{
    // The previous one goes with the argument, outside the lock.
    const CallbackLock lock;
    soundBuffer.swap(sound.samples);
    *feed = {sound.length, soundBuffer.get()};
}

/// Unless it has been stopped while it was being loaded.
void Audio::PrivateData::startSound(LoadedSound sound, const QIODevice* device, unsigned int stopsBefore)
{
    const std::lock_guard lock(mutex);
    if (stops != stopsBefore)
        return;
    spec = sound.spec;
    setSound(std::move(sound));
    SDL_PauseAudio(0);
    // Still under the mutex: what is asked for after the next stop is not answered by this start.
    requests.answer(device);
}

Audio::Audio(AbstractConfigurationData& configuration) : d(std::make_unique<PrivateData>(configuration))
{
    d->openDevice();
    moveToThread(&d->thread);
    d->thread.start();
    d->setDeviceVolume(Audio::volume());
    connect(this, &Audio::audioSet, this, &Audio::playAudio);
}

Audio::~Audio()
{
    // The thread may be loading a sound; what it has not begun to load is dropped with its event loop.
    disconnect(this, &Audio::audioSet, this, &Audio::playAudio);
    d->thread.end();
    Audio::stop();
    if (closeDevice(d->feed) && d->initialised)
        SDL_Quit();
}

void Audio::play(QIODevice* sound)
{
    d->requests.add(sound);
    emit audioSet(sound);
}

void Audio::playAudio(QIODevice* sound)
{
    const auto state = d->requests.take(sound);
    if (state == PlayRequests::State::Answered)
        return;
    auto* const file = state == PlayRequests::State::Gone ? nullptr : dynamic_cast<QFile*>(sound);
    if (file == nullptr || !file->isReadable()) {
        warn(unreadableSoundLine, QStringLiteral("Attempt to play sound in unreadable file."));
        return;
    }
    file->reset();
    stop();
    const QString fileName = file->fileName();
    // Outside the locks: a slow card must not hold up whoever pauses or stops meanwhile.
    const unsigned int stopsBefore = d->stops;
    LoadedSound loaded = LoadedSound::fromFile(fileName);
    if (loaded.samples == nullptr)
        warn(unloadableSoundLine,
             QStringLiteral("Unable to open sound file %1").arg(Utilities::Debug::literal(fileName)));
    else
        d->startSound(std::move(loaded), sound, stopsBefore);
}

void Audio::pause()
{
    SDL_PauseAudio(1);
}

void Audio::resume()
{
    SDL_PauseAudio(0);
}

void Audio::stop()
{
    const std::lock_guard lock(d->mutex);
    ++d->stops;
    SDL_PauseAudio(1);
    d->setSound({});
}

bool Audio::isPlaying() const
{
    return SDL_GetAudioStatus() == SDL_AUDIO_PLAYING;
}

int Audio::volume()
{
    return d->configuration.data(AbstractConfigurationData::Volume, defaultVolume).toInt();
}

void Audio::setVolume(int volume)
{
    d->setDeviceVolume(volume);
    // The value read from the file is a string.
    const QVariant stored = d->configuration.data(AbstractConfigurationData::Volume);
    bool isNumber = false;
    if (stored.toInt(&isNumber) != volume || !isNumber)
        d->configuration.setData(AbstractConfigurationData::Volume, volume);
}

} // namespace Domain
