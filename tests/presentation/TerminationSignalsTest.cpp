// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/TerminationSignals.h"

#include "tests/presentation/RfPanel.h"

#include <QApplication>
#include <QProcess>
#include <QTest>

#include <sys/resource.h>

#include <csignal>

using Presentation::RfTest;
using Presentation::TerminationSignals;
using TestSupport::Journal;
using TestSupport::Panel;

namespace
{

bool isCaught(int signal)
{
    struct sigaction action
    {
    };
    return sigaction(signal, nullptr, &action) == 0 && action.sa_handler != SIG_DFL;
}

/// No descriptor can be opened as long as it lives.
class NoDescriptors
{
public:
    NoDescriptors()
    {
        getrlimit(RLIMIT_NOFILE, &before);
        const rlimit none{0, before.rlim_max};
        setrlimit(RLIMIT_NOFILE, &none);
    }
    ~NoDescriptors() { setrlimit(RLIMIT_NOFILE, &before); }
    NoDescriptors(const NoDescriptors&) = delete;
    NoDescriptors& operator=(const NoDescriptors&) = delete;

private:
    rlimit before{};
};

const QString restoringArgument = QStringLiteral("--restore-the-handler");

/// What a program with a library that restores the handler comes to.
int endedByTwoSignals()
{
    const TerminationSignals signalsOfTheProgram;
    struct sigaction saved
    {
    };
    sigaction(SIGTERM, nullptr, &saved);
    std::raise(SIGTERM);
    sigaction(SIGTERM, &saved, nullptr);
    std::raise(SIGTERM);
    return 0;
}

} // namespace

/// What a termination signal does to a program that waits.
class TerminationSignalsTest : public QObject
{
    Q_OBJECT

private slots:
    void theFirstSignalEndsTheEventLoopAndTheSecondKills_data()
    {
        QTest::addColumn<int>("number");
        QTest::newRow("SIGTERM") << SIGTERM;
        QTest::newRow("SIGINT") << SIGINT;
    }

    void theFirstSignalEndsTheEventLoopAndTheSecondKills()
    {
        QFETCH(int, number);
        const TerminationSignals signalsOfTheProgram;
        QVERIFY(!TerminationSignals::isEndRequested());
        QVERIFY(isCaught(SIGTERM) && isCaught(SIGINT));
        std::raise(number);
        QVERIFY(TerminationSignals::isEndRequested());
        QVERIFY(!isCaught(SIGTERM) && !isCaught(SIGINT));
        QCOMPARE(QCoreApplication::exec(), 0);
    }

    /// As after a library's call that has saved the actions before the first signal and restores them after it.
    void theSecondSignalKillsAlsoWhereTheHandlerIsBack()
    {
        QProcess program;
        program.start(QCoreApplication::applicationFilePath(), {restoringArgument});
        QVERIFY(program.waitForFinished(60'000));
        QCOMPARE(program.exitStatus(), QProcess::CrashExit);
        QCOMPARE(program.exitCode(), SIGTERM);
    }

    void withoutAPipeTheFirstSignalKills()
    {
        const NoDescriptors noDescriptors;
        QTest::ignoreMessage(QtWarningMsg, "Termination signals end the program at once: no pipe");
        const TerminationSignals signalsOfTheProgram;
        QVERIFY(!isCaught(SIGTERM) && !isCaught(SIGINT));
    }

    /// The microcontroller never answers: without the signal the wait would not end.
    void aSignalEndsTheWaitForTheMicrocontroller()
    {
        const TerminationSignals signalsOfTheProgram;
        Panel panel;
        panel.beacon.staysPending = true;
        panel.beacon.onLook = [&panel] {
            if (panel.beacon.looks == 100)
                std::raise(SIGTERM);
        };
        panel.test.start();
        QCOMPARE(panel.taken(), Journal({"amplifier on"}));
        QCOMPARE(panel.beacon.looks, 100);
        QCOMPARE(panel.afterCalling(&RfTest::frequencyUp), Journal{});
        QCOMPARE(panel.beacon.looks, 100);
    }

    void afterASignalNothingIsCommandedAnyMore()
    {
        const TerminationSignals signalsOfTheProgram;
        Panel panel;
        std::raise(SIGTERM);
        QCOMPARE(panel.afterCalling(&RfTest::toggleExternalAntenna), Journal{});
        QCOMPARE(panel.afterCalling(&RfTest::toggleState), Journal{});
        QCOMPARE(panel.afterCalling(&RfTest::sendPing), Journal{});
        QCOMPARE(panel.text("labelRadios"), QStringLiteral("External RF"));
    }
};

int main(int argc, char** argv)
{
    const QApplication application(argc, argv);
    if (QCoreApplication::arguments().contains(restoringArgument))
        return endedByTwoSignals();
    TerminationSignalsTest test;
    return QTest::qExec(&test, argc, argv);
}

#include "TerminationSignalsTest.moc"
