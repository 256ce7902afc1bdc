// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "Domain/src/DomainLayer/AbstractAudio.h"

#include <memory>

namespace DataSource
{
class AbstractConfigurationData;
}

namespace Domain
{

/// Plays WAV files through SDL and sets the loudspeaker's volume through ALSA.
///
/// Output: 16000 Hz, signed 16-bit little-endian, mono, 4096 samples a buffer. The bytes of a file's data chunk go to
/// the device as they are, so a file of another format sounds wrong. Output stops at the first callback after the last
/// byte, at most one buffer (256 ms) after the sound's end.
///
/// Volume: 0 to 6, kept in the settings; the mixer gets ten times that, 0 to 60, in both channels of the last control
/// of the card "default". A value beyond the range is stored as it is; the mixer gets the nearest end of the range.
/// Without a card nothing is written anywhere.
///
/// Errors are logged with fixed line numbers and never reported to the caller; without an audio device sounds are
/// loaded and not heard.
///
/// Threads: the object lives on a thread of its own, which loads the sounds; SDL's audio thread takes the samples.
/// `play`, `pause`, `resume`, `stop` and `isPlaying` may be called from any thread, `volume` and `setVolume` from
/// the thread of the settings, which must outlive the object. The destructor waits for a load that is under way, and
/// 0.8 s for the device to close; one that takes no samples any more is left to itself and to the end of the
/// process. SDL is one for the whole process: there is one object of this class at a time, and none after such an end.
class Audio : public AbstractAudio
{
    Q_OBJECT

public:
    explicit Audio(DataSource::AbstractConfigurationData& configuration);
    ~Audio() override;
    Q_DISABLE_COPY_MOVE(Audio)

    void setVolume(int volume) override;
    int volume() override;
    bool isPlaying() const override;

public slots:
    void play(QIODevice* sound) override;
    void pause() override;
    void resume() override;
    void stop() override;

signals:
    void audioSet(QIODevice* sound);

private slots:
    void playAudio(QIODevice* sound);

private:
    class PrivateData;
    std::unique_ptr<PrivateData> d;
};

} // namespace Domain
