// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/ScreenHealth.h"

#include <QJsonArray>
#include <QTest>

#include <algorithm>
#include <array>

namespace TestSupport
{

namespace
{

struct Expected
{
    const char* region;
    const char* colour;
};

constexpr std::array healthy{
    Expected{"rtc", "white"},        Expected{"key.soft1", "white"},  Expected{"key.soft2", "white"},
    Expected{"key.soft3", "white"},  Expected{"key.sel", "white"},    Expected{"key.up", "white"},
    Expected{"key.down", "white"},   Expected{"key.left", "white"},   Expected{"key.right", "white"},
    Expected{"key.power", "white"},  Expected{"usb-device", "green"}, Expected{"usb-gadget", "green"},
    Expected{"fuel-gauge", "white"}, Expected{"trigger", "green"},    Expected{"sd-card", "green"},
    Expected{"rf.beacon", "green"},  Expected{"rf.radios", "green"},
};

QString differencesNow(DeviceUnderTest& device, const QStringList& except)
{
    QHash<QString, QString> colours;
    const auto regions = device.call("regions").result.toArray();
    for (const auto& region : regions)
        colours.insert(region.toObject().value("name").toString(), region.toObject().value("colour").toString());
    QStringList differences;
    for (const auto& row : healthy)
        if (!except.contains(QLatin1String(row.region)) && colours.value(row.region) != QLatin1String(row.colour))
            differences.append(QStringLiteral("%1 is %2").arg(QLatin1String(row.region), colours.value(row.region)));
    return differences.join(u", ");
}

} // namespace

bool ScreenHealth::isReached(DeviceUnderTest& device)
{
    return std::all_of(healthy.begin(), healthy.end(),
                       [&](const Expected& row) { return device.waitRegion(row.region, row.colour); });
}

QString ScreenHealth::differences(DeviceUnderTest& device, const QStringList& except)
{
    QString found;
    (void)QTest::qWaitFor([&] { return (found = differencesNow(device, except)).isEmpty(); },
                          static_cast<int>(std::chrono::milliseconds(DeviceUnderTest::usual).count()));
    return found;
}

bool ScreenHealth::passesARound(DeviceUnderTest& device)
{
    constexpr QRect clock(0, 0, 240, 30);
    for (int second = 0; second < 2; ++second) {
        const QImage before = device.screenshot().copy(clock);
        if (!QTest::qWaitFor([&] { return device.screenshot().copy(clock) != before; },
                             static_cast<int>(std::chrono::milliseconds(DeviceUnderTest::usual).count())))
            return false;
    }
    return true;
}

} // namespace TestSupport
