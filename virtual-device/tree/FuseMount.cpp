// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/tree/FuseMount.h"

#include <fcntl.h>
#include <fuse3/fuse_lowlevel.h>
#include <poll.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <csignal>
#include <cstdlib>

namespace VirtualDevice
{

namespace
{

template <FuseMount::Names names> void* configure(fuse_conn_info*, fuse_config* config)
{
    config->entry_timeout = 0;
    config->attr_timeout = 0;
    config->negative_timeout = 0;
    // Without direct I/O the kernel believes a size and stops reading there; an attribute has none.
    config->direct_io = 1;
    // A removed file goes at once, as on a disk; open handles of ours keep theirs alive.
    config->hard_remove = 1;
    config->nullpath_ok = names == FuseMount::Names::Removable ? 1 : 0;
    return fuse_get_context()->private_data;
}

/// A thread starts with its maker's mask; signals belong to the main thread.
template <typename Function> std::thread threadWithoutSignals(Function function)
{
    sigset_t everything;
    sigset_t before;
    ::sigfillset(&everything);
    ::pthread_sigmask(SIG_SETMASK, &everything, &before);
    std::thread started(function);
    ::pthread_sigmask(SIG_SETMASK, &before, nullptr);
    return started;
}

QString failure(const QString& mountPoint, const QString& reason)
{
    return QStringLiteral("%1: cannot be mounted: %2").arg(mountPoint, reason);
}

} // namespace

FuseMount::~FuseMount()
{
    unmount();
}

std::optional<QString> FuseMount::mount(const QString& mountPoint, fuse_operations operations, void* owner, Names names)
{
    unmount();
    // Without it the thread could not be ended.
    stopEvent = ::eventfd(0, EFD_CLOEXEC);
    if (stopEvent < 0)
        return failure(mountPoint, qt_error_string(errno));
    auto problem = attach(mountPoint, operations, owner, names);
    if (problem) {
        ::close(stopEvent);
        return problem;
    }
    const int session = ::fuse_session_fd(::fuse_get_session(instance));
    // A client that is killed takes its request back, which a reading that was told of it must not wait for.
    ::fcntl(session, F_SETFL, ::fcntl(session, F_GETFL) | O_NONBLOCK);
    thread = threadWithoutSignals([this, session] { serve(session); });
    return std::nullopt;
}

std::optional<QString> FuseMount::attach(const QString& mountPoint, fuse_operations operations, void* owner,
                                         Names names)
{
    operations.init = names == Names::Removable ? configure<Names::Removable> : configure<Names::Permanent>;
    std::string program = "virtual-device";
    std::string option = "-ofsname=virtual-device";
    std::array<char*, 2> words{program.data(), option.data()};
    fuse_args arguments{static_cast<int>(words.size()), words.data(), 0};
    instance = ::fuse_new(&arguments, &operations, sizeof operations, owner);
    ::fuse_opt_free_args(&arguments);
    if (instance == nullptr)
        return failure(mountPoint, QStringLiteral("libfuse refuses to start"));
    errno = 0;
    if (::fuse_mount(instance, mountPoint.toLocal8Bit().constData()) != 0) {
        const QString reason = errno == 0 ? QStringLiteral("see the line above") : qt_error_string(errno);
        ::fuse_destroy(instance);
        instance = nullptr;
        return failure(mountPoint, reason);
    }
    return std::nullopt;
}

void FuseMount::unmount()
{
    if (instance == nullptr)
        return;
    ::eventfd_write(stopEvent, 1);
    thread.join();
    ::close(stopEvent);
    ::fuse_unmount(instance);
    ::fuse_destroy(instance);
    instance = nullptr;
}

void FuseMount::serve(int session)
{
    // What the kernel tells late, above all that files were closed, is heard before the end.
    constexpr int mostAtTheEnd = 1000;
    auto* const handle = ::fuse_get_session(instance);
    fuse_buf buffer{};
    std::array<pollfd, 2> waits{pollfd{session, POLLIN, 0}, pollfd{stopEvent, POLLIN, 0}};
    for (int remaining = mostAtTheEnd; remaining > 0 && ::fuse_session_exited(handle) == 0;) {
        if (::poll(waits.data(), waits.size(), -1) < 0)
            continue;
        const bool isEnding = waits[1].revents != 0;
        if (isEnding && (--remaining == 0 || waits[0].revents == 0))
            break;
        const int length = ::fuse_session_receive_buf(handle, &buffer);
        if (length == -EINTR || length == -EAGAIN)
            continue;
        // Nothing more to read: somebody outside has unmounted us.
        if (length <= 0)
            break;
        ::fuse_session_process_buf(handle, &buffer);
    }
    std::free(buffer.mem); // the library's own malloc
}

} // namespace VirtualDevice
