// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/tree/DataPartition.h"

#include "virtual-device/registry/Registry.h"
#include "virtual-device/tree/Faults.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <utility>

namespace VirtualDevice
{

namespace
{

/// The library's path, which always starts with "/", below the partition's folder.
const char* below(const char* path)
{
    return path[1] == 0 ? "." : path + 1;
}

int outcome(int result)
{
    return result < 0 ? -errno : 0;
}

int outcome(ssize_t result)
{
    return result < 0 ? -errno : static_cast<int>(result);
}

int descriptorOf(const fuse_file_info* info)
{
    return static_cast<int>(info->fh);
}

bool changes(int flags)
{
    return (flags & O_ACCMODE) != O_RDONLY || (flags & (O_TRUNC | O_CREAT)) != 0;
}

} // namespace

/// The bridge from the library's C functions. Paths never hold a link: the kernel has followed them already.
struct PartitionOperations
{
    static DataPartition& card() { return *static_cast<DataPartition*>(::fuse_get_context()->private_data); }
    static int root() { return card().root; }

    /// Runs `action` unless the card refuses with `refusal`.
    template <typename Action> static int unless(int refusal, Action action)
    {
        return refusal != 0 ? -refusal : outcome(action());
    }

    /// The kernel keeps the root of what is mounted; a failing card shows below it.
    static int getattr(const char* path, struct stat* status, fuse_file_info* info)
    {
        const bool isRoot = info == nullptr && std::strcmp(path, "/") == 0;
        return unless(isRoot ? 0 : card().failure(), [&] {
            return info != nullptr ? ::fstat(descriptorOf(info), status)
                                   : ::fstatat(root(), below(path), status, AT_SYMLINK_NOFOLLOW);
        });
    }

    static int access(const char* path, int mode)
    {
        if ((mode & W_OK) != 0 && card().refusalOfChange() != 0)
            return -card().refusalOfChange();
        return unless(card().failure(), [&] { return ::faccessat(root(), below(path), mode, 0); });
    }

    static int readlink(const char* path, char* buffer, size_t size)
    {
        const int result =
            unless(card().failure(), [&] { return ::readlinkat(root(), below(path), buffer, size - 1); });
        if (result < 0)
            return result;
        buffer[result] = 0;
        return 0;
    }

    static int opendir(const char* path, fuse_file_info* info)
    {
        if (card().failure() != 0)
            return -card().failure();
        const int descriptor = ::openat(root(), below(path), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
        if (descriptor < 0)
            return -errno;
        DIR* folder = ::fdopendir(descriptor);
        if (folder == nullptr) {
            const int reason = errno;
            ::close(descriptor);
            return -reason;
        }
        card().openFolders.insert(folder);
        info->fh = reinterpret_cast<std::uintptr_t>(folder);
        return 0;
    }

    static DIR* folderOf(const fuse_file_info* info) { return reinterpret_cast<DIR*>(info->fh); }

    static int releasedir(const char*, fuse_file_info* info)
    {
        card().openFolders.erase(folderOf(info));
        return outcome(::closedir(folderOf(info)));
    }

    static int readdir(const char*, void* buffer, fuse_fill_dir_t fill, off_t, fuse_file_info* info, fuse_readdir_flags)
    {
        if (card().failure() != 0)
            return -card().failure();
        ::rewinddir(folderOf(info));
        while (const dirent* entry = ::readdir(folderOf(info)))
            fill(buffer, entry->d_name, nullptr, 0, fuse_fill_dir_flags{});
        return 0;
    }

    static int mkdir(const char* path, mode_t mode)
    {
        return unless(card().refusalOfGrowth(), [&] { return ::mkdirat(root(), below(path), mode); });
    }

    static int unlink(const char* path)
    {
        return unless(card().refusalOfChange(), [&] { return ::unlinkat(root(), below(path), 0); });
    }

    static int rmdir(const char* path)
    {
        return unless(card().refusalOfChange(), [&] { return ::unlinkat(root(), below(path), AT_REMOVEDIR); });
    }

    static int symlink(const char* target, const char* path)
    {
        return unless(card().refusalOfGrowth(), [&] { return ::symlinkat(target, root(), below(path)); });
    }

    static int rename(const char* from, const char* to, unsigned flags)
    {
        return unless(card().refusalOfChange(),
                      [&] { return ::renameat2(root(), below(from), root(), below(to), flags); });
    }

    static int link(const char* from, const char* to)
    {
        return unless(card().refusalOfGrowth(), [&] { return ::linkat(root(), below(from), root(), below(to), 0); });
    }

    static int chmod(const char* path, mode_t mode, fuse_file_info* info)
    {
        return unless(card().refusalOfChange(), [&] {
            return info != nullptr ? ::fchmod(descriptorOf(info), mode) : ::fchmodat(root(), below(path), mode, 0);
        });
    }

    static int truncate(const char* path, off_t size, fuse_file_info* info)
    {
        return unless(card().refusalOfChange(), [&] {
            if (info != nullptr)
                return ::ftruncate(descriptorOf(info), size);
            const int descriptor = ::openat(root(), below(path), O_WRONLY | O_CLOEXEC | O_NOFOLLOW);
            const int result = descriptor < 0 ? -1 : ::ftruncate(descriptor, size);
            const int reason = errno;
            ::close(descriptor);
            errno = reason;
            return result;
        });
    }

    static int utimens(const char* path, const timespec* times, fuse_file_info* info)
    {
        return unless(card().refusalOfChange(), [&] {
            return info != nullptr ? ::futimens(descriptorOf(info), times)
                                   : ::utimensat(root(), below(path), times, AT_SYMLINK_NOFOLLOW);
        });
    }

    static int openWith(const char* path, fuse_file_info* info, int flags, mode_t mode)
    {
        const int descriptor = ::openat(root(), below(path), flags | O_CLOEXEC | O_NOFOLLOW, mode);
        if (descriptor < 0)
            return -errno;
        card().openFiles.insert(descriptor);
        info->fh = static_cast<std::uint64_t>(descriptor);
        return 0;
    }

    static int open(const char* path, fuse_file_info* info)
    {
        const int refusal = changes(info->flags) ? card().refusalOfChange() : card().failure();
        return refusal != 0 ? -refusal : openWith(path, info, info->flags, 0);
    }

    static int create(const char* path, mode_t mode, fuse_file_info* info)
    {
        const int refusal = card().refusalOfGrowth();
        return refusal != 0 ? -refusal : openWith(path, info, info->flags | O_CREAT, mode);
    }

    static int release(const char*, fuse_file_info* info)
    {
        card().openFiles.erase(descriptorOf(info));
        return outcome(::close(descriptorOf(info)));
    }

    static int read(const char*, char* buffer, size_t size, off_t offset, fuse_file_info* info)
    {
        return unless(card().failure(), [&] { return ::pread(descriptorOf(info), buffer, size, offset); });
    }

    static int write(const char*, const char* bytes, size_t size, off_t offset, fuse_file_info* info)
    {
        return unless(card().refusalOfGrowth(), [&] { return ::pwrite(descriptorOf(info), bytes, size, offset); });
    }

    static int fsync(const char*, int, fuse_file_info* info)
    {
        return unless(card().failure(), [&] { return ::fsync(descriptorOf(info)); });
    }

    static int statfs(const char*, struct statvfs* status)
    {
        const int result = unless(card().failure(), [&] { return ::fstatvfs(root(), status); });
        if (card().refusalOfGrowth() == ENOSPC)
            status->f_bavail = status->f_bfree = 0;
        return result;
    }

    static fuse_operations table()
    {
        fuse_operations all{};
        all.getattr = getattr;
        all.access = access;
        all.readlink = readlink;
        all.opendir = opendir;
        all.releasedir = releasedir;
        all.readdir = readdir;
        all.mkdir = mkdir;
        all.unlink = unlink;
        all.rmdir = rmdir;
        all.symlink = symlink;
        all.rename = rename;
        all.link = link;
        all.chmod = chmod;
        all.truncate = truncate;
        all.utimens = utimens;
        all.open = open;
        all.create = create;
        all.release = release;
        all.read = read;
        all.write = write;
        all.fsync = fsync;
        all.statfs = statfs;
        return all;
    }
};

DataPartition::~DataPartition()
{
    unmount();
}

std::optional<QString> DataPartition::mount(const QString& folder, const QString& mountPoint)
{
    root = ::open(folder.toLocal8Bit().constData(), O_PATH | O_DIRECTORY | O_CLOEXEC);
    if (root < 0)
        return QStringLiteral("%1: %2").arg(folder, qt_error_string(errno));
    return fileSystem.mount(mountPoint, PartitionOperations::table(), this, FuseMount::Names::Removable);
}

void DataPartition::unmount()
{
    fileSystem.unmount();
    for (const int file : std::exchange(openFiles, {}))
        ::close(file);
    for (DIR* folder : std::exchange(openFolders, {}))
        ::closedir(folder);
    if (root >= 0)
        ::close(root);
    root = -1;
}

int DataPartition::failure() const
{
    return errorNumber(registry.text(QStringLiteral("sd.fault")));
}

int DataPartition::refusalOfChange() const
{
    return failure() != 0 ? failure() : registry.flag(QStringLiteral("sd.readonly")) ? EROFS : 0;
}

int DataPartition::refusalOfGrowth() const
{
    const int refusal = refusalOfChange();
    return refusal != 0 ? refusal : registry.flag(QStringLiteral("sd.full")) ? ENOSPC : 0;
}

} // namespace VirtualDevice
