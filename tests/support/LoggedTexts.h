// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "tests/support/LogCapture.h"
#include "utilities/Debug.h"

#include <syslog.h>

namespace TestSupport
{

/// Everything logged since the last call, and nothing that might still be under way: an own last message flushes the
/// line to the log service. A line with a source that is no warning begins with its priority.
inline QStringList loggedTexts(LogCapture& log)
{
    const QString last = QStringLiteral("-- end of case --");
    Utilities::Debug::info(last);
    if (!log.waitFor(last))
        return {QStringLiteral("the log service did not answer")};
    QStringList texts;
    for (const LogLine& line : log.lines()) {
        const bool isWarning = line.priority == LOG_WARNING || !line.text.contains(QStringLiteral(".cpp, "));
        if (line.text != last)
            texts.append(isWarning ? line.text : QStringLiteral("(priority %1) %2").arg(line.priority).arg(line.text));
    }
    log.clear();
    return texts;
}

} // namespace TestSupport
