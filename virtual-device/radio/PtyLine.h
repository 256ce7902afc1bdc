// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QObject>
#include <QString>

#include <memory>

class QSocketNotifier;

namespace VirtualDevice
{

/// The serial line as a pseudo-terminal. The program opens the slave; this object keeps both ends open, so that a
/// program that ends or starts again is no hang-up, and has set the line raw before anybody opens it: with the echo of
/// a fresh terminal the microcontroller would hear itself.
///
/// It reads whatever the program writes at once, so that the program's writes never block. What the program does not
/// read in time is lost, as in a UART. Lives in the thread of its owner, which must run an event loop.
class PtyLine : public QObject
{
    Q_OBJECT

public:
    explicit PtyLine(QObject* parent = nullptr);
    ~PtyLine() override;

    /// A new pseudo-terminal. False with a warning in the log when the system has none left.
    bool open();
    /// Closes both ends: whoever has the slave open sees the line hang up, for ever. The next `open()` makes another
    /// terminal, for the next program.
    void hangUp();
    [[nodiscard]] bool isOpen() const { return master >= 0; }
    /// What the program opens; empty while there is none.
    [[nodiscard]] QString devicePath() const { return path; }

    /// Gives the bytes to the program; returns how many fitted.
    qsizetype write(QByteArrayView bytes);

signals:
    void received(const QByteArray& bytes);

private:
    [[nodiscard]] bool openEnds();
    void readAvailable();

    int master = -1;
    int slave = -1;
    QString path;
    std::unique_ptr<QSocketNotifier> notifier;
};

} // namespace VirtualDevice
