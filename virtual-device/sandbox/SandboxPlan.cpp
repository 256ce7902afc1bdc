// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/sandbox/SandboxPlan.h"

#include <QRegularExpression>

#include <array>
#include <initializer_list>

namespace VirtualDevice
{

namespace
{

/// A user namespace of its own even for root: the program is the same ordinary user everywhere, without a capability.
/// No --new-session: the program must be able to be a terminal's foreground job in `exec`.
const QStringList isolation{
    "--die-with-parent", "--unshare-user", "--uid",         "1000",          "--gid",      "1000",
    "--unshare-pid",     "--unshare-net",  "--unshare-ipc", "--unshare-uts", "--hostname", "device"};

/// The root is empty; libraries, fonts and the settings of the text renderer are the host's, read-only.
const QStringList system{"--tmpfs",
                         "/",
                         "--ro-bind",
                         "/usr",
                         "/usr",
                         "--symlink",
                         "usr/bin",
                         "/bin",
                         "--symlink",
                         "usr/sbin",
                         "/sbin",
                         "--symlink",
                         "usr/lib",
                         "/lib",
                         "--symlink",
                         "usr/lib64",
                         "/lib64",
                         "--proc",
                         "/proc",
                         "--dev",
                         "/dev",
                         "--tmpfs",
                         "/tmp",
                         "--dir",
                         "/sys",
                         "--dir",
                         "/etc",
                         "--dir",
                         "/run",
                         "--perms",
                         "0700",
                         "--dir",
                         "/run/user",
                         "--ro-bind-try",
                         "/etc/fonts",
                         "/etc/fonts",
                         "--ro-bind-try",
                         "/etc/alternatives",
                         "/etc/alternatives",
                         "--ro-bind-try",
                         "/etc/alsa",
                         "/etc/alsa",
                         "--ro-bind-try",
                         "/etc/ld.so.cache",
                         "/etc/ld.so.cache",
                         "--ro-bind-try",
                         "/var/cache/fontconfig",
                         "/var/cache/fontconfig"};

const QMap<QString, QString> fixedEnvironment{
    {"PATH", "/usr/bin:/bin:/usr/sbin:/sbin"}, {"HOME", "/tmp"}, {"LC_ALL", "C.UTF-8"},
    {"XDG_RUNTIME_DIR", "/run/user"},          {"TZ", "UTC"},
};

/// What a sanitizer's build of the program is steered by; harmless to every other build.
constexpr std::array passedOn{"ASAN_OPTIONS", "LSAN_OPTIONS", "TSAN_OPTIONS", "UBSAN_OPTIONS"};

/// The files that those options name. A sanitizer looks for each by the same path inside.
QStringList suppressionFiles()
{
    static const QRegularExpression option(
        QStringLiteral(R"re((?:^|[\s:,])suppressions=(?|"([^"]*)"|'([^']*)'|([^\s:,]*)))re"));
    QStringList files;
    for (const char* name : passedOn) {
        auto matches = option.globalMatch(qEnvironmentVariable(name));
        while (matches.hasNext()) {
            const QString file = matches.next().captured(1);
            if (file.startsWith(u'/') && !files.contains(file))
                files.append(file);
        }
    }
    return files;
}

QString bindOption(const SandboxBind& bind)
{
    QString option;
    switch (bind.kind) {
    case SandboxBind::Kind::ReadOnly:
        option = QStringLiteral("--ro-bind");
        break;
    case SandboxBind::Kind::Writable:
        option = QStringLiteral("--bind");
        break;
    case SandboxBind::Kind::Device:
        option = QStringLiteral("--dev-bind");
        break;
    }
    return bind.mayBeMissing ? option + QStringLiteral("-try") : option;
}

QStringList environmentArguments(const SandboxPlan& plan)
{
    QMap<QString, QString> variables = fixedEnvironment;
    if (!plan.inheritsEnvironment) {
        for (const char* name : passedOn)
            if (qEnvironmentVariableIsSet(name))
                variables.insert(QString::fromLatin1(name), qEnvironmentVariable(name));
    }
    variables.insert(plan.environment);
    QStringList arguments;
    if (!plan.inheritsEnvironment)
        arguments.append(QStringLiteral("--clearenv"));
    for (auto variable = variables.cbegin(); variable != variables.cend(); ++variable)
        arguments += {QStringLiteral("--setenv"), variable.key(), variable.value()};
    return arguments;
}

/// The relay is started as a grandchild, so that the program finds no child of its own that it never made.
QStringList commandArguments(const SandboxPlan& plan)
{
    if (plan.vncSocket.isEmpty())
        return plan.command;
    const QString relay = QStringLiteral("(socat \"UNIX-LISTEN:$0,fork,mode=0600,unlink-early\" "
                                         "TCP4:127.0.0.1:5900 >/dev/null 2>&1 </dev/null &); exec \"$@\"");
    return QStringList{QStringLiteral("/bin/sh"), QStringLiteral("-c"), relay, plan.vncSocket} + plan.command;
}

} // namespace

void SandboxPlan::add(const QString& source, const QString& target, SandboxBind::Kind kind)
{
    binds.append({source, target, kind, false});
}

QStringList bubblewrapArguments(const SandboxPlan& plan, int statusDescriptor)
{
    QStringList arguments = isolation + system;
    // Before the device's own binds, which they must not cover.
    for (const auto& file : suppressionFiles())
        arguments += {QStringLiteral("--ro-bind-try"), file, file};
    for (const auto& bind : plan.binds)
        arguments += {bindOption(bind), bind.source, bind.target};
    arguments += environmentArguments(plan);
    arguments += {QStringLiteral("--json-status-fd"), QString::number(statusDescriptor), QStringLiteral("--chdir"),
                  QStringLiteral("/"), QStringLiteral("--")};
    return arguments + commandArguments(plan);
}

} // namespace VirtualDevice
