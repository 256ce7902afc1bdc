// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "tests/support/DeviceUnderTest.h"

#include <QString>
#include <QStringList>

namespace TestSupport
{

/// What an engineer sees while nothing is broken: the colour of every region that has one.
class ScreenHealth
{
public:
    /// Waits until every region has its healthy colour.
    [[nodiscard]] static bool isReached(DeviceUnderTest& device);
    /// The regions that look otherwise and go on doing so, and how; empty when there is none. A machine that stands
    /// still for a second turns what waits for a signal red for a moment.
    [[nodiscard]] static QString differences(DeviceUnderTest& device, const QStringList& except = {});
    /// Waits until the clock shows two other seconds: every test that looks at its device once a second has looked.
    [[nodiscard]] static bool passesARound(DeviceUnderTest& device);
};

} // namespace TestSupport
