// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/BeaconProcessor.h"
#include "Domain/src/DomainLayer/SerialPort.h"
#include "tests/Domain/Radio.h"
#include "tests/support/LogCapture.h"

#include <QTest>

#include <array>
#include <atomic>
#include <thread>
#include <vector>

using Domain::BeaconProcessor;
using Domain::SerialPort;
using TestSupport::frameOf;
using TestSupport::generousMs;
using TestSupport::LogCapture;
using TestSupport::Pty;
using TestSupport::Radio;
using TestSupport::RadioPeer;

namespace
{

/// A real port that knows who has written to it, and fails one write if it is told to.
class WatchedPort : public SerialPort
{
public:
    using SerialPort::SerialPort;

    std::atomic<int> writes = 0;
    std::atomic<QThread*> lastWriter = nullptr;
    int failingWrite = 0;

protected:
    qint64 writeData(const char* bytes, qint64 count) override
    {
        lastWriter = QThread::currentThread();
        return ++writes == failingWrite ? -1 : SerialPort::writeData(bytes, count);
    }
};

} // namespace

/// One command in flight, the others waiting: order, failures, threads, beginning and end.
class BeaconEngineTest : public QObject
{
    Q_OBJECT

private slots:
    void init();
    void cleanup() { log.reset(); }

    void onlyOneCommandIsInFlight();
    void sevenCommandsBackToBackAllArriveAndTwoWarn();
    void aRefusedCommandIsFollowedByTheNext();
    void aRefusalWithoutAReasonEndsNothing();
    void repliesForNobodyDoNoHarm();
    void aFailedQueuedSendClearsThePendingFlag();
    void afterAFailedQueuedSendTheNextCommandGoesOutAtOnce();
    void pendingEndsWithoutTheCallersEventLoop();
    void commandsOfManyThreadsAllArriveInEachThreadsOrder();
    void aCommandRightAfterConstructionIsSent();
    void aConversationSurvivesNoise();
    void aMissingLineDoesNotKeepTheProcessorFromStanding();
    void mayBeDestroyedInTheMiddleOfEverything();
    void aNewProcessorGoesOnWithAnOpenPort();
    void anErrorIsToldBeforeTheNextCommandGoesOut_data();
    void anErrorIsToldBeforeTheNextCommandGoesOut();
    void theFirstCommandIsWrittenByItsCallerAndTheQueuedOneByTheWorker();
    void repliesAreToldOnAWorkerThreadOfHighPriority();
    void theObjectsOfTheWorkerAreMadeOnce();

private:
    std::unique_ptr<LogCapture> log;
};

void BeaconEngineTest::init()
{
    TestSupport::makeResetLine();
    log = std::make_unique<LogCapture>();
}

void BeaconEngineTest::onlyOneCommandIsInFlight()
{
    Radio radio;
    QVERIFY(radio.processor.sendPing());
    QVERIFY(radio.processor.checkRadioInterface());
    QVERIFY(radio.takes({"\x7E"}));
    QVERIFY(radio.settles());
    QCOMPARE(radio.peer.commands(), QList<QByteArray>{"\x7E"});
    radio.says("\xFE");
    QVERIFY(radio.takes({"\x7E", "\x62"}));
    QVERIFY(radio.processor.isCommandPending());
    radio.says("\xFE");
    QVERIFY(radio.becomesIdle());
    QCOMPARE(radio.events, QStringList());
}

void BeaconEngineTest::sevenCommandsBackToBackAllArriveAndTwoWarn()
{
    Radio radio;
    QList<QByteArray> expected;
    for (int mode = 0; mode < 7; ++mode) {
        QVERIFY(radio.processor.setAccelMode(static_cast<uchar>(mode)));
        expected.append(QByteArray("\x30") + static_cast<char>(mode));
    }
    QVERIFY(radio.takes({expected.front()}));
    // The sixth that waits is one too many: that is the seventh command.
    QVERIFY(log->waitFor(", Beacon processor message queue over maximum"));
    QVERIFY(radio.processor.setAccelMode(7));
    expected.append("\x30\x07");
    QVERIFY(log->waitFor(", Beacon processor message queue over maximum", 2));
    radio.peer.answerWith(RadioPeer::wellBehaved);
    radio.says("\xFE");
    QVERIFY(radio.takes(expected));
    QVERIFY(radio.becomesIdle());
    // By now every line has come.
    QCOMPARE(log->lines().size(), std::size_t(2));
}

void BeaconEngineTest::aRefusedCommandIsFollowedByTheNext()
{
    Radio radio;
    QVERIFY(radio.processor.sendPing());
    QVERIFY(radio.processor.checkRadioInterface());
    QVERIFY(radio.takes({"\x7E"}));
    radio.pty.write(RadioPeer::nak('\xC8'));
    QVERIFY(radio.takes({"\x7E", "\x62"}));
    QVERIFY(radio.tells({"error 0"}));
    QVERIFY(log->waitFor(", Received application-level NAK with data = 200"));
    QVERIFY(radio.processor.isCommandPending());
}

void BeaconEngineTest::aRefusalWithoutAReasonEndsNothing()
{
    Radio radio;
    QVERIFY(radio.processor.sendPing());
    QVERIFY(radio.processor.checkRadioInterface());
    radio.says("\xFF");
    QVERIFY(radio.tells({"error 4"}));
    QVERIFY(radio.settles());
    QVERIFY(radio.processor.isCommandPending());
    QCOMPARE(radio.peer.commands().size(), 1);
}

void BeaconEngineTest::repliesForNobodyDoNoHarm()
{
    Radio radio;
    radio.pty.write(RadioPeer::ack() + RadioPeer::nak(1) + RadioPeer::ack());
    QVERIFY(radio.tells({"error 0"}));
    QVERIFY(radio.settles());
    QVERIFY(!radio.processor.isCommandPending());
    radio.peer.answerWith(RadioPeer::wellBehaved);
    QVERIFY(radio.processor.sendPing());
    QVERIFY(radio.tells({"error 0", "pingResponse"}));
}

void BeaconEngineTest::aFailedQueuedSendClearsThePendingFlag()
{
    auto lost = std::make_unique<Pty>();
    SerialPort port(lost->name(), SerialPort::Baud115200);
    BeaconProcessor processor(port);
    QVERIFY(processor.sendPing());
    QVERIFY(processor.checkRadioInterface());
    lost.reset();
    QMetaObject::invokeMethod(&processor, "processMessage", Qt::QueuedConnection, Q_ARG(QByteArray, "\xFE"));
    QTRY_VERIFY(!processor.isCommandPending());
    QVERIFY(log->waitFor(", Unable to send serial packet"));
}

/// It overtakes those that wait, which follow it.
void BeaconEngineTest::afterAFailedQueuedSendTheNextCommandGoesOutAtOnce()
{
    Pty pty;
    WatchedPort port(pty.name(), SerialPort::Baud115200);
    port.failingWrite = 2;
    BeaconProcessor processor(port);
    const RadioPeer peer(pty);
    QVERIFY(processor.sendPing());
    QVERIFY(processor.checkRadioInterface());
    QVERIFY(processor.toggleFramePulseLine());
    pty.write(RadioPeer::ack());
    QTRY_VERIFY(!processor.isCommandPending());
    QVERIFY(processor.stopTransmittingRfTestPacket());
    QVERIFY(processor.isCommandPending());
    QTRY_COMPARE(peer.commands(), (QList<QByteArray>{"\x7E", "\x61"}));
    pty.write(RadioPeer::ack());
    QTRY_COMPARE(peer.commands(), (QList<QByteArray>{"\x7E", "\x61", "\x65"}));
}

void BeaconEngineTest::pendingEndsWithoutTheCallersEventLoop()
{
    Radio radio;
    radio.peer.answerWith(RadioPeer::wellBehaved);
    for (int round = 0; round < 100; ++round) {
        QVERIFY(radio.processor.setPowerAmpEnable(round % 2 == 0));
        const QDeadlineTimer deadline(generousMs);
        while (radio.processor.isCommandPending() && !deadline.hasExpired())
            std::this_thread::yield();
        QVERIFY(!deadline.hasExpired());
    }
}

void BeaconEngineTest::commandsOfManyThreadsAllArriveInEachThreadsOrder()
{
    constexpr int threadCount = 4;
    constexpr int commandsEach = 100;
    Radio radio;
    radio.peer.answerWith(RadioPeer::wellBehaved);
    std::atomic<int> refused = 0;
    std::vector<std::thread> threads;
    for (int thread = 0; thread < threadCount; ++thread)
        threads.emplace_back([&, thread] {
            for (int index = 0; index < commandsEach; ++index)
                refused +=
                    !radio.processor.transmitPacket(static_cast<unsigned>(thread), 2, static_cast<uchar>(index), "x");
        });
    for (auto& thread : threads)
        thread.join();
    QCOMPARE(refused.load(), 0);
    QTRY_COMPARE_WITH_TIMEOUT(radio.peer.commands().size(), threadCount * commandsEach, generousMs);
    std::array<int, threadCount> next{};
    for (const auto& command : radio.peer.commands()) {
        constexpr qsizetype addressOffset = 3;
        constexpr qsizetype argumentOffset = 5;
        const auto thread = static_cast<std::size_t>(static_cast<uchar>(command.at(addressOffset)));
        QCOMPARE(int(command.at(argumentOffset)), next.at(thread)++);
    }
    QVERIFY(radio.becomesIdle());
    QCOMPARE(radio.events, QStringList());
}

void BeaconEngineTest::aCommandRightAfterConstructionIsSent()
{
    const Pty pty;
    for (int round = 0; round < 50; ++round) {
        SerialPort port(pty.name(), SerialPort::Baud115200);
        BeaconProcessor processor(port);
        QVERIFY(processor.sendPing());
        QCOMPARE(TestSupport::payloadOf(pty.read(9)), QByteArray("\x7E"));
    }
    QCOMPARE(log->texts(), QStringList());
}

void BeaconEngineTest::aConversationSurvivesNoise()
{
    Radio radio;
    radio.peer.answerWith([generator = TestSupport::Generator(41)](const QByteArray& command) mutable {
        const auto noise = [&] {
            return TestSupport::randomBytes(generator, TestSupport::randomBetween(generator, 0, 150));
        };
        // Behind the answer enough bytes for any false header in the noise to be seen through.
        return noise() + RadioPeer::ack() + noise() + frameOf("\x7F") + QByteArray(200, command.front());
    });
    constexpr int rounds = 200;
    for (int round = 0; round < rounds; ++round) {
        QVERIFY(radio.processor.sendPing());
        QVERIFY(radio.becomesIdle());
    }
    QVERIFY(radio.tells(QStringList(rounds, "pingResponse")));
    QCOMPARE(radio.peer.commands().size(), rounds);
}

void BeaconEngineTest::aMissingLineDoesNotKeepTheProcessorFromStanding()
{
    SerialPort port("/dev/ttyS1", SerialPort::Baud115200);
    BeaconProcessor processor(port);
    QVERIFY(log->waitFor(", Unable to open beacon serial port"));
    QVERIFY(!processor.sendPing());
    QVERIFY(processor.isCommandPending());
}

void BeaconEngineTest::mayBeDestroyedInTheMiddleOfEverything()
{
    for (int round = 0; round < 20; ++round) {
        Pty pty;
        SerialPort port(pty.name(), SerialPort::Baud115200);
        auto processor = std::make_unique<BeaconProcessor>(port);
        RadioPeer peer(pty);
        peer.answerWith(RadioPeer::wellBehaved);
        for (int index = 0; index < 20; ++index) {
            QVERIFY(processor->sendPing());
            pty.write(frameOf("\x7F") + "|noise|" + frameOf("\x7B"));
        }
        processor.reset();
    }
}

void BeaconEngineTest::aNewProcessorGoesOnWithAnOpenPort()
{
    Pty pty;
    SerialPort port(pty.name(), SerialPort::Baud115200);
    std::make_unique<BeaconProcessor>(port).reset();
    BeaconProcessor processor(port);
    QVERIFY(log->waitFor(", Unable to open beacon serial port"));
    RadioPeer peer(pty);
    peer.answerWith(RadioPeer::wellBehaved);
    bool answered = false;
    connect(&processor, &BeaconProcessor::pingResponse, this, [&] { answered = true; });
    QVERIFY(processor.sendPing());
    QTRY_VERIFY(answered);
}

void BeaconEngineTest::anErrorIsToldBeforeTheNextCommandGoesOut_data()
{
    QTest::addColumn<bool>("refused");
    QTest::addRow("refused") << true;
    QTest::addRow("timed out") << false;
}

void BeaconEngineTest::anErrorIsToldBeforeTheNextCommandGoesOut()
{
    QFETCH(const bool, refused);
    const Pty pty;
    WatchedPort port(pty.name(), SerialPort::Baud115200);
    BeaconProcessor processor(port);
    std::atomic<int> writesBefore = 0;
    connect(
        &processor, &BeaconProcessor::error, this, [&] { writesBefore = port.writes.load(); }, Qt::DirectConnection);
    QVERIFY(processor.sendPing());
    QVERIFY(processor.checkRadioInterface());
    if (refused)
        QMetaObject::invokeMethod(&processor, "processMessage", Qt::BlockingQueuedConnection,
                                  Q_ARG(QByteArray, QByteArray("\xFF\x01")));
    else
        QMetaObject::invokeMethod(&processor, "timeout", Qt::BlockingQueuedConnection);
    QCOMPARE(writesBefore.load(), 1);
    QCOMPARE(port.writes.load(), 2);
}

void BeaconEngineTest::theFirstCommandIsWrittenByItsCallerAndTheQueuedOneByTheWorker()
{
    const Pty pty;
    WatchedPort port(pty.name(), SerialPort::Baud115200);
    BeaconProcessor processor(port);
    QVERIFY(processor.sendPing());
    QCOMPARE(port.writes.load(), 1);
    QCOMPARE(port.lastWriter.load(), QThread::currentThread());
    QVERIFY(processor.sendPing());
    QCOMPARE(port.writes.load(), 1);
    pty.write(RadioPeer::ack());
    QTRY_COMPARE(port.writes.load(), 2);
    QCOMPARE(port.lastWriter.load(), processor.thread());
}

void BeaconEngineTest::repliesAreToldOnAWorkerThreadOfHighPriority()
{
    std::atomic<QThread*> teller = nullptr;
    Radio radio;
    QThread* const worker = radio.processor.thread();
    QVERIFY(worker != QThread::currentThread());
    QCOMPARE(worker->priority(), QThread::HighPriority);
    connect(
        &radio.processor, &BeaconProcessor::pingResponse, this, [&] { teller = QThread::currentThread(); },
        Qt::DirectConnection);
    radio.says("\x7F");
    QTRY_COMPARE(teller.load(), worker);
}

void BeaconEngineTest::theObjectsOfTheWorkerAreMadeOnce()
{
    Radio radio;
    QMetaObject::invokeMethod(&radio.processor, "createObjectsOnThread", Qt::BlockingQueuedConnection);
    QCOMPARE(log->texts(), QStringList());
    radio.peer.answerWith(RadioPeer::wellBehaved);
    QVERIFY(radio.processor.sendPing());
    QVERIFY(radio.tells({"pingResponse"}));
    QVERIFY(radio.settles());
    QCOMPARE(radio.events, QStringList{"pingResponse"});
}

QTEST_GUILESS_MAIN(BeaconEngineTest)
#include "BeaconEngineTest.moc"
