// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

namespace Benchmarks
{

/// Waits, as a client of the VNC server that the program brings along, until its window of 240 by 320 pixels has been
/// painted from the first row to the last. False when that takes longer than a minute.
[[nodiscard]] bool waitForFirstFrame(int port);

} // namespace Benchmarks
