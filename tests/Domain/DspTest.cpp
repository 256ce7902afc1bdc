// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/Dsp.h"

#include "Domain/src/DomainLayer/DspPort.h"
#include "tests/Domain/DspTestParts.h"

#include <QElapsedTimer>
#include <QMetaMethod>
#include <QScopeGuard>
#include <QSemaphore>
#include <QTest>
#include <QThread>

#include <atomic>
#include <functional>
#include <future>
#include <memory>
#include <thread>

using namespace Domain;
using TestSupport::DspPeer;
using TestSupport::sourcedTexts;
using Command = std::function<bool(Dsp&)>;
Q_DECLARE_METATYPE(Command)

namespace
{

constexpr quint32 ack = 0x1100B;
constexpr quint32 nak = 0x1100C;

QByteArray commandMessage(quint32 command, std::initializer_list<quint32> payload)
{
    return DspPeer::dspMessage(command, DspPeer::words(payload));
}

/// Returns from a write only when the answer to it has been handled.
class PatientPort : public DspPort
{
public:
    PatientPort() : DspPort(QStringLiteral("/dsp.out")) {}

    QSemaphore answered;

protected:
    qint64 writeData(const char* data, qint64 size) override
    {
        const qint64 written = DspPort::writeData(data, size);
        return answered.tryAcquire(1, 20000) ? written : -1;
    }
};

/// Returns from opening only when a first message has been announced.
class HeraldedPort : public DspPort
{
public:
    HeraldedPort() : DspPort(QStringLiteral("/dsp.out"))
    {
        connect(
            this, &DspPort::readyRead, this, [this] { announced.release(); }, Qt::DirectConnection);
    }

    bool open(OpenMode mode) override { return DspPort::open(mode) && announced.tryAcquire(1, 20000); }

private:
    QSemaphore announced;
};

} // namespace

/// The commands and their acknowledgements, over the port, the host library and a real socket.
class DspTest : public QObject
{
    Q_OBJECT

private:
    std::unique_ptr<TestSupport::LogCapture> log;
    std::unique_ptr<DspPeer> peer;
    std::unique_ptr<DspPort> port;
    std::unique_ptr<TestSupport::AssertionLine> buttons;
    std::unique_ptr<Dsp> dsp;

    QList<QByteArray> commands() const
    {
        QList<QByteArray> all;
        for (const auto& message : peer->messages())
            all.append(message.data.first(8 + message.word(4)));
        return all;
    }

    void refuseAll()
    {
        peer->onMessage(
            [](DspPeer& device, const auto& message) { device.sendDsp(nak, DspPeer::words({message.word(0)})); });
    }

private slots:
    void initTestCase() { TestSupport::writeFirmware(); }

    void init()
    {
        log = std::make_unique<TestSupport::LogCapture>();
        peer = std::make_unique<DspPeer>();
        peer->acknowledgeAll();
        port = std::make_unique<DspPort>(QStringLiteral("/dsp.out"));
        buttons = std::make_unique<TestSupport::AssertionLine>();
        dsp = std::make_unique<Dsp>(*port, *buttons);
        (void)sourcedTexts(*log);
    }

    void cleanup()
    {
        peer.reset(); // first: with nothing to wait for the port closes quicker
        dsp.reset();
        buttons.reset();
        port.reset();
        log.reset();
    }

    void itLivesOnAWorkerThreadAndOwnsThePortsOpening()
    {
        QVERIFY(dsp->thread() != QThread::currentThread());
        QVERIFY(dsp->thread()->isRunning());
        QCOMPARE(dsp->thread()->priority(), QThread::HighestPriority);
        QVERIFY(port->isOpen());
        QCOMPARE(port->openMode(), QIODevice::ReadWrite | QIODevice::Unbuffered);
        dsp.reset();
        QVERIFY(!port->isOpen());
    }

    void theMetaObjectNamesSignalsAndSlots()
    {
        const auto described = [](const QMetaObject& meta) {
            QStringList all;
            for (int index = meta.methodOffset(); index < meta.methodCount(); ++index) {
                const QMetaMethod method = meta.method(index);
                const bool isSignal = method.methodType() == QMetaMethod::Signal;
                const char* const kind = isSignal                                 ? "signal"
                                         : method.access() == QMetaMethod::Public ? "slot"
                                                                                  : "own slot";
                all.append(QStringLiteral("%1 %2(%3)").arg(kind, method.name(), method.parameterNames().join(',')));
            }
            return all;
        };
        QCOMPARE(described(AbstractDsp::staticMetaObject),
                 (QStringList{"signal versionReceived(version)", "slot requestVersion()",
                              "slot setReceiverEnableTest(type)", "slot runHardwareTest(testId)"}));
        QCOMPARE(described(Dsp::staticMetaObject), (QStringList{"signal pairingUpgradeDataReceived(data)",
                                                                "signal sensorReadingsReceived(readings)",
                                                                "signal lineNoiseDetected()",
                                                                "signal startTriggerDetected(frameNumber,time)",
                                                                "signal stopTriggerDetected(frameNumber,time)",
                                                                "signal diagnosticDataReceived(frameNumber,data)",
                                                                "signal messageReadStart()",
                                                                "signal sensorDataReceived()",
                                                                "signal rfDiagnosticDataEmitted()",
                                                                "signal wirelessSensorReadingsGenerated()",
                                                                "slot requestVersion()",
                                                                "slot setReceiverEnable(type)",
                                                                "slot setReceiverEnableTest(type)",
                                                                "slot setLongRangeAntennaEnable(enabled)",
                                                                "slot setUpsamplingEnable(enabled)",
                                                                "slot configureLineNoiseDetection(configuration)",
                                                                "slot setTrigger(trigger)",
                                                                "slot setAcquisitionMode(mode)",
                                                                "slot setDspEnable(enabled)",
                                                                "slot runHardwareTest(testId)",
                                                                "own slot receiveData()",
                                                                "own slot dspAssert()"}));
    }

    void aPortThatDoesNotOpenIsLogged()
    {
        dsp.reset();
        QVERIFY(port->open(QIODevice::ReadWrite));
        (void)sourcedTexts(*log);
        dsp = std::make_unique<Dsp>(*port, *buttons);
        const QStringList texts = sourcedTexts(*log);
        QCOMPARE(texts.mid(texts.size() - 2),
                 (QStringList{"DspPort: Previous read thread is not finished.", "Dsp: Unable to open DSP port"}));
    }

    void aMessageThatArrivesWhileThePortOpensIsHandled()
    {
        dsp.reset();
        port = std::make_unique<HeraldedPort>();
        peer->onRequest([](DspPeer& device, DspPeer::Kind kind) {
            if (kind == DspPeer::Locate)
                device.sendDsp(0x11002, "early");
        });
        log->clear();
        dsp = std::make_unique<Dsp>(*port, *buttons);
        QVERIFY(log->waitFor("DSP Log: early"));
        // And it does not leave its place to the next, and the next to the one after.
        QVERIFY(peer->sendDsp(0x11002, "next"));
        QVERIFY(log->waitFor("DSP Log: next"));
    }

    void eachCommandCarriesItsCodeAndPayload_data()
    {
        QTest::addColumn<Command>("command");
        QTest::addColumn<QByteArray>("expected");
        const auto row = [](const char* name, Command command, quint32 code, std::initializer_list<quint32> payload) {
            QTest::newRow(name) << command << commandMessage(code, payload);
        };
        row("requestVersion", [](Dsp& d) { return d.requestVersion(); }, 0x10000, {});
        row("setReceiverEnable", [](Dsp& d) { return d.setReceiverEnable(static_cast<ReceiverEnableType>(-2)); },
            0x10001, {0xFFFFFFFE});
        row("setReceiverEnableTest", [](Dsp& d) { return d.setReceiverEnableTest(2); }, 0x10001, {2});
        row("long range on", [](Dsp& d) { return d.setLongRangeAntennaEnable(true); }, 0x10002, {1});
        row("long range off", [](Dsp& d) { return d.setLongRangeAntennaEnable(false); }, 0x10002, {0});
        row("setTrigger", [](Dsp& d) { return d.setTrigger(static_cast<DataGatherTrigger>(0x12345678)); }, 0x10003,
            {0x12345678});
        row("upsampling on", [](Dsp& d) { return d.setUpsamplingEnable(true); }, 0x10004, {1});
        row("upsampling off", [](Dsp& d) { return d.setUpsamplingEnable(false); }, 0x10004, {0});
        row("line noise", [](Dsp& d) { return d.configureLineNoiseDetection(static_cast<LineNoiseDetectConfig>(3)); },
            0x10005, {3});
        row("DSP on", [](Dsp& d) { return d.setDspEnable(true); }, 0x10008, {1});
        row("DSP off", [](Dsp& d) { return d.setDspEnable(false); }, 0x10008, {0});
        row("hardware test", [](Dsp& d) { return d.runHardwareTest(-1); }, 0x10009, {0xFFFFFFFF});
    }

    void eachCommandCarriesItsCodeAndPayload()
    {
        QFETCH(const Command, command);
        QFETCH(const QByteArray, expected);
        QVERIFY(command(*dsp));
        QCOMPARE(commands(), QList<QByteArray>{expected});
        refuseAll();
        QVERIFY(!command(*dsp));
        const QString code = QString::number(peer->messages().first().word(0), 16);
        QCOMPARE(sourcedTexts(*log), QStringList{"Dsp: Received Nak for DSP command 0x" + code});
    }

    void theAcknowledgementsValueIsNotCompared()
    {
        peer->onMessage([](DspPeer& device, const auto&) { device.sendDsp(ack, DspPeer::words({0xDEADBEEF})); });
        QVERIFY(dsp->requestVersion());
    }

    void anAnswerBeforeTheWaitEndsItAtOnce()
    {
        // A peer on a thread of its own answers before the write has returned as often as after it.
        constexpr int exchanges = 4000;
        for (int number = 0; number < exchanges; ++number)
            QVERIFY2(dsp->runHardwareTest(number), qPrintable(QString::number(number)));
        QCOMPARE(peer->messages().size(), exchanges);
        QCOMPARE(sourcedTexts(*log), QStringList());
    }

    void anAnswerThatIsThereBeforeTheWaitNeedsNone()
    {
        dsp.reset();
        auto patient = std::make_unique<PatientPort>();
        QSemaphore& answered = patient->answered;
        port = std::move(patient);
        dsp = std::make_unique<Dsp>(*port, *buttons);
        connect(
            dsp.get(), &Dsp::lineNoiseDetected, this, [&] { answered.release(); }, Qt::DirectConnection);
        // What follows the answer is handled after it.
        peer->onMessage([](DspPeer& device, const auto& message) {
            device.sendDsp(message.word(0) == 0x10009 ? ack : nak, DspPeer::words({message.word(0)}));
            device.sendDsp(0x11006, QByteArray(1, '\1'));
        });
        (void)sourcedTexts(*log);
        QElapsedTimer timer;
        timer.start();
        constexpr int exchanges = 10;
        for (int number = 0; number < exchanges; ++number)
            QVERIFY(dsp->runHardwareTest(number));
        QVERIFY2(timer.elapsed() < exchanges * 800, qPrintable(QString::number(timer.elapsed())));
        QVERIFY(!dsp->requestVersion());
        QCOMPARE(sourcedTexts(*log), QStringList{"Dsp: Received Nak for DSP command 0x10000"});
    }

    void acknowledgementsAndRefusalsAreToldApartThousandsOfTimes()
    {
        peer->onMessage([](DspPeer& device, const auto& message) {
            device.sendDsp(message.word(8) % 3 == 0 ? nak : ack, DspPeer::words({0}));
        });
        for (int number = 0; number < 1000; ++number)
            QCOMPARE(dsp->runHardwareTest(number), number % 3 != 0);
    }

    void noAnswerIsATimeOutAfter800ms()
    {
        peer->onMessage({});
        QElapsedTimer timer;
        timer.start();
        QVERIFY(!dsp->requestVersion());
        const qint64 elapsed = timer.elapsed();
        QVERIFY2(elapsed >= 800 && elapsed < 3000, qPrintable(QString::number(elapsed)));
        QCOMPARE(sourcedTexts(*log), QStringList{"Dsp: Timed out waiting for DSP ACK"});
    }

    void anAnswerThatComesLateIsNoAnswerToTheNextCommand()
    {
        peer->onMessage({});
        QVERIFY(!dsp->requestVersion());
        std::atomic<int> later = 0;
        connect(
            dsp.get(), &Dsp::lineNoiseDetected, this, [&] { ++later; }, Qt::DirectConnection);
        QVERIFY(peer->sendDsp(ack, DspPeer::words({0})));
        QVERIFY(peer->sendDsp(0x11006, QByteArray(1, '\1')));
        QTRY_COMPARE_WITH_TIMEOUT(later.load(), 1, 20'000);
        QVERIFY(!dsp->requestVersion());
        QCOMPARE(sourcedTexts(*log),
                 (QStringList{"Dsp: Timed out waiting for DSP ACK", "Dsp: Timed out waiting for DSP ACK"}));
    }

    void anAnswerThatComesLateAnswersTheCommandThenInFlight()
    {
        peer->onMessage({});
        QVERIFY(!dsp->runHardwareTest(1));
        // The only answer that the next command sees is the one to the command before.
        peer->onMessage([](DspPeer& device, const auto&) { device.sendDsp(ack, DspPeer::words({0x10009})); });
        QVERIFY(dsp->requestVersion());
        QCOMPARE(sourcedTexts(*log), QStringList{"Dsp: Timed out waiting for DSP ACK"});
    }

    void otherMessagesAreNoAnswersAndPutTheTimeOutOffByNothing()
    {
        // They do not wake the sender: what it makes of a wake-up without an answer cannot be seen from here.
        std::atomic<bool> running = true;
        peer->onMessage({});
        auto noise = std::async(std::launch::async, [&] {
            while (running && peer->sendDsp(0x11001, {}))
                QThread::msleep(50);
        });
        QElapsedTimer timer;
        timer.start();
        QVERIFY(!dsp->requestVersion());
        running = false;
        QVERIFY2(timer.elapsed() < 3000, qPrintable(QString::number(timer.elapsed())));
        QCOMPARE(sourcedTexts(*log), QStringList{"Dsp: Timed out waiting for DSP ACK"});
    }

    void shortAnswersAreLoggedAndNoAnswers()
    {
        peer->onMessage([](DspPeer& device, const auto&) {
            device.sendDsp(ack, QByteArray(3, '\1'));
            device.sendDsp(nak, {});
        });
        QVERIFY(!dsp->requestVersion());
        QStringList texts = sourcedTexts(*log);
        QCOMPARE(texts.takeLast(), "Dsp: Timed out waiting for DSP ACK");
        texts.sort(); // the acknowledgement may overtake, or not
        QCOMPARE(texts, (QStringList{"Dsp: Received Ack response with insufficent data. got 3 need 4",
                                     "Dsp: Received Nak response with insufficent data. got 0 need 4"}));
    }

    void aCommandThatCannotBeWrittenFails()
    {
        peer->hangUp();
        QTRY_VERIFY(!peer->isConnected());
        QVERIFY(!dsp->requestVersion());
        QCOMPARE(sourcedTexts(*log).last(), "Dsp: sendCommand failed");
    }

    void channelsFrom2To74AreAccepted()
    {
        QVERIFY(dsp->setChannels(2, 74, 2, 74));
        QCOMPARE(sourcedTexts(*log), QStringList());
    }

    void aChannelOutOfRangeKeepsThePreviousOnes()
    {
        QVERIFY(dsp->setBaseAddress(0));
        QVERIFY(dsp->setChannels(10, 20, 30, 40));
        const QList<std::array<uchar, 4>> refused{
            {1, 10, 10, 10}, {10, 1, 10, 10}, {10, 10, 75, 10}, {10, 10, 10, 75}, {0, 0, 0, 255}};
        QStringList expected;
        for (const auto& c : refused) {
            QVERIFY(!dsp->setChannels(c[0], c[1], c[2], c[3]));
            expected += QStringLiteral("Dsp: At least one channel {%1, %2, %3, %4} outside of valid range range 2->74")
                            .arg(c[0])
                            .arg(c[1])
                            .arg(c[2])
                            .arg(c[3]);
        }
        QCOMPARE(sourcedTexts(*log), expected);
        QVERIFY(dsp->setAcquisitionMode(Dsp::DataGatheringMode));
        QCOMPARE(commands().at(1), commandMessage(0x10007, {1, 10, 20, 30, 40, 0}));
    }

    void baseAddressesAreCheckedAsSignedNumbers()
    {
        QVERIFY(dsp->setChannels(2, 3, 4, 5));
        QVERIFY(dsp->setBaseAddress(0xFFFFFF));
        QVERIFY(dsp->setBaseAddress(-1));
        QVERIFY(!dsp->setBaseAddress(0x1000000));
        QCOMPARE(sourcedTexts(*log), QStringList{"Dsp: Addess 16777216 exceeds maximum address 16777215"});
        QVERIFY(dsp->setAcquisitionMode(Dsp::DataGatheringMode));
        QCOMPARE(commands().at(1), commandMessage(0x10007, {1, 2, 3, 4, 5, 0xFFFFFFFF}));
    }

    void nothingIsSentBySettersAlone()
    {
        QVERIFY(dsp->setChannels(2, 3, 4, 5));
        QVERIFY(dsp->setBaseAddress(1));
        QVERIFY(dsp->requestVersion());
        QCOMPARE(commands().size(), 1);
    }

    void eachAcquisitionModeIsTwoCommands_data()
    {
        QTest::addColumn<int>("mode");
        QTest::addColumn<QList<QByteArray>>("expected");
        const QByteArray off = commandMessage(0x10007, {0, 11, 12, 13, 14, 0xABCDEF});
        const QByteArray on = commandMessage(0x10007, {1, 11, 12, 13, 14, 0xABCDEF});
        QTest::newRow("idle") << 0 << QList<QByteArray>{off, commandMessage(0x10006, {0, 8, 0, 0, 0})};
        QTest::newRow("pairing A") << 1 << QList<QByteArray>{off, commandMessage(0x10006, {1, 12, 0, 0, 0})};
        QTest::newRow("pairing B") << 2 << QList<QByteArray>{off, commandMessage(0x10006, {1, 8, 0, 0, 0})};
        QTest::newRow("gathering") << 3 << QList<QByteArray>{commandMessage(0x10006, {0, 8, 0, 0, 0}), on};
    }

    void eachAcquisitionModeIsTwoCommands()
    {
        QFETCH(const int, mode);
        QFETCH(const QList<QByteArray>, expected);
        QVERIFY(dsp->setChannels(11, 12, 13, 14));
        QVERIFY(dsp->setBaseAddress(0xABCDEF));
        QVERIFY(dsp->setAcquisitionMode(static_cast<Dsp::AcquisitionMode>(mode)));
        QCOMPARE(commands(), expected);
        // Either step refused fails the whole, and both are still sent.
        for (const quint32 refused : {0x10006U, 0x10007U}) {
            peer->onMessage([refused](DspPeer& device, const auto& message) {
                device.sendDsp(message.word(0) == refused ? nak : ack, DspPeer::words({0}));
            });
            QVERIFY(!dsp->setAcquisitionMode(static_cast<Dsp::AcquisitionMode>(mode)));
        }
        QCOMPARE(commands(), expected + expected + expected);
        QCOMPARE(sourcedTexts(*log), (QStringList{"Dsp: Received Nak for DSP command 0x10006",
                                                  "Dsp: Received Nak for DSP command 0x10007"}));
    }

    void unconfiguredModesStillEndPairingButFail_data()
    {
        QTest::addColumn<int>("mode");
        QTest::addColumn<QByteArray>("sent");
        QTest::newRow("idle") << 0 << commandMessage(0x10006, {0, 8, 0, 0, 0});
        QTest::newRow("pairing A") << 1 << commandMessage(0x10006, {1, 12, 0, 0, 0});
        QTest::newRow("pairing B") << 2 << commandMessage(0x10006, {1, 8, 0, 0, 0});
        QTest::newRow("gathering") << 3 << commandMessage(0x10006, {0, 8, 0, 0, 0});
    }

    void unconfiguredModesStillEndPairingButFail()
    {
        QFETCH(const int, mode);
        QFETCH(const QByteArray, sent);
        const auto acquisition = static_cast<Dsp::AcquisitionMode>(mode);
        QVERIFY(!dsp->setAcquisitionMode(acquisition));
        QCOMPARE(sourcedTexts(*log), QStringList{"Dsp: Attempt to start data gathering without configuring channels"});
        QVERIFY(dsp->setChannels(2, 3, 4, 5));
        QVERIFY(!dsp->setAcquisitionMode(acquisition));
        QCOMPARE(sourcedTexts(*log),
                 QStringList{"Dsp: Attempt to start data gathering without configuring base address"});
        QCOMPARE(commands(), (QList<QByteArray>{sent, sent}));
    }

    void anUnknownModeSendsNothing()
    {
        QVERIFY(!dsp->setAcquisitionMode(static_cast<Dsp::AcquisitionMode>(4)));
        QVERIFY(!dsp->setAcquisitionMode(static_cast<Dsp::AcquisitionMode>(-1)));
        QVERIFY(dsp->requestVersion());
        QCOMPARE(commands(), QList<QByteArray>{commandMessage(0x10000, {})});
        QCOMPARE(sourcedTexts(*log), (QStringList{"Dsp: Attempt to set invalid acquisition mode 4",
                                                  "Dsp: Attempt to set invalid acquisition mode -1"}));
    }

    void onlyTheFirstAssertIsLogged()
    {
        for (int number = 0; number < 3; ++number)
            emit buttons->dspAssert();
        QVERIFY(log->waitFor("DSP Assert"));
        emit buttons->dspAssert();
        QVERIFY(dsp->requestVersion());
        QCOMPARE(sourcedTexts(*log), QStringList{"Dsp: DSP Assert"});
        QCOMPARE(commands().size(), 1);
    }

    void commandsOfSeveralThreadsNeverInterleave()
    {
        constexpr int callers = 4;
        constexpr int each = 200;
        // Even callers are acknowledged, odd ones refused: mixed-up exchanges would show as somebody else's answer.
        peer->onMessage([](DspPeer& device, const auto& message) {
            device.sendDsp(message.word(8) % 2 == 0 ? ack : nak, DspPeer::words({message.word(0)}));
        });
        std::atomic<int> wrong = 0;
        std::vector<std::thread> threads;
        for (int caller = 0; caller < callers; ++caller) {
            threads.emplace_back([&, caller] {
                for (int number = 0; number < each; ++number)
                    wrong += dsp->runHardwareTest(caller) == (caller % 2 == 0) ? 0 : 1;
            });
        }
        for (auto& thread : threads)
            thread.join();
        QCOMPARE(wrong.load(), 0);
        QCOMPARE(peer->messages().size(), callers * each);
    }

    void anAcknowledgementIsHandledBeforeABacklog()
    {
        constexpr int backlog = 1000;
        std::atomic<int> announced = 0;
        std::atomic<int> handled = 0;
        QSemaphore turns; // without one the worker stands still after each message
        const auto end = qScopeGuard([&] {
            turns.release(2 * backlog);
            dsp.reset(); // with its thread, before what the thread counts with
        });
        connect(
            port.get(), &DspPort::readyRead, this, [&] { ++announced; }, Qt::DirectConnection);
        connect(
            dsp.get(), &Dsp::lineNoiseDetected, this,
            [&] {
                ++handled;
                turns.acquire();
            },
            Qt::DirectConnection);
        for (int number = 0; number < backlog; ++number)
            QVERIFY(peer->sendDsp(0x11006, QByteArray(1, '\1')));
        QTRY_COMPARE_WITH_TIMEOUT(announced.load(), backlog, 20000);
        QTRY_COMPARE(handled.load(), 1);
        auto answered = std::async(std::launch::async, [this] { return dsp->requestVersion(); });
        QTRY_COMPARE(announced.load(), backlog + 1);
        turns.release(); // for the message after the one that the worker has in hand: the acknowledgement
        QVERIFY(answered.get());
        QVERIFY2(handled <= 2, qPrintable(QString::number(handled)));
        turns.release(backlog);
        QTRY_COMPARE_WITH_TIMEOUT(handled.load(), backlog, 20000);
    }

    void endingWhileDataArriveIsClean()
    {
        for (int round = 0; round < 4; ++round) {
            std::atomic<int> handled = 0;
            connect(
                dsp.get(), &Dsp::sensorDataReceived, this, [&] { ++handled; }, Qt::DirectConnection);
            std::atomic<bool> sending = true;
            auto sender = std::async(std::launch::async, [&] {
                while (sending) {
                    if (!peer->sendDsp(0x11004, QByteArray(2020, '\1')))
                        QThread::msleep(1);
                }
            });
            const auto end = qScopeGuard([&] { sending = false; });
            QTRY_VERIFY(handled > 10);
            dsp.reset();
            sending = false;
            sender.get();
            dsp = std::make_unique<Dsp>(*port, *buttons);
        }
    }

    void anAnnouncementAfterTheClosingReadsNothing()
    {
        std::atomic<int> started = 0;
        connect(
            dsp.get(), &Dsp::messageReadStart, this, [&] { ++started; }, Qt::DirectConnection);
        port->close();
        QVERIFY(QMetaObject::invokeMethod(dsp.get(), "receiveData", Qt::QueuedConnection));
        QTRY_COMPARE(started.load(), 1);
        QCOMPARE(sourcedTexts(*log), QStringList());
    }
};

QTEST_GUILESS_MAIN(DspTest)
#include "DspTest.moc"
