// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/dsp/SensorSource.h"

#include "virtual-device/dsp/DspProtocol.h"
#include "virtual-device/dsp/SensorFrame.h"
#include "virtual-device/registry/Registry.h"

namespace VirtualDevice
{

namespace
{

struct TypesName
{
    QStringView name;
    SensorFrame::Types types;
};

constexpr std::array typesNames{
    TypesName{u"0", SensorFrame::Types::Zero}, TypesName{u"31", SensorFrame::Types::ThirtyOne},
    TypesName{u"mixed", SensorFrame::Types::Mixed}, TypesName{u"invalid", SensorFrame::Types::TooHigh}};

SensorFrame::Types typesNamed(const QString& name)
{
    for (const auto& entry : typesNames)
        if (entry.name == name)
            return entry.types;
    return SensorFrame::Types::Zero;
}

/// A frame whose length fields contradict each other, or one that is cut off.
QByteArray damaged(QByteArray frame, const QString& fault)
{
    if (fault == u"readings-length")
        frame[2] = static_cast<char>(frame[2] + 16);
    else if (fault == u"indivisible") {
        frame.remove(4, 8);
        const int length = static_cast<int>(frame.size()) - 4 - SensorFrame::diagnosticSize;
        frame[2] = static_cast<char>(length & 0xFF);
        frame[3] = static_cast<char>(length >> 8);
    } else if (fault == u"short")
        frame.truncate(3);
    return frame;
}

} // namespace

SensorSource::SensorSource(Registry& controls, QObject* parent) : QObject(parent), registry(controls), timer(this)
{
    connect(&timer, &RateTimer::due, this, &SensorSource::sendFrame);
    connect(&registry, &Registry::changed, this, [this](const QString& name) {
        if (name == u"dsp.sensor_rate" || name == u"dsp.receiver")
            adoptRate();
    });
    adoptRate();
}

void SensorSource::adoptRate()
{
    const bool enabled = registry.integer(QStringLiteral("dsp.receiver")) != 0;
    timer.setRate(enabled ? registry.integer(QStringLiteral("dsp.sensor_rate")) : 0);
}

int SensorSource::ratio() const
{
    const auto chosen = static_cast<int>(registry.integer(QStringLiteral("dsp.sensor_ratio")));
    return chosen != 0 ? chosen : registry.flag(QStringLiteral("dsp.upsampling")) ? 2 : 1;
}

QByteArray SensorSource::frame(int upsampleRatio) const
{
    const auto slotSize = static_cast<int>(registry.integer(QStringLiteral("dsp.slot_size")));
    return SensorFrame{number, static_cast<int>(registry.integer(QStringLiteral("dsp.sensors"))),
                       typesNamed(registry.text(QStringLiteral("dsp.sensor_types"))),
                       slotSize != 0 ? slotSize : SensorFrame::naturalSlotSize(upsampleRatio)}
        .data();
}

void SensorSource::sendFrame()
{
    using DspProtocol::MessageType;
    const int upsampleRatio = ratio();
    const auto type = upsampleRatio == 2 ? MessageType::UpsampledSensorData : MessageType::SensorData;
    const QByteArray bytes = damaged(frame(upsampleRatio), registry.text(QStringLiteral("dsp.sensor_fault")));
    ++number;
    registry.count(QStringLiteral("dsp.sensor_frames"));
    emit send(static_cast<quint32>(type), bytes);
}

} // namespace VirtualDevice
