// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/registry/Values.h"

#include <cmath>

namespace VirtualDevice
{

QString fromView(std::string_view view)
{
    return QString::fromUtf8(view.data(), static_cast<qsizetype>(view.size()));
}

bool isWholeNumberWithin(const QJsonValue& value, std::int64_t minimum, std::int64_t maximum)
{
    const double number = value.toDouble();
    return value.isDouble() && std::trunc(number) == number && number >= static_cast<double>(minimum) &&
           number <= static_cast<double>(maximum);
}

} // namespace VirtualDevice
