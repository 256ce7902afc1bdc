// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "utilities/Debug.h"

#include <benchmark/benchmark.h>

/// Takes the place of the whole facade, so that a benchmark measures what is above it: all of its operations, since
/// the linker takes the real one for any that is missing.
namespace Utilities
{

namespace
{

void take(const QString& text)
{
    benchmark::DoNotOptimize(text.constData());
}

} // namespace

void Debug::open() {}

void Debug::close() {}

void Debug::info(const QString& text)
{
    take(text);
}

void Debug::debugBrief(const QString& text)
{
    take(text);
}

void Debug::debugMessage(const QString& /*file*/, int /*line*/, const QString& text)
{
    take(text);
}

void Debug::warningMessage(const QString& /*file*/, int /*line*/, const QString& text)
{
    take(text);
}

void Debug::criticalMessage(const QString& /*file*/, int /*line*/, const QString& text)
{
    take(text);
}

void Debug::fatalMessage(const QString& /*file*/, int /*line*/, const QString& text)
{
    take(text);
}

QString Debug::literal(QString foreignText)
{
    return foreignText;
}

} // namespace Utilities
