// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/radio/PtyLine.h"

#include "utilities/Debug.h"

#include <QSocketNotifier>

#include <fcntl.h>
#include <termios.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdlib>

namespace VirtualDevice
{

namespace
{

void closeEnd(int& descriptor)
{
    if (descriptor >= 0)
        ::close(descriptor);
    descriptor = -1;
}

bool setRaw(int descriptor)
{
    termios attributes{};
    if (::tcgetattr(descriptor, &attributes) != 0)
        return false;
    ::cfmakeraw(&attributes);
    return ::tcsetattr(descriptor, TCSANOW, &attributes) == 0;
}

} // namespace

PtyLine::PtyLine(QObject* parent) : QObject(parent) {}

PtyLine::~PtyLine()
{
    hangUp();
}

bool PtyLine::open()
{
    hangUp();
    if (!openEnds()) {
        Utilities::Debug::warningMessage(QStringLiteral(__FILE__), __LINE__,
                                         QStringLiteral("Cannot make a terminal for the radio's line: %m"));
        hangUp();
        return false;
    }
    notifier = std::make_unique<QSocketNotifier>(master, QSocketNotifier::Read);
    connect(notifier.get(), &QSocketNotifier::activated, this, &PtyLine::readAvailable);
    return true;
}

bool PtyLine::openEnds()
{
    master = ::posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC | O_NONBLOCK);
    if (master < 0 || ::grantpt(master) != 0 || ::unlockpt(master) != 0)
        return false;
    std::array<char, 64> name{};
    if (::ptsname_r(master, name.data(), name.size()) != 0)
        return false;
    slave = ::open(name.data(), O_RDWR | O_NOCTTY | O_CLOEXEC);
    if (slave < 0 || !setRaw(slave))
        return false;
    path = QString::fromLatin1(name.data());
    return true;
}

void PtyLine::hangUp()
{
    // The notifier may be the sender of the very call that led here.
    if (notifier) {
        notifier->setEnabled(false);
        notifier.release()->deleteLater();
    }
    path.clear();
    closeEnd(slave);
    closeEnd(master);
}

qsizetype PtyLine::write(QByteArrayView bytes)
{
    if (!isOpen())
        return 0;
    const auto written = ::write(master, bytes.data(), static_cast<std::size_t>(bytes.size()));
    return written < 0 ? 0 : written;
}

void PtyLine::readAvailable()
{
    std::array<char, 4096> chunk{};
    const auto count = ::read(master, chunk.data(), chunk.size());
    if (count > 0)
        emit received(QByteArray(chunk.data(), count));
}

} // namespace VirtualDevice
