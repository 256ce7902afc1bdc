// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/tree/TreeTable.h"

#include "virtual-device/registry/Registry.h"

#include <algorithm>
#include <array>

namespace VirtualDevice
{

namespace
{

using Kind = TreeEntry::Kind;

QByteArray number(qint64 value)
{
    return QByteArray::number(value) + '\n';
}

QByteArray voltage(const Registry& registry)
{
    return number(registry.integer(QStringLiteral("battery.voltage")));
}

QByteArray current(const Registry& registry)
{
    return number(registry.integer(QStringLiteral("battery.current")));
}

QByteArray mode(const Registry& registry)
{
    return registry.flag(QStringLiteral("usb.gadget")) ? "b_peripheral\n" : "b_idle\n";
}

QByteArray powerLatch(const Registry& registry)
{
    return number(registry.integer(QStringLiteral("led.power_latch")));
}

constexpr std::string_view hidFolder = "/sys/devices/platform/musb_hdrc/usb1/1-1/1-1.4";
constexpr std::string_view cardFolder = "/sys/devices/platform/mmc_host/mmc0/mmc0:0001/block/mmcblk0";

// As in the kernel, the entry below bus and block is a link to the device's own folder.
constexpr std::array entries{
    TreeEntry{"/sys/class/power_supply/ds2780-battery.0/voltage_now",
              Kind::Attribute,
              0444,
              {},
              {},
              "battery.voltage_fault",
              "battery.voltage_content",
              voltage},
    TreeEntry{"/sys/class/power_supply/ds2780-battery.0/current_now",
              Kind::Attribute,
              0444,
              {},
              {},
              "battery.current_fault",
              "battery.current_content",
              current},
    TreeEntry{"/sys/bus/usb/devices/1-1.4",
              Kind::Link,
              0777,
              "../../../devices/platform/musb_hdrc/usb1/1-1/1-1.4",
              "usb.hid",
              "usb.hid_fault",
              {},
              nullptr},
    TreeEntry{hidFolder, Kind::Folder, 0755, {}, "usb.hid", "usb.hid_fault", {}, nullptr},
    TreeEntry{"/sys/devices/platform/musb_hdrc/mode",
              Kind::Attribute,
              0444,
              {},
              {},
              "usb.gadget_fault",
              "usb.gadget_content",
              mode},
    TreeEntry{"/sys/block/mmcblk0",
              Kind::Link,
              0777,
              "../devices/platform/mmc_host/mmc0/mmc0:0001/block/mmcblk0",
              "sd.present",
              "sd.block_fault",
              {},
              nullptr},
    TreeEntry{cardFolder, Kind::Folder, 0755, {}, "sd.present", "sd.block_fault", {}, nullptr},
    TreeEntry{TreePath::powerLatch, Kind::Attribute, 0644, {}, {}, "led.fault", {}, powerLatch},
    TreeEntry{TreePath::resetLine, Kind::Attribute, 0200, {}, {}, "reset_line.fault", {}, nullptr},
    TreeEntry{TreePath::clock, Kind::Clock, 0666, {}, {}, "rtc.fault", {}, nullptr},
};

} // namespace

std::span<const TreeEntry> treeTable()
{
    return entries;
}

const TreeEntry* findEntry(std::string_view path)
{
    const auto found =
        std::find_if(entries.begin(), entries.end(), [&](const TreeEntry& entry) { return entry.path == path; });
    return found == entries.end() ? nullptr : &*found;
}

} // namespace VirtualDevice
