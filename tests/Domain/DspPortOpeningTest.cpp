// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/DspPort.h"
#include "tests/Domain/DspTestParts.h"

#include <QCoreApplication>
#include <QTest>
#include <QThread>
#include <QTimer>

#include <atomic>
#include <memory>
#include <thread>

using Domain::DspPort;
using TestSupport::DspPeer;
using TestSupport::sourcedTexts;

namespace
{

/// The reading operation without the checks that the base class makes first.
class BarePort : public DspPort
{
public:
    using DspPort::DspPort;
    using DspPort::readData;
    using DspPort::readLineData;
};

} // namespace

/// The ways into and out of the open state, over the host library and a real socket.
class DspPortOpeningTest : public QObject
{
    Q_OBJECT

private:
    std::unique_ptr<TestSupport::LogCapture> log;
    std::unique_ptr<DspPeer> peer;
    std::unique_ptr<BarePort> port;

private slots:
    void init()
    {
        TestSupport::writeFirmware();
        log = std::make_unique<TestSupport::LogCapture>();
        peer = std::make_unique<DspPeer>();
        port = std::make_unique<BarePort>(QStringLiteral("/dsp.out"));
    }

    void cleanup()
    {
        peer.reset(); // first: with nothing to wait for the port closes quicker
        port.reset();
        log.reset();
    }

    void onlyCodesOfTheSuccessRangeAreSuccess_data()
    {
        QTest::addColumn<quint32>("status");
        QTest::addColumn<bool>("isSuccess");
        QTest::newRow("below the range") << 0x7FFFU << false;
        QTest::newRow("first of the range") << 0x8000U << true;
        QTest::newRow("inside") << 0x800DU << true;
        QTest::newRow("last of the range") << 0x8500U << true;
        QTest::newRow("beyond the range") << 0x8501U << false;
        QTest::newRow("zero") << 0U << false;
    }

    void onlyCodesOfTheSuccessRangeAreSuccess()
    {
        QFETCH(const quint32, status);
        QFETCH(const bool, isSuccess);
        peer->answer(DspPeer::Locate, status);
        QVERIFY(port->open(QIODevice::ReadWrite));
        QStringList expected{"DspLink: DSP execution started successfully.", "DspPort: open complete."};
        if (!isSuccess)
            expected.insert(1, "DspPort: MSGQ_locate(dspMessageQueueName, &this->privateData->dspMessageQueue, "
                               "&syncLocateAttrs). Status = 0x" +
                                   QString::number(status, 16));
        QCOMPARE(sourcedTexts(*log), expected);
    }

    void anErrorHandlerWithoutAQueueIsReported()
    {
        QVERIFY(port->open(QIODevice::ReadWrite));
        port->close();
        (void)sourcedTexts(*log);
        peer->answer(DspPeer::QueueOpen, 0x80008028U);
        QVERIFY(port->open(QIODevice::ReadWrite));
        const QStringList texts = sourcedTexts(*log);
        QCOMPARE(texts.at(0),
                 "DspPort: MSGQ_open(processorMessageQueueName, &this->privateData->processorMessageQueue, "
                 "NULL). Status = 0x80008028");
        QCOMPARE(texts.at(1), "DspPort: MSGQ_setErrorHandler(this->privateData->processorMessageQueue, "
                              "this->privateData->applicationPoolId). Status = 0x8000800b");
    }

    void readingNeedsTheReadLoop()
    {
        std::array<char, 11> buffer{};
        QCOMPARE(port->readLineData(buffer.data(), 10), -1);
        QVERIFY(port->open(QIODevice::ReadWrite));
        (void)sourcedTexts(*log);
        QCOMPARE(port->readLineData(buffer.data(), 10), 0);
        QCOMPARE(port->readData(buffer.data(), 10), -1);
        QCOMPARE(sourcedTexts(*log), QStringList{"DspPort: Reading when no data available"});
        port->close();
        QCOMPARE(port->readLineData(buffer.data(), 10), -1);
        QCOMPARE(sourcedTexts(*log), QStringList());
    }

    void messagesAreFetchedAtHighPriority()
    {
        std::atomic<int> priority = -1;
        connect(
            port.get(), &DspPort::readyRead, this, [&] { priority = QThread::currentThread()->priority(); },
            Qt::DirectConnection);
        QVERIFY(port->open(QIODevice::ReadWrite));
        QVERIFY(peer->sendDsp(0x11006, QByteArray(1, '\1')));
        QTRY_COMPARE(priority.load(), static_cast<int>(QThread::HighPriority));
    }

    void closingServesTheEventsThatWait()
    {
        // Many times: the read loop may just be at the end of a wait, and then there is nothing to pass the time for.
        int served = 0;
        for (int round = 0; round < 5; ++round) {
            QVERIFY(port->open(QIODevice::ReadWrite));
            QTimer::singleShot(0, port.get(), [&] { ++served; });
            port->close();
        }
        port.reset(); // with what was not served
        QVERIFY(served > 0);
    }

    void aFatalWriteOfAnotherThreadEndsTheEventLoopToo()
    {
        QVERIFY(port->open(QIODevice::ReadWrite));
        peer->hangUp();
        QTRY_VERIFY(!peer->isConnected());
        std::thread writer;
        QTimer::singleShot(0, this, [&] {
            writer = std::thread([&] {
                while (port->write("x", 1) > 0) // until the loss is known
                    QThread::msleep(10);
            });
        });
        const int result = QCoreApplication::exec();
        writer.join();
        QCOMPARE(result, -1);
    }

    void aDspThatIsLostAndBackIsOpenedAnew()
    {
        QVERIFY(port->open(QIODevice::ReadWrite));
        peer->hangUp();
        QTRY_COMPARE(port->write("x", 1), -1);
        port->close();
        (void)sourcedTexts(*log);
        QVERIFY(port->open(QIODevice::ReadWrite));
        QCOMPARE(sourcedTexts(*log),
                 (QStringList{"DspLink: DSP execution started successfully.", "DspPort: open complete."}));
        QCOMPARE(port->write("command", 7), 7);
        QTRY_COMPARE(peer->messages().size(), 1);
    }
};

QTEST_GUILESS_MAIN(DspPortOpeningTest)
#include "DspPortOpeningTest.moc"
