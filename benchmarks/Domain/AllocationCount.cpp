// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "benchmarks/Domain/AllocationCount.h"

#include <atomic>
#include <cstddef>

namespace
{

std::atomic<std::uint64_t> allocations = 0;

} // namespace

std::uint64_t Benchmarks::allocationCount()
{
    return allocations;
}

// Qt's containers call malloc themselves, so counting operator new would not see them.
extern "C" {

void* __libc_malloc(std::size_t size);             // NOLINT: the C library's names
void* __libc_realloc(void* old, std::size_t size); // NOLINT

void* malloc(std::size_t size)
{
    allocations.fetch_add(1, std::memory_order_relaxed);
    return __libc_malloc(size);
}

void* realloc(void* old, std::size_t size)
{
    allocations.fetch_add(1, std::memory_order_relaxed);
    return __libc_realloc(old, size);
}
}
