// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "utilities/Debug.h"

#include "tests/support/LogCapture.h"
#include "utilities/LogWriter.h"
#include "utilities/SourceWarnings.h"

#include <QCoreApplication>
#include <QFile>
#include <QTest>
#include <QTimer>

#include <fcntl.h>
#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <thread>

using TestSupport::LogCapture;
using Utilities::Debug;

namespace
{

/// A log service that takes its time over each message, or takes none as long as `hangs` is set.
class SlowService
{
public:
    std::atomic<bool> hangs{false};
    std::atomic<int> taken{0};

    explicit SlowService(std::chrono::milliseconds each) : pause(each)
    {
        sockaddr_un address{};
        address.sun_family = AF_UNIX;
        qstrncpy(address.sun_path, "/dev/log", sizeof address.sun_path);
        if (::bind(socket, reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0)
            qFatal("no /dev/log");
        thread = std::thread([this] { serve(); });
        Debug::open();
    }
    ~SlowService()
    {
        ending = true;
        thread.join();
        ::close(socket);
        ::unlink("/dev/log");
    }
    SlowService(const SlowService&) = delete;
    SlowService& operator=(const SlowService&) = delete;

    void hurry() { pause = std::chrono::milliseconds(0); }

private:
    void serve()
    {
        char message[256];
        while (!ending) {
            if (!hangs && ::recv(socket, message, sizeof message, MSG_DONTWAIT) > 0)
                ++taken;
            std::this_thread::sleep_for(pause.load());
        }
    }

    const int socket = ::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    std::atomic<std::chrono::milliseconds> pause;
    std::atomic<bool> ending{false};
    std::thread thread;
};

} // namespace

class DebugTest : public QObject
{
    Q_OBJECT

private slots:
    void everyOperationHasItsPriority_data();
    void everyOperationHasItsPriority();
    void identityAndFacilityAreFixed();
    void infoAndDebugBriefLogTheTextAlone();
    void composedLineIsFileCommaLineCommaText();
    void emptyFileGivesALineThatStartsWithAComma();
    void negativeLineKeepsItsMinusSign();
    void sourceNameIsThePathFromTheProjectRoot();
    void warningsOfASourceBeginWithItsName();
    void conversionInATextIsExpandedByTheLogService();
    void errnoConversionShowsTheCallersErrno();
    void literalForeignTextReachesTheLogAsReceived();
    void charactersBeyondLatin1AreLost();
    void fatalLogsReturnsAndEndsTheEventLoopWithMinusOne();
    void fatalFromAnotherThreadEndsTheEventLoop();
    void fatalBeforeTheEventLoopEndsNothing();
    void messagesFromManyThreadsAllArrive();
    void messagesAfterCloseStillArriveUnderTheProgramsName();
    void everyMessageIsEchoedOnStandardErrorBeforeItsCallReturns();
    void withoutALogServiceMessagesGoToTheConsole();
    void aServiceThatTakesNothingHoldsNobodyUp();
    void aSlowServiceHoldsNobodyUp();
    void aBacklogThatASlowServiceWorksOffHoldsNobodyUp();
};

void DebugTest::everyOperationHasItsPriority_data()
{
    using Operation = void (*)();
    QTest::addColumn<Operation>("operation");
    QTest::addColumn<int>("priority");
    QTest::addRow("info") << Operation([] { Debug::info("x"); }) << 6;
    QTest::addRow("debugBrief") << Operation([] { Debug::debugBrief("x"); }) << 7;
    QTest::addRow("debug") << Operation([] { Debug::debugMessage("f", 1, "x"); }) << 7;
    QTest::addRow("warning") << Operation([] { Debug::warningMessage("f", 1, "x"); }) << 4;
    QTest::addRow("critical") << Operation([] { Debug::criticalMessage("f", 1, "x"); }) << 2;
    QTest::addRow("fatal") << Operation([] { Debug::fatalMessage("f", 1, "x"); }) << 0;
}

void DebugTest::everyOperationHasItsPriority()
{
    using Operation = void (*)();
    QFETCH(const Operation, operation);
    LogCapture log;
    operation();
    QVERIFY(log.waitFor("x"));
    QTEST(log.lines().front().priority, "priority");
}

void DebugTest::identityAndFacilityAreFixed()
{
    LogCapture log;
    Debug::info("x");
    QVERIFY(log.waitFor("x"));
    QCOMPARE(log.lines().front().identity, "VQK");
    QCOMPARE(log.lines().front().facility, 1);
}

void DebugTest::infoAndDebugBriefLogTheTextAlone()
{
    LogCapture log;
    Debug::info("Starting");
    Debug::debugBrief("brief");
    QVERIFY(log.waitFor("brief"));
    QCOMPARE(log.texts(), (QStringList{"Starting", "brief"}));
}

void DebugTest::composedLineIsFileCommaLineCommaText()
{
    LogCapture log;
    Debug::debugMessage("a/B.cpp", 1, "one");
    Debug::warningMessage("a/B.cpp", 419, "Reading when no data available");
    Debug::criticalMessage("a/B.cpp", 3, "three");
    Debug::fatalMessage("a/B.cpp", 4, "four");
    QVERIFY(log.waitFor("four"));
    QCOMPARE(log.texts(), (QStringList{"a/B.cpp, 1, one", "a/B.cpp, 419, Reading when no data available",
                                       "a/B.cpp, 3, three", "a/B.cpp, 4, four"}));
}

void DebugTest::emptyFileGivesALineThatStartsWithAComma()
{
    LogCapture log;
    Debug::warningMessage(QString(), 7, "x");
    QVERIFY(log.waitFor("x"));
    QCOMPARE(log.texts().front(), ", 7, x");
}

void DebugTest::negativeLineKeepsItsMinusSign()
{
    LogCapture log;
    Debug::warningMessage("f", -12, "x");
    QVERIFY(log.waitFor("x"));
    QCOMPARE(log.texts().front(), "f, -12, x");
}

void DebugTest::sourceNameIsThePathFromTheProjectRoot()
{
    QCOMPARE(QString(__FILE__), "tests/utilities/DebugTest.cpp");
}

void DebugTest::warningsOfASourceBeginWithItsName()
{
    LogCapture log;
    const Utilities::SourceWarnings warn(QStringLiteral(__FILE__));
    warn(419, "Reading when no data available");
    QVERIFY(log.waitFor("available"));
    QCOMPARE(log.texts(), QStringList{"tests/utilities/DebugTest.cpp, 419, Reading when no data available"});
    QCOMPARE(log.lines().front().priority, 4);
}

void DebugTest::conversionInATextIsExpandedByTheLogService()
{
    LogCapture log;
    Debug::info("100%% sure");
    QVERIFY(log.waitFor("sure"));
    QCOMPARE(log.texts().front(), "100% sure");
}

void DebugTest::errnoConversionShowsTheCallersErrno()
{
    LogCapture log;
    errno = ENODEV;
    Debug::warningMessage("f", 1, "%m");
    QVERIFY(log.waitFor("No such device"));
}

void DebugTest::literalForeignTextReachesTheLogAsReceived()
{
    LogCapture log;
    Debug::warningMessage("f", 1, "noise " + Debug::literal("%n%s") + " end");
    QVERIFY(log.waitFor("noise %n%s end"));
}

void DebugTest::charactersBeyondLatin1AreLost()
{
    LogCapture log;
    Debug::info(QStringLiteral("a\u00e9\u20ac.z"));
    QVERIFY(log.waitFor(".z"));
    QCOMPARE(log.texts().front(), QStringLiteral("a\u00e9?.z"));
}

void DebugTest::fatalLogsReturnsAndEndsTheEventLoopWithMinusOne()
{
    LogCapture log;
    bool callerWentOn = false;
    QTimer::singleShot(0, this, [&] {
        Debug::fatalMessage("f", 1, "fatal");
        callerWentOn = log.waitFor("fatal");
    });
    QCOMPARE(QCoreApplication::exec(), -1);
    QVERIFY(callerWentOn);
}

void DebugTest::fatalFromAnotherThreadEndsTheEventLoop()
{
    LogCapture log;
    std::thread worker;
    QTimer::singleShot(0, this, [&] { worker = std::thread([] { Debug::fatalMessage("f", 1, "fatal"); }); });
    QCOMPARE(QCoreApplication::exec(), -1);
    worker.join();
}

void DebugTest::fatalBeforeTheEventLoopEndsNothing()
{
    LogCapture log;
    Debug::fatalMessage("f", 1, "too early");
    QTimer::singleShot(0, this, [] { QCoreApplication::exit(5); });
    QCOMPARE(QCoreApplication::exec(), 5);
}

void DebugTest::messagesFromManyThreadsAllArrive()
{
    constexpr int threadCount = 8;
    constexpr int messagesEach = 100; // the queue has room for all of them, should the service stand still
    LogCapture log;
    std::vector<std::thread> threads;
    for (int index = 0; index < threadCount; ++index)
        threads.emplace_back([] {
            for (int message = 0; message < messagesEach; ++message)
                Debug::warningMessage("f", message, "concurrent");
        });
    for (auto& thread : threads)
        thread.join();
    QVERIFY(log.waitFor("concurrent", threadCount * messagesEach));
}

void DebugTest::messagesAfterCloseStillArriveUnderTheProgramsName()
{
    LogCapture log;
    Debug::close();
    Debug::info("late");
    QVERIFY(log.waitFor("late"));
    QCOMPARE(log.lines().front().identity, "DebugTest");
}

void DebugTest::everyMessageIsEchoedOnStandardErrorBeforeItsCallReturns()
{
    const LogCapture log;
    Debug::open();
    int ends[2];
    QCOMPARE(::pipe2(ends, O_CLOEXEC), 0);
    const int standardError = ::dup(STDERR_FILENO);
    ::dup2(ends[1], STDERR_FILENO);
    Debug::info("brief");
    Debug::debugBrief("detail");
    Debug::debugMessage("f", 1, "debug");
    Debug::warningMessage("f", 2, "warning");
    Debug::criticalMessage("f", 3, "critical");
    Debug::fatalMessage("f", 4, "fatal");
    // What were echoed after its call had returned would miss the pipe.
    ::dup2(standardError, STDERR_FILENO);
    ::close(standardError);
    ::close(ends[1]);
    QFile echo;
    QVERIFY(echo.open(ends[0], QIODevice::ReadOnly, QFile::AutoCloseHandle));
    QCOMPARE(echo.readAll(), QByteArray("VQK: brief\nVQK: detail\nVQK: f, 1, debug\nVQK: f, 2, warning\n"
                                        "VQK: f, 3, critical\nVQK: f, 4, fatal\n"));
}

void DebugTest::withoutALogServiceMessagesGoToTheConsole()
{
    QFile console("/dev/console");
    QVERIFY(!console.exists());
    QVERIFY(console.open(QIODevice::ReadWrite));
    Debug::close();
    Debug::open();
    Debug::info("nobody listens");
    QByteArray text;
    QTRY_VERIFY2((text += console.readAll()).contains("VQK: nobody listens\r\n"), text);
    QVERIFY(console.remove());
}

void DebugTest::aServiceThatTakesNothingHoldsNobodyUp()
{
    // A service that nobody reads: its queue fills after a few hundred messages at the most.
    const int stuck = ::socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    qstrncpy(address.sun_path, "/dev/log", sizeof address.sun_path);
    QCOMPARE(::bind(stuck, reinterpret_cast<const sockaddr*>(&address), sizeof address), 0);
    Debug::open();

    constexpr int far = 5 * static_cast<int>(Utilities::LogWriter::capacity);
    for (int message = 0; message < far; ++message)
        Debug::info("nobody reads this");

    // Reached at all: no call above blocked. The service comes back and the queue drains.
    ::close(stuck);
    ::unlink("/dev/log");
    LogCapture log;
    QVERIFY(QTest::qWaitFor(
        [&] {
            Debug::info("back again");
            return log.count("back again") > 0;
        },
        20000));
}

/// Callers who waited for each of their messages would have it taken when they are through.
void DebugTest::aSlowServiceHoldsNobodyUp()
{
    constexpr int far = 9 * static_cast<int>(Utilities::LogWriter::capacity) / 10;
    SlowService service(2 * Utilities::LogWriter::quick);
    for (int message = 0; message < far; ++message)
        Debug::info("one of many");
    QVERIFY2(service.taken < far * 2 / 3, qPrintable(QString::number(service.taken)));
    // The queue has room for them all.
    service.hurry();
    QTRY_COMPARE_WITH_TIMEOUT(service.taken.load(), far, 20'000);
}

/// A service that was away for a moment, and then is not slow, but has a second's messages to work off: who waited for
/// a place behind them would wait for the whole patience, each time.
void DebugTest::aBacklogThatASlowServiceWorksOffHoldsNobodyUp()
{
    constexpr int far = static_cast<int>(Utilities::LogWriter::capacity) / 2;
    constexpr int more = 20;
    SlowService service(Utilities::LogWriter::quick * 3 / 5);
    service.hangs = true;
    for (int message = 0; message < far; ++message)
        Debug::info("one of many");
    service.hangs = false;
    for (int message = 0; message < more; ++message) {
        const int before = service.taken;
        QVERIFY(QTest::qWaitFor([&] { return service.taken > before; }, 20'000));
        Debug::info("one behind them");
    }
    QVERIFY2(service.taken < far, qPrintable(QString::number(service.taken)));
    service.hurry();
    QTRY_COMPARE_WITH_TIMEOUT(service.taken.load(), far + more, 20'000);
}

QTEST_GUILESS_MAIN(DebugTest)
#include "DebugTest.moc"
