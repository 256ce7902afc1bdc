// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "utilities/StandardError.h"

#include "utilities/LogWriter.h"

#include <QString>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace Utilities
{

namespace
{

void handOver(QtMsgType type, const QMessageLogContext& context, const QString& message)
{
    const QString line = qFormatLogMessage(type, context, message);
    // An empty line is one, too; nothing at all is what a pattern leaves of a message that it is not for.
    if (!line.isNull())
        LogWriter::instance().writeError(line.toLocal8Bit() + '\n');
}

/// Not by a flag of the descriptor as it is: that would be a flag of every process that has inherited the same one.
void openAnew()
{
    struct stat status
    {
    };
    if (::fstat(STDERR_FILENO, &status) != 0 || !(S_ISFIFO(status.st_mode) || S_ISCHR(status.st_mode)))
        return;
    const int own = ::open("/proc/self/fd/2", O_WRONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC);
    if (own < 0)
        return;
    ::dup2(own, STDERR_FILENO);
    ::close(own);
}

} // namespace

void StandardError::keepFromBlocking()
{
    openAnew();
    qInstallMessageHandler(handOver);
}

} // namespace Utilities
