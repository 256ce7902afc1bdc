// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/tree/Mounts.h"

#include <QFile>
#include <QProcess>

#include <sys/mount.h>

#include <algorithm>

namespace VirtualDevice
{

namespace
{

/// The mount table writes blanks, tabs, line ends and backslashes as three octal digits.
QString unescaped(const QByteArray& field)
{
    QByteArray plain;
    for (qsizetype index = 0; index < field.size(); ++index) {
        if (field[index] != '\\') {
            plain.append(field[index]);
            continue;
        }
        plain.append(static_cast<char>(field.mid(index + 1, 3).toInt(nullptr, 8)));
        index += 3;
    }
    return QString::fromLocal8Bit(plain);
}

} // namespace

QStringList mountedBelow(const QString& folder)
{
    constexpr qsizetype mountPointField = 4;
    QStringList found;
    QFile table(QStringLiteral("/proc/self/mountinfo"));
    if (!table.open(QIODevice::ReadOnly))
        return found;
    const auto lines = table.readAll().split('\n');
    for (const auto& line : lines) {
        const QString mountPoint = unescaped(line.split(' ').value(mountPointField));
        if (mountPoint == folder || mountPoint.startsWith(folder + u'/'))
            found.append(mountPoint);
    }
    std::reverse(found.begin(), found.end());
    return found;
}

void detachMount(const QString& mountPoint)
{
    if (::umount2(mountPoint.toLocal8Bit().constData(), MNT_DETACH | UMOUNT_NOFOLLOW) == 0)
        return;
    QProcess helper;
    helper.start(QStringLiteral("fusermount3"),
                 {QStringLiteral("-u"), QStringLiteral("-z"), QStringLiteral("-q"), QStringLiteral("--"), mountPoint});
    helper.waitForFinished();
}

void unmountBelow(const QString& folder)
{
    const auto mountPoints = mountedBelow(folder);
    for (const auto& mountPoint : mountPoints)
        detachMount(mountPoint);
}

} // namespace VirtualDevice
