// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <array>
#include <cstddef>
#include <cstdint>

/// What goes over the serial line between the program and the radio microcontroller, as the microcontroller's firmware
/// sees it. Every message is the payload of one frame (RadioFrame.h): a code byte, then its data, big-endian.
namespace VirtualDevice::RadioProtocol
{

inline constexpr std::uint8_t startByte = 0x7C;
inline constexpr std::uint8_t endByte = 0x0A;
inline constexpr std::size_t headerSize = 7;
inline constexpr std::size_t envelopeSize = headerSize + 1; ///< header and end byte
inline constexpr std::size_t longestPayload = 100;
inline constexpr int bytesPerSecond = 11'520; ///< 115200 baud, 8 data bits, one start and one stop bit
inline constexpr std::uint8_t lowestChannel = 2;
inline constexpr std::uint8_t highestChannel = 74;
inline constexpr int channelZeroMegahertz = 2400;
inline constexpr std::uint8_t highestPowerLevel = 3;

enum class Command : std::uint8_t
{
    TransmitPacket = 0x02,
    StartBeacon = 0x20,
    StopBeacon = 0x21,
    UpdateBeacon = 0x22,
    SetAccelMode = 0x30,
    StartRfTest = 0x60,
    StopRfTest = 0x61,
    CheckRadio = 0x62,
    SetPowerAmp = 0x64,
    ToggleFramePulse = 0x65,
    RequestVersion = 0x70,
    Ping = 0x7E,
};

enum class Reply : std::uint8_t
{
    TransmitComplete = 0x03,
    AccelData = 0x31,
    CheckRadioResult = 0x63,
    FirmwareVersion = 0x71,
    Text = 0x7B,
    PingReply = 0x7F,
    Ack = 0xFE,
    Nak = 0xFF,
};

/// The data byte of a NAK.
enum class NakReason : std::uint8_t
{
    Refused = 0,
    UnknownCommand = 1,
    WrongLength = 2,
    WrongValue = 3,
};

/// What the firmware accepts after a command's code byte.
struct CommandShape
{
    Command command;
    int shortest; ///< bytes after the code
    int longest;
};

inline constexpr std::array commandShapes{
    CommandShape{Command::TransmitPacket, 6, 37},  // address 3, channel, option, data 1 to 32
    CommandShape{Command::StartBeacon, 7, 17},     // address 3, channels 4, packets 2 each, up to 5
    CommandShape{Command::StopBeacon, 1, 1},       // option
    CommandShape{Command::UpdateBeacon, 0, 10},    // packets 2 each, up to 5
    CommandShape{Command::SetAccelMode, 1, 1},     // mode
    CommandShape{Command::StartRfTest, 2, 2},      // channel, power level
    CommandShape{Command::StopRfTest, 0, 0},       // nothing
    CommandShape{Command::CheckRadio, 0, 0},       // nothing
    CommandShape{Command::SetPowerAmp, 1, 1},      // 1 on, 0 off
    CommandShape{Command::ToggleFramePulse, 0, 0}, // nothing
    CommandShape{Command::RequestVersion, 0, 0},   // nothing
    CommandShape{Command::Ping, 0, 0},             // nothing
};

constexpr const CommandShape* shapeOf(std::uint8_t code)
{
    for (const auto& shape : commandShapes)
        if (static_cast<std::uint8_t>(shape.command) == code)
            return &shape;
    return nullptr;
}

} // namespace VirtualDevice::RadioProtocol
