// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/control/PendingWait.h"

#include "virtual-device/log/LogStore.h"
#include "virtual-device/registry/Registry.h"
#include "virtual-device/screen/RegionWatch.h"

#include <utility>

namespace VirtualDevice
{

PendingWait::PendingWait(QObject* parent) : QObject(parent), timer(this)
{
    timer.setSingleShot(true);
    connect(&timer, &QTimer::timeout, this, [this] {
        if (std::exchange(isOver, true))
            return;
        emit timedOut(present());
        deleteLater();
    });
}

void PendingWait::forRegion(RegionWatch& regions, const QString& region, const QString& colour)
{
    present = [&regions, region] { return QJsonValue(RegionMap::word(regions.colour(region))); };
    connect(&regions, &RegionWatch::changed, this, [this, region, colour](const QString& name, RegionColour now) {
        if (name == region && RegionMap::word(now) == colour)
            finish(colour);
    });
    if (present() == colour)
        finish(colour);
}

void PendingWait::forControl(Registry& registry, const QString& name, const QJsonValue& wanted)
{
    present = [&registry, name] { return registry.value(name); };
    connect(&registry, &Registry::changed, this, [this, name, wanted](const QString& changed, const QJsonValue& value) {
        if (changed == name && value == wanted)
            finish(value);
    });
    if (present() == wanted)
        finish(wanted);
}

void PendingWait::forLog(LogStore& log, const QString& text, qint64 after)
{
    present = [] { return QJsonValue(); };
    const auto look = [this, text](const LogLine& line) {
        if (line.text.contains(text))
            finish(line.text);
    };
    connect(&log, &LogStore::lineReceived, this, look);
    for (const auto& line : log.linesAfter(after))
        look(line);
}

void PendingWait::start(std::chrono::milliseconds within)
{
    isStarted = true;
    if (outcome)
        finish(*outcome);
    else
        timer.start(within);
}

void PendingWait::finish(const QJsonValue& seen)
{
    if (!isStarted) {
        if (!outcome)
            outcome = seen;
        return;
    }
    if (std::exchange(isOver, true))
        return;
    timer.stop();
    emit cameTrue(seen);
    deleteLater();
}

} // namespace VirtualDevice
