// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/SerialPort.h"
#include "tests/Domain/SerialLine.h"
#include "tests/support/LogCapture.h"
#include "tests/support/ProcessorTime.h"
#include "tests/support/WakeUpWatch.h"
#include "utilities/Debug.h"

#include <QCoreApplication>
#include <QElapsedTimer>
#include <QFile>
#include <QTest>

#include <fcntl.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <csignal>
#include <ctime>
#include <thread>

using Domain::SerialPort;
using TestSupport::ClosedPort;
using TestSupport::LogCapture;
using TestSupport::numberedBytes;
using TestSupport::OpenedPort;
using TestSupport::Pty;
using TestSupport::readAll;
using TestSupport::ReadingThread;
using TestSupport::waitFor;
using TestSupport::WakeUpWatch;

namespace
{

constexpr auto sessionLeaderArgument = "--as-session-leader";

/// Keeps the thread that it lives on until it is released.
class Guest : public QObject
{
    Q_OBJECT

public:
    std::atomic<bool> released = false;

public slots:
    void stay()
    {
        (void)waitFor([this] { return released.load(); });
    }
};

/// A process that may have one open file may not wait for two.
class OneDescriptorOnly
{
public:
    OneDescriptorOnly()
    {
        ::getrlimit(RLIMIT_NOFILE, &before);
        const rlimit tight{1, before.rlim_max};
        ::setrlimit(RLIMIT_NOFILE, &tight);
    }
    ~OneDescriptorOnly() { ::setrlimit(RLIMIT_NOFILE, &before); }
    OneDescriptorOnly(const OneDescriptorOnly&) = delete;
    OneDescriptorOnly& operator=(const OneDescriptorOnly&) = delete;

private:
    rlimit before{};
};

/// From now on the signal does nothing but interrupt.
void interruptWithSigusr1()
{
    struct sigaction action
    {
    };
    action.sa_handler = [](int) {};
    if (::sigaction(SIGUSR1, &action, nullptr) != 0)
        qFatal("No signal");
}

std::chrono::nanoseconds processorTime(pthread_t thread)
{
    clockid_t clock{};
    timespec used{};
    if (::pthread_getcpuclockid(thread, &clock) != 0 || ::clock_gettime(clock, &used) != 0)
        qFatal("No processor time");
    return std::chrono::seconds(used.tv_sec) + std::chrono::nanoseconds(used.tv_nsec);
}

} // namespace

/// A line or a system that misbehaves, and a reader that is late.
class SerialPortTroubleTest : public QObject
{
    Q_OBJECT

private slots:
    void init() { log = std::make_unique<LogCapture>(); }
    void cleanup() { log.reset(); }

    void aLateReadThreadIsReportedAndRefusesTheNextOpen();
    void theReadThreadDoesNotEndUnderTheHandsThatWakeIt();
    void pollPortOnAClosedPortIsReported();
    void aFailingSelectIsReportedAndReadingGoesOn();
    void interruptedWaitsAreInvisible();
    void anInterruptedWriteHasAllItsPatience();
    void aLineThatHangsUpIsSilentAndCostsNoProcessor();
    void aFileInPlaceOfALineCostsNoProcessor();
    void aLineWhoseReadsFailIsSilentAndCostsNoProcessor();
    void theLineNeverBecomesTheControllingTerminal();
    void anUnreadLineWaitsInTheDriverAndLosesNothing();
    void theBufferMayBeWatchedFromAnotherThread();

private:
    std::unique_ptr<LogCapture> log;
};

void SerialPortTroubleTest::aLateReadThreadIsReportedAndRefusesTheNextOpen()
{
    const Pty pty;
    Guest guest;
    ClosedPort port(pty);
    const ReadingThread reader(port);
    QVERIFY(port.open(QIODevice::ReadWrite));
    pty.write("x");
    QVERIFY(waitFor([&] { return reader.chunks == 1; }));
    // Work that the thread finds when it has left the read loop, before it is told to quit.
    guest.moveToThread(reader.object);
    QMetaObject::invokeMethod(&guest, "stay", Qt::QueuedConnection);
    port.close();
    QVERIFY(log->waitFor(", Read thread took too long to finish"));
    QVERIFY(!port.isOpen());
    QVERIFY(!port.open(QIODevice::ReadWrite));
    QVERIFY(log->waitFor(", Previous read thread is not finished."));
    QCOMPARE(log->lines().size(), std::size_t(2));
    guest.released = true;
}

void SerialPortTroubleTest::theReadThreadDoesNotEndUnderTheHandsThatWakeIt()
{
    const Pty pty;
    ClosedPort port(pty);
    const ReadingThread reader(port);
    QVERIFY(port.open(QIODevice::ReadWrite));
    pty.write("x");
    QVERIFY(waitFor([&] { return reader.chunks == 1; }));
    port.close();
    // Without a thread there is nothing to end, neither now nor when one comes.
    QVERIFY(port.open(QIODevice::WriteOnly));
    port.close();
    const WakeUpWatch watch(*reader.object);
    QVERIFY(port.open(QIODevice::ReadWrite));
    port.close();
    QVERIFY(watch.sawOnlyLivingThreadsWoken());
    QVERIFY(log->lines().empty());
}

void SerialPortTroubleTest::pollPortOnAClosedPortIsReported()
{
    const Pty pty;
    SerialPort port(pty.name(), SerialPort::Baud115200);
    port.pollPort();
    QVERIFY(log->waitFor(", Attempting to read from a serial port that is not open"));
    QVERIFY(port.open(QIODevice::ReadWrite));
    pty.write("x");
    QCOMPARE(readAll(port, 1), QByteArray("x"));
}

void SerialPortTroubleTest::aFailingSelectIsReportedAndReadingGoesOn()
{
    const Pty pty;
    OpenedPort port(pty);
    pty.write("w");
    QVERIFY(waitFor([&] { return port.bytesAvailable() == 1; }));
    // The limit hits the log's reader, too, unless that waits already: then another attempt is due.
    bool reported = false;
    for (int attempt = 0; attempt < 10 && !reported; ++attempt) {
        log.reset();
        log = std::make_unique<LogCapture>();
        Utilities::Debug::info("connected");
        QVERIFY(log->waitFor("connected"));
        const OneDescriptorOnly limit;
        pty.write("x");
        reported = waitFor([&] { return log->count(", Select failed in serial port read thread") > 0; }, 2000);
    }
    QVERIFY(reported);
    pty.write("y");
    QByteArray received;
    QTRY_VERIFY_WITH_TIMEOUT((received += port.readAll()).endsWith("xy"), 20000);
}

void SerialPortTroubleTest::interruptedWaitsAreInvisible()
{
    interruptWithSigusr1();
    const Pty pty;
    ClosedPort port(pty);
    const ReadingThread reader(port);
    QVERIFY(port.open(QIODevice::ReadWrite));
    pty.write("x");
    QVERIFY(waitFor([&] { return reader.chunks == 1; }));
    for (int round = 0; round < 100; ++round) {
        ::pthread_kill(reader.handle, SIGUSR1);
        pty.write("y");
        QVERIFY(waitFor([&] { return port.bytesAvailable() == round + 2; }));
    }
    QCOMPARE(log->texts(), QStringList());
}

void SerialPortTroubleTest::anInterruptedWriteHasAllItsPatience()
{
    interruptWithSigusr1();
    const Pty pty;
    OpenedPort port(pty);
    const QByteArray block(4096, 'x');
    while (port.write(block) > 0) {
    }
    std::atomic<bool> finished = false;
    std::thread disturber([&, writer = ::pthread_self()] {
        while (!finished) {
            ::pthread_kill(writer, SIGUSR1);
            std::this_thread::sleep_for(std::chrono::milliseconds(10));
        }
    });
    QElapsedTimer clock;
    qint64 written = 0;
    do { // the kernel may still have made room
        clock.start();
        written = port.write(block);
    } while (written > 0);
    const auto elapsed = clock.elapsed();
    finished = true;
    disturber.join();
    QCOMPARE(written, qint64(-1));
    QVERIFY2(elapsed >= 490, qPrintable(QString::number(elapsed)));
}

void SerialPortTroubleTest::aLineThatHangsUpIsSilentAndCostsNoProcessor()
{
    Pty pty;
    ClosedPort port(pty);
    const ReadingThread reader(port);
    QVERIFY(port.open(QIODevice::ReadWrite));
    pty.write("x");
    QVERIFY(waitFor([&] { return reader.chunks == 1; }));
    pty.hangUp();
    QCOMPARE(port.write("y"), qint64(-1));
    const auto before = processorTime(reader.handle);
    QTest::qWait(1000);
    const auto used = processorTime(reader.handle) - before;
    QVERIFY2(used < std::chrono::milliseconds(100), qPrintable(QString::number(used.count())));
    QElapsedTimer timer;
    timer.start();
    port.close();
    QVERIFY(timer.elapsed() < 3000);
    QVERIFY(log->waitFor(", Serial port write failed.  Error code = Input/output error"));
    QCOMPARE(log->lines().size(), std::size_t(1));
}

void SerialPortTroubleTest::aFileInPlaceOfALineCostsNoProcessor()
{
    QFile file("/tmp/line");
    QVERIFY(file.open(QIODevice::WriteOnly));
    file.write("abc");
    file.close();
    SerialPort port("/tmp/line", SerialPort::Baud115200);
    const ReadingThread reader(port);
    QVERIFY(port.open(QIODevice::ReadOnly));
    QCOMPARE(readAll(port, 3), QByteArray("abc"));
    QVERIFY(waitFor([&] { return reader.chunks == 1; }));
    const auto before = processorTime(reader.handle);
    QTest::qWait(1000);
    QVERIFY(processorTime(reader.handle) - before < std::chrono::milliseconds(100));
    port.close();
    QCOMPARE(log->texts(), QStringList());
}

/// The memory of a process is always ready, and at its address 0 there is nothing.
void SerialPortTroubleTest::aLineWhoseReadsFailIsSilentAndCostsNoProcessor()
{
    SerialPort port("/proc/self/mem", SerialPort::Baud115200);
    QVERIFY(port.open(QIODevice::ReadOnly));
    const double before = TestSupport::processSeconds();
    QTest::qWait(1000);
    const double used = TestSupport::processSeconds() - before;
    QVERIFY2(used < 0.1, qPrintable(QString::number(used)));
    port.close();
    QCOMPARE(log->texts(), QStringList());
}

void SerialPortTroubleTest::theLineNeverBecomesTheControllingTerminal()
{
    const Pty pty;
    QByteArray program = QCoreApplication::applicationFilePath().toLocal8Bit();
    QByteArray argument = sessionLeaderArgument;
    QByteArray line = pty.name().toLocal8Bit();
    char* arguments[] = {program.data(), argument.data(), line.data(), nullptr};
    posix_spawnattr_t attributes;
    ::posix_spawnattr_init(&attributes);
    ::posix_spawnattr_setflags(&attributes, POSIX_SPAWN_SETSID);
    pid_t child = 0;
    QCOMPARE(::posix_spawn(&child, program.constData(), nullptr, &attributes, arguments, environ), 0);
    int status = 0;
    QCOMPARE(::waitpid(child, &status, 0), child);
    QVERIFY(WIFEXITED(status));
    QCOMPARE(WEXITSTATUS(status), 0);
}

void SerialPortTroubleTest::anUnreadLineWaitsInTheDriverAndLosesNothing()
{
    const Pty pty;
    OpenedPort port(pty);
    const QByteArray sent = numberedBytes(400 * 1024);
    std::thread peer([&] { pty.write(sent); });
    const bool filled = waitFor([&] { return port.bytesAvailable() >= 256 * 1024; });
    QTest::qWait(200);
    const auto most = port.bytesAvailable();
    const QByteArray received = readAll(port, sent.size());
    peer.join();
    QVERIFY(filled);
    QVERIFY2(most < 256 * 1024 + 46, qPrintable(QString::number(most)));
    QVERIFY(received == sent);
}

void SerialPortTroubleTest::theBufferMayBeWatchedFromAnotherThread()
{
    const Pty pty;
    OpenedPort port(pty);
    std::atomic<bool> finished = false;
    std::thread watcher([&] {
        while (!finished) {
            (void)port.bytesAvailable();
            (void)port.canReadLine();
        }
    });
    const QByteArray sent = numberedBytes(20000);
    std::thread peer([&] { pty.write(sent); });
    const QByteArray received = readAll(port, sent.size());
    finished = true;
    watcher.join();
    peer.join();
    QVERIFY(received == sent);
}

namespace
{

/// The process leads a session without a terminal: the first one that it opens carelessly becomes its own.
int openAsSessionLeader(const char* name)
{
    SerialPort port(QFile::decodeName(name), SerialPort::Baud115200);
    if (!port.open(QIODevice::ReadWrite))
        return 2;
    return ::open("/dev/tty", O_RDWR | O_CLOEXEC) < 0 ? 0 : 1;
}

} // namespace

int main(int argc, char** argv)
{
    const QCoreApplication application(argc, argv);
    if (argc == 3 && QByteArray(argv[1]) == sessionLeaderArgument)
        return openAsSessionLeader(argv[2]);
    SerialPortTroubleTest test;
    return QTest::qExec(&test, argc, argv);
}

#include "SerialPortTroubleTest.moc"
