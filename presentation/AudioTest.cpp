// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/AudioTest.h"

#include "Domain/src/DomainLayer/AbstractAudio.h"

#include <QFile>
#include <QThread>
#include <QTimer>

#include <chrono>

namespace Presentation
{

namespace
{

const QString soundPath = QStringLiteral("/etc/sounds/TestSound.wav");
constexpr std::chrono::milliseconds checkInterval{1000};

const char* word(bool value)
{
    return value ? "true" : "false";
}

/// Waits until the player's thread has worked off what was asked of it so far.
void flush(Domain::AbstractAudio& audio)
{
    const QThread* const thread = audio.thread();
    if (thread != QThread::currentThread() && thread->isRunning())
        QMetaObject::invokeMethod(
            &audio, [] {}, Qt::BlockingQueuedConnection);
}

} // namespace

class AudioTest::PrivateData
{
public:
    explicit PrivateData(Domain::AbstractAudio& player) : audio(player), soundFile(soundPath) {}

    Domain::AbstractAudio& audio;
    QFile soundFile;
    QTimer timer;
    bool enabled = false;
};

AudioTest::AudioTest(Domain::AbstractAudio& audio) : d(std::make_unique<PrivateData>(audio))
{
    // The default type may take a twentieth longer, and silence is to last a second at most.
    d->timer.setTimerType(Qt::PreciseTimer);
    d->timer.start(checkInterval);
    qDebug("Audio file exists = %s", word(d->soundFile.exists()));
    qDebug("Attempting to open audio file.  Success = %s", word(d->soundFile.open(QIODevice::ReadOnly)));
    connect(&d->timer, &QTimer::timeout, this, &AudioTest::checkPlaying);
}

AudioTest::~AudioTest()
{
    d->timer.stop();
    flush(d->audio);
    d->soundFile.close();
}

void AudioTest::start()
{
    if (!d->soundFile.isReadable()) {
        qDebug("Error: attempt to play unreadable audio file.");
        return;
    }
    d->enabled = true;
    playAudio();
}

void AudioTest::stop()
{
    d->enabled = false;
}

void AudioTest::checkPlaying()
{
    if (!d->audio.isPlaying())
        playAudio();
}

void AudioTest::playAudio()
{
    if (d->enabled)
        d->audio.play(&d->soundFile);
}

} // namespace Presentation
