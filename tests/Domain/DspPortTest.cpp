// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/Domain/DspPortFixture.h"

#include <QCoreApplication>
#include <QElapsedTimer>
#include <QTest>
#include <QThread>
#include <QTimer>

#include <atomic>
#include <future>
#include <initializer_list>
#include <memory>
#include <utility>

extern "C" {
#include <msgq.h>
#include <pool.h>
}

using TestSupport::dataType;
using TestSupport::DspPeer;
using TestSupport::openTexts;
using TestSupport::sourcedTexts;

namespace
{

constexpr const char* attachCall = "PROC_attach(dspProcessorId, NULL)";
constexpr const char* poolOpenCall = "POOL_open(this->privateData->applicationPoolId, &poolAttributes)";
constexpr const char* queueOpenCall =
    "MSGQ_open(processorMessageQueueName, &this->privateData->processorMessageQueue, NULL)";
constexpr const char* errorHandlerCall =
    "MSGQ_setErrorHandler(this->privateData->processorMessageQueue, this->privateData->applicationPoolId)";
constexpr const char* loadCall =
    "PROC_load(dspProcessorId, this->privateData->dspExecutablePath.toAscii().data(), 0, NULL)";
constexpr const char* startCall = "PROC_start(dspProcessorId)";
constexpr const char* transportOpenCall = "MSGQ_transportOpen(dspProcessorId, &mqtAttrs)";
constexpr const char* locateCall =
    "MSGQ_locate(dspMessageQueueName, &this->privateData->dspMessageQueue, &syncLocateAttrs)";

const QList<DspPeer::Kind> openingRequests{DspPeer::Attach, DspPeer::QueueOpen,     DspPeer::Load,
                                           DspPeer::Start,  DspPeer::TransportOpen, DspPeer::Locate};

} // namespace

/// The port over the host library and a real socket: opening, writing, closing.
class DspPortTest : public QObject, private TestSupport::DspPortFixture
{
    Q_OBJECT

private slots:
    void init() { prepare(); }
    void cleanup() { tidyUp(); }

    void itIsASequentialDeviceReadByLineOnly()
    {
        openPort();
        QVERIFY(port->isSequential());
        QVERIFY(!port->canReadLine());
        QCOMPARE(port->maxBytesAvailable(), 2028);
        QVERIFY(peer->sendMessage(message(dataType, 40)));
        arrived(1);
        char byte = 0;
        QCOMPARE(port->read(&byte, 1), -1);
        QCOMPARE(next().size(), 40);
    }

    void openingLoadsStartsAndConnectsInOrder()
    {
        openPort();
        QCOMPARE(peer->requestKinds(), openingRequests);
        QCOMPARE(peer->requests().at(1).payload.mid(4), QByteArray("GPPMSGQ1"));
        QCOMPARE(peer->requests().at(2).payload, QByteArray("/dsp.out"));
        QCOMPARE(peer->requests().at(5).payload, QByteArray("DSPMSGQ0"));
        QVERIFY(port->openMode() & QIODevice::Unbuffered);
    }

    void progressIsInformation()
    {
        makePort();
        QVERIFY(port->open(QIODevice::ReadWrite));
        QVERIFY(log->waitFor(openTexts.at(1)));
        for (const auto& line : log->lines())
            QCOMPARE(line.priority, 6);
    }

    void thePathOfTheImageTravelsAsLatin1()
    {
        QFile image(QFile::decodeName(QByteArray("/firmware\xe4.out")));
        const auto path = QString::fromLatin1("/firmware\xe4.out");
        QCOMPARE(::rename("/dsp.out", path.toLatin1().constData()), 0);
        makePort(path);
        QVERIFY(port->open(QIODevice::ReadWrite));
        QCOMPARE(sourcedTexts(*log), openTexts);
        QCOMPARE(peer->requests().at(2).payload, QByteArray("/firmware\xe4.out"));
        ::unlink(path.toLatin1().constData());
    }

    void aRefusedStepIsFatalAndTheRestGoesOn_data()
    {
        QTest::addColumn<int>("kind");
        QTest::addColumn<QStringList>("fatal");
        QTest::addColumn<QList<DspPeer::Kind>>("requests"); // what the library still asks the DSP for
        const auto fatal = [](std::initializer_list<std::pair<const char*, const char*>> calls) {
            QStringList lines;
            for (const auto& [text, status] : calls)
                lines += QStringLiteral("(priority 0) DspPort: %1. Status = 0x%2").arg(text, status);
            return lines;
        };
        const auto upTo = [](DspPeer::Kind last) { return openingRequests.first(openingRequests.indexOf(last) + 1); };
        const char* const refused = "80008028";
        const char* const failed = "80008008";
        QTest::newRow("attach") << int{DspPeer::Attach}
                                << fatal({{attachCall, refused},
                                          {poolOpenCall, "80008000"},
                                          {queueOpenCall, failed},
                                          {errorHandlerCall, failed},
                                          {loadCall, "80008002"},
                                          {startCall, "80008002"},
                                          {transportOpenCall, "80008002"},
                                          {locateCall, failed}})
                                << upTo(DspPeer::Attach);
        QTest::newRow("queue") << int{DspPeer::QueueOpen} << fatal({{queueOpenCall, refused}}) << openingRequests;
        QTest::newRow("load") << int{DspPeer::Load}
                              << fatal({{loadCall, refused},
                                        {startCall, "8000801b"},
                                        {transportOpenCall, "80008000"},
                                        {locateCall, failed}})
                              << upTo(DspPeer::Load);
        QTest::newRow("start") << int{DspPeer::Start}
                               << fatal({{startCall, refused}, {transportOpenCall, "80008000"}, {locateCall, failed}})
                               << upTo(DspPeer::Start);
        QTest::newRow("transport") << int{DspPeer::TransportOpen}
                                   << fatal({{transportOpenCall, refused}, {locateCall, failed}})
                                   << upTo(DspPeer::TransportOpen);
        QTest::newRow("locate") << int{DspPeer::Locate} << fatal({{locateCall, refused}}) << openingRequests;
    }

    void aRefusedStepIsFatalAndTheRestGoesOn()
    {
        QFETCH(const int, kind);
        QFETCH(const QStringList, fatal);
        QFETCH(const QList<DspPeer::Kind>, requests);
        peer->answer(static_cast<DspPeer::Kind>(kind), 0x80008028U);
        makePort();
        QVERIFY(port->open(QIODevice::ReadWrite));
        QStringList texts = sourcedTexts(*log, TestSupport::Priorities::Shown);
        QCOMPARE(texts.takeLast(), openTexts.at(1));
        QVERIFY(texts.removeOne(openTexts.at(0)));
        QCOMPARE(texts, fatal);
        QCOMPARE(peer->requestKinds(), requests);
    }

    void thePoolHasTenLargeBuffersAndEightSmall()
    {
        openPort();
        QList<MSGQ_Msg> taken;
        const auto allocate = [&](Uint16 size) {
            MSGQ_Msg message = nullptr;
            const DSP_STATUS status = MSGQ_alloc(0, size, &message);
            if (message != nullptr)
                taken.append(message);
            return static_cast<quint32>(status);
        };
        for (const auto& [size, count] : {std::pair{Uint16{2048}, 10}, std::pair{Uint16{128}, 8}}) {
            for (int number = 0; number < count; ++number)
                QCOMPARE(allocate(size), 0x8000U);
            QCOMPARE(allocate(size), 0x8000800CU);
        }
        QCOMPARE(allocate(129), 0x8000800BU); // no other size
        // The port cannot close a pool with buffers out.
        for (const MSGQ_Msg message : taken)
            QCOMPARE(static_cast<quint32>(MSGQ_free(message)), 0x8000U);
    }

    void closingClosesThePool()
    {
        openPort();
        port->close();
        MSGQ_Msg message = nullptr;
        QCOMPARE(static_cast<quint32>(MSGQ_alloc(0, 2048, &message)), 0x80008008U);
        QCOMPARE(static_cast<quint32>(POOL_close(0)), 0x80008000U);
    }

    void locatingTheDspsQueueWaitsUntilTheFirmwareHasMadeIt()
    {
        peer->keepSilentOn(DspPeer::Locate);
        auto firmware = std::async(std::launch::async, [this] {
            for (int attempt = 0; attempt < 2000 && !peer->requestKinds().contains(DspPeer::Locate); ++attempt)
                QThread::msleep(10);
            QThread::msleep(500); // longer than anything that answers
            peer->answerLocate();
        });
        openPort();
        firmware.get();
        QCOMPARE(port->write("command", 7), 7);
        QTRY_COMPARE(peer->messages().size(), 1);
        QCOMPARE(peer->messages().first().destination, DspPeer::dspQueue);
    }

    void withoutADspEveryCallIsReportedAndTheWindowStillComesUp()
    {
        peer.reset();
        makePort();
        QVERIFY(port->open(QIODevice::ReadWrite));
        const auto line = [](const char* call, const char* status) {
            return QStringLiteral("(priority 0) DspPort: %1. Status = 0x%2").arg(call, status);
        };
        const QStringList expected{line("PROC_setup(NULL)", "80008008"),
                                   line(attachCall, "8000801b"),
                                   line(poolOpenCall, "80008000"),
                                   line(queueOpenCall, "80008008"),
                                   line(errorHandlerCall, "80008008"),
                                   line(loadCall, "8000800d"),
                                   line(startCall, "8000800d"),
                                   openTexts.at(0),
                                   line(transportOpenCall, "80008002"),
                                   line(locateCall, "80008008"),
                                   openTexts.at(1)};
        const QStringList texts = sourcedTexts(*log, TestSupport::Priorities::Shown);
        QCOMPARE(texts, expected);
        QCOMPARE(port->write("x", 1), -1);
        QCOMPARE(sourcedTexts(*log), QStringList{"DspPort: MSGQ_alloc() failed. Status = 0x80008008"});
        // Nothing that was fatal before the event loop runs ends it.
        QTimer::singleShot(50, QCoreApplication::instance(), [] { QCoreApplication::exit(7); });
        QCOMPARE(QCoreApplication::exec(), 7);
    }

    void aMissingImageIsReported()
    {
        QVERIFY(QFile::remove(QStringLiteral("/dsp.out")));
        makePort();
        QVERIFY(port->open(QIODevice::ReadWrite));
        const QStringList texts = sourcedTexts(*log);
        QCOMPARE(texts.first(),
                 "DspPort: PROC_load(dspProcessorId, this->privateData->dspExecutablePath.toAscii().data(),"
                 " 0, NULL). Status = 0x80008009");
        QCOMPARE(texts.at(1), "DspPort: PROC_start(dspProcessorId). Status = 0x8000801b");
    }

    void withoutADspTheReadLoopCostsNothingAndStops()
    {
        peer.reset();
        makePort();
        QVERIFY(port->open(QIODevice::ReadWrite));
        const double before = TestSupport::processSeconds();
        QTest::qSleep(1200);
        QVERIFY2(TestSupport::processSeconds() - before < 0.2, "the read loop spins");
        QElapsedTimer timer;
        timer.start();
        port->close();
        QVERIFY2(timer.elapsed() < 4000, qPrintable(QString::number(timer.elapsed())));
    }

    void aLostDspDoesNotMakeTheReadLoopSpin()
    {
        openPort();
        peer->hangUp();
        QTRY_VERIFY(!peer->isConnected());
        QTest::qSleep(100);
        const double before = TestSupport::processSeconds();
        QTest::qSleep(1200);
        QVERIFY2(TestSupport::processSeconds() - before < 0.2, "the read loop spins");
    }

    void aWriteIsOneMessageWithAClearedTail()
    {
        openPort();
        QCOMPARE(port->write(QByteArray(2028, 'o')), 2028);
        QCOMPARE(port->write("command"), 7);
        QTRY_COMPARE(peer->messages().size(), 2);
        const auto sent = peer->messages().at(1);
        QCOMPARE(sent.id(), 0x41);
        QCOMPARE(sent.destination, DspPeer::dspQueue);
        QCOMPARE(sent.data, QByteArray("command").leftJustified(2028, '\0'));
    }

    void aLongWriteIsCutTo2028Bytes()
    {
        openPort();
        QByteArray bytes(3000, 'a');
        bytes[2027] = 'z';
        QCOMPARE(port->write(bytes), 2028);
        QTRY_COMPARE(peer->messages().size(), 1);
        QCOMPARE(peer->messages().first().data, bytes.first(2028));
        QCOMPARE(sourcedTexts(*log), QStringList());
    }

    void aWriteWithoutAFreeBufferFails()
    {
        openPort();
        peer->setReading(false);
        qint64 written = 1;
        for (int attempt = 0; attempt < 10000 && written > 0; ++attempt)
            written = port->write("x", 1);
        QCOMPARE(written, -1);
        QCOMPARE(sourcedTexts(*log), QStringList{"DspPort: MSGQ_alloc() failed. Status = 0x8000800c"});
        peer->setReading(true);
        QTRY_COMPARE(port->write("x", 1), 1);
    }

    void aWriteToALostDspIsFatalAndLosesNoBuffer()
    {
        openPort();
        peer->hangUp();
        QTRY_COMPARE(port->write("x", 1), -1);
        (void)sourcedTexts(*log);
        QStringList expected;
        for (int attempt = 0; attempt < 30; ++attempt) {
            QCOMPARE(port->write("x", 1), -1);
            expected += "DspPort: MSGQ_put(this->privateData->dspMessageQueue, message.messageQueueMessage). Status = "
                        "0x80008008";
        }
        QCOMPARE(sourcedTexts(*log), expected);
    }

    void aFatalWriteEndsTheRunningEventLoop()
    {
        openPort();
        peer->hangUp();
        QTRY_VERIFY(!peer->isConnected());
        QTimer writing;
        connect(&writing, &QTimer::timeout, this, [this] { port->write("x", 1); });
        writing.start(10);
        QCOMPARE(QCoreApplication::exec(), -1);
    }

    void aSecondOpenFindsTheReadThreadBusy()
    {
        openPort();
        QVERIFY(!port->open(QIODevice::ReadWrite));
        const QStringList texts = sourcedTexts(*log);
        QCOMPARE(texts.last(), "DspPort: Previous read thread is not finished.");
        QVERIFY(!texts.contains(openTexts.at(1)));
    }

    void closingTearsDownInOrderAndReopeningRepeatsTheLoad()
    {
        openPort();
        port->close();
        QVERIFY(!port->isOpen());
        const QList<DspPeer::Kind> closing{DspPeer::TransportClose, DspPeer::Stop, DspPeer::QueueClose,
                                           DspPeer::Detach};
        QCOMPARE(peer->requestKinds().mid(6), closing);
        QVERIFY(port->open(QIODevice::ReadWrite));
        QCOMPARE(peer->requestKinds().mid(10), openingRequests);
        QCOMPARE(sourcedTexts(*log), openTexts);
        QVERIFY(peer->sendMessage(message(dataType, 40)));
        arrived(1);
        QCOMPARE(next().size(), 40);
        port.reset(); // closes
        QCOMPARE(peer->requestKinds().mid(16), closing);
        QCOMPARE(sourcedTexts(*log), QStringList());
    }

    void whatWasNotReadBeforeTheClosingIsForgotten()
    {
        openPort();
        constexpr int unread = 101; // enough for the warning
        for (int number = 0; number < unread; ++number)
            QVERIFY(peer->sendMessage(message(dataType, 40)));
        arrived(unread);
        port->close();
        QVERIFY(port->open(QIODevice::ReadWrite));
        (void)sourcedTexts(*log);
        QCOMPARE(port->bytesAvailable(), 0);
        QVERIFY(peer->sendMessage(message(dataType, 48)));
        arrived(unread + 1);
        QCOMPARE(next(), message(dataType, 48));
        QCOMPARE(port->bytesAvailable(), 0);
        for (int number = 0; number < unread; ++number)
            QVERIFY(peer->sendMessage(message(dataType, 40)));
        arrived(2 * unread + 1);
        QCOMPARE(sourcedTexts(*log), QStringList{"DspPort: DSP data buffer too large"});
    }

    void closingAtOnceAfterOpeningEnds()
    {
        makePort();
        for (int round = 0; round < 8; ++round) {
            QVERIFY(port->open(QIODevice::ReadWrite));
            QElapsedTimer timer;
            timer.start();
            port->close();
            QVERIFY(timer.elapsed() < 4000);
        }
        QVERIFY(!sourcedTexts(*log).contains("DspPort: Read thread took too long to finish"));
    }

    void closingWhileDataArriveIsClean()
    {
        std::atomic<bool> sending = true;
        auto sender = std::async(std::launch::async, [&] {
            while (sending) {
                if (!peer->sendMessage(message(dataType, 2028)))
                    QThread::msleep(1);
            }
        });
        const auto end = qScopeGuard([&] { sending = false; });
        for (int round = 0; round < 5; ++round) {
            makePort();
            QVERIFY(port->open(QIODevice::ReadWrite));
            QTRY_VERIFY(announced > 20);
            port->close();
            port.reset();
        }
    }
};

QTEST_GUILESS_MAIN(DspPortTest)
#include "DspPortTest.moc"
