// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/sandbox/StateFolder.h"

#include <QDataStream>
#include <QDir>
#include <QFile>

#include <cmath>
#include <numbers>

namespace VirtualDevice
{

namespace
{

constexpr quint32 sampleRate = 16'000;
constexpr quint32 sampleCount = sampleRate;
constexpr quint32 sampleBytes = 2;
constexpr double firstFrequency = 500;
constexpr double lastFrequency = 1500;
constexpr double amplitude = 0.5 * 32767;

/// At a time in seconds, of the one second that the sound takes.
qint16 sampleAt(double time)
{
    const double periods = firstFrequency * time + (lastFrequency - firstFrequency) * time * time / 2;
    return static_cast<qint16>(std::lround(amplitude * std::sin(2 * std::numbers::pi * periods)));
}

std::optional<QString> writeUnlessThere(const QString& path, const QByteArray& content)
{
    QFile file(path);
    if (file.exists())
        return std::nullopt;
    if (file.open(QIODevice::WriteOnly) && file.write(content) == content.size() && file.flush())
        return std::nullopt;
    return QStringLiteral("%1: %2").arg(path, file.errorString());
}

} // namespace

std::optional<QString> prepareState(const QString& folder)
{
    for (const char* name : {"mnt/boot", "mnt/data", "mnt/sysdata", "etc/sounds"}) {
        if (!QDir(folder).mkpath(QString::fromLatin1(name)))
            return QStringLiteral("%1/%2: cannot be made").arg(folder, QString::fromLatin1(name));
    }
    if (auto problem = writeUnlessThere(folder + QStringLiteral("/etc/sounds/TestSound.wav"), testSound()))
        return problem;
    return writeUnlessThere(folder + QStringLiteral("/dsp.out"), "virtual DSP firmware image\n");
}

QByteArray testSound()
{
    constexpr quint32 dataBytes = sampleCount * sampleBytes;
    constexpr quint32 headerBytes = 36; // what follows the length field, without the samples
    QByteArray bytes;
    QDataStream out(&bytes, QIODevice::WriteOnly);
    out.setByteOrder(QDataStream::LittleEndian);
    out.writeRawData("RIFF", 4);
    out << quint32(headerBytes + dataBytes);
    out.writeRawData("WAVEfmt ", 8);
    out << quint32(16) << quint16(1) << quint16(1) << sampleRate << quint32(sampleRate * sampleBytes)
        << quint16(sampleBytes) << quint16(16);
    out.writeRawData("data", 4);
    out << dataBytes;
    for (quint32 index = 0; index < sampleCount; ++index)
        out << sampleAt(static_cast<double>(index) / sampleRate);
    return bytes;
}

} // namespace VirtualDevice
