// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QSharedDataPointer>
#include <QString>

class QDataStream;

namespace Domain
{

/// One packet of the pairing and upgrade exchange with the wireless sensors, as the DSP relays it. A value, copied
/// cheaply.
///
/// Byte form (at least 7 bytes; the 16-bit parts in the stream's byte order, which is big-endian everywhere here):
///
/// | Offset | Size | Field                                                              |
/// |--------|------|--------------------------------------------------------------------|
/// | 0      | 1    | bits 16 to 23 of the source address                                |
/// | 1      | 2    | bits 0 to 15 of the source address                                 |
/// | 3      | 1    | bits 16 to 23 of the destination address                           |
/// | 4      | 2    | bits 0 to 15 of the destination address                            |
/// | 6      | 1    | command                                                            |
/// | 7      | rest | data, to the end of the packet                                     |
///
/// Threads: a value; its shared data are counted atomically, so copies may go to other threads.
///
/// Errors: a stream that is too short is logged and leaves the packet as it was, invalid if new; an address that has
/// no place in 24 bits is logged and written as zero.
class PairingUpgradeData
{
public:
    /// The sensors' business: any byte goes.
    enum class Command : quint8
    {
    };

    PairingUpgradeData();
    /// Stored unchecked; an address outside 0 to 0xFFFFFF shows when it is written.
    PairingUpgradeData(int sourceAddress, int destinationAddress, Command command, const QByteArray& data);
    ~PairingUpgradeData();
    PairingUpgradeData(const PairingUpgradeData& other);
    PairingUpgradeData& operator=(const PairingUpgradeData& other);

    [[nodiscard]] bool isValid() const;
    [[nodiscard]] int sourceAddress() const;
    [[nodiscard]] int destinationAddress() const;
    [[nodiscard]] Command command() const;
    [[nodiscard]] QByteArray data() const;

    [[nodiscard]] QByteArray toByteArray() const;
    /// "Source Address: 0x123456, Destination Address: 0xabcdef, Command: 5, Data: 00ff"
    operator QString() const;

private:
    friend QDataStream& operator>>(QDataStream& stream, PairingUpgradeData& packet);

    struct PrivateData;
    QSharedDataPointer<PrivateData> privateData;
};

/// An address beyond 24 bits, negative ones included, is logged and written as zero.
QDataStream& operator<<(QDataStream& stream, const PairingUpgradeData& packet);
/// Reads to the end of the stream's device; a stream too short is logged and leaves the packet as it was.
QDataStream& operator>>(QDataStream& stream, PairingUpgradeData& packet);

} // namespace Domain
