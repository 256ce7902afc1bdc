// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/device/RateTimer.h"

#include <QByteArray>
#include <QObject>

namespace VirtualDevice
{

class Registry;

/// The wireless sensors as the DSP hears them: frames at `dsp.sensor_rate` while the receiver is enabled
/// (`dsp.receiver` is not 0), made as `dsp.sensors`, `dsp.sensor_types`, `dsp.sensor_ratio`, `dsp.slot_size` and
/// `dsp.sensor_fault` say. Lives in the thread of its owner, which must run an event loop.
class SensorSource : public QObject
{
    Q_OBJECT

public:
    explicit SensorSource(Registry& registry, QObject* parent = nullptr);

    /// The next frame has number 0.
    void restart() { number = 0; }

signals:
    void send(quint32 type, const QByteArray& data);

private:
    void adoptRate();
    void sendFrame();
    [[nodiscard]] int ratio() const;
    [[nodiscard]] QByteArray frame(int upsampleRatio) const;

    Registry& registry;
    RateTimer timer;
    quint16 number = 0;
};

} // namespace VirtualDevice
