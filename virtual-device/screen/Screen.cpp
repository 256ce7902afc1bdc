// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/screen/Screen.h"

#include "virtual-device/screen/KeyTable.h"
#include "virtual-device/screen/RfbConnection.h"

#include <QBuffer>
#include <QTimer>

namespace VirtualDevice
{

Screen::Screen(QObject* parent) : QObject(parent), connection(new RfbConnection)
{
    connection->moveToThread(&thread);
    connect(&thread, &QThread::finished, connection, &QObject::deleteLater);
    connect(connection, &RfbConnection::opened, this, [this] {
        connected = true;
        emit opened();
    });
    connect(connection, &RfbConnection::updated, this, &Screen::updated);
    connect(connection, &RfbConnection::closed, this, [this] {
        connected = false;
        emit closed();
    });
    thread.setObjectName("screen");
    thread.start();
}

Screen::~Screen()
{
    disconnect(connection, nullptr, this, nullptr);
    connection->stop();
    thread.quit();
    thread.wait();
}

void Screen::open(const QString& socketPath)
{
    // By name, here and below: Qt copies the arguments. What a functor captures crosses between the threads behind
    // locks that the thread sanitizer does not see.
    QMetaObject::invokeMethod(connection, "open", Q_ARG(QString, socketPath));
}

QImage Screen::picture() const
{
    return connection->picture();
}

QByteArray Screen::png() const
{
    QByteArray bytes;
    QBuffer buffer(&bytes);
    buffer.open(QIODevice::WriteOnly);
    return picture().save(&buffer, "PNG") ? bytes : QByteArray();
}

bool Screen::writePng(const QString& path) const
{
    return picture().save(path, "PNG");
}

bool Screen::press(const QString& key)
{
    return send(key, true);
}

bool Screen::release(const QString& key)
{
    return send(key, false);
}

bool Screen::hold(const QString& key, std::chrono::milliseconds duration, std::function<void()> released)
{
    if (!press(key))
        return false;
    QTimer::singleShot(duration, Qt::PreciseTimer, this, [this, key, done = std::move(released)] {
        static_cast<void>(release(key));
        if (done)
            done();
    });
    return true;
}

bool Screen::send(const QString& key, bool pressed)
{
    const auto symbol = KeyTable::symbol(key);
    if (!symbol || !connected)
        return false;
    QMetaObject::invokeMethod(connection, "sendKey", Q_ARG(quint32, *symbol), Q_ARG(bool, pressed));
    return true;
}

} // namespace VirtualDevice
