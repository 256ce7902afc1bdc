// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QObject>
#include <QTimer>

namespace VirtualDevice
{

class Registry;
class Screen;

/// The two lines of the device that reach the program as keys again and again while their signal is present: the
/// trigger input (F10, control `trigger.period`) and the radio's line (F11, control `radioline.period`). A period is
/// the time from one key press to the next in milliseconds; 0 is a silent line.
///
/// Threads: lives in the thread of its screen.
class SignalLines : public QObject
{
    Q_OBJECT

public:
    SignalLines(Registry& registry, Screen& screen, QObject* parent = nullptr);

private:
    void add(QTimer& timer, const QString& control, const QString& key);

    Registry& registry;
    Screen& screen;
    QTimer trigger;
    QTimer radio;
};

} // namespace VirtualDevice
