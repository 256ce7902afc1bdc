// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/screen/RegionMap.h"

#include <QHash>
#include <QObject>
#include <QString>

namespace VirtualDevice
{

class Screen;

/// The colour of every region of the window, kept up with the picture. All are `None` while there is no picture.
///
/// Threads: lives in the thread of its screen.
class RegionWatch : public QObject
{
    Q_OBJECT

public:
    explicit RegionWatch(Screen& watched, QObject* parent = nullptr);

    /// Names that are not in `RegionMap` have the colour `None`.
    [[nodiscard]] RegionColour colour(const QString& region) const;

signals:
    void changed(const QString& region, VirtualDevice::RegionColour colour);

private:
    void look(const QRect& area);

    Screen& screen;
    QHash<QString, RegionColour> colours;
};

} // namespace VirtualDevice
