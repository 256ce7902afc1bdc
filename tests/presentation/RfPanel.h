// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "presentation/RfTest.h"
#include "tests/presentation/RecordingBeacon.h"
#include "tests/presentation/WidgetProbe.h"

#include <QLabel>
#include <QSlider>

#include <utility>

namespace TestSupport
{

/// The panel with its two partners and the journal of what it asked of them.
struct Panel
{
    Journal journal;
    RecordingBeacon beacon{journal};
    RecordingDsp dsp{journal};
    Presentation::RfTest test{beacon, dsp, nullptr};

    [[nodiscard]] QString text(const char* label) { return child<QLabel>(test, label).text(); }
    [[nodiscard]] QString style(const char* label) { return child<QLabel>(test, label).styleSheet(); }
    [[nodiscard]] int slider(const char* name) { return child<QSlider>(test, name).value(); }

    [[nodiscard]] Journal taken() { return std::exchange(journal, {}); }
    /// What a slot asks of the partners.
    [[nodiscard]] Journal afterCalling(void (Presentation::RfTest::*slot)())
    {
        journal.clear();
        (test.*slot)();
        return taken();
    }
};

/// What a change of channel or level asks of the microcontroller while it transmits.
inline Journal restartAt(int channel, int level)
{
    return {QStringLiteral("stop"), QStringLiteral("done"), QStringLiteral("start %1 %2").arg(channel).arg(level),
            QStringLiteral("done")};
}

} // namespace TestSupport
