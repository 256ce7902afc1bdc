// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QImage>
#include <QObject>
#include <QRect>
#include <QString>
#include <QThread>

#include <chrono>
#include <functional>

namespace VirtualDevice
{

class RfbConnection;

/// The device's screen and keypad: a client of the program's VNC server that keeps the picture (240 by 320 pixels,
/// `QImage::Format_RGB32`) and sends key events.
///
/// Connects to a Unix socket, which crosses network namespaces, and again whenever the connection ends, so that it may
/// be told its socket before the program stands. Keys that are pressed while nobody is connected are refused.
///
/// Threads: all operations and signals belong to the thread that makes it; the conversation itself runs on a thread
/// of its own, so that a program that is stuck in the middle of an answer holds up nothing else of the virtual device.
class Screen : public QObject
{
    Q_OBJECT

public:
    explicit Screen(QObject* parent = nullptr);
    ~Screen() override;

    void open(const QString& socketPath);

    [[nodiscard]] bool isConnected() const { return connected; }
    /// The last complete picture; null while there is none.
    [[nodiscard]] QImage picture() const;
    /// The picture as a PNG file; empty while there is none.
    [[nodiscard]] QByteArray png() const;
    [[nodiscard]] bool writePng(const QString& path) const;

    /// Names as in `KeyTable`. False when the name is unknown or nobody is connected.
    [[nodiscard]] bool press(const QString& key);
    [[nodiscard]] bool release(const QString& key);
    /// Presses now, releases later and then calls `released`, also when whoever asked for it has gone.
    [[nodiscard]] bool hold(const QString& key, std::chrono::milliseconds duration,
                            std::function<void()> released = {});

signals:
    void opened();
    /// A complete new picture, in which only `area` differs from the one before.
    void updated(const QRect& area);
    void closed();

private:
    [[nodiscard]] bool send(const QString& key, bool pressed);

    RfbConnection* connection;
    QThread thread;
    bool connected = false;
};

} // namespace VirtualDevice
