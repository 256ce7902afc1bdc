// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QString>

#include <SDL.h>

#include <memory>

namespace Domain
{

/// A sound as SDL has loaded it from a WAV file: the format and the bytes of the data chunk.
///
/// Only whole, uncompressed files (encoding 1) of at most 64 MiB come as far as SDL, whose loader is made for files
/// that mean well: of a compressed one it divides by a size in its header, a 0 too, and it takes the memory for a chunk
/// of any length before it looks for the chunk. A file is read once, and it is those bytes that are looked at and
/// loaded, whatever happens to the file meanwhile.
///
/// A plain value; any thread.
struct LoadedSound
{
    struct Release
    {
        void operator()(Uint8* samples) const { SDL_FreeWAV(samples); }
    };
    using Samples = std::unique_ptr<Uint8, Release>;

    /// Without samples when the file cannot be loaded. Never waits for anything but the medium.
    [[nodiscard]] static LoadedSound fromFile(const QString& name);
    /// The same for a file's content.
    [[nodiscard]] static LoadedSound fromContent(const QByteArray& content);

    SDL_AudioSpec spec{};
    Samples samples;
    Uint32 length = 0; ///< of the samples, in bytes
};

} // namespace Domain
