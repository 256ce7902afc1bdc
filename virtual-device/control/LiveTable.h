// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QObject>
#include <QTimer>

namespace VirtualDevice
{

class RegionWatch;

/// The colours of the window's regions as a table on a terminal, redrawn in place when one changes, at most ten times a
/// second.
///
/// Threads: lives in the thread of its regions.
class LiveTable : public QObject
{
    Q_OBJECT

public:
    /// Writes to the file descriptor, which must be a terminal.
    LiveTable(RegionWatch& watched, int terminal, QObject* parent = nullptr);
    ~LiveTable() override;

    /// The table's lines with the escape sequences that colour them.
    [[nodiscard]] QByteArray lines() const;

private:
    void draw();

    RegionWatch& regions;
    int descriptor;
    QTimer pause;
    int drawnLines = 0;
};

} // namespace VirtualDevice
