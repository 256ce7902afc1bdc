// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/registry/ControlTable.h"

#include <array>

namespace VirtualDevice
{

namespace
{

constexpr std::array controls{
    integerControl("battery.voltage", "uV", -2'147'483'648, 2'147'483'647, "4100000", "what the fuel gauge measures"),
    integerControl("battery.current", "uA", -2'147'483'648, 2'147'483'647, "-123456",
                   "what the fuel gauge measures; negative while the battery discharges"),
};

} // namespace

std::span<const ControlSpec> controlTable()
{
    return controls;
}

} // namespace VirtualDevice
