// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QIODevice>
#include <QString>

#include <memory>

namespace Domain
{

/// The DSP as a byte stream. Opening loads the firmware image, starts the DSP and connects two message queues through
/// DSPLink: the firmware sends to "GPPMSGQ1", the port to its "DSPMSGQ0". One `write` is one message to the DSP; one
/// read returns at most one message of the DSP. Reading is by line only: use
/// `readLine(port.maxBytesAvailable() + 1)`, where Qt keeps the one byte for itself; `read` always fails.
///
/// Message (little-endian, one buffer of the shared pool):
///
/// | Offset | Size | Field                                                                               |
/// |--------|------|-------------------------------------------------------------------------------------|
/// | 0      | 20   | header of DSPLink; message id at 18: 65 to the DSP, 100 from it                     |
/// | 20     | 4    | message type; 0x1100B, an acknowledgement, overtakes everything that waits          |
/// | 24     | 4    | payload length, unsigned; checked in 64 bits and against the buffer that arrived    |
/// | 28     | n    | payload, at most 2020 bytes                                                         |
///
/// Reader and writer see the data from offset 20 on, type and length words included: 2028 bytes at most. A longer
/// write is cut.
///
/// Threads: made, opened, closed and destroyed in one thread; `write` from any, `readLine` and `bytesAvailable` from
/// one reader's. A thread of the port's own fetches messages; `readyRead()` is emitted there, once a message.
///
/// Errors: a DSPLink call that fails while opening is logged as fatal and the sequence goes on, so the port is open
/// whatever the DSP says; without a DSP every write then fails (-1, logged) and nothing ever arrives. Locating
/// the DSP's queue waits as long as running firmware takes to make it. What has not been read when the port closes is
/// forgotten when it opens again.
class DspPort : public QIODevice
{
    Q_OBJECT

public:
    explicit DspPort(const QString& dspExecutablePath, QObject* parent = nullptr);
    ~DspPort() override;
    Q_DISABLE_COPY_MOVE(DspPort)

    [[nodiscard]] bool isSequential() const override;
    bool open(OpenMode mode) override;
    void close() override;
    /// Size of the message that the next read returns.
    [[nodiscard]] qint64 bytesAvailable() const override;
    [[nodiscard]] bool canReadLine() const override;
    /// The largest data part of one message.
    [[nodiscard]] qint64 maxBytesAvailable() const;

public slots:
    /// The read loop; runs on the port's own thread from open to close.
    void pollPort();

protected:
    qint64 readData(char* data, qint64 maxSize) override;
    qint64 readLineData(char* data, qint64 maxSize) override;
    qint64 writeData(const char* data, qint64 size) override;

private:
    struct PrivateData;
    std::unique_ptr<PrivateData> privateData;
};

} // namespace Domain
