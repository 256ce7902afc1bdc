// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QString>
#include <QStringList>
#include <QTemporaryDir>

namespace TestSupport
{

/// A WAV file's content: PCM, by default in the device's own format.
struct Wave
{
    QByteArray samples;
    quint32 rate = 16000;
    quint16 channels = 1;
    quint16 bits = 16;

    [[nodiscard]] QByteArray file() const;
};

/// A WAV file in a compressed encoding, which is 2 or 0x11: four bits a sample, some zeros as samples. Its format chunk
/// may promise what it likes.
struct CompressedWave
{
    quint16 encoding = 2;
    quint16 channels = 1;
    quint16 blockAlign = 256;
    quint16 samplesPerBlock = 505;
    quint32 formatSize = 50; ///< of the chunk: with its extension, which the encodings need

    [[nodiscard]] QByteArray file() const;
};

/// Bytes of which none is 0, so that they stand out from silence; different for each seed.
[[nodiscard]] QByteArray noise(qsizetype size, quint32 seed);

/// A place where a sound can be heard and a volume seen: SDL's "disk" driver, which writes what it plays to a file, and
/// a sound card whose volume is kept in a state file (virtual-device/audio/MixerState.h). To be made before the first
/// use of SDL or ALSA in the program.
class SoundFixture
{
public:
    /// Samples that SDL takes at a time, in bytes.
    static constexpr qsizetype bufferSize = 8192;

    SoundFixture();

    [[nodiscard]] QString path(const QString& name) const { return directory.filePath(name); }
    QString makeFile(const QString& name, const QByteArray& content) const;

    void chooseDiskOutput() const;
    static void chooseNoOutput();
    void chooseCard() const;
    void chooseNoCard() const;

    /// What SDL has put out since the last `chooseDiskOutput`.
    [[nodiscard]] QByteArray output() const;
    /// The stretches of output between silent buffers.
    [[nodiscard]] QList<QByteArray> sounds() const;
    /// "LEFT RIGHT WRITES"; empty when nothing has been written.
    [[nodiscard]] QString mixer() const;
    void forgetMixer() const;

private:
    QTemporaryDir directory;
};

} // namespace TestSupport
