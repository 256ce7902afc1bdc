// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/control/LiveTable.h"

#include "virtual-device/screen/RegionWatch.h"

#include <QSocketNotifier>

#include <fcntl.h>
#include <poll.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>

namespace VirtualDevice
{

namespace
{

constexpr std::chrono::milliseconds shortestPause(100);
constexpr int nameWidth = 20;
constexpr int colourWidth = 7;
constexpr int columns = 2;
constexpr qsizetype largestPiece = 128;

/// In the order of `RegionColour`.
constexpr std::array<const char*, 5> escapes{"\x1b[2m", "\x1b[30;42m", "\x1b[97;41m", "\x1b[30;47m", "\x1b[0m"};

QByteArray cell(const QString& name, RegionColour colour)
{
    return name.leftJustified(nameWidth).toUtf8() + escapes.at(static_cast<std::size_t>(colour)) +
           RegionMap::word(colour).leftJustified(colourWidth).toUtf8() + "\x1b[0m  ";
}

/// The terminal by a descriptor that never blocks. The one that we were given stays as it is: the mode belongs to the
/// terminal's other users as well, such as the shell.
int openedAgain(int terminal)
{
    const auto name = "/proc/self/fd/" + QByteArray::number(terminal);
    const int own = ::open(name.constData(), O_WRONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC);
    // Somebody else's terminal (su, sudo) cannot be opened; in small pieces it hardly ever blocks.
    return own >= 0 ? own : ::fcntl(terminal, F_DUPFD_CLOEXEC, 0);
}

/// Also one that has gone: writing to it tells.
bool takesSomething(int descriptor)
{
    pollfd request{descriptor, POLLOUT, 0};
    return ::poll(&request, 1, 0) == 1;
}

} // namespace

LiveTable::LiveTable(RegionWatch& watched, int terminal, const QByteArray& heading, QObject* parent)
    : QObject(parent),
      regions(watched),
      descriptor(openedAgain(terminal)),
      writable(std::make_unique<QSocketNotifier>(descriptor, QSocketNotifier::Write)),
      pending(heading)
{
    connect(writable.get(), &QSocketNotifier::activated, this, &LiveTable::flush);
    pause.setSingleShot(true);
    pause.setInterval(shortestPause);
    connect(&pause, &QTimer::timeout, this, &LiveTable::draw);
    connect(&regions, &RegionWatch::changed, this, [this] {
        if (!pause.isActive())
            pause.start();
    });
    draw();
}

LiveTable::~LiveTable()
{
    if (pause.isActive())
        draw();
    writable.reset();
    ::close(descriptor);
}

QByteArray LiveTable::lines() const
{
    const QStringList names = RegionMap::names();
    const auto rows = (names.size() + columns - 1) / columns;
    QByteArray text;
    for (qsizetype row = 0; row < rows; ++row) {
        for (qsizetype index = row; index < names.size(); index += rows)
            text += cell(names.at(index), regions.colour(names.at(index)));
        text += "\x1b[K\n";
    }
    return text;
}

void LiveTable::draw()
{
    isStale = drawnLines > 0 && !pending.isEmpty();
    if (isStale)
        return;
    if (drawnLines > 0)
        pending = "\x1b[" + QByteArray::number(drawnLines) + "A\r";
    const QByteArray table = lines();
    drawnLines = static_cast<int>(table.count('\n'));
    pending += table;
    flush();
}

void LiveTable::flush()
{
    while (!pending.isEmpty() && takesSomething(descriptor)) {
        const auto size = std::min(pending.size(), largestPiece);
        const auto count = ::write(descriptor, pending.constData(), static_cast<size_t>(size));
        if (count < 0 && errno == EAGAIN) { // room, but less than a line end needs
            writable->setEnabled(false);
            QTimer::singleShot(shortestPause, this, &LiveTable::flush);
            return;
        }
        if (count < 0)
            pending.clear(); // nobody is there any more
        else
            pending.remove(0, count);
    }
    writable->setEnabled(!pending.isEmpty());
    if (pending.isEmpty() && isStale)
        draw();
}

} // namespace VirtualDevice
