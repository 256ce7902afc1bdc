// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/radio/LineDirection.h"
#include "virtual-device/radio/PtyLine.h"
#include "virtual-device/radio/RadioFirmware.h"
#include "virtual-device/radio/RadioFrameReader.h"
#include "virtual-device/radio/RadioMonitor.h"

#include <QObject>

#include <atomic>

namespace VirtualDevice
{

class Registry;

/// The radio microcontroller behind the program's serial line: a pseudo-terminal, a line of 115200 baud that can be
/// disturbed, a monitor of the program's manners, and the firmware. Controls and reports are the `radio.` rows of the
/// control table.
///
/// Lives in the thread that makes it, which must run an event loop; `reset()` may be called from any thread.
class RadioModel : public QObject
{
    Q_OBJECT

public:
    explicit RadioModel(Registry& registry, QObject* parent = nullptr);

    /// The terminal that the sandbox binds as the program's serial port; empty while the line is hung up. A hang-up is
    /// final for whoever has it open: when the line returns it has another path, for the next program.
    [[nodiscard]] QString devicePath() const { return line.devicePath(); }

public slots:
    /// The reset line has been pulsed. Any thread; in force before the first byte that the caller writes to the line
    /// afterwards, so connect it directly to whatever sees the pulse.
    void reset();

signals:
    /// The program has broken the rules of the line (also `radio.violations` and `radio.last_violation`).
    void violated(const QString& what);

private:
    void takeResets();
    void received(const QByteArray& bytes);
    void arrivedAtRadio(const QByteArray& bytes);
    void arrivedAtProgram(const QByteArray& bytes);
    void sendMessage(const QByteArray& message);
    void report(const QString& what);
    void controlChanged(const QString& name);
    void adoptLineState();
    void adoptSeed();
    void sendRaw();
    [[nodiscard]] bool connected() const;

    Registry& registry;
    PtyLine line;
    LineDirection toRadio;
    LineDirection toProgram;
    RadioFirmware firmware;
    RadioMonitor monitor;
    RadioFrameReader reader;
    std::atomic<quint32> pulses = 0;
};

} // namespace VirtualDevice
