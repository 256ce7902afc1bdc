// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/screen/SignalLines.h"

#include "virtual-device/registry/Registry.h"
#include "virtual-device/screen/Screen.h"

namespace VirtualDevice
{

namespace
{

void setPeriod(QTimer& timer, qint64 milliseconds)
{
    if (milliseconds > 0)
        timer.start(std::chrono::milliseconds(milliseconds));
    else
        timer.stop();
}

} // namespace

SignalLines::SignalLines(Registry& values, Screen& keypad, QObject* parent)
    : QObject(parent), registry(values), screen(keypad)
{
    add(trigger, QStringLiteral("trigger.period"), QStringLiteral("Trigger"));
    add(radio, QStringLiteral("radioline.period"), QStringLiteral("Radio"));
}

void SignalLines::add(QTimer& timer, const QString& control, const QString& key)
{
    timer.setTimerType(Qt::PreciseTimer);
    connect(&timer, &QTimer::timeout, this, [this, key] {
        // Refused while no program is there to hear it.
        if (screen.press(key))
            static_cast<void>(screen.release(key));
    });
    connect(&registry, &Registry::changed, this, [&timer, control](const QString& name, const QJsonValue& value) {
        if (name == control)
            setPeriod(timer, value.toInteger());
    });
    setPeriod(timer, registry.integer(control));
}

} // namespace VirtualDevice
