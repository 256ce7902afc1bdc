// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "dsplink/host/BufferPool.h"

#include <algorithm>
#include <span>

namespace DspLinkHost
{

DSP_STATUS BufferPool::check(const SMAPOOL_Attrs* attributes)
{
    if (attributes == nullptr || attributes->bufSizes == nullptr || attributes->numBuffers == nullptr ||
        attributes->numBufPools == 0 || attributes->numBufPools > MAX_SMABUFENTRIES)
        return DSP_EINVALIDARG;
    const std::span sizes(attributes->bufSizes, attributes->numBufPools);
    const auto fits = [](Uint32 size) { return size != 0 && size % DSPLINK_BUF_ALIGN == 0 && size <= UINT16_MAX; };
    return std::all_of(sizes.begin(), sizes.end(), fits) ? DSP_SOK : DSP_EINVALIDARG;
}

BufferPool::BufferPool(const SMAPOOL_Attrs& attributes) : exactMatch(attributes.exactMatchReq != 0)
{
    for (Uint32 entry = 0; entry < attributes.numBufPools; ++entry) {
        const std::size_t size = attributes.bufSizes[entry];
        for (Uint32 number = 0; number < attributes.numBuffers[entry]; ++number)
            buffers.push_back({size, std::vector<CacheLine>(size / DSPLINK_BUF_ALIGN), false});
    }
    std::stable_sort(buffers.begin(), buffers.end(), [](const Buffer& a, const Buffer& b) { return a.size < b.size; });
}

DSP_STATUS BufferPool::allocate(std::size_t size, std::uint8_t** buffer)
{
    *buffer = nullptr;
    const auto serves = [&](const Buffer& candidate) {
        return exactMatch ? candidate.size == size : candidate.size >= size;
    };
    if (std::none_of(buffers.begin(), buffers.end(), serves))
        return DSP_EINVALIDARG;
    const auto found = std::find_if(buffers.begin(), buffers.end(),
                                    [&](const Buffer& candidate) { return serves(candidate) && !candidate.allocated; });
    if (found == buffers.end())
        return DSP_EMEMORY;
    found->allocated = true;
    *buffer = found->memory.front().bytes.data();
    return DSP_SOK;
}

bool BufferPool::hasSizeFor(std::size_t size) const
{
    return !buffers.empty() && buffers.back().size >= size;
}

std::uint8_t* BufferPool::allocateAtLeast(std::size_t size)
{
    const auto found = std::find_if(buffers.begin(), buffers.end(),
                                    [&](const Buffer& buffer) { return buffer.size >= size && !buffer.allocated; });
    if (found == buffers.end())
        return nullptr;
    found->allocated = true;
    return found->memory.front().bytes.data();
}

bool BufferPool::free(const void* buffer)
{
    if (!isAllocated(buffer))
        return false;
    buffers[indexOf(buffer)].allocated = false;
    return true;
}

bool BufferPool::isAllocated(const void* buffer) const
{
    const std::size_t index = indexOf(buffer);
    return index < buffers.size() && buffers[index].allocated;
}

bool BufferPool::allFree() const
{
    return std::none_of(buffers.begin(), buffers.end(), [](const Buffer& buffer) { return buffer.allocated; });
}

std::size_t BufferPool::indexOf(const void* buffer) const
{
    const auto found = std::find_if(buffers.begin(), buffers.end(),
                                    [&](const Buffer& candidate) { return candidate.memory.data() == buffer; });
    return static_cast<std::size_t>(found - buffers.begin());
}

} // namespace DspLinkHost
