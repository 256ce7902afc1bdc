// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "Domain/src/DomainLayer/SerialPort.h"
#include "tests/Domain/Pty.h"

#include <QTest>

#include <pthread.h>

#include <atomic>
#include <chrono>
#include <functional>
#include <thread>

/// What the tests of a serial port on a real line need.
namespace TestSupport
{

/// Waits without serving events.
inline bool waitFor(const std::function<bool()>& condition, int limitMs = 20000)
{
    const QDeadlineTimer deadline(limitMs);
    while (!condition()) {
        if (deadline.hasExpired())
            return false;
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    return true;
}

class ClosedPort : public Domain::SerialPort
{
public:
    explicit ClosedPort(const Pty& pty) : Domain::SerialPort(pty.name(), Baud115200) {}
};

class OpenedPort : public ClosedPort
{
public:
    explicit OpenedPort(const Pty& pty, OpenMode mode = ReadWrite) : ClosedPort(pty)
    {
        if (!open(mode))
            qFatal("The line cannot be opened");
    }
};

inline QByteArray numberedBytes(int count)
{
    QByteArray bytes(count, '\0');
    for (int index = 0; index < count; ++index)
        bytes[index] = static_cast<char>(index * 7 + index / 256);
    return bytes;
}

/// Collects what a port gives, until nothing is missing.
inline QByteArray readAll(Domain::SerialPort& port, qsizetype count)
{
    QByteArray bytes;
    (void)QTest::qWaitFor(
        [&] {
            bytes += port.readAll();
            return bytes.size() >= count;
        },
        20000);
    return bytes;
}

/// Lets the port's reading thread run something, and knows that thread. Made before the port is opened.
class ReadingThread
{
public:
    ReadingThread(
        Domain::SerialPort& port, std::function<void()> onChunk = [] {})
    {
        QObject::connect(
            &port, &QIODevice::readyRead, &port,
            [this, work = std::move(onChunk)] {
                handle = ::pthread_self();
                object = QThread::currentThread();
                work();
                ++chunks;
            },
            Qt::DirectConnection);
    }

    std::atomic<pthread_t> handle{};
    std::atomic<QThread*> object = nullptr;
    std::atomic<int> chunks = 0;
};

} // namespace TestSupport
