// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QList>
#include <QObject>
#include <QString>

#include <memory>
#include <optional>

class QSocketNotifier;

namespace VirtualDevice
{

/// The Unix socket (SOCK_SEQPACKET) that the sandbox sees as `/dev/dsplink`: one program at a time, packet by packet.
///
/// A second program is turned away while the first is there. What the program does not take is kept, up to `capacity`
/// packets and as many answers again, then `send` refuses. Lives in the thread of its owner, which must run an event
/// loop.
class DspSocket : public QObject
{
    Q_OBJECT

public:
    static constexpr qsizetype capacity = 64;

    explicit DspSocket(QObject* parent = nullptr);
    ~DspSocket() override;

    /// Returns what went wrong.
    [[nodiscard]] std::optional<QString> listen(const QString& path);
    /// Leaves the socket's file without anybody behind it: whoever connects is refused.
    [[nodiscard]] std::optional<QString> refuse(const QString& path);
    /// Takes the file away. The three of them end a connection that stands.
    void close();
    /// Ends the connection; the program may connect again.
    void hangUp();

    [[nodiscard]] bool isConnected() const { return connection >= 0; }
    enum class Urgency
    {
        Data,
        Answer ///< finds room where data finds none: the program waits for it
    };
    /// False when nobody is connected or too much is waiting.
    bool send(const QByteArray& packet, Urgency urgency);

signals:
    void connected();
    void disconnected();
    void received(const QByteArray& packet);

private:
    [[nodiscard]] std::optional<QString> bind(const QString& path);
    void accept();
    void adopt(int descriptor);
    void readAvailable();
    [[nodiscard]] bool readOne();
    void flush();
    void release();

    QString file;
    int listener = -1;
    int connection = -1;
    std::unique_ptr<QSocketNotifier> acceptNotifier;
    std::unique_ptr<QSocketNotifier> readNotifier;
    std::unique_ptr<QSocketNotifier> writeNotifier;
    QList<QByteArray> waiting;
};

} // namespace VirtualDevice
