// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/tree/Faults.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <utility>

namespace VirtualDevice
{

int errorNumber(const QString& fault)
{
    constexpr std::array<std::pair<const char16_t*, int>, 5> numbers{
        {{u"EIO", EIO}, {u"ENODATA", ENODATA}, {u"ENOENT", ENOENT}, {u"EACCES", EACCES}, {u"EINVAL", EINVAL}}};
    const auto found =
        std::find_if(numbers.begin(), numbers.end(), [&](const auto& row) { return fault == QStringView(row.first); });
    return found == numbers.end() ? 0 : found->second;
}

} // namespace VirtualDevice
