// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "utilities/Debug.h"

#include <QString>

#include <utility>

namespace Utilities
{

/// The warnings of one source file, which begin with its name. At the head of the file
///
///     const Utilities::SourceWarnings warn(QStringLiteral(__FILE__));
///
/// and from then on `warn(__LINE__, text)`, with a text as `Debug` takes it.
///
/// Threads: any. The literal keeps the name off the heap: on a noisy line there is a warning for every byte.
class SourceWarnings
{
public:
    explicit SourceWarnings(QString sourceFile) : file(std::move(sourceFile)) {}

    void operator()(int line, const QString& text) const { Debug::warningMessage(file, line, text); }

private:
    QString file;
};

} // namespace Utilities
