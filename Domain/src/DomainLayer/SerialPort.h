// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QIODevice>
#include <QString>

#include <memory>

namespace Domain
{

/// A Linux tty as a byte stream: raw, 8 data bits, no flow control, at a fixed speed.
///
/// Threads: any may open, close and destroy it, one at a time and none during a read or a write. While it is open with
/// read access, a thread of its own moves what arrives into a receive buffer, at most 46 bytes at a time, and emits
/// `readyRead()` once a chunk: receivers on other threads get it queued. One thread reads; any may write, several at
/// once, too.
///
/// Reading never blocks: it takes from the receive buffer. The buffer holds about 256 KiB, 20 seconds of a line at
/// 115200 baud; when its reader is further behind than that, bytes wait with the driver.
/// A write is one system call. It does not block for longer than half a second, and what the driver took of it counts
/// as all.
///
/// Errors: logged; `open` returns false, `write` -1. A line that hangs up is silent. A failed `open` leaves the device
/// marked open, and writes to it fail.
class SerialPort : public QIODevice
{
    Q_OBJECT

public:
    /// Speed codes of the kernel's terminal interface, used as they are.
    enum Baud : unsigned int
    {
        Baud115200 = 4098
    };

    SerialPort(const QString& portName, Baud baud, QObject* parent = nullptr);
    ~SerialPort() override;

    /// Changes the name that is kept, not the device: that is chosen at construction.
    void setPortName(const QString& portName);

    [[nodiscard]] bool isSequential() const override;
    bool open(OpenMode mode) override;
    /// Serves the calling thread's events, input excluded, until the reading thread has stopped: about half a second at
    /// the most.
    void close() override;
    [[nodiscard]] qint64 bytesAvailable() const override;
    [[nodiscard]] bool canReadLine() const override;

public slots:
    /// The read loop; runs on the reading thread until `close`.
    void pollPort();

protected:
    /// -1 while no read loop is active.
    qint64 readData(char* destination, qint64 maximum) override;
    qint64 writeData(const char* bytes, qint64 count) override;

private:
    class PrivateData;

    std::unique_ptr<PrivateData> data;
};

} // namespace Domain
