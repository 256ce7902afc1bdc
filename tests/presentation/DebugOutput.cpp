// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/presentation/DebugOutput.h"

#include <QMutex>

#include <utility>

namespace TestSupport
{

namespace
{

QMutex mutex;
QStringList debugTexts;
QStringList otherTexts;

void keep(QtMsgType type, const QMessageLogContext& /*context*/, const QString& text)
{
    const QMutexLocker lock(&mutex);
    (type == QtDebugMsg ? debugTexts : otherTexts).append(text);
}

} // namespace

DebugOutput::DebugOutput()
{
    debugTexts.clear();
    otherTexts.clear();
    previous = qInstallMessageHandler(keep);
}

DebugOutput::~DebugOutput()
{
    qInstallMessageHandler(previous);
}

QStringList DebugOutput::texts() const
{
    const QMutexLocker lock(&mutex);
    return debugTexts;
}

QStringList DebugOutput::complaints() const
{
    const QMutexLocker lock(&mutex);
    return otherTexts;
}

QStringList DebugOutput::take()
{
    const QMutexLocker lock(&mutex);
    return std::exchange(debugTexts, {});
}

int DebugOutput::count(const QString& text) const
{
    return static_cast<int>(texts().count(text));
}

} // namespace TestSupport
