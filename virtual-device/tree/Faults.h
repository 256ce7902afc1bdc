// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QString>

namespace VirtualDevice
{

/// The error number that a fault control names ("EIO"), 0 for every word that is none ("none", "garbage").
///
/// Threads: any.
[[nodiscard]] int errorNumber(const QString& fault);

} // namespace VirtualDevice
