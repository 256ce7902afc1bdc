// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "utilities/Debug.h"

#include <cstdlib>

/// In place of the system log: the text would be its format, so nothing that came from outside may look like a
/// conversion in it.
namespace Utilities
{

namespace
{

void check(const QString& text)
{
    for (qsizetype at = text.indexOf(u'%'); at >= 0; at = text.indexOf(u'%', at + 2)) {
        if (at + 1 >= text.size() || text.at(at + 1) != u'%')
            std::abort();
    }
}

} // namespace

void Debug::open() {}

void Debug::close() {}

void Debug::debugBrief(const QString& text)
{
    check(text);
}

void Debug::debugMessage(const QString& /*file*/, int /*line*/, const QString& text)
{
    check(text);
}

void Debug::criticalMessage(const QString& /*file*/, int /*line*/, const QString& text)
{
    check(text);
}

void Debug::info(const QString& text)
{
    check(text);
}

void Debug::warningMessage(const QString& /*file*/, int /*line*/, const QString& text)
{
    check(text);
}

void Debug::fatalMessage(const QString& /*file*/, int /*line*/, const QString& /*text*/)
{
    std::abort();
}

QString Debug::literal(QString foreignText)
{
    return foreignText.replace(u'%', QStringLiteral("%%"));
}

} // namespace Utilities
