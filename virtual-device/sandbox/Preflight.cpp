// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/sandbox/Preflight.h"

#include <QFile>
#include <QLibraryInfo>
#include <QProcess>
#include <QStandardPaths>

#include <fcntl.h>
#include <unistd.h>

#include <array>
#include <cerrno>

namespace VirtualDevice
{

namespace
{

struct NeededProgram
{
    const char* name;
    const char* package;
    bool isForRoot; ///< root does without it where false
};

constexpr std::array neededPrograms{
    NeededProgram{"bwrap", "bubblewrap", true},
    NeededProgram{"socat", "socat", true},
    NeededProgram{"fusermount3", "fuse3", false},
};

std::optional<QString> missingProgram()
{
    for (const auto& program : neededPrograms) {
        if (!program.isForRoot && ::geteuid() == 0)
            continue;
        if (QStandardPaths::findExecutable(QString::fromLatin1(program.name)).isEmpty())
            return QStringLiteral("the program %1 is missing: install the package %2")
                .arg(QString::fromLatin1(program.name), QString::fromLatin1(program.package));
    }
    return std::nullopt;
}

std::optional<QString> missingFuse()
{
    const int descriptor = ::open("/dev/fuse", O_RDWR | O_CLOEXEC);
    if (descriptor >= 0) {
        ::close(descriptor);
        return std::nullopt;
    }
    if (errno == EACCES || errno == EPERM)
        return QStringLiteral("/dev/fuse is closed to this user: run \"chmod 0666 /dev/fuse\" as root");
    return QStringLiteral("there is no usable /dev/fuse (%1): run \"modprobe fuse\" as root, or give the container "
                          "that device")
        .arg(qt_error_string(errno));
}

std::optional<QString> missingNamespaces()
{
    QProcess trial;
    trial.start(QStringLiteral("bwrap"),
                {QStringLiteral("--unshare-user"), QStringLiteral("--unshare-pid"), QStringLiteral("--unshare-net"),
                 QStringLiteral("--ro-bind"), QStringLiteral("/"), QStringLiteral("/"), QStringLiteral("true")});
    if (trial.waitForFinished() && trial.exitStatus() == QProcess::NormalExit && trial.exitCode() == 0)
        return std::nullopt;
    const auto reason = QString::fromLocal8Bit(trial.readAllStandardError()).simplified();
    return QStringLiteral("this machine forbids user namespaces (%1): allow them as root, with \"sysctl "
                          "user.max_user_namespaces=10000\" or, where ordinary users alone are refused, \"sysctl "
                          "kernel.unprivileged_userns_clone=1\", or in the container's settings")
        .arg(reason);
}

std::optional<QString> missingPlugin()
{
    const QString plugin = QLibraryInfo::path(QLibraryInfo::PluginsPath) + QStringLiteral("/platforms/libqvnc.so");
    if (QFile::exists(plugin))
        return std::nullopt;
    return QStringLiteral("Qt's VNC platform plugin %1 is missing: install the package "
                          "qt6-qpa-plugins")
        .arg(plugin);
}

} // namespace

std::optional<QString> missingPrerequisite()
{
    for (const auto check : {missingProgram, missingFuse, missingNamespaces, missingPlugin}) {
        if (auto problem = check())
            return problem;
    }
    return std::nullopt;
}

} // namespace VirtualDevice
