// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QtGlobal>

namespace Domain
{

/// Commands to the DSP firmware: signed 32-bit little-endian, the first word of an outgoing message.
enum DspCommand : qint32
{
    CommandRequestVersion = 0x10000,
    CommandReceiverEnable = 0x10001,
    CommandLongRangeAntennaEnable = 0x10002,
    CommandSetTrigger = 0x10003,
    CommandUpsamplingEnable = 0x10004,
    CommandConfigureLineNoiseDetection = 0x10005,
    CommandPairingUpgradeMode = 0x10006,
    CommandDataGathering = 0x10007,
    CommandDspEnable = 0x10008,
    CommandRunHardwareTest = 0x10009,
};

/// What the firmware sends: unsigned 32-bit little-endian, the first word of an incoming message.
enum DspMessageType : quint32
{
    MessageVersionData = 0x11000,
    MessageDiscarded = 0x11001,
    MessageLogString = 0x11002,
    MessagePairingUpgradePacket = 0x11003,
    MessageSensorData = 0x11004,
    MessageUpsampledSensorData = 0x11005,
    MessageLineNoise = 0x11006,
    MessageStartTrigger = 0x11007,
    MessageStopTrigger = 0x11008,
    MessageAck = 0x1100B,
    MessageNak = 0x1100C,
};

// The firmware defines the values of these; they pass through as they are.
enum ReceiverEnableType : qint32
{
};
enum DataGatherTrigger : qint32
{
};
enum LineNoiseDetectConfig : qint32
{
};

} // namespace Domain
