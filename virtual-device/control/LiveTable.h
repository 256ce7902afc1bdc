// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QObject>
#include <QTimer>

#include <memory>

class QSocketNotifier;

namespace VirtualDevice
{

class RegionWatch;

/// The colours of the window's regions as a table on a terminal, redrawn in place when one changes, at most ten times a
/// second. A terminal that takes nothing (Ctrl-S, a stopped pager, a dead connection) holds nobody up: what does not
/// fit waits, and the table is drawn as it is then once the terminal takes something again.
///
/// Threads: lives in the thread of its regions.
class LiveTable : public QObject
{
    Q_OBJECT

public:
    /// Writes to the file descriptor, which must be a terminal: the heading first, as it is, then the table.
    LiveTable(RegionWatch& watched, int terminal, const QByteArray& heading = {}, QObject* parent = nullptr);
    ~LiveTable() override;

    /// The table's lines with the escape sequences that colour them.
    [[nodiscard]] QByteArray lines() const;

private:
    void draw();
    void flush();

    RegionWatch& regions;
    int descriptor; ///< our own
    std::unique_ptr<QSocketNotifier> writable;
    QTimer pause;
    QByteArray pending;
    bool isStale = false; ///< a colour changed while something was pending
    int drawnLines = 0;
};

} // namespace VirtualDevice
