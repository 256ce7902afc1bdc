// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/control/LiveTable.h"

#include "virtual-device/screen/RegionWatch.h"

#include <unistd.h>

#include <array>

namespace VirtualDevice
{

namespace
{

constexpr std::chrono::milliseconds shortestPause(100);
constexpr int nameWidth = 20;
constexpr int colourWidth = 7;
constexpr int columns = 2;

/// In the order of `RegionColour`.
constexpr std::array<const char*, 5> escapes{"\x1b[2m", "\x1b[30;42m", "\x1b[97;41m", "\x1b[30;47m", "\x1b[0m"};

QByteArray cell(const QString& name, RegionColour colour)
{
    return name.leftJustified(nameWidth).toUtf8() + escapes.at(static_cast<std::size_t>(colour)) +
           RegionMap::word(colour).leftJustified(colourWidth).toUtf8() + "\x1b[0m  ";
}

void writeAll(int descriptor, const QByteArray& bytes)
{
    for (qsizetype written = 0; written < bytes.size();) {
        const auto count =
            ::write(descriptor, bytes.constData() + written, static_cast<size_t>(bytes.size() - written));
        if (count <= 0)
            return;
        written += count;
    }
}

} // namespace

LiveTable::LiveTable(RegionWatch& watched, int terminal, QObject* parent)
    : QObject(parent), regions(watched), descriptor(terminal)
{
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
    const QByteArray table = lines();
    QByteArray bytes;
    if (drawnLines > 0)
        bytes = "\x1b[" + QByteArray::number(drawnLines) + "A\r";
    drawnLines = static_cast<int>(table.count('\n'));
    writeAll(descriptor, bytes + table);
}

} // namespace VirtualDevice
