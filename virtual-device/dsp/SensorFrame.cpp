// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/dsp/SensorFrame.h"

#include "virtual-device/dsp/DspPacket.h"

#include <algorithm>

namespace VirtualDevice
{

namespace
{

static_assert(DspProtocol::wordsSize + 4 + SensorFrame::slotCount * SensorFrame::largestSlot +
                  SensorFrame::diagnosticSize <=
              DspProtocol::longestData);
static_assert(DspProtocol::wordsSize + 4 + SensorFrame::slotCount * (SensorFrame::largestSlot + 1) +
                  SensorFrame::diagnosticSize >
              DspProtocol::longestData);

void appendSlot(QByteArray& to, const SensorFrame& frame, int slot)
{
    if (slot >= frame.sensors) {
        to.append(frame.slotSize, '\0');
        return;
    }
    const QByteArray header{QByteArray(1, '\1')
                                .append(static_cast<char>(frame.typeOf(slot)))
                                .append(static_cast<char>(100 + slot))
                                .append(static_cast<char>(200 - slot))
                                .append(static_cast<char>(slot & 3))};
    to.append(header.first(std::min<qsizetype>(header.size(), frame.slotSize)));
    for (int offset = 0; offset < frame.slotSize - SensorFrame::slotHeaderSize; ++offset)
        to.append(static_cast<char>(SensorFrame::sample(frame.number, slot, offset)));
}

} // namespace

int SensorFrame::naturalSlotSize(int ratio)
{
    constexpr int samplesOfTypeZero = 60;
    return std::min(slotHeaderSize + samplesOfTypeZero * ratio, largestSlot);
}

quint8 SensorFrame::sample(quint16 number, int slot, int offset)
{
    return static_cast<quint8>(number + 17 * slot + offset);
}

int SensorFrame::typeOf(int slot) const
{
    switch (types) {
    case Types::Zero:
        return typeZero;
    case Types::ThirtyOne:
        return typeThirtyOne;
    case Types::Mixed:
        return slot % 2 == 0 ? typeZero : typeThirtyOne;
    case Types::TooHigh:
        return typeTooHigh;
    }
    return typeZero;
}

QByteArray SensorFrame::data() const
{
    QByteArray bytes;
    appendDspHalfWord(bytes, number);
    appendDspHalfWord(bytes, static_cast<quint16>(slotCount * slotSize));
    for (int slot = 0; slot < slotCount; ++slot)
        appendSlot(bytes, *this, slot);
    for (int offset = 0; offset < diagnosticSize; ++offset)
        bytes.append(static_cast<char>(number + offset));
    return bytes;
}

} // namespace VirtualDevice
