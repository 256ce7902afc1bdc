// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>

#include <span>

namespace Benchmarks
{

/// What the radio microcontroller's line may carry, good and bad.
struct Content
{
    const char* name;
    bool isReadAtOnceToo;                 ///< one of the few that are tried in a single read of everything, too
    QByteArray (*stream)(qsizetype size); ///< at least `size` bytes, the same in every run
};

[[nodiscard]] std::span<const Content> allContents();

} // namespace Benchmarks
