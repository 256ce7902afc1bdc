// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QObject>
#include <QString>
#include <QTcpServer>

#include <optional>

namespace VirtualDevice
{

/// Offers the sandbox's screen to a person's VNC viewer: the program's own server asks no password and listens on every
/// address of a network that nobody else is in; this is its only way out, and on 127.0.0.1 only.
///
/// Threads: lives in the main thread.
class VncRelay : public QObject
{
    Q_OBJECT

public:
    explicit VncRelay(QObject* parent = nullptr);

    /// Relays `port` (0: one that is free) to the Unix socket at `path`. Returns what went wrong.
    [[nodiscard]] std::optional<QString> listen(quint16 port, const QString& path);
    [[nodiscard]] QString address() const;

private:
    void accept();

    QTcpServer server;
    QString socketPath;
};

} // namespace VirtualDevice
