// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/LogCapture.h"
#include "tests/support/ThreadShortage.h"
#include "utilities/Debug.h"

#include <QProcess>
#include <QTest>

#include <fcntl.h>
#include <unistd.h>

#include <climits>
#include <thread>

using TestSupport::ThreadShortage::refusesOfTheStandardLibrary;
using TestSupport::ThreadShortage::started;
using Utilities::Debug;

namespace
{

const QString heldUpArgument = QStringLiteral("--end-while-a-message-is-held-up");

/// Standard error is a pipe from now on that nobody reads and nothing fits into.
void fillStandardError()
{
    int ends[2] = {-1, -1};
    if (::pipe2(ends, O_CLOEXEC | O_NONBLOCK) != 0)
        qFatal("no pipe");
    while (::write(ends[1], "x", 1) == 1) {
    }
    ::dup2(ends[1], STDERR_FILENO);
}

/// Ends while a thread of it carries its message out itself, which never comes to an end.
int endedWhileAMessageIsHeldUp()
{
    fillStandardError();
    std::thread([] {
        refusesOfTheStandardLibrary = INT_MAX;
        Debug::info(QStringLiteral("held up"));
    }).detach();
    while (refusesOfTheStandardLibrary == 0 || refusesOfTheStandardLibrary == INT_MAX)
        std::this_thread::yield();
    return 0;
}

} // namespace

/// The log on a machine that has no thread left for its writer, at first.
class LogThreadShortageTest : public QObject
{
    Q_OBJECT

private slots:
    void whatIsLoggedComesAllTheSame()
    {
        refusesOfTheStandardLibrary = 1;
        Debug::info(QStringLiteral("before anybody listens"));
        QCOMPARE(refusesOfTheStandardLibrary.load(), 0);
        const int before = started;
        Debug::info(QStringLiteral("with threads again"));
        QCOMPARE(started - before, 1);
        const TestSupport::LogCapture log;
        Debug::info(QStringLiteral("first"));
        Debug::debugBrief(QStringLiteral("second"));
        QVERIFY(log.waitFor(QStringLiteral("second")));
        QCOMPARE(log.texts(), (QStringList{QStringLiteral("first"), QStringLiteral("second")}));
    }

    void aMessageThatIsHeldUpDoesNotHoldUpTheEnd()
    {
        QProcess program;
        program.start(QCoreApplication::applicationFilePath(), {heldUpArgument});
        QVERIFY(program.waitForFinished(60'000));
        QCOMPARE(program.exitStatus(), QProcess::NormalExit);
        QCOMPARE(program.exitCode(), 0);
    }
};

int main(int argc, char** argv)
{
    const QCoreApplication application(argc, argv);
    if (QCoreApplication::arguments().contains(heldUpArgument))
        return endedWhileAMessageIsHeldUp();
    LogThreadShortageTest test;
    return QTest::qExec(&test, argc, argv);
}

#include "LogThreadShortageTest.moc"
