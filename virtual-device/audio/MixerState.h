// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <cstdint>
#include <optional>
#include <string>

namespace VirtualDevice
{

/// What the virtual sound card's volume control has been set to, as its state file says it.
///
/// File: one line of ASCII, three decimal numbers with a blank between them and a line feed at the end:
///
///     LEFT RIGHT WRITES
///
/// LEFT and RIGHT are 0 to 60; WRITES counts the writes to the control since the file was made. The file is replaced as
/// a whole with each write, so that a reader never sees half a line and may watch its directory for the change. No file
/// means that nothing has been written yet: the card then stands at 0 0.
///
/// Threads: a value; any. The writer is the program's process, the reader the device's.
struct MixerState
{
    static constexpr long minimum = 0;
    static constexpr long maximum = 60;

    long left = 0;
    long right = 0;
    std::uint64_t writes = 0;

    /// Nothing when there is no such file or it does not hold such a line.
    [[nodiscard]] static std::optional<MixerState> read(const std::string& path);
    /// False when the file could not be replaced; the old one is whole then.
    [[nodiscard]] bool write(const std::string& path) const;
};

} // namespace VirtualDevice
