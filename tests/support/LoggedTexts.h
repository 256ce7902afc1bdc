// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "tests/support/LogCapture.h"
#include "utilities/Debug.h"

namespace TestSupport
{

/// Everything logged since the last call, and nothing that might still be under way: an own last message flushes the
/// line to the log service.
inline QStringList loggedTexts(LogCapture& log)
{
    const QString last = QStringLiteral("-- end of case --");
    Utilities::Debug::info(last);
    if (!log.waitFor(last))
        return {QStringLiteral("the log service did not answer")};
    QStringList texts = log.texts();
    texts.removeAll(last);
    log.clear();
    return texts;
}

} // namespace TestSupport
