// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/SerialPort.h"

#include "tests/Domain/Pty.h"
#include "tests/support/LogCapture.h"
#include "utilities/Debug.h"

#include <QCoreApplication>
#include <QElapsedTimer>
#include <QFile>
#include <QTest>

#include <fcntl.h>
#include <pthread.h>
#include <spawn.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <termios.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <csignal>
#include <ctime>
#include <functional>
#include <mutex>
#include <numeric>
#include <thread>
#include <vector>

using Domain::SerialPort;
using TestSupport::LogCapture;
using TestSupport::Pty;

namespace
{

constexpr auto sessionLeaderArgument = "--as-session-leader";

/// Waits without serving events.
bool waitFor(const std::function<bool()>& condition, int limitMs = 20000)
{
    const QDeadlineTimer deadline(limitMs);
    while (!condition()) {
        if (deadline.hasExpired())
            return false;
        std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    return true;
}

class ClosedPort : public SerialPort
{
public:
    explicit ClosedPort(const Pty& pty) : SerialPort(pty.name(), Baud115200) {}
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

class ReadablePort : public SerialPort
{
public:
    using SerialPort::readData;
    using SerialPort::SerialPort;
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

QByteArray numberedBytes(int count)
{
    QByteArray bytes(count, '\0');
    for (int index = 0; index < count; ++index)
        bytes[index] = static_cast<char>(index * 7 + index / 256);
    return bytes;
}

/// Collects what a port gives, until nothing is missing.
QByteArray readAll(SerialPort& port, qsizetype count)
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

std::chrono::nanoseconds processorTime(pthread_t thread)
{
    clockid_t clock{};
    timespec used{};
    if (::pthread_getcpuclockid(thread, &clock) != 0 || ::clock_gettime(clock, &used) != 0)
        qFatal("No processor time");
    return std::chrono::seconds(used.tv_sec) + std::chrono::nanoseconds(used.tv_nsec);
}

/// Lets the port's reading thread run something, and knows that thread. Made before the port is opened.
class ReadingThread
{
public:
    ReadingThread(
        SerialPort& port, std::function<void()> onChunk = [] {})
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
    void readDataGivesAtMostWhatIsAskedFor();
    void aLineFeedAnywhereMakesALineReadable();
    void writtenBytesReachTheLineAtOnce();
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
    void aLateReadThreadIsReportedAndRefusesTheNextOpen();
    void pollPortOnAClosedPortIsReported();
    void aFailingSelectIsReportedAndReadingGoesOn();
    void interruptedWaitsAreInvisible();
    void aLineThatHangsUpIsSilentAndCostsNoProcessor();
    void aFileInPlaceOfALineCostsNoProcessor();
    void theLineNeverBecomesTheControllingTerminal();
    void anUnreadLineWaitsInTheDriverAndLosesNothing();
    void theBufferMayBeWatchedFromAnotherThread();

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
    OpenedPort port(pty);
    const QByteArray sent = numberedBytes(20000);
    std::thread peer([&] { pty.write(sent); });
    QByteArray received;
    connect(&port, &QIODevice::readyRead, this, [&] { received += port.readAll(); });
    const bool complete = QTest::qWaitFor([&] { return received.size() >= sent.size(); }, 20000);
    peer.join();
    QVERIFY(complete);
    QCOMPARE(received, sent);
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

void SerialPortTest::aLateReadThreadIsReportedAndRefusesTheNextOpen()
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

void SerialPortTest::pollPortOnAClosedPortIsReported()
{
    const Pty pty;
    SerialPort port(pty.name(), SerialPort::Baud115200);
    port.pollPort();
    QVERIFY(log->waitFor(", Attempting to read from a serial port that is not open"));
    QVERIFY(port.open(QIODevice::ReadWrite));
    pty.write("x");
    QCOMPARE(readAll(port, 1), QByteArray("x"));
}

void SerialPortTest::aFailingSelectIsReportedAndReadingGoesOn()
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

void SerialPortTest::interruptedWaitsAreInvisible()
{
    struct sigaction action
    {
    };
    action.sa_handler = [](int) {};
    QCOMPARE(::sigaction(SIGUSR1, &action, nullptr), 0);
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

void SerialPortTest::aLineThatHangsUpIsSilentAndCostsNoProcessor()
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

void SerialPortTest::aFileInPlaceOfALineCostsNoProcessor()
{
    QFile file("/tmp/line");
    QVERIFY(file.open(QIODevice::WriteOnly));
    file.write("abc");
    file.close();
    SerialPort port("/tmp/line", SerialPort::Baud115200);
    const ReadingThread reader(port);
    QVERIFY(port.open(QIODevice::ReadOnly));
    QCOMPARE(readAll(port, 3), QByteArray("abc"));
    const auto before = processorTime(reader.handle);
    QTest::qWait(1000);
    QVERIFY(processorTime(reader.handle) - before < std::chrono::milliseconds(100));
    port.close();
    QCOMPARE(log->texts(), QStringList());
}

void SerialPortTest::theLineNeverBecomesTheControllingTerminal()
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

void SerialPortTest::anUnreadLineWaitsInTheDriverAndLosesNothing()
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

void SerialPortTest::theBufferMayBeWatchedFromAnotherThread()
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
    SerialPortTest test;
    return QTest::qExec(&test, argc, argv);
}

#include "SerialPortTest.moc"
