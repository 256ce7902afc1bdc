// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <cstddef>
#include <cstdint>
#include <span>
#include <string_view>
#include <vector>

namespace DspLinkHost
{

/// The packets of /dev/dsplink (table: docs/dsplink-host-protocol.md). All integers little-endian.
enum class PacketKind : std::uint16_t
{
    Attach = 1,
    QueueOpen = 2,
    Load = 3,
    Start = 4,
    TransportOpen = 5,
    Locate = 6,
    TransportClose = 7,
    Stop = 8,
    QueueClose = 9,
    Detach = 10,
    Reply = 128,
    Message = 256,
};

using Bytes = std::vector<std::uint8_t>;
using ByteView = std::span<const std::uint8_t>;

constexpr std::uint32_t protocolVersion = 1;
constexpr std::size_t packetHeaderSize = 8;
constexpr std::size_t replySize = packetHeaderSize + 8;
/// Up to the message itself: packet header and destination queue.
constexpr std::size_t messagePrefixSize = packetHeaderSize + 4;
constexpr std::size_t maximumMessageSize = 2048;
constexpr std::size_t maximumPacketSize = messagePrefixSize + maximumMessageSize;

void store16(std::uint8_t* to, std::uint16_t value);
void store32(std::uint8_t* to, std::uint32_t value);
[[nodiscard]] std::uint16_t load16(const std::uint8_t* from);
[[nodiscard]] std::uint32_t load32(const std::uint8_t* from);

/// Writes the eight bytes with which every packet begins.
void storePacketHeader(std::uint8_t* to, PacketKind kind, std::uint32_t serial);

[[nodiscard]] Bytes numberPayload(std::uint32_t value);
[[nodiscard]] Bytes textPayload(std::string_view text);
[[nodiscard]] Bytes queueOpenPayload(std::uint32_t queue, std::string_view name);

} // namespace DspLinkHost
