// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#ifndef FUSE_USE_VERSION
#define FUSE_USE_VERSION 35
#endif

#include <QString>

#include <fuse3/fuse.h>

#include <optional>
#include <thread>

namespace VirtualDevice
{

/// One mounted file system, answered by a thread of its own. Nothing is cached by the kernel: every look at a name, an
/// attribute or a content reaches the operations, so that a change shows at once.
///
/// Threads: mount and unmount on the owner's thread; the operations are called on the mount's thread, one at a time.
/// They must not block and must not throw: a program that looks at the file waits for them, in its GUI thread as well.
class FuseMount
{
public:
    FuseMount() = default;
    ~FuseMount();
    FuseMount(const FuseMount&) = delete;
    FuseMount& operator=(const FuseMount&) = delete;

    enum class Names
    {
        Permanent, ///< nothing can be removed: every operation is told the path
        Removable, ///< operations on something open are told its handle alone (path null), as its name may have gone
    };

    /// `owner` is what the operations find as `fuse_get_context()->private_data`. Returns what went wrong.
    [[nodiscard]] std::optional<QString> mount(const QString& mountPoint, fuse_operations operations, void* owner,
                                               Names names);
    /// Ends the thread and detaches the mount point; whoever still holds a file of it gets errors from now on.
    void unmount();

private:
    [[nodiscard]] std::optional<QString> attach(const QString& mountPoint, fuse_operations operations, void* owner,
                                                Names names);
    void serve(int session);

    fuse* instance = nullptr;
    int stopEvent = -1;
    std::thread thread;
};

} // namespace VirtualDevice
