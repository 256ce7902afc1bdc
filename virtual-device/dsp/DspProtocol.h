// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QtGlobal>

#include <array>
#include <string_view>

/// What the DSP's side of `/dev/dsplink` and the DSP's firmware know. The packets are those of
/// docs/dsplink-host-protocol.md; the words in the messages are the firmware's own. Everything is little-endian but
/// the version and the pairing packets, which are big-endian.
namespace VirtualDevice::DspProtocol
{

// Packets on the socket.

enum class PacketKind : quint16
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

enum class Status : quint32
{
    Done = 0x8000,
    Failed = 0x80008008,
    WrongState = 0x8000801B,
    NotFound = 0x8000802D,
    WrongVersion = 0x80008030,
};

inline constexpr quint32 protocolVersion = 1;
inline constexpr qsizetype packetHeaderSize = 8;
inline constexpr qsizetype destinationSize = 4;
inline constexpr qsizetype messageHeaderSize = 20;
inline constexpr qsizetype longestMessage = 2048;
inline constexpr qsizetype longestData = longestMessage - messageHeaderSize;
inline constexpr qsizetype longestPacket = packetHeaderSize + destinationSize + longestMessage;
inline constexpr quint32 dspQueueHandle = 0x0000'0001; ///< processor 0, queue 1
inline constexpr std::string_view dspQueueName = "DSPMSGQ0";
inline constexpr std::string_view armQueueName = "GPPMSGQ1";

// Messages between program and firmware: a type or command word, a length word, then as many bytes.

inline constexpr qsizetype wordsSize = 8;
inline constexpr quint16 commandMessageId = 0x41;

enum class Command : quint32
{
    RequestVersion = 0x10000,
    ReceiverEnable = 0x10001,
    LongRangeAntennaEnable = 0x10002,
    SetTrigger = 0x10003,
    UpsamplingEnable = 0x10004,
    ConfigureLineNoiseDetection = 0x10005,
    PairingUpgradeMode = 0x10006,
    DataGathering = 0x10007,
    DspEnable = 0x10008,
    RunHardwareTest = 0x10009,
};

struct CommandShape
{
    Command command;
    int payloadSize; ///< 32-bit numbers, signed
};

inline constexpr std::array commandShapes{
    CommandShape{Command::RequestVersion, 0},
    CommandShape{Command::ReceiverEnable, 4},
    CommandShape{Command::LongRangeAntennaEnable, 4},
    CommandShape{Command::SetTrigger, 4},
    CommandShape{Command::UpsamplingEnable, 4},
    CommandShape{Command::ConfigureLineNoiseDetection, 4},
    CommandShape{Command::PairingUpgradeMode, 20}, // enable, parameter, three unused
    CommandShape{Command::DataGathering, 24},      // enable, four channels, base address
    CommandShape{Command::DspEnable, 4},
    CommandShape{Command::RunHardwareTest, 4},
};

enum class MessageType : quint32
{
    VersionData = 0x11000,
    Discarded = 0x11001,
    LogString = 0x11002,
    PairingUpgradePacket = 0x11003,
    SensorData = 0x11004,
    UpsampledSensorData = 0x11005,
    LineNoise = 0x11006,
    StartTrigger = 0x11007,
    StopTrigger = 0x11008,
    Ack = 0x1100B,
    Nak = 0x1100C,
};

} // namespace VirtualDevice::DspProtocol
