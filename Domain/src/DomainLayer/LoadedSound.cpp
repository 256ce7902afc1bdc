// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/LoadedSound.h"

#include <QFile>
#include <QtEndian>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <optional>

namespace Domain
{

namespace
{

constexpr off_t longestFile = 64 * 1024 * 1024;
constexpr qsizetype chunkHeaderSize = 8;
constexpr qsizetype containerHeaderSize = 12;
constexpr qsizetype formatSize = 16;
constexpr quint16 uncompressed = 1;

/// A regular file's; none of anything else, nor of a file beyond the limit. A pipe that has taken a file's place would
/// keep the thread for ever.
QByteArray contentOf(const QByteArray& fileName)
{
    const int descriptor = ::open(fileName.constData(), O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    if (descriptor < 0)
        return {};
    struct stat status
    {
    };
    const bool isUsable = ::fstat(descriptor, &status) == 0 && S_ISREG(status.st_mode) && status.st_size <= longestFile;
    QFile file;
    if (isUsable && file.open(descriptor, QIODevice::ReadOnly | QIODevice::Unbuffered, QFile::AutoCloseHandle))
        return file.read(status.st_size);
    ::close(descriptor);
    return {};
}

/// Takes the first chunk from `chunks` and returns what it holds; none when it is not whole. Chunks stand close
/// together, as SDL reads them: one of an odd length is not filled up.
std::optional<QByteArrayView> takenChunk(QByteArrayView& chunks)
{
    if (chunks.size() < chunkHeaderSize)
        return std::nullopt;
    const auto length = qFromLittleEndian<quint32>(chunks.data() + 4);
    chunks = chunks.sliced(chunkHeaderSize);
    if (length > static_cast<quint64>(chunks.size()))
        return std::nullopt;
    const auto content = chunks.first(static_cast<qsizetype>(length));
    chunks = chunks.sliced(content.size());
    return content;
}

bool isUncompressed(QByteArrayView format)
{
    return format.size() >= formatSize && qFromLittleEndian<quint16>(format.data()) == uncompressed;
}

/// Whether all is well as far as SDL reads: of the first format chunk, and with no chunk that is longer than the file,
/// for which it would take the memory all the same, to the first data chunk behind it.
bool isTrustworthy(QByteArrayView file)
{
    if (!file.startsWith("RIFF") || file.size() < containerHeaderSize)
        return false;
    QByteArrayView chunks = file.sliced(containerHeaderSize);
    bool hasFormat = false;
    for (;;) {
        const auto header = chunks;
        const auto content = takenChunk(chunks);
        if (!content)
            return false;
        if (hasFormat && header.startsWith("data"))
            return true;
        if (!hasFormat && header.startsWith("fmt ")) {
            if (!isUncompressed(*content))
                return false;
            hasFormat = true;
        }
    }
}

} // namespace

LoadedSound LoadedSound::fromFile(const QString& name)
{
    return fromContent(contentOf(QFile::encodeName(name)));
}

/// SDL leaves its results alone on failure and closes the stream.
LoadedSound LoadedSound::fromContent(const QByteArray& content)
{
    LoadedSound sound;
    if (!isTrustworthy(content))
        return sound;
    SDL_RWops* const stream = SDL_RWFromConstMem(content.constData(), static_cast<int>(content.size()));
    Uint8* samples = nullptr;
    if (stream != nullptr && SDL_LoadWAV_RW(stream, 1, &sound.spec, &samples, &sound.length) != nullptr)
        sound.samples.reset(samples);
    return sound;
}

} // namespace Domain
