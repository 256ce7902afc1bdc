// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "tests/support/AssertionLine.h"
#include "tests/support/DspPeer.h"
#include "tests/support/LogCapture.h"
#include "tests/support/LoggedTexts.h"
#include "tests/support/ProcessorTime.h"

#include <QFile>
#include <QRegularExpression>

namespace TestSupport
{

enum class Priorities
{
    Hidden,
    Shown ///< of fatal lines
};

/// What was logged since the last call; "Domain/src/DomainLayer/X.cpp, LINE, TEXT" shortened to "X: TEXT". Unless
/// priorities are shown, fatal lines are not told from warnings.
inline QStringList sourcedTexts(LogCapture& log, Priorities priorities = Priorities::Hidden)
{
    static const QRegularExpression prefix(
        QStringLiteral(R"(^(\(priority 0\) )?Domain/src/DomainLayer/(\w+)\.cpp, \d+, )"));
    QStringList texts = loggedTexts(log);
    for (QString& text : texts)
        text.replace(prefix, priorities == Priorities::Shown ? QStringLiteral("\\1\\2: ") : QStringLiteral("\\2: "));
    return texts;
}

inline void writeFirmware()
{
    QFile image(QStringLiteral("/dsp.out"));
    if (!image.open(QIODevice::WriteOnly) || image.write("firmware") < 0)
        qFatal("cannot write /dsp.out");
}

} // namespace TestSupport
