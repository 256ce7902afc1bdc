// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>

namespace VirtualDevice
{

/// One frame of the wireless sensors as the DSP forwards it: the data of a sensor-data message. Little-endian.
///
/// | Offset       | Size  | Field                                         |
/// |--------------|-------|-----------------------------------------------|
/// | 0            | 2     | frame number                                  |
/// | 2            | 2     | L, the size of the readings: 16 slots of S    |
/// | 4            | L     | slots 0 to 15                                 |
/// | 4 + L        | 32    | diagnostic block                              |
///
/// A slot: presence (0 = empty), type, battery level, signal strength, flags (bit 0 pin 1, bit 1 pin 2), then the
/// samples. Type 0: 54 r bytes, then 2 r triplets (r = upsample ratio); type 31: 3 + 2 + 1 bytes.
///
/// The contents are made up, different in every slot and frame, and follow from the fields alone. No state; any thread.
struct SensorFrame
{
    static constexpr int slotCount = 16;
    static constexpr int slotHeaderSize = 5;
    static constexpr int diagnosticSize = 32;
    static constexpr int typeZero = 0;
    static constexpr int typeThirtyOne = 31;
    static constexpr int typeTooHigh = 32;

    enum class Types
    {
        Zero,
        ThirtyOne,
        Mixed,  ///< even slots type 0, odd slots type 31
        TooHigh ///< 32, which no receiver knows
    };

    quint16 number = 0;
    int sensors = slotCount; ///< slots 0 to sensors - 1 are occupied
    Types types = Types::Zero;
    int slotSize = 0; ///< S, at least the slot header

    /// The largest slot of which 16 fit into one message of the DSP.
    static constexpr int largestSlot = 124;
    /// What a type 0 sensor needs at a ratio, or the largest slot that a message can carry.
    [[nodiscard]] static int naturalSlotSize(int ratio);
    /// The byte at an offset in a sensor's samples.
    [[nodiscard]] static quint8 sample(quint16 number, int slot, int offset);

    [[nodiscard]] int typeOf(int slot) const;
    [[nodiscard]] QByteArray data() const;
};

} // namespace VirtualDevice
