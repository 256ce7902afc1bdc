// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/commands/Commands.h"
#include "virtual-device/commands/DeviceSession.h"
#include "virtual-device/control/LiveTable.h"

#include <QCommandLineParser>
#include <QCoreApplication>
#include <QDir>
#include <QFile>
#include <QFileInfo>
#include <QTextStream>

#include <unistd.h>

#include <algorithm>
#include <optional>

namespace VirtualDevice
{

namespace
{

QString builtProgram()
{
    return QDir(QCoreApplication::applicationDirPath()).absoluteFilePath(QStringLiteral("../presentation/immunityrig"));
}

/// The program and its folder, which the sandbox must see at the same place.
std::optional<QString> chooseProgram(const QCommandLineParser& parser, DeviceOptions& options)
{
    const QFileInfo program(parser.isSet("program") ? parser.value("program") : builtProgram());
    if (!program.isFile() || !program.isExecutable())
        return QStringLiteral("%1 is no program: build it, or name one with --program").arg(program.filePath());
    options.command = {program.canonicalFilePath()};
    options.readOnlyFolders = {QFileInfo(program.canonicalFilePath()).path()};
    return std::nullopt;
}

QString announcement(const Device& device)
{
    return QStringLiteral("ready: VNC %1, control %2\n").arg(device.vncAddress(), device.controlSocket());
}

/// Each line as it comes: whoever reads the file while the program runs sees what it has printed so far.
std::optional<QString> keepOutput(const QCommandLineParser& parser, QFile& file, Sandbox& program)
{
    if (!parser.isSet("output"))
        return std::nullopt;
    file.setFileName(parser.value("output"));
    if (!file.open(QIODevice::WriteOnly | QIODevice::Unbuffered))
        return QStringLiteral("%1: %2").arg(file.fileName(), file.errorString());
    QObject::connect(&program, &Sandbox::outputReceived, &file,
                     [&file](const QByteArray& line) { file.write(line + '\n'); });
    return std::nullopt;
}

/// A program that fails says why on its error output, which nobody sees while it runs.
void explainEnd(Sandbox& program, int status)
{
    constexpr qsizetype mostLines = 10;
    const auto output = program.output();
    for (const auto& line : output.last(std::min(output.size(), mostLines)))
        QTextStream(stderr) << QString::fromLocal8Bit(line) << Qt::endl;
    DeviceSession::complain(QStringLiteral("the program ended with status %1").arg(status), status);
}

} // namespace

int runCommand(const QStringList& arguments)
{
    QCommandLineParser parser;
    parser.setApplicationDescription("Runs the program on a virtual device until it ends or is interrupted.");
    DeviceSession::addOptions(parser);
    parser.addOptions({{"vnc-port", "Offer the screen on this port of 127.0.0.1 instead of a free one.", "port"},
                       {"program", "Run this program instead of the one of this build.", "file"},
                       {"output", "Write what the program prints, both streams, to this file.", "file"}});
    DeviceOptions options;
    if (const auto status = DeviceSession::parse(parser, arguments, options))
        return *status;
    bool isPort = true;
    if (parser.isSet("vnc-port"))
        options.vncPort = parser.value("vnc-port").toUShort(&isPort);
    if (!isPort || !parser.positionalArguments().isEmpty())
        return DeviceSession::complain("wrong use: see virtual-device run --help", ExitStatus::wrongUse);
    if (const auto problem = chooseProgram(parser, options))
        return DeviceSession::complain(*problem, ExitStatus::failure);
    QFile output;
    DeviceSession session(options);
    if (const auto problem = keepOutput(parser, output, session.device().program()))
        return DeviceSession::complain(*problem, ExitStatus::failure);
    std::optional<LiveTable> table;
    QObject::connect(&session.device(), &Device::ready, [&] {
        if (::isatty(STDOUT_FILENO) != 0)
            table.emplace(session.device().regions(), STDOUT_FILENO, announcement(session.device()).toLocal8Bit());
        else
            QTextStream(stdout) << announcement(session.device());
    });
    QObject::connect(&session.device(), &Device::ended, [&](int status) {
        if (status != 0 && !session.isAskedToEnd())
            explainEnd(session.device().program(), status);
    });
    return session.run();
}

} // namespace VirtualDevice
