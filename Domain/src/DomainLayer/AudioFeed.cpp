// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/AudioFeed.h"

#include <SDL.h>

#include <algorithm>

namespace Domain
{

void audioFeed(void* userData, unsigned char* stream, int length)
{
    auto& feed = *static_cast<AudioFeed*>(userData);
    if (feed.remaining == 0) {
        SDL_PauseAudio(1);
        return;
    }
    const auto count = std::min(static_cast<std::uint32_t>(std::max(length, 0)), feed.remaining);
    std::copy_n(feed.position, count, stream);
    feed.position += count;
    feed.remaining -= count;
}

} // namespace Domain
