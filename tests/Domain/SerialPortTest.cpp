// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/SerialPort.h"

#include "tests/Domain/SerialLine.h"
#include "tests/support/LogCapture.h"

#include <QElapsedTimer>
#include <QFile>
#include <QTest>

#include <termios.h>

#include <algorithm>
#include <atomic>
#include <mutex>
#include <numeric>
#include <thread>
#include <vector>

using Domain::SerialPort;
using TestSupport::ClosedPort;
using TestSupport::LogCapture;
using TestSupport::numberedBytes;
using TestSupport::OpenedPort;
using TestSupport::Pty;
using TestSupport::readAll;
using TestSupport::ReadingThread;
using TestSupport::waitFor;

namespace
{

class ReadablePort : public SerialPort
{
public:
    using SerialPort::readData;
    using SerialPort::SerialPort;
};

} // namespace

class SerialPortTest : public QObject
{
    Q_OBJECT

public slots:
    void noteServed() { served = true; }

private slots:
    void init() { log = std::make_unique<LogCapture>(); }
    void cleanup() { log.reset(); }

    void isSequentialAndClosedAtFirst();
    void readDataWithoutAReadLoopIsMinusOne();
    void openMakesTheLineRawAtItsSpeed();
    void openDropsWhatArrivedBefore();
    void everyByteArrivesInOrder();
    void readyReadComesOncePerChunkOfAtMost46Bytes();
    void theLineIsReadOnAThreadOfHighPriority();
    void readDataGivesAtMostWhatIsAskedFor();
    void bytesAvailableIsAllThatCanBeRead();
    void aLineFeedAnywhereMakesALineReadable();
    void writtenBytesReachTheLineAtOnce();
    void twoWhoWriteAtOnceBothSucceed();
    void aPartlyAcceptedWriteReportsTheFullLength();
    void aLineThatTakesNothingFailsTheWrite();
    void openWithoutReadAccessConfiguresTheLineAndReadsNothing();
    void aMissingDeviceIsRefusedAndNotCreated();
    void openWithoutAnyAccessIsRefused();
    void writingToAPortThatCouldNotBeOpenedFails();
    void aSecondOpenIsRefusedAndTheFirstGoesOn();
    void setPortNameKeepsTheDevice();
    void closeEndsTheReadLoopSoon();
    void closeRightAfterOpenEndsAndReportsNothing();
    void closeServesTheCallersEvents();
    void aClosedPortOpensAgain();
    void aPortThatIsOpenMayBeDestroyed();

private:
    std::unique_ptr<LogCapture> log;
    std::atomic<bool> served = false;
};

void SerialPortTest::isSequentialAndClosedAtFirst()
{
    const Pty pty;
    const SerialPort port(pty.name(), SerialPort::Baud115200);
    QVERIFY(port.isSequential());
    QVERIFY(!port.isOpen());
    QCOMPARE(port.bytesAvailable(), qint64(0));
}

void SerialPortTest::readDataWithoutAReadLoopIsMinusOne()
{
    const Pty pty;
    ReadablePort port(pty.name(), SerialPort::Baud115200);
    char byte = 0;
    QCOMPARE(port.readData(&byte, 1), qint64(-1));
    QVERIFY(port.open(QIODevice::ReadWrite));
    QCOMPARE(port.readData(&byte, 1), qint64(0));
    port.close();
    QCOMPARE(port.readData(&byte, 1), qint64(-1));
}

void SerialPortTest::openMakesTheLineRawAtItsSpeed()
{
    const Pty pty;
    const OpenedPort port(pty);
    termios settings{};
    QCOMPARE(::tcgetattr(pty.line(), &settings), 0);
    QCOMPARE(settings.c_iflag, tcflag_t(IGNPAR));
    QCOMPARE(settings.c_oflag, tcflag_t(0));
    QCOMPARE(settings.c_lflag, tcflag_t(0));
    QCOMPARE(settings.c_cflag & tcflag_t(CBAUD), tcflag_t(4098));
    QCOMPARE(settings.c_cflag & ~tcflag_t(CBAUD), tcflag_t(CS8 | CREAD | CLOCAL));
    QCOMPARE(::cfgetospeed(&settings), speed_t(B115200));
    for (int index = 0; index < NCCS; ++index)
        QCOMPARE(int(settings.c_cc[index]), index == VMIN ? 1 : 0);
}

void SerialPortTest::openDropsWhatArrivedBefore()
{
    const Pty pty;
    pty.write("stale");
    QTRY_COMPARE(pty.waiting(), 5);
    OpenedPort port(pty);
    pty.write("fresh");
    QCOMPARE(readAll(port, 5), QByteArray("fresh"));
}

void SerialPortTest::everyByteArrivesInOrder()
{
    const Pty pty;
    const QByteArray sent = numberedBytes(20000);
    QByteArray received;
    OpenedPort port(pty);
    // Before the first byte: on a busy machine all of them may be in the port before this thread gets on. What has been
    // announced and not heard goes with the port.
    connect(&port, &QIODevice::readyRead, &port, [&] { received += port.readAll(); });
    std::thread peer([&] { pty.write(sent); });
    const bool complete = QTest::qWaitFor([&] { return received.size() >= sent.size(); }, 20000);
    peer.join();
    QVERIFY(complete);
    QCOMPARE(received, sent);
}

void SerialPortTest::bytesAvailableIsAllThatCanBeRead()
{
    const Pty pty;
    OpenedPort port(pty);
    QCOMPARE(port.bytesAvailable(), 0);
    pty.write(numberedBytes(100));
    QTRY_COMPARE(port.bytesAvailable(), 100);
    // What the base class has been given back counts, too.
    port.ungetChar('x');
    QCOMPARE(port.bytesAvailable(), 101);
}

void SerialPortTest::readyReadComesOncePerChunkOfAtMost46Bytes()
{
    const Pty pty;
    ClosedPort port(pty);
    std::mutex mutex;
    std::vector<qint64> totals{0};
    const ReadingThread reader(port, [&] {
        const std::lock_guard guard(mutex);
        totals.push_back(port.bytesAvailable());
    });
    QVERIFY(port.open(QIODevice::ReadWrite));
    pty.write(numberedBytes(1000));
    QVERIFY(waitFor([&] { return port.bytesAvailable() == 1000; }));
    port.close();
    QCOMPARE(totals.back(), qint64(1000));
    std::vector<qint64> chunks(totals.size());
    std::adjacent_difference(totals.begin(), totals.end(), chunks.begin());
    QVERIFY(std::all_of(chunks.begin() + 1, chunks.end(), [](qint64 size) { return size >= 1 && size <= 46; }));
    QCOMPARE(reader.chunks.load(), int(totals.size()) - 1);
}

void SerialPortTest::theLineIsReadOnAThreadOfHighPriority()
{
    const Pty pty;
    ClosedPort port(pty);
    const ReadingThread reader(port);
    QVERIFY(port.open(QIODevice::ReadWrite));
    pty.write("x");
    QVERIFY(waitFor([&] { return reader.chunks == 1; }));
    QVERIFY(reader.object != QThread::currentThread());
    QCOMPARE(reader.object.load()->priority(), QThread::HighPriority);
}

void SerialPortTest::readDataGivesAtMostWhatIsAskedFor()
{
    const Pty pty;
    OpenedPort port(pty);
    pty.write("abcdef");
    QTRY_COMPARE(port.bytesAvailable(), qint64(6));
    QCOMPARE(port.read(4), QByteArray("abcd"));
    QCOMPARE(port.bytesAvailable(), qint64(2));
    QCOMPARE(port.read(100), QByteArray("ef"));
    QCOMPARE(port.read(100), QByteArray());
}

void SerialPortTest::aLineFeedAnywhereMakesALineReadable()
{
    const Pty pty;
    OpenedPort port(pty);
    QVERIFY(!port.canReadLine());
    pty.write("ab");
    QTRY_COMPARE(port.bytesAvailable(), qint64(2));
    QVERIFY(!port.canReadLine());
    pty.write("c\nd");
    QTRY_COMPARE(port.bytesAvailable(), qint64(5));
    QVERIFY(port.canReadLine());
    QCOMPARE(port.readLine(), QByteArray("abc\n"));
    QVERIFY(!port.canReadLine());
}

void SerialPortTest::writtenBytesReachTheLineAtOnce()
{
    const Pty pty;
    OpenedPort port(pty);
    const QByteArray sent = numberedBytes(256);
    QCOMPARE(port.write(sent), qint64(256));
    QCOMPARE(pty.read(256), sent);
}

void SerialPortTest::twoWhoWriteAtOnceBothSucceed()
{
    constexpr int each = 1000; // together less than the line takes without a reader
    const Pty pty;
    OpenedPort port(pty);
    std::atomic<int> failed = 0;
    const auto writer = [&] {
        for (int number = 0; number < each; ++number)
            failed += port.write("x") == 1 ? 0 : 1;
    };
    for (int round = 0; round < 50; ++round) { // the driver seldom finds two at once
        std::thread one(writer);
        std::thread other(writer);
        one.join();
        other.join();
        QCOMPARE(failed.load(), 0);
        QCOMPARE(pty.read(2 * each), QByteArray(2 * each, 'x'));
    }
}

void SerialPortTest::aPartlyAcceptedWriteReportsTheFullLength()
{
    const Pty pty;
    OpenedPort port(pty);
    const QByteArray large(1024 * 1024, 'x');
    QCOMPARE(port.write(large), qint64(large.size()));
    QVERIFY(pty.read().size() < large.size());
    QCOMPARE(log->texts(), QStringList());
}

void SerialPortTest::aLineThatTakesNothingFailsTheWrite()
{
    const Pty pty;
    OpenedPort port(pty);
    const QByteArray block(4096, 'x');
    qint64 result = 0;
    for (int count = 0; count < 1000 && result >= 0; ++count)
        result = port.write(block);
    QCOMPARE(result, qint64(-1));
    QVERIFY(log->waitFor(", Serial port write failed.  Error code = Resource temporarily unavailable"));
    QCOMPARE(log->lines().size(), std::size_t(1));
    QVERIFY(log->texts().front().startsWith("Domain/src/DomainLayer/SerialPort"));
}

void SerialPortTest::openWithoutReadAccessConfiguresTheLineAndReadsNothing()
{
    const Pty pty;
    OpenedPort port(pty, QIODevice::WriteOnly);
    termios settings{};
    QCOMPARE(::tcgetattr(pty.line(), &settings), 0);
    QCOMPARE(settings.c_iflag, tcflag_t(IGNPAR));
    QCOMPARE(port.write("out"), qint64(3));
    QCOMPARE(pty.read(3), QByteArray("out"));
    pty.write("in");
    QTRY_COMPARE(pty.waiting(), 2);
    // Nobody takes them: a read loop would have done so before an idle second has passed.
    QTest::qWait(1000);
    QCOMPARE(pty.waiting(), 2);
    QCOMPARE(port.bytesAvailable(), qint64(0));
    port.close();
    QCOMPARE(log->texts(), QStringList());
}

void SerialPortTest::aMissingDeviceIsRefusedAndNotCreated()
{
    SerialPort port("/dev/ttyS1", SerialPort::Baud115200);
    QVERIFY(!port.open(QIODevice::ReadWrite));
    QVERIFY(port.isOpen());
    QVERIFY(!QFile::exists("/dev/ttyS1"));
    QVERIFY(log->waitFor(", Serial port open failed.  Error code = No such file or directory"));
    QCOMPARE(log->lines().size(), std::size_t(1));
}

void SerialPortTest::openWithoutAnyAccessIsRefused()
{
    const Pty pty;
    SerialPort port(pty.name(), SerialPort::Baud115200);
    QVERIFY(!port.open(QIODevice::NotOpen));
    QVERIFY(log->waitFor(", Serial port open failed.  Error code = Invalid argument"));
}

void SerialPortTest::writingToAPortThatCouldNotBeOpenedFails()
{
    SerialPort port("/dev/ttyS1", SerialPort::Baud115200);
    QVERIFY(!port.open(QIODevice::ReadWrite));
    QCOMPARE(port.write("x"), qint64(-1));
    QVERIFY(log->waitFor(", Serial port write failed.  Error code = Bad file descriptor"));
}

void SerialPortTest::aSecondOpenIsRefusedAndTheFirstGoesOn()
{
    const Pty pty;
    OpenedPort port(pty);
    QVERIFY(!port.open(QIODevice::ReadWrite));
    QVERIFY(log->waitFor(", Serial port open failed.  Error code = Device or resource busy"));
    pty.write("still here");
    QCOMPARE(readAll(port, 10), QByteArray("still here"));
    QCOMPARE(port.write("me too"), qint64(6));
    QCOMPARE(pty.read(6), QByteArray("me too"));
}

void SerialPortTest::setPortNameKeepsTheDevice()
{
    const Pty pty;
    SerialPort port(pty.name(), SerialPort::Baud115200);
    port.setPortName("/dev/ttyS7");
    QVERIFY(port.open(QIODevice::ReadWrite));
    QCOMPARE(port.write("x"), qint64(1));
    QCOMPARE(pty.read(1), QByteArray("x"));
}

void SerialPortTest::closeEndsTheReadLoopSoon()
{
    const Pty pty;
    OpenedPort port(pty);
    pty.write("x");
    QTRY_COMPARE(port.bytesAvailable(), qint64(1));
    QElapsedTimer timer;
    timer.start();
    port.close();
    QVERIFY2(timer.elapsed() < 3000, qPrintable(QString::number(timer.elapsed())));
    QVERIFY(!port.isOpen());
    QCOMPARE(log->texts(), QStringList());
}

void SerialPortTest::closeRightAfterOpenEndsAndReportsNothing()
{
    const Pty pty;
    SerialPort port(pty.name(), SerialPort::Baud115200);
    for (int round = 0; round < 200; ++round) {
        QVERIFY(port.open(QIODevice::ReadWrite));
        port.close();
    }
    QCOMPARE(log->texts(), QStringList());
}

void SerialPortTest::closeServesTheCallersEvents()
{
    const Pty pty;
    ClosedPort port(pty);
    served = false;
    std::atomic<bool> entered = false;
    const ReadingThread reader(port, [&] {
        QMetaObject::invokeMethod(this, "noteServed", Qt::QueuedConnection);
        entered = true;
        (void)waitFor([&] { return served.load(); });
    });
    QVERIFY(port.open(QIODevice::ReadWrite));
    pty.write("x");
    QVERIFY(waitFor([&] { return entered.load(); }));
    QVERIFY(!served);
    port.close();
    QVERIFY(served);
}

void SerialPortTest::aClosedPortOpensAgain()
{
    const Pty pty;
    SerialPort port(pty.name(), SerialPort::Baud115200);
    for (const auto& text : {QByteArray("first"), QByteArray("second")}) {
        QVERIFY(port.open(QIODevice::ReadWrite));
        pty.write(text);
        QCOMPARE(readAll(port, text.size()), text);
        port.close();
    }
    QCOMPARE(log->texts(), QStringList());
}

void SerialPortTest::aPortThatIsOpenMayBeDestroyed()
{
    const Pty pty;
    for (int round = 0; round < 20; ++round) {
        const OpenedPort port(pty);
        pty.write("x");
    }
    QCOMPARE(log->texts(), QStringList());
}

QTEST_GUILESS_MAIN(SerialPortTest)
#include "SerialPortTest.moc"
