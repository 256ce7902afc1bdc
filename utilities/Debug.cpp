// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "utilities/Debug.h"

#include "utilities/LogWriter.h"

#include <QCoreApplication>
#include <QIODevice>
#include <QTextStream>

#include <syslog.h>

namespace Utilities
{

namespace
{

QByteArray composedLine(const QString& file, int line, const QString& text)
{
    QString composed;
    QTextStream stream(&composed, QIODevice::WriteOnly);
    stream << file << ", " << line << ", " << text;
    stream.flush();
    return composed.toLatin1();
}

} // namespace

void Debug::open()
{
    LogWriter::instance().open("VQK", LOG_CONS | LOG_PERROR, LOG_USER);
}

void Debug::close()
{
    LogWriter::instance().close();
}

void Debug::info(const QString& text)
{
    LogWriter::instance().write(LOG_INFO, text.toLatin1());
}

void Debug::debugBrief(const QString& text)
{
    LogWriter::instance().write(LOG_DEBUG, text.toLatin1());
}

void Debug::debugMessage(const QString& file, int line, const QString& text)
{
    LogWriter::instance().write(LOG_DEBUG, composedLine(file, line, text));
}

void Debug::warningMessage(const QString& file, int line, const QString& text)
{
    LogWriter::instance().write(LOG_WARNING, composedLine(file, line, text));
}

void Debug::criticalMessage(const QString& file, int line, const QString& text)
{
    LogWriter::instance().write(LOG_CRIT, composedLine(file, line, text));
}

void Debug::fatalMessage(const QString& file, int line, const QString& text)
{
    LogWriter::instance().write(LOG_EMERG, composedLine(file, line, text));
    QCoreApplication::exit(-1);
}

QString Debug::literal(QString foreignText)
{
    return foreignText.replace(u'%', QStringLiteral("%%"));
}

} // namespace Utilities
