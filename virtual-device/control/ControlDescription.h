// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/registry/ControlSpec.h"

#include <QJsonObject>
#include <QString>

namespace VirtualDevice
{

/// The control table as people and machines read it.
///
/// Threads: no state; any thread.
class ControlDescription
{
public:
    ControlDescription() = delete;

    /// One row without its value: name, type, unit, access, default, allowed, help, and minimum and maximum of a number
    /// or choices of a choice.
    [[nodiscard]] static QJsonObject object(const ControlSpec& spec);

    /// "0..400 frames a second", "true or false", "read only, MHz".
    [[nodiscard]] static QString takes(const ControlSpec& spec);

    /// The whole table as the page docs/controls.md, with the window's regions, and as plain text.
    [[nodiscard]] static QString markdown();
    [[nodiscard]] static QString text();

    /// `virtual-device controls [--markdown|--json]`; `arguments` begin behind the word "controls". Returns the
    /// exit status.
    [[nodiscard]] static int run(const QStringList& arguments);
};

} // namespace VirtualDevice
