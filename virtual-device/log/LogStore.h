// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QDateTime>
#include <QList>
#include <QObject>
#include <QString>

#include <deque>
#include <memory>
#include <optional>

class QSocketNotifier;

namespace VirtualDevice
{

/// One message as it arrived at the device's log service.
struct LogLine
{
    qint64 number = 0;  ///< 1 for the first message of the device, without gaps
    QDateTime received; ///< the host's clock, UTC
    int priority = 5;   ///< 0 (emergency) to 7 (debug)
    int facility = 1;   ///< 0 = kernel, 1 = user
    QString identity;   ///< who logged; empty when the message names nobody
    QString text;       ///< Latin-1 as the program sends it, control characters included
};

/// The log service of the device: owns the datagram socket that the sandbox sees as `/dev/log` and keeps what arrives.
///
/// Wire format, one message a datagram: "<PRI>Mmm dd hh:mm:ss IDENTITY: TEXT" with PRI = facility * 8 + priority. The
/// time stamp and the identity may be missing; a datagram without PRI counts as user.notice and is kept whole.
///
/// Threads: lives in the thread that makes it, which must run an event loop.
class LogStore : public QObject
{
    Q_OBJECT

public:
    static constexpr std::size_t capacity = 10'000;
    static constexpr qsizetype largestText = 32 * 1024 * 1024;

    explicit LogStore(QObject* parent = nullptr);
    ~LogStore() override;

    /// Binds the socket, replacing what is left at `path`. Returns what went wrong.
    [[nodiscard]] std::optional<QString> open(const QString& path);
    /// Closes the socket and removes it; what was kept stays readable.
    void close();

    /// A stalled service keeps its socket but reads nothing, so that its senders meet a full queue.
    void setStalled(bool stalled);

    /// The newest messages, oldest first, at most `capacity` and together at most `largestText` characters.
    [[nodiscard]] QList<LogLine> lines() const;
    /// Those of them that came after the message `number`.
    [[nodiscard]] QList<LogLine> linesAfter(qint64 number) const;

    [[nodiscard]] static LogLine parsed(const QByteArray& datagram);

signals:
    void lineReceived(const VirtualDevice::LogLine& line);

private:
    void keep(const LogLine& line);
    void receive();

    QString socketPath;
    int descriptor = -1;
    bool isStalled = false;
    std::unique_ptr<QSocketNotifier> notifier;
    std::deque<LogLine> kept;
    qsizetype keptText = 0; ///< characters
    qint64 received = 0;
};

} // namespace VirtualDevice

Q_DECLARE_METATYPE(VirtualDevice::LogLine)
