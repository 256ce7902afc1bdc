// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/screen/RegionMap.h"

#include "virtual-device/registry/Values.h"

#include <QHash>

#include <algorithm>
#include <array>

namespace VirtualDevice
{

namespace
{

// The key labels and the radio panel's rows are placed by layouts, which share the room out by the font's size: a
// region there is the part of the label that is inside it with every font that the device's settings give.
constexpr std::array map{
    Region{"rtc", 0, 0, 240, 30, "RtcTest/dateTimeEdit", "date and time of the clock; red once a read has failed"},
    Region{"buttons", 0, 32, 240, 62, "ButtonsTest/", "the keypad panel"},
    Region{"key.soft1", 0, 32, 53, 16, "ButtonsTest/soft1Label", "soft key 1: green while held"},
    Region{"key.soft2", 60, 32, 53, 16, "ButtonsTest/soft2Label", "soft key 2: green while held"},
    Region{"key.soft3", 119, 32, 53, 16, "ButtonsTest/soft3Label", "soft key 3: green while held"},
    Region{"key.sel", 178, 32, 53, 16, "ButtonsTest/selLabel", "Enter: green while held"},
    Region{"key.up", 0, 55, 53, 15, "ButtonsTest/upLabel", "Up: green while held"},
    Region{"key.down", 60, 55, 53, 15, "ButtonsTest/downLabel", "Down: green while held"},
    Region{"key.left", 119, 55, 53, 15, "ButtonsTest/leftLabel", "Left: green while held"},
    Region{"key.right", 178, 55, 53, 15, "ButtonsTest/rightLabel", "Right: green while held"},
    Region{"key.power", 0, 77, 53, 15, "ButtonsTest/powerLabel", "Power: green while held"},
    Region{"key.unknown", 60, 77, 171, 15, "ButtonsTest/unknownLabel", "any other key: green while held"},
    Region{"usb-device", 0, 94, 120, 25, "UsbDeviceTest/connectLabel", "green while the USB device is attached"},
    Region{"usb-gadget", 120, 94, 120, 25, "UsbGadgetTest/connectLabel", "green while a host sees the device"},
    Region{"fuel-gauge", 0, 119, 240, 75, "FuelGuageTest/groupBox", "battery voltage and current"},
    Region{"fuel-gauge.voltage", 5, 139, 230, 25, "FuelGuageTest/voltageSpinBox", "battery voltage"},
    Region{"fuel-gauge.current", 5, 164, 230, 25, "FuelGuageTest/currentSpinBox", "battery current"},
    Region{"trigger", 0, 220, 120, 18, "TriggerTest/connectedLabel", "green while triggers arrive each second"},
    Region{"sd-card", 120, 220, 120, 18, "SdCardTest/connectedLabel", "green while the card and its file are well"},
    Region{"rf", 0, 237, 240, 83, "RfTest/", "the radio panel"},
    Region{"rf.frequency.label", 4, 243, 74, 14, "RfTest/label_2", "the frequency's name"},
    Region{"rf.frequency", 92, 243, 56, 14, "RfTest/labelFrequencyValue", "frequency of the test packet"},
    Region{"rf.power.label", 4, 283, 64, 14, "RfTest/label", "the power's name"},
    Region{"rf.power", 85, 283, 60, 14, "RfTest/labelPowerValue", "power of the test packet"},
    Region{"rf.transmitting", 158, 243, 74, 17, "RfTest/labelTransmitting", "the transmission's animation"},
    Region{"rf.beacon", 157, 268, 74, 20, "RfTest/labelBeacon", "green while the radio controller answers"},
    Region{"rf.radios", 157, 295, 74, 20, "RfTest/labelRadios", "green while the radio's signal line is active"},
};

static_assert(std::all_of(map.begin(), map.end(),
                          [](const Region& region) {
                              return region.isIn(RegionMap::windowWidth, RegionMap::windowHeight);
                          }),
              "a region leaves the window");

struct Named
{
    QRgb pixel;
    RegionColour colour;
};

constexpr std::array named{
    Named{0xff008000, RegionColour::Green},
    Named{0xffff0000, RegionColour::Red},
    Named{0xffffffff, RegionColour::White},
};

constexpr std::array<std::string_view, 5> colourWords{"none", "green", "red", "white", "other"};

QHash<QRgb, int> histogram(const QImage& picture, const QRect& area)
{
    QHash<QRgb, int> counts;
    for (int y = area.top(); y <= area.bottom(); ++y)
        for (int x = area.left(); x <= area.right(); ++x)
            ++counts[picture.pixel(x, y) | 0xff000000];
    return counts;
}

} // namespace

std::span<const Region> RegionMap::regions()
{
    return map;
}

const Region* RegionMap::find(const QString& name)
{
    const auto* const found =
        std::find_if(map.begin(), map.end(), [&](const Region& region) { return fromView(region.name) == name; });
    return found == map.end() ? nullptr : found;
}

QStringList RegionMap::names()
{
    QStringList all;
    for (const auto& region : map)
        all.append(fromView(region.name));
    return all;
}

RegionColour RegionMap::dominantColour(const QImage& picture, const QRect& rectangle)
{
    const QRect area = rectangle & picture.rect();
    if (area.isEmpty())
        return RegionColour::None;
    const auto counts = histogram(picture, area);
    const auto most = std::max_element(counts.begin(), counts.end());
    const auto* const row =
        std::find_if(named.begin(), named.end(), [&](const Named& candidate) { return candidate.pixel == most.key(); });
    return row == named.end() ? RegionColour::Other : row->colour;
}

QString RegionMap::word(RegionColour colour)
{
    return fromView(colourWords.at(static_cast<std::size_t>(colour)));
}

QStringList RegionMap::words()
{
    QStringList all;
    for (const auto word : colourWords)
        all.append(fromView(word));
    return all;
}

} // namespace VirtualDevice
