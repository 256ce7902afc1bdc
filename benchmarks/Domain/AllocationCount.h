// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <cstdint>

namespace Benchmarks
{

/// Heap allocations of the whole program since its start, Qt's and the standard library's included.
[[nodiscard]] std::uint64_t allocationCount();

} // namespace Benchmarks
