// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "dsplink/host/Packet.h"

namespace DspLinkHost
{

void store16(std::uint8_t* to, std::uint16_t value)
{
    to[0] = static_cast<std::uint8_t>(value & 0xFFU);
    to[1] = static_cast<std::uint8_t>(value >> 8U);
}

void store32(std::uint8_t* to, std::uint32_t value)
{
    store16(to, static_cast<std::uint16_t>(value & 0xFFFFU));
    store16(to + 2, static_cast<std::uint16_t>(value >> 16U));
}

std::uint16_t load16(const std::uint8_t* from)
{
    return static_cast<std::uint16_t>(from[0] | (from[1] << 8));
}

std::uint32_t load32(const std::uint8_t* from)
{
    return load16(from) | (static_cast<std::uint32_t>(load16(from + 2)) << 16U);
}

void storePacketHeader(std::uint8_t* to, PacketKind kind, std::uint32_t serial)
{
    store16(to, static_cast<std::uint16_t>(kind));
    store16(to + 2, 0);
    store32(to + 4, serial);
}

Bytes numberPayload(std::uint32_t value)
{
    Bytes payload(4);
    store32(payload.data(), value);
    return payload;
}

Bytes textPayload(std::string_view text)
{
    return {text.begin(), text.end()};
}

Bytes queueOpenPayload(std::uint32_t queue, std::string_view name)
{
    Bytes payload = numberPayload(queue);
    payload.insert(payload.end(), name.begin(), name.end());
    return payload;
}

} // namespace DspLinkHost
