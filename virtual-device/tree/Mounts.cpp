// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/tree/Mounts.h"

#include <QDir>
#include <QFileInfo>
#include <QProcess>

#include <mntent.h>
#include <sys/mount.h>

#include <algorithm>
#include <cstdio>
#include <memory>
#include <vector>

namespace VirtualDevice
{

namespace
{

/// As the mount table names it. The last component stays as it is: a mount point whose server has died answers nothing.
QString canonical(const QString& folder)
{
    const QFileInfo plain(QDir::cleanPath(folder));
    const QString parent = QFileInfo(plain.absolutePath()).canonicalFilePath();
    return parent.isEmpty() ? plain.absoluteFilePath() : QDir(parent).absoluteFilePath(plain.fileName());
}

} // namespace

QStringList mountedBelow(const QString& folder)
{
    constexpr std::size_t longestLine = 32 * 1024; // two paths, each with every byte escaped
    QStringList found;
    const QString wanted = canonical(folder);
    const std::unique_ptr<FILE, int (*)(FILE*)> table(::setmntent("/proc/self/mounts", "re"), ::endmntent);
    std::vector<char> line(longestLine);
    mntent entry{};
    while (table && ::getmntent_r(table.get(), &entry, line.data(), static_cast<int>(line.size())) != nullptr) {
        const QString mountPoint = QString::fromLocal8Bit(entry.mnt_dir);
        if (mountPoint == wanted || mountPoint.startsWith(wanted + u'/'))
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
