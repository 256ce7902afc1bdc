// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QJsonValue>
#include <QString>

#include <cstdint>
#include <string_view>

namespace VirtualDevice
{

// What the tables and the checks of the control socket share. Threads: any.

/// A word of a constant table.
[[nodiscard]] QString fromView(std::string_view view);

/// Whether a JSON value is a number without a fraction within minimum..maximum.
[[nodiscard]] bool isWholeNumberWithin(const QJsonValue& value, std::int64_t minimum, std::int64_t maximum);

} // namespace VirtualDevice
