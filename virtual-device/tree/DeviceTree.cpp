// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/tree/DeviceTree.h"

#include "virtual-device/registry/Registry.h"
#include "virtual-device/registry/Values.h"
#include "virtual-device/tree/Faults.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <set>

namespace VirtualDevice
{

namespace
{

constexpr off_t attributeSize = 4096; ///< what the kernel claims for every attribute
constexpr qsizetype hugeSize = 1 << 20;

QByteArray everyByte()
{
    QByteArray bytes;
    for (int value = 0; value < 256; ++value)
        bytes.append(static_cast<char>(value));
    return bytes;
}

/// The names directly below a folder of the tree; none: it is no folder.
std::set<std::string_view> childrenOf(std::string_view folder)
{
    std::set<std::string_view> names;
    if (folder == "/")
        folder = {};
    for (const auto& entry : treeTable()) {
        if (!entry.path.starts_with(folder) || entry.path.size() <= folder.size() || entry.path[folder.size()] != '/')
            continue;
        const auto rest = entry.path.substr(folder.size() + 1);
        names.insert(rest.substr(0, rest.find('/')));
    }
    return names;
}

void fillFolder(struct stat& status)
{
    status.st_mode = S_IFDIR | 0755;
    status.st_nlink = 2;
}

void fillEntry(const TreeEntry& entry, struct stat& status)
{
    status.st_nlink = 1;
    switch (entry.kind) {
    case TreeEntry::Kind::Folder:
        fillFolder(status);
        return;
    case TreeEntry::Kind::Link:
        status.st_mode = S_IFLNK | entry.permissions;
        status.st_size = static_cast<off_t>(entry.target.size());
        return;
    case TreeEntry::Kind::Attribute:
        status.st_mode = S_IFREG | entry.permissions;
        status.st_size = attributeSize;
        return;
    case TreeEntry::Kind::Clock:
        status.st_mode = S_IFREG | entry.permissions;
        return;
    }
}

QString stamp(const QDateTime& time)
{
    return time.toString(Qt::ISODateWithMs);
}

} // namespace

/// The bridge from the library's C functions.
struct TreeOperations
{
    static DeviceTree& tree() { return *static_cast<DeviceTree*>(::fuse_get_context()->private_data); }

    /// None: the handle is not of a file of ours, as that of a folder, which is opened without us.
    static DeviceTree::OpenFile* file(const fuse_file_info* info)
    {
        const auto found = tree().openFiles.find(info->fh);
        return found == tree().openFiles.end() ? nullptr : &found->second;
    }

    static int getattr(const char* path, struct stat* status, fuse_file_info*)
    {
        *status = {};
        status->st_uid = ::geteuid();
        status->st_gid = ::getegid();
        status->st_mtime = status->st_ctime = status->st_atime = ::time(nullptr);
        const TreeEntry* entry = findEntry(path);
        if (entry == nullptr) {
            fillFolder(*status);
            return childrenOf(path).empty() ? -ENOENT : 0;
        }
        fillEntry(*entry, *status);
        return -tree().lookUp(*entry);
    }

    static int readlink(const char* path, char* buffer, size_t size)
    {
        const TreeEntry* entry = findEntry(path);
        if (entry == nullptr || entry->kind != TreeEntry::Kind::Link)
            return -EINVAL;
        const auto length = std::min(entry->target.size(), size - 1);
        std::memcpy(buffer, entry->target.data(), length);
        buffer[length] = 0;
        return -tree().lookUp(*entry);
    }

    static int readdir(const char* path, void* buffer, fuse_fill_dir_t fill, off_t, fuse_file_info*, fuse_readdir_flags)
    {
        const std::string folder = std::strcmp(path, "/") == 0 ? path : std::string(path) + '/';
        for (const char* name : {".", ".."})
            fill(buffer, name, nullptr, 0, FUSE_FILL_DIR_PLUS);
        for (const auto& child : childrenOf(path)) {
            const std::string name(child);
            const TreeEntry* entry = findEntry(folder + name);
            if (entry == nullptr || tree().isThere(*entry))
                fill(buffer, name.c_str(), nullptr, 0, fuse_fill_dir_flags{});
        }
        return 0;
    }

    static int open(const char* path, fuse_file_info* info)
    {
        const TreeEntry* entry = findEntry(path);
        if (entry == nullptr)
            return -ENOENT;
        const int error = tree().open(*entry, info->flags);
        if (error != 0)
            return -error;
        info->fh = ++tree().lastHandle;
        tree().openFiles[info->fh].entry = entry;
        return 0;
    }

    static int release(const char*, fuse_file_info* info)
    {
        tree().openFiles.erase(info->fh);
        return 0;
    }

    static int read(const char*, char* buffer, size_t size, off_t offset, fuse_file_info* info)
    {
        auto* const open = file(info);
        if (open == nullptr)
            return -EBADF;
        if (offset == 0 || !open->isFilled) {
            const int error = tree().refresh(*open);
            if (error != 0)
                return -error;
        }
        const auto part = open->content.mid(static_cast<qsizetype>(offset), static_cast<qsizetype>(size));
        std::memcpy(buffer, part.constData(), static_cast<std::size_t>(part.size()));
        return static_cast<int>(part.size());
    }

    static int write(const char*, const char* bytes, size_t size, off_t, fuse_file_info* info)
    {
        const auto* const open = file(info);
        if (open == nullptr)
            return -EBADF;
        const int error = tree().write(*open->entry, QByteArray(bytes, static_cast<qsizetype>(size)));
        return error != 0 ? -error : static_cast<int>(size);
    }

    /// An attribute has no length that could change; the kernel takes the request and does nothing.
    static int truncate(const char* path, off_t, fuse_file_info*)
    {
        const TreeEntry* entry = findEntry(path);
        return entry == nullptr ? -ENOENT : -tree().lookUp(*entry);
    }

    static int ioctl(const char*, unsigned request, void*, fuse_file_info* info, unsigned, void* data)
    {
        const auto* const open = file(info);
        if (open == nullptr || open->entry->kind != TreeEntry::Kind::Clock ||
            request != static_cast<unsigned>(RTC_RD_TIME) || data == nullptr)
            return -ENOTTY;
        const int error = tree().fault(*open->entry);
        if (error != 0)
            return error == ENOENT ? -ENODEV : -error;
        const rtc_time now = tree().clock.read();
        std::memcpy(data, &now, sizeof now);
        return 0;
    }

    static int create(const char*, mode_t, fuse_file_info*) { return -EACCES; }
    static int mkdir(const char*, mode_t) { return -EPERM; }
    static int mknod(const char*, mode_t, dev_t) { return -EACCES; }
    static int remove(const char*) { return -EPERM; }
    static int rename(const char*, const char*, unsigned) { return -EPERM; }

    static fuse_operations table()
    {
        fuse_operations all{};
        all.getattr = getattr;
        all.readlink = readlink;
        all.readdir = readdir;
        all.open = open;
        all.release = release;
        all.read = read;
        all.write = write;
        all.truncate = truncate;
        all.ioctl = ioctl;
        all.create = create;
        all.mkdir = mkdir;
        all.mknod = mknod;
        all.unlink = remove;
        all.rmdir = remove;
        all.rename = rename;
        return all;
    }
};

DeviceTree::DeviceTree(Registry& values, QObject* parent) : QObject(parent), registry(values), clock(values) {}

DeviceTree::~DeviceTree()
{
    unmount();
}

std::optional<QString> DeviceTree::mount(const QString& mountPoint)
{
    return fileSystem.mount(mountPoint, TreeOperations::table(), this, FuseMount::Names::Permanent);
}

void DeviceTree::unmount()
{
    fileSystem.unmount();
    openFiles.clear();
}

int DeviceTree::fault(const TreeEntry& entry) const
{
    return entry.fault.empty() ? 0 : errorNumber(registry.text(fromView(entry.fault)));
}

/// The clock is bound into the sandbox by itself: its name stays, and only opening it says that it is gone.
bool DeviceTree::isThere(const TreeEntry& entry) const
{
    if (!entry.presence.empty() && !registry.flag(fromView(entry.presence)))
        return false;
    if (entry.kind == TreeEntry::Kind::Folder)
        return entry.fault.empty() || registry.text(fromView(entry.fault)) != u"dangling";
    return entry.kind == TreeEntry::Kind::Clock || fault(entry) != ENOENT;
}

int DeviceTree::lookUp(const TreeEntry& entry) const
{
    if (!isThere(entry))
        return ENOENT;
    return entry.kind == TreeEntry::Kind::Link ? fault(entry) : 0;
}

int DeviceTree::open(const TreeEntry& entry, int flags) const
{
    if (!isThere(entry))
        return ENOENT;
    const int error = fault(entry);
    const bool wantsToWrite = (flags & O_ACCMODE) != O_RDONLY;
    if (error == ENOENT || error == EACCES)
        return error;
    return wantsToWrite && (entry.permissions & 0222) == 0 ? EACCES : 0;
}

int DeviceTree::refresh(OpenFile& file) const
{
    if (!isThere(*file.entry))
        return ENODEV;
    const int error = fault(*file.entry);
    if (error != 0 && error != EACCES)
        return error;
    if (file.entry->show == nullptr)
        return file.entry->kind == TreeEntry::Kind::Clock ? EINVAL : EIO;
    file.content = contentOf(*file.entry);
    file.isFilled = true;
    return 0;
}

QByteArray DeviceTree::contentOf(const TreeEntry& entry) const
{
    const QByteArray value = entry.show(registry);
    const QString choice = entry.content.empty() ? QString() : registry.text(fromView(entry.content));
    if (choice == u"empty")
        return {};
    if (choice == u"binary")
        return everyByte();
    if (choice == u"huge")
        return QByteArray(hugeSize, '7');
    return choice == u"no-newline" ? value.chopped(1) : value;
}

int DeviceTree::write(const TreeEntry& entry, const QByteArray& bytes)
{
    if (!isThere(entry))
        return ENODEV;
    const int error = fault(entry);
    if (error != 0 && error != EACCES)
        return error;
    if (entry.path == TreePath::powerLatch)
        return writePowerLatch(bytes);
    return entry.path == TreePath::resetLine ? writeResetLine(bytes) : EINVAL;
}

int DeviceTree::writePowerLatch(const QByteArray& bytes)
{
    constexpr uint brightest = 255;
    bool isNumber = false;
    const uint value = bytes.trimmed().toUInt(&isNumber, 0);
    if (!isNumber)
        return EINVAL;
    const int brightness = static_cast<int>(std::min(value, brightest));
    const QDateTime now = QDateTime::currentDateTimeUtc();
    registry.publish(QStringLiteral("led.power_latch"), brightness);
    registry.publish(QStringLiteral("led.written"), stamp(now));
    registry.count(QStringLiteral("led.writes"));
    emit powerLatchWritten(brightness, now);
    return 0;
}

int DeviceTree::writeResetLine(const QByteArray& bytes)
{
    if (bytes.trimmed() != "1")
        return EINVAL;
    registry.publish(QStringLiteral("reset_line.written"), stamp(QDateTime::currentDateTimeUtc()));
    registry.count(QStringLiteral("reset_line.writes"));
    emit resetLineWritten();
    return 0;
}

} // namespace VirtualDevice
