// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QString>
#include <QStringList>

#include <cstdint>
#include <optional>

namespace VirtualDevice
{

/// The keys that the virtual device can press, by every name that a person may give them: as on the keypad ("Soft1",
/// "Trigger") or as on a keyboard ("F5", "F10"); letters and digits as themselves. Case does not matter.
///
/// The codes are those of the remote framebuffer protocol (X key symbols).
///
/// Threads: no state; any thread.
class KeyTable
{
public:
    KeyTable() = delete;

    [[nodiscard]] static std::optional<std::uint32_t> symbol(const QString& name);
    /// One entry a key, its names separated by "|": "Return|Enter|Sel".
    [[nodiscard]] static QStringList names();
};

} // namespace VirtualDevice
