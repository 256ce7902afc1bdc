// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/sandbox/DeviceFolder.h"

#include "virtual-device/tree/Mounts.h"

#include <QDir>
#include <QFileInfo>
#include <QRegularExpression>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>

namespace VirtualDevice
{

namespace
{

constexpr int mostDevices = 1000;
const QString lockSuffix = QStringLiteral(".lock");

QByteArray native(const QString& path)
{
    return path.toLocal8Bit();
}

bool isPrivateFolder(const QString& path)
{
    struct stat status
    {
    };
    return ::lstat(native(path).constData(), &status) == 0 && S_ISDIR(status.st_mode) && status.st_uid == ::geteuid() &&
           (status.st_mode & 0077) == 0;
}

struct flock wholeFile()
{
    struct flock request
    {
    };
    request.l_type = F_WRLCK;
    request.l_whence = SEEK_SET;
    return request;
}

bool isLockedBySomebody(int descriptor)
{
    auto request = wholeFile();
    return ::fcntl(descriptor, F_OFD_GETLK, &request) == 0 && request.l_type != F_UNLCK;
}

struct LockAttempt
{
    int descriptor = -1;
    int error = 0; ///< without a descriptor: 0 where somebody holds the lock, or why the file cannot be made
};

LockAttempt lockedFile(const QString& path)
{
    auto request = wholeFile();
    for (;;) {
        const int descriptor = ::open(native(path).constData(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW, 0600);
        if (descriptor < 0)
            return {-1, errno};
        if (::fcntl(descriptor, F_OFD_SETLK, &request) != 0) {
            const int error = errno == EAGAIN || errno == EACCES ? 0 : errno;
            ::close(descriptor);
            return {-1, error};
        }
        struct stat held
        {
        };
        struct stat named
        {
        };
        // The last owner may have removed the file between our open and our lock.
        if (::fstat(descriptor, &held) == 0 && ::stat(native(path).constData(), &named) == 0 &&
            held.st_ino == named.st_ino)
            return {descriptor, 0};
        ::close(descriptor);
    }
}

QString lockPath(const QString& name)
{
    return DeviceFolder::root() + u'/' + name + lockSuffix;
}

QStringList knownNames()
{
    QStringList names;
    const auto files = QDir(DeviceFolder::root()).entryList({u'*' + lockSuffix}, QDir::Files | QDir::Hidden);
    for (const auto& file : files)
        names.append(file.chopped(lockSuffix.size()));
    return names;
}

/// A folder that the program closed to itself could not be emptied.
void openFolders(const std::filesystem::path& folder)
{
    using std::filesystem::perms;
    std::error_code ignored;
    for (std::filesystem::recursive_directory_iterator entry(folder, ignored), end; entry != end && !ignored;
         entry.increment(ignored)) {
        if (entry->symlink_status(ignored).type() == std::filesystem::file_type::directory)
            std::filesystem::permissions(entry->path(), perms::owner_all, std::filesystem::perm_options::add, ignored);
    }
}

QString folderOf(const QString& name)
{
    return DeviceFolder::root() + u'/' + name;
}

/// Never enters a file system that is mounted below the folder: what it shows may be the operator's own state. Returns
/// whether the folder is gone.
bool removeFolder(const QString& folder)
{
    unmountBelow(folder);
    if (!mountedBelow(folder).isEmpty())
        return false;
    openFolders(folder.toStdString());
    std::error_code ignored;
    std::filesystem::remove_all(folder.toStdString(), ignored);
    struct stat status
    {
    };
    return ::lstat(native(folder).constData(), &status) != 0 && errno == ENOENT;
}

/// What cannot be removed keeps its lock's file, by which the next start finds it. Returns whether everything is gone.
bool removeDevice(const QString& name, int lock)
{
    const bool isGone = removeFolder(folderOf(name));
    if (isGone)
        ::unlink(native(lockPath(name)).constData());
    ::close(lock);
    return isGone;
}

} // namespace

DeviceFolder::~DeviceFolder()
{
    release();
}

QString DeviceFolder::root()
{
    const QString variable = qEnvironmentVariable("XDG_RUNTIME_DIR");
    const QString runtime = variable.isEmpty() ? QString() : QFileInfo(variable).canonicalFilePath();
    if (!runtime.isEmpty() && isPrivateFolder(runtime))
        return runtime + QStringLiteral("/virtual-device");
    const QString temporary = QFileInfo(QStringLiteral("/tmp")).canonicalFilePath();
    return QStringLiteral("%1/virtual-device-%2").arg(temporary).arg(::geteuid());
}

QStringList DeviceFolder::running()
{
    QStringList names;
    for (const auto& name : knownNames()) {
        const int descriptor = ::open(native(lockPath(name)).constData(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW);
        if (descriptor < 0)
            continue;
        if (isLockedBySomebody(descriptor))
            names.append(name);
        ::close(descriptor);
    }
    return names;
}

QString DeviceFolder::controlSocket(const QString& name)
{
    return folderOf(name) + QStringLiteral("/control");
}

bool DeviceFolder::isName(const QString& name)
{
    static const QRegularExpression allowed(QStringLiteral("\\A[A-Za-z0-9][A-Za-z0-9_-]{0,23}\\z"));
    return allowed.match(name).hasMatch();
}

std::optional<QString> DeviceFolder::nameProblem(const QString& name)
{
    if (isName(name))
        return std::nullopt;
    return QStringLiteral("\"%1\" is no device name: letters, digits, \"-\" and \"_\", at most 24").arg(name);
}

QStringList DeviceFolder::cleanUp()
{
    QStringList cleaned;
    // Where the root is somebody else's, so is what is in it.
    if (!isPrivateFolder(root()))
        return cleaned;
    for (const auto& name : knownNames()) {
        const int descriptor = lockedFile(lockPath(name)).descriptor;
        if (descriptor < 0)
            continue;
        if (removeDevice(name, descriptor))
            cleaned.append(name);
    }
    return cleaned;
}

std::optional<QString> DeviceFolder::claim(const QString& name)
{
    if (auto problem = name.isEmpty() ? std::nullopt : nameProblem(name))
        return problem;
    ::mkdir(native(root()).constData(), 0700);
    if (!isPrivateFolder(root()))
        return QStringLiteral("%1 is not a folder of this user with mode 0700: remove it").arg(root());
    if (auto problem = takeName(name))
        return problem;
    if (::mkdir(native(path()).constData(), 0700) != 0)
        return QStringLiteral("%1: cannot make the device's folder: %2").arg(path(), qt_error_string(errno));
    return std::nullopt;
}

std::optional<QString> DeviceFolder::takeName(const QString& name)
{
    for (int number = 1; number <= mostDevices; ++number) {
        const QString candidate = name.isEmpty() ? QStringLiteral("device-%1").arg(number) : name;
        const auto attempt = lockedFile(lockPath(candidate));
        if (attempt.error != 0)
            return QStringLiteral("%1: cannot be made: %2").arg(lockPath(candidate), qt_error_string(attempt.error));
        const bool isFree = attempt.descriptor >= 0;
        if (isFree && (removeFolder(folderOf(candidate)) || !name.isEmpty())) {
            deviceName = candidate;
            lock = attempt.descriptor;
            return std::nullopt;
        }
        if (isFree)
            ::close(attempt.descriptor); // what was left there cannot be removed
        if (!name.isEmpty())
            return QStringLiteral("a device named \"%1\" is running: choose another name with --name").arg(name);
    }
    return QStringLiteral("%1 devices are running: end one, or choose a name with --name").arg(mostDevices);
}

void DeviceFolder::release()
{
    if (lock < 0)
        return;
    (void)removeDevice(deviceName, lock);
    lock = -1;
}

QString DeviceFolder::path(const QString& relative) const
{
    const QString own = folderOf(deviceName);
    return relative.isEmpty() ? own : own + u'/' + relative;
}

} // namespace VirtualDevice
