// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/presentation/DebugOutput.h"

#include <QMutex>

#include <utility>
#include <vector>

namespace TestSupport
{

namespace
{

QMutex mutex;
// Any thread adds to them: not shared with the copies that are given out.
std::vector<QString> debugTexts;
std::vector<QString> otherTexts;

QStringList listOf(const std::vector<QString>& texts)
{
    return {texts.begin(), texts.end()};
}

void keep(QtMsgType type, const QMessageLogContext& /*context*/, const QString& text)
{
    const QMutexLocker lock(&mutex);
    (type == QtDebugMsg ? debugTexts : otherTexts).push_back(text);
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
    return listOf(debugTexts);
}

QStringList DebugOutput::complaints() const
{
    const QMutexLocker lock(&mutex);
    return listOf(otherTexts);
}

QStringList DebugOutput::take()
{
    const QMutexLocker lock(&mutex);
    return listOf(std::exchange(debugTexts, {}));
}

int DebugOutput::count(const QString& text) const
{
    return static_cast<int>(texts().count(text));
}

} // namespace TestSupport
