// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QObject>

#include <memory>

namespace Domain
{
class AbstractAudio;
}

namespace Presentation
{

/// Keeps the test sound playing, so that the operator hears any break in the audio path while the device is disturbed.
/// The sound starts again at most a second after it has ended, for whatever reason. No screen area of its own.
///
/// The file /etc/sounds/TestSound.wav is opened once, at construction; if that fails the test stays silent for good,
/// which the debug output says.
///
/// Threads: the GUI thread. The player must outlive the test and, if it loads sounds on a thread of its own, run until
/// then: the destructor waits until that thread has done with the file.
class AudioTest : public QObject
{
    Q_OBJECT

public:
    explicit AudioTest(Domain::AbstractAudio& audio);
    ~AudioTest() override;
    Q_DISABLE_COPY_MOVE(AudioTest)

    void start();
    /// A sound that is playing is heard to its end.
    void stop();

private slots:
    void checkPlaying();
    void playAudio();

private:
    class PrivateData;
    std::unique_ptr<PrivateData> d;
};

} // namespace Presentation
