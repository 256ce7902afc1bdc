// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/commands/Commands.h"

#include <QCoreApplication>
#include <QTextStream>

#include <algorithm>
#include <array>
#include <csignal>

namespace
{

struct Row
{
    const char* name;
    VirtualDevice::Subcommand function;
    const char* help;
};

constexpr std::array rows{
    Row{"run", VirtualDevice::runCommand, "start a device and the program on it"},
    Row{"exec", VirtualDevice::execCommand, "run a command of your own in a device's sandbox"},
    Row{"ctl", VirtualDevice::ctlCommand, "look at a running device, change it, press its keys, wait for it"},
    Row{"controls", VirtualDevice::controlsCommand, "explain every control that ctl can get and set"},
};

void writeUsage(QTextStream stream)
{
    stream << "Usage: virtual-device COMMAND [options]\n\nCommands (each knows --help):\n";
    for (const auto& row : rows)
        stream << "  " << QString::fromLatin1(row.name).leftJustified(10) << row.help << '\n';
}

} // namespace

int main(int argc, char** argv)
{
    // A reader of ours that goes away must not take the device with it.
    std::signal(SIGPIPE, SIG_IGN);
    const QCoreApplication application(argc, argv);
    QCoreApplication::setApplicationName(QStringLiteral("virtual-device"));
    QCoreApplication::setApplicationVersion(QStringLiteral(IMMUNITYRIG_VERSION));
    const QStringList arguments = QCoreApplication::arguments().mid(1);
    const QString name = arguments.value(0);
    const auto found = std::find_if(rows.begin(), rows.end(), [&](const Row& row) { return name == row.name; });
    if (found != rows.end())
        return found->function(arguments);
    if (name == u"--help" || name == u"-h") {
        writeUsage(QTextStream(stdout));
        return VirtualDevice::ExitStatus::success;
    }
    if (name == u"--version") {
        QTextStream(stdout) << "virtual-device " << IMMUNITYRIG_VERSION << Qt::endl;
        return VirtualDevice::ExitStatus::success;
    }
    writeUsage(QTextStream(stderr));
    return VirtualDevice::ExitStatus::wrongUse;
}
