// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

namespace Benchmarks
{

/// Puts ordinary files in memory, with the same contents, in the place of /sys and of the data card, for this process
/// and those that it starts from now on.
///
/// The kernel answers a read of its own files at once. The virtual device answers it from another process, and every
/// lookup, open and read costs the reader a wait, some forty in a second: they would hide what the program's own timers
/// do. The clock alone stays the virtual device's, as no ordinary file tells the time.
/// Throws std::exception. Call it while the process has one thread.
void useOrdinaryFiles();

} // namespace Benchmarks
