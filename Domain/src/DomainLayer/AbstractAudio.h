// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

// The whole type, not a declaration: without it the meta-object system cannot carry the pointer to another thread.
#include <QIODevice>
#include <QObject>

namespace Domain
{

/// The loudspeaker: plays one sound at a time and sets the volume, 0 to 6.
///
/// Threads: the operations may be called from any thread that does not change the settings at the same time; the
/// object itself may live in a thread of its own.
class AbstractAudio : public QObject
{
    Q_OBJECT

public:
    AbstractAudio() = default;
    ~AbstractAudio() override = default;
    Q_DISABLE_COPY_MOVE(AbstractAudio)

    /// Plays a sound file from its beginning in place of what plays now. The device must be a `QFile` and must live
    /// until it has been loaded.
    virtual void play(QIODevice* sound) = 0;
    virtual void setVolume(int volume) = 0;
    virtual void pause() = 0;
    virtual void resume() = 0;
    virtual void stop() = 0;
    virtual int volume() = 0;
    virtual bool isPlaying() const = 0;

signals:
    /// For users of the interface; the end of a sound is seen by asking `isPlaying()`.
    void complete();
};

} // namespace Domain
