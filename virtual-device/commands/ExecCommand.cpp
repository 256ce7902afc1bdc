// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/commands/Commands.h"
#include "virtual-device/commands/DeviceSession.h"

#include <QCommandLineParser>
#include <QCoreApplication>
#include <QDir>

namespace VirtualDevice
{

namespace
{

/// This build's folder and its sources, so that a test program finds itself and its data.
QStringList projectFolders()
{
    QStringList folders;
    for (const QString& folder : {QStringLiteral(IMMUNITYRIG_SOURCE_FOLDER),
                                  QDir(QCoreApplication::applicationDirPath() + "/..").canonicalPath()}) {
        if (QDir(folder).exists())
            folders.append(folder);
    }
    return folders;
}

} // namespace

int execCommand(const QStringList& arguments)
{
    QCommandLineParser parser;
    parser.setApplicationDescription("Runs a command in a device's sandbox, in place of the program. The device's "
                                     "control socket is named in $VIRTUAL_DEVICE_CONTROL.");
    DeviceSession::addOptions(parser);
    parser.addPositionalArgument("command", "The command and its arguments.", "-- command [argument...]");
    DeviceOptions options;
    if (const auto status = DeviceSession::parse(parser, arguments, options))
        return *status;
    options.command = parser.positionalArguments();
    options.isOwnCommand = true;
    options.readOnlyFolders = projectFolders();
    if (options.command.isEmpty())
        return DeviceSession::complain("no command given: see virtual-device exec --help", ExitStatus::wrongUse);
    DeviceSession session(options);
    return session.run();
}

} // namespace VirtualDevice
