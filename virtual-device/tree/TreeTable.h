// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>

#include <span>
#include <string_view>

namespace VirtualDevice
{

class Registry;

/// One entry of the served tree and the controls that steer it. Folders follow from the paths.
///
/// Threads: the table is constant; `show` is called from the file system's threads.
struct TreeEntry
{
    enum class Kind
    {
        Folder,    ///< that is there although nothing lies in it
        Link,      ///< symbolic, to `target`
        Attribute, ///< as the kernel's attribute files: a value computed when it is read
        Clock,     ///< answers the read-time request
    };
    using Show = QByteArray (*)(const Registry&);

    std::string_view path; ///< from the tree's root: "/sys/..." or "/rtc"
    Kind kind = Kind::Attribute;
    unsigned permissions = 0444;
    std::string_view target;   ///< of a link
    std::string_view presence; ///< switch without which the entry is gone; empty: always there
    std::string_view fault;    ///< choice of a failure
    std::string_view content;  ///< choice of an odd content; empty: always the value
    Show show = nullptr;       ///< the value with its line end; null: cannot be read
};

namespace TreePath
{
inline constexpr std::string_view clock = "/rtc";
inline constexpr std::string_view powerLatch = "/sys/class/leds/power_latch/brightness";
inline constexpr std::string_view resetLine = "/sys/class/misc/msp430/reset";
} // namespace TreePath

[[nodiscard]] std::span<const TreeEntry> treeTable();
/// Null when the path is none of the table's; a folder above an entry is not in the table either.
[[nodiscard]] const TreeEntry* findEntry(std::string_view path);

} // namespace VirtualDevice
