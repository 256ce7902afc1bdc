// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "Domain/src/DomainLayer/DspPort.h"
#include "tests/Domain/DspTestParts.h"

#include <QTest>
#include <QThread>

#include <atomic>
#include <memory>

namespace TestSupport
{

constexpr quint32 dataType = 0x11004;
constexpr quint32 ackType = 0x1100B;
constexpr quint32 nakType = 0x1100C;

inline const QStringList openTexts{QStringLiteral("DspLink: DSP execution started successfully."),
                                   QStringLiteral("DspPort: open complete.")};

/// A port over the host library and a real socket, with its DSP and the log.
struct DspPortFixture
{
    std::unique_ptr<LogCapture> log;
    std::unique_ptr<DspPeer> peer;
    std::unique_ptr<Domain::DspPort> port;
    std::atomic<int> announced = 0;
    std::atomic<QThread*> announcer = nullptr;

    void prepare()
    {
        writeFirmware();
        log = std::make_unique<LogCapture>();
        peer = std::make_unique<DspPeer>();
    }

    void tidyUp()
    {
        peer.reset(); // first: with nothing to wait for the port closes quicker
        port.reset();
        log.reset();
    }

    void makePort(const QString& image = QStringLiteral("/dsp.out"))
    {
        port = std::make_unique<Domain::DspPort>(image);
        announced = 0;
        QObject::connect(
            port.get(), &Domain::DspPort::readyRead, port.get(),
            [this] {
                ++announced;
                announcer = QThread::currentThread();
            },
            Qt::DirectConnection);
    }

    void openPort()
    {
        makePort();
        QVERIFY(port->open(QIODevice::ReadWrite));
        QCOMPARE(sourcedTexts(*log), openTexts);
    }

    QByteArray next() { return port->readLine(port->maxBytesAvailable() + 1); }

    void arrived(int count) { QTRY_COMPARE_WITH_TIMEOUT(announced.load(), count, 20000); }

    /// Data of `size` bytes that states its own length.
    static QByteArray message(quint32 type, qsizetype size, char fill = 'x')
    {
        return DspPeer::dspMessage(type, QByteArray(size - 8, fill));
    }
};

} // namespace TestSupport
