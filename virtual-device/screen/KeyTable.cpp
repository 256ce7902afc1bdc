// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/screen/KeyTable.h"

#include "virtual-device/registry/Values.h"

#include <array>
#include <string_view>

namespace VirtualDevice
{

namespace
{

struct Row
{
    std::string_view names;
    std::uint32_t symbol;
};

constexpr std::array rows{
    Row{"Return|Enter|Sel", 0xff0d},
    Row{"Up", 0xff52},
    Row{"Down", 0xff54},
    Row{"Left", 0xff51},
    Row{"Right", 0xff53},
    Row{"F5|Soft1", 0xffc2},
    Row{"F6|Soft2", 0xffc3},
    Row{"F7|Soft3", 0xffc4},
    Row{"F8", 0xffc5},
    Row{"F9", 0xffc6},
    Row{"F10|Trigger", 0xffc7},
    Row{"F11|Radio", 0xffc8},
    Row{"F12|Power", 0xffc9},
    Row{"Escape|Esc", 0xff1b},
    Row{"Tab", 0xff09},
    Row{"Space", 0x20},
};

} // namespace

std::optional<std::uint32_t> KeyTable::symbol(const QString& name)
{
    for (const auto& row : rows)
        if (fromView(row.names).split(u'|').contains(name, Qt::CaseInsensitive))
            return row.symbol;
    if (name.size() != 1)
        return std::nullopt;
    const char16_t character = name.front().toLower().unicode();
    const bool isLetterOrDigit = (character >= u'a' && character <= u'z') || (character >= u'0' && character <= u'9');
    return isLetterOrDigit ? std::optional<std::uint32_t>(character) : std::nullopt;
}

QStringList KeyTable::names()
{
    QStringList names;
    for (const auto& row : rows)
        names.append(fromView(row.names));
    names << QStringLiteral("a..z") << QStringLiteral("0..9");
    return names;
}

} // namespace VirtualDevice
