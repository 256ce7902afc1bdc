// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QByteArrayView>

namespace VirtualDevice
{

/// Compares what comes out of the loudspeaker with the sound that should, one device buffer at a time: 4096 samples of
/// 16 bits, 8192 bytes, 256 ms. A sound begins at the begin of a buffer, goes on without a hole, and the rest of its
/// last buffer is zero; between sounds there are buffers of zeros. A sound that is cut off may go on where it was cut,
/// or begin again. One thread.
class SoundMatcher
{
public:
    static constexpr qsizetype bufferSize = 8192;
    static constexpr int bytesPerMillisecond = 32; ///< 16 kHz, 16 bits, mono

    enum class Verdict
    {
        Silence,
        Sound,
        Mismatch
    };
    struct Judgement
    {
        Verdict verdict = Verdict::Silence;
        bool begins = false;      ///< a sound
        qsizetype soundBytes = 0; ///< of the buffer; what follows them is silent
    };

    /// The sample bytes of the sound, as they are in its file.
    void setSound(const QByteArray& samples);
    [[nodiscard]] bool isBetweenSounds() const { return next == 0; }
    [[nodiscard]] Judgement judge(QByteArrayView buffer);
    /// The next buffer is the first of a new program.
    void clear() { next = 0; }

private:
    [[nodiscard]] bool continuesAt(qsizetype offset, QByteArrayView buffer) const;
    [[nodiscard]] Judgement advanceFrom(qsizetype offset, Judgement judgement);
    [[nodiscard]] qsizetype placeOf(QByteArrayView buffer) const;

    QByteArray sound;
    qsizetype first = 0; ///< offset of the sound's first buffer that is not all zero
    qsizetype next = 0;  ///< offset of what is due; 0 between sounds
};

/// The bytes of a WAV file's data chunk; empty where there is none.
[[nodiscard]] QByteArray wavSamples(QByteArrayView file);

} // namespace VirtualDevice
