// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/commands/DeviceSession.h"

#include "virtual-device/commands/Commands.h"
#include "virtual-device/sandbox/Preflight.h"

#include <QCommandLineParser>
#include <QCoreApplication>
#include <QTextStream>

namespace VirtualDevice
{

namespace
{

/// What can be told from the words alone, before anything is started.
std::optional<QString> wrongWord(const DeviceOptions& options)
{
    if (auto problem = options.name.isEmpty() ? std::nullopt : DeviceFolder::nameProblem(options.name))
        return problem;
    Registry trial;
    return Device::apply(options.settings, trial);
}

} // namespace

DeviceSession::DeviceSession(const DeviceOptions& options) : virtualDevice(options)
{
    QObject::connect(&endSignals, &EndSignals::requested, &virtualDevice, [this] {
        isAsked = true;
        virtualDevice.terminate();
    });
    QObject::connect(&virtualDevice, &Device::ended, &virtualDevice,
                     [](int status) { QCoreApplication::exit(status); });
}

void DeviceSession::addOptions(QCommandLineParser& parser)
{
    parser.addHelpOption();
    parser.addOptions({{"name", "Name the device; by default the first free device-N.", "name"},
                       {"state", "Keep the device's files in this folder, also after its end.", "folder"},
                       {"set", "Set a control before the start; may be given several times.", "name=value"}});
    parser.setOptionsAfterPositionalArgumentsMode(QCommandLineParser::ParseAsPositionalArguments);
}

std::optional<int> DeviceSession::parse(QCommandLineParser& parser, const QStringList& arguments,
                                        DeviceOptions& options)
{
    if (!parser.parse(arguments))
        return complain(parser.errorText(), ExitStatus::wrongUse);
    if (parser.isSet("help")) {
        QTextStream(stdout) << parser.helpText();
        return ExitStatus::success;
    }
    options.name = parser.value("name");
    options.stateFolder = parser.value("state");
    options.settings = parser.values("set");
    if (const auto problem = wrongWord(options))
        return complain(*problem, ExitStatus::wrongUse);
    return std::nullopt;
}

int DeviceSession::complain(const QString& text, int status)
{
    QTextStream(stderr) << "virtual-device: " << text << Qt::endl;
    return status;
}

int DeviceSession::run()
{
    auto problem = missingPrerequisite();
    if (!problem)
        problem = virtualDevice.start();
    if (problem)
        return complain(*problem, ExitStatus::failure);
    const int status = QCoreApplication::exec();
    // Whoever asked for the end does not care how the program took it.
    return isAsked ? ExitStatus::success : status;
}

} // namespace VirtualDevice
