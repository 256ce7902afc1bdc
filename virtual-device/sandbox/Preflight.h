// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QString>

#include <optional>

namespace VirtualDevice
{

/// What this machine lacks for running a virtual device, as one line that says what to do; nothing when it lacks
/// nothing. Starts nothing that stays.
///
/// Threads: any; waits for the programs that it tries.
[[nodiscard]] std::optional<QString> missingPrerequisite();

} // namespace VirtualDevice
