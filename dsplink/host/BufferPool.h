// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <pool.h>

#include <array>
#include <cstddef>
#include <cstdint>
#include <vector>

namespace DspLinkHost
{

/// A pool of the shared memory: a fixed number of buffers of a few fixed sizes. What is not given back is missed.
///
/// Not thread-safe; its owner locks.
class BufferPool
{
public:
    /// `DSP_EINVALIDARG` for tables that no shared pool can have, else `DSP_SOK`.
    [[nodiscard]] static DSP_STATUS check(const SMAPOOL_Attrs* attributes);

    /// `attributes` have passed the check.
    explicit BufferPool(const SMAPOOL_Attrs& attributes);

    /// `DSP_EINVALIDARG` for a size that an exact pool does not have, `DSP_EMEMORY` when all of that size are out.
    [[nodiscard]] DSP_STATUS allocate(std::size_t size, std::uint8_t** buffer);

    /// Whether any buffer, free or not, holds so much.
    [[nodiscard]] bool hasSizeFor(std::size_t size) const;

    /// For a message that arrives: the smallest free buffer that holds it; null if there is none.
    [[nodiscard]] std::uint8_t* allocateAtLeast(std::size_t size);

    /// False if the buffer is none of the pool's or is free already.
    [[nodiscard]] bool free(const void* buffer);
    [[nodiscard]] bool isAllocated(const void* buffer) const;
    [[nodiscard]] bool allFree() const;

private:
    struct alignas(DSPLINK_BUF_ALIGN) CacheLine
    {
        std::array<std::uint8_t, DSPLINK_BUF_ALIGN> bytes;
    };
    struct Buffer
    {
        std::size_t size = 0;
        std::vector<CacheLine> memory;
        bool allocated = false;
    };

    [[nodiscard]] std::size_t indexOf(const void* buffer) const;

    std::vector<Buffer> buffers; ///< by size, smallest first
    bool exactMatch;
};

} // namespace DspLinkHost
