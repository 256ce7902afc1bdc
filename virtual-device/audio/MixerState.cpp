// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/audio/MixerState.h"

#include <unistd.h>

#include <cstdio>
#include <fstream>

namespace VirtualDevice
{

namespace
{

bool isLevel(long value)
{
    return value >= MixerState::minimum && value <= MixerState::maximum;
}

} // namespace

std::optional<MixerState> MixerState::read(const std::string& path)
{
    std::ifstream file(path);
    MixerState state;
    if (!(file >> state.left >> state.right >> state.writes) || !isLevel(state.left) || !isLevel(state.right))
        return std::nullopt;
    return state;
}

bool MixerState::write(const std::string& path) const
{
    const std::string replacement = path + ".new." + std::to_string(::getpid());
    {
        std::ofstream file(replacement, std::ios::trunc);
        file << left << ' ' << right << ' ' << writes << '\n';
        if (!file.flush())
            return false;
    }
    return std::rename(replacement.c_str(), path.c_str()) == 0;
}

} // namespace VirtualDevice
