// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/registry/ControlSpec.h"

#include <span>

namespace VirtualDevice
{

/// Every control of the virtual device, in the order in which the documentation lists them.
///
/// Threads: any; the table is constant.
[[nodiscard]] std::span<const ControlSpec> controlTable();

} // namespace VirtualDevice
