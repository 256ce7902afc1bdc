// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QString>
#include <QTest>

#include <fcntl.h>
#include <sys/ioctl.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <utility>

/// Ends a test function early where the machine itself has no FUSE for this user.
#define REQUIRE_FUSE()                                                                                                 \
    do {                                                                                                               \
        const int fuseProbe = ::open("/dev/fuse", O_RDWR | O_CLOEXEC);                                                 \
        if (fuseProbe < 0)                                                                                             \
            QSKIP("/dev/fuse cannot be opened by this user");                                                          \
        ::close(fuseProbe);                                                                                            \
    } while (false)

namespace TestSupport
{

/// A file as a program opens it, without the layers of a file class between.
class RawFile
{
public:
    RawFile(const QString& path, int flags, mode_t mode = 0600)
        : descriptor(::open(qPrintable(path), flags | O_CLOEXEC, mode)), reason(descriptor < 0 ? errno : 0)
    {
    }
    ~RawFile()
    {
        if (descriptor >= 0)
            ::close(descriptor);
    }
    RawFile(const RawFile&) = delete;
    RawFile& operator=(const RawFile&) = delete;

    [[nodiscard]] int handle() const { return descriptor; }
    /// The errno of the last call that failed, 0 when it went well.
    [[nodiscard]] int error() const { return reason; }

    QByteArray read(qsizetype size)
    {
        QByteArray bytes(size, 0);
        const auto length = ::read(descriptor, bytes.data(), static_cast<std::size_t>(size));
        note(length);
        return bytes.left(length < 0 ? 0 : length);
    }
    int write(const QByteArray& bytes)
    {
        return note(::write(descriptor, bytes.constData(), static_cast<std::size_t>(bytes.size())));
    }
    void rewind() { ::lseek(descriptor, 0, SEEK_SET); }

private:
    int note(ssize_t result)
    {
        reason = result < 0 ? errno : 0;
        return reason;
    }

    int descriptor;
    int reason;
};

/// The errno of an ioctl, 0 when it went well; -1 when its process died. Another process asks: one that serves the file
/// system itself could not even die of a fault in it, as its own question would wait for the answer.
inline int errorOfRequest(const RawFile& file, unsigned long request)
{
    const pid_t asking = ::fork();
    if (asking == 0) {
        // Nor could it while anybody else holds its end of the file system.
        const auto handle = static_cast<unsigned>(file.handle());
        ::close_range(handle + 1, ~0U, 0);
        ::close_range(0, handle - 1, 0);
        std::array<char, 64> answer{};
        ::_exit(::ioctl(file.handle(), request, answer.data()) == 0 ? 0 : errno);
    }
    int status = 0;
    return ::waitpid(asking, &status, 0) == asking && WIFEXITED(status) ? WEXITSTATUS(status) : -1;
}

} // namespace TestSupport
