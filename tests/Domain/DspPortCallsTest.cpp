// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/DspPort.h"
#include "tests/Domain/DspTestParts.h"
#include "tests/support/InstantDsp.h"

#include <QElapsedTimer>
#include <QTest>

#include <algorithm>
#include <atomic>
#include <climits>
#include <csignal>
#include <cstdlib>
#include <memory>

using Domain::DspPort;
namespace InstantDsp = TestSupport::InstantDsp;

namespace
{

const QStringList openingCalls{
    QStringLiteral("PROC_setup(null)"),
    QStringLiteral("PROC_attach(0, null)"),
    QStringLiteral("POOL_open(0, 4: 10 x 2048, 2 x 128, 2 x 128, 4 x 128, exact)"),
    QStringLiteral("MSGQ_open(GPPMSGQ1, null)"),
    QStringLiteral("MSGQ_setErrorHandler(10000, 0)"),
    QStringLiteral("PROC_load(0, /dsp.out, 0, null)"),
    QStringLiteral("PROC_start(0)"),
    QStringLiteral("MSGQ_transportOpen(0, 0)"),
    QStringLiteral("MSGQ_locate(DSPMSGQ0, ffffffff)"),
};
const QStringList closingCalls{
    QStringLiteral("MSGQ_transportClose(0)"), QStringLiteral("PROC_stop(0)"),   QStringLiteral("MSGQ_close(10000)"),
    QStringLiteral("POOL_close(0)"),          QStringLiteral("PROC_detach(0)"),
};

} // namespace

/// The calls by which the port opens and closes the link, all of them: some of them nobody hears at the other end.
class DspPortCallsTest : public QObject
{
    Q_OBJECT

private:
    std::unique_ptr<TestSupport::LogCapture> log;
    std::unique_ptr<DspPort> port;

private slots:
    void init()
    {
        log = std::make_unique<TestSupport::LogCapture>();
        port = std::make_unique<DspPort>(QStringLiteral("/dsp.out"));
        (void)InstantDsp::takeCalls();
    }

    void cleanup()
    {
        port.reset();
        InstantDsp::refuse();
        InstantDsp::during();
        log.reset();
    }

    void openingIsNineCallsInOrder()
    {
        QVERIFY(port->open(QIODevice::ReadWrite));
        QCOMPARE(InstantDsp::takeCalls(), openingCalls);
    }

    void terminationSignalsStayTheProgramsOwn_data()
    {
        QTest::addColumn<QByteArray>("call");
        QTest::newRow("none") << QByteArray();
        QTest::newRow("PROC_setup") << QByteArray("PROC_setup");
        QTest::newRow("PROC_attach") << QByteArray("PROC_attach");
    }

    /// Whatever handlers the device's library sets for them.
    void terminationSignalsStayTheProgramsOwn()
    {
        QFETCH(const QByteArray, call);
        const auto ownHandler = [](int) {};
        for (const int number : {SIGTERM, SIGINT})
            std::signal(number, ownHandler);
        InstantDsp::during(call.constData(), [] {
            for (const int number : {SIGTERM, SIGINT})
                std::signal(number, [](int) { std::_Exit(1); });
        });
        QVERIFY(port->open(QIODevice::ReadWrite));
        for (const int number : {SIGTERM, SIGINT}) {
            const auto after = std::signal(number, SIG_DFL);
            QVERIFY(after == +ownHandler);
        }
    }

    /// The program's handler has taken itself away, and the library has put its own in its place.
    void theyDoSoWhenASignalComesMeanwhile()
    {
        const auto ownHandler = [](int number) { std::signal(number, SIG_DFL); };
        std::signal(SIGTERM, ownHandler);
        InstantDsp::during("PROC_attach", [] {
            std::raise(SIGTERM);
            std::signal(SIGTERM, [](int) { std::_Exit(1); });
        });
        QVERIFY(port->open(QIODevice::ReadWrite));
        const auto after = std::signal(SIGTERM, SIG_DFL);
        QVERIFY(after == +ownHandler);
    }

    void closingIsFiveCallsInOrder()
    {
        QVERIFY(port->open(QIODevice::ReadWrite));
        (void)InstantDsp::takeCalls();
        port->close();
        QCOMPARE(InstantDsp::takeCalls(), closingCalls);
        port->close(); // of a closed port is nothing
        QCOMPARE(InstantDsp::takeCalls(), QStringList());
    }

    void destructionOfAnOpenPortClosesIt()
    {
        QVERIFY(port->open(QIODevice::ReadWrite));
        (void)InstantDsp::takeCalls();
        port.reset();
        QCOMPARE(InstantDsp::takeCalls(), closingCalls);
    }

    void aRefusedCallIsFatalAndTheSequenceCarriesOn_data()
    {
        QTest::addColumn<QString>("text");
        QTest::newRow("PROC_setup") << "PROC_setup(NULL)";
        QTest::newRow("PROC_attach") << "PROC_attach(dspProcessorId, NULL)";
        QTest::newRow("POOL_open") << "POOL_open(this->privateData->applicationPoolId, &poolAttributes)";
        QTest::newRow("MSGQ_open")
            << "MSGQ_open(processorMessageQueueName, &this->privateData->processorMessageQueue, NULL)";
        QTest::newRow("MSGQ_setErrorHandler") << "MSGQ_setErrorHandler(this->privateData->processorMessageQueue, "
                                                 "this->privateData->applicationPoolId)";
        QTest::newRow("PROC_load")
            << "PROC_load(dspProcessorId, this->privateData->dspExecutablePath.toAscii().data(), 0, NULL)";
        QTest::newRow("PROC_start") << "PROC_start(dspProcessorId)";
        QTest::newRow("MSGQ_transportOpen") << "MSGQ_transportOpen(dspProcessorId, &mqtAttrs)";
        QTest::newRow("MSGQ_locate")
            << "MSGQ_locate(dspMessageQueueName, &this->privateData->dspMessageQueue, &syncLocateAttrs)";
    }

    void aRefusedCallIsFatalAndTheSequenceCarriesOn()
    {
        QFETCH(const QString, text);
        const QByteArray refused = QTest::currentDataTag();
        InstantDsp::refuse(refused.constData());
        QVERIFY(port->open(QIODevice::ReadWrite));
        InstantDsp::refuse();
        QStringList calls = openingCalls;
        if (refused == "MSGQ_open") // there is no queue then
            calls.replaceInStrings(QStringLiteral("(10000, 0)"), QStringLiteral("(ffff, 0)"));
        QCOMPARE(InstantDsp::takeCalls(), calls);
        // The start is reported before the transport opens, whatever came of it.
        const bool afterTheStart = refused == "MSGQ_transportOpen" || refused == "MSGQ_locate";
        QStringList expected{"DspLink: DSP execution started successfully.", "DspPort: open complete."};
        expected.insert(afterTheStart ? 1 : 0, "(priority 0) DspPort: " + text + ". Status = 0x80008028");
        QCOMPARE(TestSupport::sourcedTexts(*log, TestSupport::Priorities::Shown), expected);
    }

    void messagesAreWaitedForHalfASecondAtATime()
    {
        QVERIFY(port->open(QIODevice::ReadWrite));
        QTRY_VERIFY(InstantDsp::fetches() > 0);
        QCOMPARE(InstantDsp::fetchTimeout(), 500U);
    }

    void aRefusedFetchIsRepeatedTwiceASecondAtMost()
    {
        InstantDsp::refuse("MSGQ_get");
        const std::size_t before = InstantDsp::fetches();
        QElapsedTimer clock;
        clock.start();
        QVERIFY(port->open(QIODevice::ReadWrite));
        QTRY_VERIFY(InstantDsp::fetches() > before);
        QTest::qSleep(1200);
        const std::size_t fetches = InstantDsp::fetches() - before;
        constexpr qint64 shortestPause = 450; // ms; a wait may end a little early
        const auto most = static_cast<std::size_t>(clock.elapsed() / shortestPause + 1);
        QVERIFY2(fetches <= most, qPrintable(QString::number(fetches)));
    }

    void closingCutsThePauseAfterARefusedFetch()
    {
        InstantDsp::refuse("MSGQ_get");
        qint64 shortest = LLONG_MAX; // of several: the machine may be busy
        for (int round = 0; round < 5; ++round) {
            std::size_t before = InstantDsp::fetches();
            QVERIFY(port->open(QIODevice::ReadWrite));
            QTRY_VERIFY(InstantDsp::fetches() > before);
            before = InstantDsp::fetches();
            QElapsedTimer clock;
            clock.start();
            port->close();
            const auto elapsed = clock.elapsed();
            const auto more = InstantDsp::fetches() - before;
            QVERIFY(more <= 1 || elapsed >= 450); // one may have been on its way
            shortest = std::min(shortest, elapsed);
        }
        QVERIFY2(shortest < 300, qPrintable(QString::number(shortest)));
    }

    /// The base class finds it out on first use and remembers it: not in two threads at once.
    void whetherItIsSequentialIsKnownBeforeAnyThreadUsesIt()
    {
        struct AskedPort : DspPort
        {
            using DspPort::DspPort;
            bool isSequential() const override
            {
                ++asked;
                return DspPort::isSequential();
            }
            mutable std::atomic<int> asked = 0;
        } askedPort(QStringLiteral("/dsp.out"));
        for (int round = 0; round < 2; ++round) {
            QVERIFY(askedPort.open(QIODevice::ReadWrite));
            QVERIFY(askedPort.asked > round); // opening forgets
            const int before = askedPort.asked;
            QCOMPARE(askedPort.write("command!", 8), 8);
            QTRY_VERIFY(askedPort.bytesAvailable() > 0);
            QCOMPARE(askedPort.readLine(askedPort.maxBytesAvailable() + 1).size(), 12);
            QCOMPARE(askedPort.asked.load(), before);
            askedPort.close();
        }
    }
};

QTEST_GUILESS_MAIN(DspPortCallsTest)
#include "DspPortCallsTest.moc"
