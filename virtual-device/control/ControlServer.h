// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/control/ControlContext.h"

#include <QLocalServer>
#include <QObject>
#include <QString>

#include <optional>

namespace VirtualDevice
{

/// The door of the virtual device for tests, scripts and `virtual-device ctl`: a Unix socket of mode 0600 that speaks
/// JSON-RPC 2.0, one message a line (`JsonRpc`), with any number of clients at once.
///
/// | method       | parameters                               | result                                                |
/// |--------------|------------------------------------------|-------------------------------------------------------|
/// | `list`       |                                          | array of the controls with value and what is allowed  |
/// | `get`        | `name`                                   | the value                                             |
/// | `set`        | `name`, `value`                          | the value                                             |
/// | `press`      | `key`                                    | true; the key stays down                              |
/// | `release`    | `key`                                    | true                                                  |
/// | `hold`       | `key`, `milliseconds` (1..600000)        | true, once the key is up again                        |
/// | `screenshot` |                                          | a PNG file in base 64                                 |
/// | `regions`    |                                          | array of name, colour and rectangle                   |
/// | `log`        | `after` (number of a line, 0)            | array of the lines that came after it                 |
/// | `wait`       | one condition, `within` (seconds, 10)    | what came true                                        |
/// | `events`     | `kinds` (array of words, all)            | true; from then on `event` notifications              |
///
/// Conditions of `wait`: `region` and `colour`, or `control` and `value`, or `log` (a text that a line contains) with
/// `after` (0: lines that are there already count). The answer is pushed the moment the condition holds.
/// Kinds of events: "control", "log", "region", "monitor"; each `event` notification carries its `kind`.
///
/// A line of more than 64 KiB, a malformed one, an unknown name or a value out of range is answered with an error that
/// says what is allowed, and changes nothing. A client that does not read what it subscribed to is dropped.
///
/// Threads: lives in the thread that makes it, which must run an event loop.
class ControlServer : public QObject
{
    Q_OBJECT

public:
    explicit ControlServer(const ControlContext& reached, QObject* parent = nullptr);
    ~ControlServer() override;

    /// Replaces a socket that an earlier device left at `path`. Returns what went wrong.
    [[nodiscard]] std::optional<QString> listen(const QString& path);
    /// Removes the socket; whoever is there already stays.
    void stopListening();
    /// Hangs up on every client and removes the socket.
    void close();
    [[nodiscard]] QString path() const { return server.fullServerName(); }

private:
    void accept();

    ControlContext context;
    QLocalServer server;
};

} // namespace VirtualDevice
