// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/screen/RegionWatch.h"

#include "virtual-device/registry/Values.h"
#include "virtual-device/screen/Screen.h"

#include <utility>

namespace VirtualDevice
{

RegionWatch::RegionWatch(Screen& watched, QObject* parent) : QObject(parent), screen(watched)
{
    const QRect all(0, 0, RegionMap::windowWidth, RegionMap::windowHeight);
    connect(&screen, &Screen::updated, this, &RegionWatch::look);
    connect(&screen, &Screen::closed, this, [this, all] { look(all); });
    look(all);
}

RegionColour RegionWatch::colour(const QString& region) const
{
    return colours.value(region, RegionColour::None);
}

void RegionWatch::look(const QRect& area)
{
    const QImage picture = screen.isConnected() ? screen.picture() : QImage();
    for (const auto& region : RegionMap::regions()) {
        if (!region.rectangle().intersects(area))
            continue;
        const QString name = fromView(region.name);
        const RegionColour now = RegionMap::dominantColour(picture, region.rectangle());
        if (std::exchange(colours[name], now) != now)
            emit changed(name, now);
    }
}

} // namespace VirtualDevice
