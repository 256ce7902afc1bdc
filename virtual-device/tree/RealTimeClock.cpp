// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/tree/RealTimeClock.h"

#include "virtual-device/registry/Registry.h"

#include <QDateTime>

#include <cstring>

namespace VirtualDevice
{

namespace
{

const QString timeControl = QStringLiteral("rtc.time");
const QString runningControl = QStringLiteral("rtc.running");
const QString faultControl = QStringLiteral("rtc.fault");

constexpr qint64 second = 1000;

/// Set while this thread publishes the time, so that the clock does not take its own word for an operator's.
thread_local bool isShowing = false;

rtc_time nonsense()
{
    rtc_time fields{};
    std::memset(&fields, 0xA5, sizeof fields);
    return fields;
}

} // namespace

RealTimeClock::RealTimeClock(Registry& values, QObject* parent) : QObject(parent), registry(values)
{
    // Direct: a time that was set is what the next read must find, whichever thread set it.
    connect(&registry, &Registry::changed, this, &RealTimeClock::adopt, Qt::DirectConnection);
    connect(&timer, &QTimer::timeout, this, &RealTimeClock::show);
    timer.start(static_cast<int>(second));
    show();
}

qint64 RealTimeClock::seconds() const
{
    return running ? (QDateTime::currentMSecsSinceEpoch() + offset) / second : standstill.load();
}

rtc_time RealTimeClock::read() const
{
    if (registry.text(faultControl) == u"garbage")
        return nonsense();
    const QDateTime now = QDateTime::fromSecsSinceEpoch(seconds(), Qt::UTC);
    rtc_time fields{};
    fields.tm_sec = now.time().second();
    fields.tm_min = now.time().minute();
    fields.tm_hour = now.time().hour();
    fields.tm_mday = now.date().day();
    fields.tm_mon = now.date().month() - 1;
    fields.tm_year = now.date().year() - 1900;
    fields.tm_wday = now.date().dayOfWeek() % 7;
    fields.tm_yday = now.date().dayOfYear() - 1;
    return fields;
}

void RealTimeClock::adopt(const QString& name, const QJsonValue& value)
{
    const qint64 now = QDateTime::currentMSecsSinceEpoch();
    if (name == timeControl && !isShowing) {
        offset = value.toInteger() * second - now;
        standstill = value.toInteger();
    } else if (name == runningControl) {
        const qint64 shown = seconds();
        standstill = shown;
        offset = shown * second - now;
        running = value.toBool();
    }
}

void RealTimeClock::show()
{
    isShowing = true;
    registry.publish(timeControl, seconds());
    isShowing = false;
}

} // namespace VirtualDevice
