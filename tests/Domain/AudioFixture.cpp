// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/Domain/AudioFixture.h"

#include <QTest>

#include <dlfcn.h>

using TestSupport::SdlCalls;

extern "C" SDL_AudioSpec* SDL_LoadWAV_RW(SDL_RWops* source, int freeSource, SDL_AudioSpec* spec, Uint8** buffer,
                                         Uint32* length)
{
    using Function = SDL_AudioSpec* (*)(SDL_RWops*, int, SDL_AudioSpec*, Uint8**, Uint32*);
    static const auto real = reinterpret_cast<Function>(::dlsym(RTLD_NEXT, "SDL_LoadWAV_RW"));
    if (SdlCalls::loadsAreSlow) {
        ++SdlCalls::waitingLoads;
        SdlCalls::slowLoads.acquire();
        --SdlCalls::waitingLoads;
    }
    ++SdlCalls::loads;
    return real(source, freeSource, spec, buffer, length);
}

extern "C" void SDL_PauseAudio(int isPaused)
{
    static const auto real = reinterpret_cast<void (*)(int)>(::dlsym(RTLD_NEXT, "SDL_PauseAudio"));
    SdlCalls::pauses += isPaused != 0 ? 1 : 0;
    real(isPaused);
}

extern "C" int SDL_Init(Uint32 subsystems)
{
    static const auto real = reinterpret_cast<int (*)(Uint32)>(::dlsym(RTLD_NEXT, "SDL_Init"));
    SdlCalls::initialisedSubsystems = subsystems;
    return SdlCalls::initialisationFails ? -1 : real(subsystems);
}

extern "C" int SDL_OpenAudio(SDL_AudioSpec* desired, SDL_AudioSpec* obtained)
{
    using Function = int (*)(SDL_AudioSpec*, SDL_AudioSpec*);
    static const auto real = reinterpret_cast<Function>(::dlsym(RTLD_NEXT, "SDL_OpenAudio"));
    SdlCalls::openedSpec = *desired;
    SdlCalls::obtainedSpecWanted = obtained != nullptr;
    return real(desired, obtained);
}

namespace TestSupport
{

const QString AudioFixture::unreadable =
    "Domain/src/DomainLayer/Audio.cpp, 270, Attempt to play sound in unreadable file.";

QString AudioFixture::unloadable(const QString& path)
{
    return QStringLiteral("Domain/src/DomainLayer/Audio.cpp, 285, Unable to open sound file %1").arg(path);
}

void AudioFixture::init()
{
    sound = std::make_unique<SoundFixture>();
    log = std::make_unique<LogCapture>();
    configuration = std::make_unique<DataSource::XmlConfigurationData>(sound->path("configuration"));
    audio = std::make_unique<Domain::Audio>(*configuration);
    loggedTexts(*log);
    SdlCalls::loads = 0;
}

void AudioFixture::cleanup()
{
    SdlCalls::loadsAreSlow = false;
    audio.reset();
    files.clear();
    configuration.reset();
    log.reset();
    sound.reset();
}

void AudioFixture::restart()
{
    audio.reset();
    audio = std::make_unique<Domain::Audio>(*configuration);
}

QFile* AudioFixture::wave(const QByteArray& samples, const QString& name)
{
    files.push_back(std::make_unique<QFile>(sound->makeFile(name, Wave{samples}.file())));
    if (!files.back()->open(QIODevice::ReadOnly))
        qFatal("Cannot open %s", qPrintable(name));
    return files.back().get();
}

void AudioFixture::flush() const
{
    QMetaObject::invokeMethod(
        audio.get(), [] {}, Qt::BlockingQueuedConnection);
}

void AudioFixture::playToTheEnd(QIODevice* device)
{
    audio->play(device);
    flush();
    waitForTheEnd();
}

void AudioFixture::waitForTheEnd() const
{
    QTRY_VERIFY_WITH_TIMEOUT(!audio->isPlaying(), 20000);
}

void AudioFixture::playSlowly(QIODevice* device)
{
    SdlCalls::loadsAreSlow = true;
    audio->play(device);
    QTRY_COMPARE(SdlCalls::waitingLoads.load(), 1);
}

void AudioFixture::releaseLoads()
{
    SdlCalls::loadsAreSlow = false;
    SdlCalls::slowLoads.release();
    flush();
}

} // namespace TestSupport
