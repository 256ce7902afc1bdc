// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/TerminationSignals.h"

#include "tests/presentation/RfPanel.h"

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
        QCOMPARE(panel.taken(), Journal({"amplifier on", "start 2 0"}));
        QCOMPARE(panel.beacon.looks, 100);
        QCOMPARE(panel.afterCalling(&RfTest::frequencyUp), Journal({"stop", "start 40 0"}));
        QCOMPARE(panel.beacon.looks, 100);
    }

    void afterASignalTheDspIsAskedForNothing()
    {
        const TerminationSignals signalsOfTheProgram;
        Panel panel;
        std::raise(SIGTERM);
        QCOMPARE(panel.afterCalling(&RfTest::toggleExternalAntenna), Journal{});
        QCOMPARE(panel.text("labelRadios"), QStringLiteral("External RF"));
    }
};

QTEST_MAIN(TerminationSignalsTest)
#include "TerminationSignalsTest.moc"
