// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/radio/RadioFrameReader.h"

#include <QByteArrayView>
#include <QObject>

#include <chrono>

namespace VirtualDevice
{

/// Listens on the radio's line, at the program's end of it, and says what the program does wrong. It hears the bytes
/// before any damage that the line is told to do, so whatever it reports is the program's own doing:
///
/// - a header or data checksum that is wrong, a wrong end byte, bytes outside a frame, a length over the limit of 100;
/// - an empty message, an unknown command, a command whose length its code does not allow;
/// - a second command while one awaits its acknowledgement. The wait ends with an ACK or NAK of the right length that
///   went to the program, or after `patience`, when the program has given it up.
///
/// Threads: lives in the thread of its RadioModel.
class RadioMonitor : public QObject
{
    Q_OBJECT

public:
    /// The program waits 3 s for an acknowledgement; the rest is for a monitor that read the first command late.
    static constexpr std::chrono::milliseconds patience{1500};

    using QObject::QObject;

    /// What the program has written.
    void programSent(QByteArrayView bytes);
    /// What has reached the program.
    void radioSent(QByteArrayView bytes);
    /// The microcontroller or the program starts afresh.
    void clear();

signals:
    void violated(const QString& what);

private:
    using Clock = std::chrono::steady_clock;

    void examine(const QByteArray& command);
    void track(const QByteArray& command);

    RadioFrameReader fromProgram;
    RadioFrameReader fromRadio;
    bool awaiting = false;
    quint8 awaitingCode = 0;
    Clock::time_point awaitingSince;
};

} // namespace VirtualDevice
