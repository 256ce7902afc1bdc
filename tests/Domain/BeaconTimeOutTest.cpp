// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/BeaconProcessor.h"
#include "Domain/src/DomainLayer/SerialPort.h"
#include "tests/Domain/Radio.h"
#include "tests/support/LogCapture.h"

#include <QElapsedTimer>
#include <QTest>
#include <QTimer>

#include <atomic>
#include <functional>
#include <thread>

using Domain::BeaconProcessor;
using Domain::SerialPort;
using TestSupport::generousMs;
using TestSupport::LogCapture;
using TestSupport::Pty;
using TestSupport::Radio;
using TestSupport::RadioPeer;

namespace
{

/// A real port whose writes come back late, as they do when the writing thread loses the processor.
class LingeringPort : public SerialPort
{
public:
    using SerialPort::SerialPort;

    std::function<bool()> lingerUntil = [] { return true; };

protected:
    qint64 writeData(const char* bytes, qint64 count) override
    {
        const auto written = SerialPort::writeData(bytes, count);
        const QDeadlineTimer deadline(generousMs);
        while (!lingerUntil() && !deadline.hasExpired())
            std::this_thread::yield();
        return written;
    }
};

/// A real port whose first write fails, after a while.
class FailingFirstWritePort : public SerialPort
{
public:
    using SerialPort::SerialPort;

    std::atomic<bool> entered = false;
    std::atomic<bool> released = false;

protected:
    qint64 writeData(const char* bytes, qint64 count) override
    {
        if (entered.exchange(true))
            return SerialPort::writeData(bytes, count);
        const QDeadlineTimer deadline(generousMs);
        while (!released && !deadline.hasExpired())
            std::this_thread::yield();
        return -1;
    }
};

/// Tells what kind of timer ran out.
class TimerTellingProcessor : public BeaconProcessor
{
public:
    explicit TimerTellingProcessor(SerialPort& port) : BeaconProcessor(port)
    {
        connect(
            this, &BeaconProcessor::error, &listener, [this] { look(); }, Qt::DirectConnection);
    }

    std::atomic<int> timeOuts = 0;
    std::atomic<bool> isSingleShot = false;
    std::atomic<int> interval = 0;

private:
    /// On the worker thread, within the slot that the timer has called.
    void look()
    {
        const auto* const timer = qobject_cast<QTimer*>(sender());
        isSingleShot = timer != nullptr && timer->isSingleShot();
        interval = timer != nullptr ? timer->interval() : 0;
        ++timeOuts;
    }

    QObject listener; ///< Were it the processor, that would be its own signal's receiver, and its sender.
};

} // namespace

/// The timer that ends a command nobody acknowledges: when it runs, when it does not, and what follows.
class BeaconTimeOutTest : public QObject
{
    Q_OBJECT

private slots:
    void init();
    void cleanup() { log.reset(); }

    void theThreeSecondsBeginBeforeTheFirstByteLeaves();
    void aTimedOutCommandIsFollowedByTheNextAndNotRepeated();
    void anAcknowledgementWithDataLeavesTheCommandToTimeOut();
    void aFailedSendLeavesTheCommandPendingWithoutATimer();
    void aTimeoutWithNothingPendingIsSilent();
    void anAcknowledgementHandledBeforeTheWriteReturnsLeavesNoTimerBehind();
    void aFailedSendLeavesTheTimerOfACommandSentMeanwhileAlone();

private:
    std::unique_ptr<LogCapture> log;
};

void BeaconTimeOutTest::init()
{
    TestSupport::makeResetLine();
    log = std::make_unique<LogCapture>();
}

/// While the write has not come back only a timer that was started before it can run out.
void BeaconTimeOutTest::theThreeSecondsBeginBeforeTheFirstByteLeaves()
{
    const Pty pty;
    LingeringPort port(pty.name(), SerialPort::Baud115200);
    TimerTellingProcessor processor(port);
    port.lingerUntil = [&] { return processor.timeOuts > 0; };
    QVERIFY(processor.sendPing());
    QCOMPARE(processor.timeOuts.load(), 1);
    QVERIFY(processor.isSingleShot);
    QCOMPARE(processor.interval.load(), 3000);
    QVERIFY(log->waitFor(", Beacon processor timed out"));
}

void BeaconTimeOutTest::aTimedOutCommandIsFollowedByTheNextAndNotRepeated()
{
    Radio radio;
    QElapsedTimer clock;
    clock.start();
    QVERIFY(radio.processor.sendPing());
    QVERIFY(radio.processor.checkRadioInterface());
    radio.peer.answerWith(
        [](const QByteArray& command) { return command == "\x62" ? RadioPeer::ack() : QByteArray(); });
    QVERIFY(radio.takes({"\x7E", "\x62"}));
    QVERIFY(radio.tells({"error 1"}));
    QVERIFY2(clock.elapsed() >= 3000, qPrintable(QString::number(clock.elapsed())));
    QVERIFY(log->waitFor(", Beacon processor timed out"));
    QVERIFY(radio.becomesIdle());
    QVERIFY(radio.settles());
    QCOMPARE(radio.peer.commands().size(), 2);
    QCOMPARE(log->lines().size(), std::size_t(1));
}

void BeaconTimeOutTest::anAcknowledgementWithDataLeavesTheCommandToTimeOut()
{
    Radio radio;
    QVERIFY(radio.processor.sendPing());
    QVERIFY(radio.processor.checkRadioInterface());
    radio.says(QByteArray("\xFE\x00", 2));
    QVERIFY(radio.tells({"error 4"}));
    QVERIFY(radio.settles());
    QVERIFY(radio.processor.isCommandPending());
    QCOMPARE(radio.peer.commands().size(), 1);
    QVERIFY(radio.tells({"error 4", "error 1"}));
    QVERIFY(radio.takes({"\x7E", "\x62"}));
}

void BeaconTimeOutTest::aFailedSendLeavesTheCommandPendingWithoutATimer()
{
    const Pty pty;
    auto lost = std::make_unique<Pty>();
    SerialPort port(lost->name(), SerialPort::Baud115200);
    BeaconProcessor processor(port);
    int errors = 0;
    connect(
        &processor, &BeaconProcessor::error, this, [&] { ++errors; }, Qt::DirectConnection);
    lost.reset();
    QVERIFY(!processor.sendPing());
    QVERIFY(log->waitFor(", Unable to send serial packet"));
    QVERIFY(processor.isCommandPending());
    QVERIFY(processor.sendPing());
    // A timer would have run out by then.
    QTest::qWait(3500);
    QVERIFY(processor.isCommandPending());
    QCOMPARE(errors, 0);
    QCOMPARE(log->count(", Beacon processor timed out"), 0);
}

void BeaconTimeOutTest::aTimeoutWithNothingPendingIsSilent()
{
    Radio radio;
    QMetaObject::invokeMethod(&radio.processor, "timeout", Qt::BlockingQueuedConnection);
    QVERIFY(radio.settles());
    QCOMPARE(radio.events, QStringList());
    QCOMPARE(log->texts(), QStringList());
}

void BeaconTimeOutTest::anAcknowledgementHandledBeforeTheWriteReturnsLeavesNoTimerBehind()
{
    Pty pty;
    LingeringPort port(pty.name(), SerialPort::Baud115200);
    BeaconProcessor processor(port);
    RadioPeer peer(pty);
    peer.answerWith(RadioPeer::wellBehaved);
    int errors = 0;
    connect(
        &processor, &BeaconProcessor::error, this, [&] { ++errors; }, Qt::DirectConnection);
    port.lingerUntil = [&] { return !processor.isCommandPending(); };
    QVERIFY(processor.sendPing());
    QVERIFY(!processor.isCommandPending());
    // A timer that was left behind would have run out by then.
    QTest::qWait(3500);
    QCOMPARE(errors, 0);
    QCOMPARE(log->texts(), QStringList());
}

/// Its timer was on the way to be stopped when the next command got the timer.
void BeaconTimeOutTest::aFailedSendLeavesTheTimerOfACommandSentMeanwhileAlone()
{
    Pty pty;
    FailingFirstWritePort port(pty.name(), SerialPort::Baud115200);
    BeaconProcessor processor(port);
    const RadioPeer peer(pty);
    std::atomic<int> errors = 0;
    connect(
        &processor, &BeaconProcessor::error, this, [&] { ++errors; }, Qt::DirectConnection);
    std::atomic<bool> sent = true;
    std::thread caller([&] { sent = processor.sendPing(); });
    const bool entered = QTest::qWaitFor([&] { return port.entered.load(); }, generousMs);
    const bool queued = processor.checkRadioInterface();
    // An acknowledgement that belongs to nobody.
    QMetaObject::invokeMethod(&processor, "processMessage", Qt::BlockingQueuedConnection,
                              Q_ARG(QByteArray, QByteArray("\xFE")));
    const bool taken = QTest::qWaitFor([&] { return peer.commands() == QList<QByteArray>{"\x62"}; }, generousMs);
    port.released = true;
    caller.join();
    QVERIFY(entered && queued && taken && !sent);
    QTRY_COMPARE_WITH_TIMEOUT(errors.load(), 1, generousMs);
    QVERIFY(log->waitFor(", Beacon processor timed out"));
    QTRY_VERIFY(!processor.isCommandPending());
}

QTEST_GUILESS_MAIN(BeaconTimeOutTest)
#include "BeaconTimeOutTest.moc"
