// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "Domain/src/DomainLayer/AbstractButtons.h"
#include "tests/support/DspPeer.h"
#include "tests/support/LogCapture.h"
#include "tests/support/LoggedTexts.h"

#include <QFile>
#include <QRegularExpression>

#include <time.h>

namespace TestSupport
{

/// What was logged since the last call; "Domain/src/DomainLayer/X.cpp, LINE, TEXT" shortened to "X: TEXT".
/// Fatal lines are not told from warnings.
inline QStringList sourcedTexts(LogCapture& log)
{
    static const QRegularExpression prefix(
        QStringLiteral(R"(^(?:\(priority 0\) )?Domain/src/DomainLayer/(\w+)\.cpp, \d+, )"));
    QStringList texts = loggedTexts(log);
    for (QString& text : texts)
        text.replace(prefix, QStringLiteral("\\1: "));
    return texts;
}

inline void writeFirmware()
{
    QFile image(QStringLiteral("/dsp.out"));
    if (!image.open(QIODevice::WriteOnly) || image.write("firmware") < 0)
        qFatal("cannot write /dsp.out");
}

inline double processSeconds()
{
    timespec time{};
    ::clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &time);
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) * 1e-9;
}

/// A keypad without keys: the DSP listens to its assertion line only.
class AssertionLine : public Domain::AbstractButtons
{
public:
    bool buttonsLocked() override { return false; }
    void setButtonLock(bool /*locked*/) override {}
};

} // namespace TestSupport
