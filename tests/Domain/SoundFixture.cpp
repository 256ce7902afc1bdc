// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/Domain/SoundFixture.h"

#include <QDataStream>
#include <QFile>
#include <QIODevice>
#include <QRandomGenerator>

namespace TestSupport
{

QByteArray Wave::file() const
{
    QByteArray content;
    QDataStream stream(&content, QIODevice::WriteOnly);
    stream.setByteOrder(QDataStream::LittleEndian);
    const auto length = static_cast<quint32>(samples.size());
    const auto frame = static_cast<quint16>(channels * bits / 8);
    stream.writeRawData("RIFF", 4);
    stream << length + 36;
    stream.writeRawData("WAVEfmt ", 8);
    stream << quint32(16) << quint16(1) << channels << rate << rate * frame << frame << bits;
    stream.writeRawData("data", 4);
    stream << length;
    stream.writeRawData(samples.constData(), static_cast<int>(samples.size()));
    return content;
}

QByteArray CompressedWave::file() const
{
    QByteArray format;
    QDataStream fields(&format, QIODevice::WriteOnly);
    fields.setByteOrder(QDataStream::LittleEndian);
    fields << encoding << channels << quint32(16000) << quint32(8110) << blockAlign << quint16(4);
    fields << quint16(32) << samplesPerBlock << quint16(7);
    for (const int coefficient : {256, 0, 512, -256, 0, 0, 192, 64, 240, 0, 460, -208, 392, -232})
        fields << static_cast<qint16>(coefficient);
    QByteArray content;
    QDataStream stream(&content, QIODevice::WriteOnly);
    stream.setByteOrder(QDataStream::LittleEndian);
    const QByteArray samples(4 * 256, '\0');
    stream.writeRawData("RIFF", 4);
    stream << quint32(20 + formatSize + samples.size());
    stream.writeRawData("WAVEfmt ", 8);
    stream << formatSize;
    stream.writeRawData(format.constData(), static_cast<int>(formatSize));
    stream.writeRawData("data", 4);
    stream << static_cast<quint32>(samples.size());
    stream.writeRawData(samples.constData(), static_cast<int>(samples.size()));
    return content;
}

QByteArray noise(qsizetype size, quint32 seed)
{
    QRandomGenerator random(seed);
    QByteArray bytes(size, '\0');
    for (auto& byte : bytes)
        byte = static_cast<char>(random.bounded(1, 256));
    return bytes;
}

SoundFixture::SoundFixture()
{
    chooseDiskOutput();
    chooseCard();
}

QString SoundFixture::makeFile(const QString& name, const QByteArray& content) const
{
    QFile file(path(name));
    if (!file.open(QIODevice::WriteOnly) || file.write(content) != content.size())
        qFatal("Cannot write %s", qPrintable(file.fileName()));
    return file.fileName();
}

void SoundFixture::chooseDiskOutput() const
{
    QFile::remove(path("output"));
    qputenv("SDL_AUDIODRIVER", "disk");
    qputenv("SDL_DISKAUDIOFILE", QFile::encodeName(path("output")));
    // Milliseconds for each buffer: faster than life, so that the tests are.
    qputenv("SDL_DISKAUDIODELAY", "5");
}

void SoundFixture::chooseNoOutput()
{
    qputenv("SDL_AUDIODRIVER", "none-such");
}

void SoundFixture::chooseCard() const
{
    const QByteArray configuration = "ctl_type.immunityrig { lib \"" MIXER_PLUGIN "\" }\n"
                                     "ctl.default { type immunityrig state \"" +
                                     QFile::encodeName(path("mixer")) + "\" }\n";
    qputenv("ALSA_CONFIG_PATH", QFile::encodeName(makeFile("asound.conf", configuration)));
}

void SoundFixture::chooseNoCard() const
{
    qputenv("ALSA_CONFIG_PATH", QFile::encodeName(makeFile("empty.conf", "# nothing\n")));
}

QByteArray SoundFixture::output() const
{
    QFile file(path("output"));
    return file.open(QIODevice::ReadOnly) ? file.readAll() : QByteArray();
}

QList<QByteArray> SoundFixture::sounds() const
{
    static const QByteArray silence(bufferSize, '\0');
    const QByteArray all = output();
    QList<QByteArray> found;
    bool inSound = false;
    for (qsizetype start = 0; start + bufferSize <= all.size(); start += bufferSize) {
        const QByteArray buffer = all.mid(start, bufferSize);
        const bool isSilent = buffer == silence;
        if (!isSilent && !inSound)
            found.append(QByteArray());
        if (!isSilent)
            found.last() += buffer;
        inSound = !isSilent;
    }
    return found;
}

QString SoundFixture::mixer() const
{
    QFile file(path("mixer"));
    return file.open(QIODevice::ReadOnly) ? QString::fromLatin1(file.readAll()).trimmed() : QString();
}

void SoundFixture::forgetMixer() const
{
    QFile::remove(path("mixer"));
}

} // namespace TestSupport
