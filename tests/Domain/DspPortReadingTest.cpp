// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/Domain/DspPortFixture.h"
#include "tests/support/WakeUpWatch.h"

#include <QTest>

extern "C" {
#include <pool.h>
}

using TestSupport::ackType;
using TestSupport::dataType;
using TestSupport::DspPeer;
using TestSupport::nakType;
using TestSupport::sourcedTexts;
using TestSupport::WakeUpWatch;

/// What the port makes of the DSP's messages, over the host library and a real socket.
class DspPortReadingTest : public QObject, private TestSupport::DspPortFixture
{
    Q_OBJECT

private slots:
    void init() { prepare(); }
    void cleanup() { tidyUp(); }

    void oneReadReturnsOneMessage()
    {
        openPort();
        for (const char fill : {'a', '\n', '\0'})
            QVERIFY(peer->sendMessage(message(dataType, 40, fill)));
        arrived(3);
        for (const char fill : {'a', '\n', '\0'})
            QCOMPARE(next(), message(dataType, 40, fill));
        QVERIFY(announcer != QThread::currentThread());
    }

    void theReadThreadDoesNotEndUnderTheHandsThatWakeIt()
    {
        openPort();
        QVERIFY(peer->sendMessage(message(dataType, 40)));
        arrived(1);
        port->close();
        const WakeUpWatch watch(*announcer);
        QVERIFY(port->open(QIODevice::ReadWrite));
        port->close();
        QVERIFY(watch.sawOnlyLivingThreadsWoken());
        QCOMPARE(sourcedTexts(*log), TestSupport::openTexts);
    }

    void theLargestMessageIsOneRead()
    {
        openPort();
        QVERIFY(peer->sendMessage(message(dataType, 2028)));
        arrived(1);
        QCOMPARE(next(), message(dataType, 2028));
        QCOMPARE(port->bytesAvailable(), 0);
    }

    void aShortReadLeavesTheRestInFront()
    {
        openPort();
        QByteArray data = message(dataType, 40);
        for (int byte = 8; byte < 40; ++byte)
            data[byte] = static_cast<char>(byte);
        QVERIFY(peer->sendMessage(data));
        QVERIFY(peer->sendMessage(message(dataType, 50)));
        arrived(2);
        char buffer[11]{};
        QCOMPARE(port->readLine(buffer, 11), 10);
        QCOMPARE(QByteArray(buffer, 10), data.first(10));
        QCOMPARE(port->bytesAvailable(), 30);
        QCOMPARE(port->readLine(buffer, 11), 10);
        QCOMPARE(QByteArray(buffer, 10), data.sliced(10, 10));
        QCOMPARE(next(), data.sliced(20));
        QCOMPARE(next().size(), 50);
    }

    void bytesAvailableIsTheFirstMessageOnly()
    {
        openPort();
        QCOMPARE(port->bytesAvailable(), 0);
        for (int number = 0; number < 3; ++number)
            QVERIFY(peer->sendMessage(message(dataType, 40)));
        arrived(3);
        QCOMPARE(port->bytesAvailable(), 40);
        // What the base class has been given back counts, too.
        port->ungetChar('x');
        QCOMPARE(port->bytesAvailable(), 41);
    }

    void readingWithNothingThereIsLogged()
    {
        openPort();
        char buffer[11]{};
        QCOMPARE(port->readLine(buffer, 11), 0);
        QCOMPARE(sourcedTexts(*log), QStringList{"DspPort: Reading when no data available"});
    }

    void readingBeforeOpenAndAfterCloseFails()
    {
        makePort();
        char buffer[11]{};
        QCOMPARE(port->readLine(buffer, 11), -1);
        QVERIFY(port->open(QIODevice::ReadWrite));
        port->close();
        QCOMPARE(port->readLine(buffer, 11), -1);
        (void)sourcedTexts(*log);
    }

    void aPortOpenedForWritingOnlyHasNoReadLoop()
    {
        makePort();
        QVERIFY(port->open(QIODevice::WriteOnly));
        QVERIFY(peer->sendMessage(message(dataType, 40)));
        QCOMPARE(port->write("x", 1), 1);
        QTRY_COMPARE(peer->messages().size(), 1);
        QCOMPARE(announced.load(), 0);
        QElapsedTimer timer;
        timer.start();
        port->close();
        QVERIFY(timer.elapsed() < 4000);
    }

    void aForeignMessageIdIsLoggedAndDropped()
    {
        openPort();
        for (const quint16 id : {quint16{0}, quint16{0x41}, quint16{65281}})
            QVERIFY(peer->sendMessage(message(dataType, 40), id));
        QVERIFY(peer->sendMessage(message(dataType, 48)));
        arrived(1);
        QCOMPARE(next().size(), 48);
        QCOMPARE(sourcedTexts(*log), (QStringList{"DspPort: DspLink: Received message with invalid ID = 0",
                                                  "DspPort: DspLink: Received message with invalid ID = 65",
                                                  "DspPort: DspLink: Received message with invalid ID = 65281"}));
    }

    void droppedMessagesGiveTheirBuffersBack()
    {
        openPort();
        for (int number = 0; number < 50; ++number)
            QVERIFY(peer->sendMessage(QByteArray(2028, 'x'), 99));
        QVERIFY(peer->sendMessage(message(dataType, 2028)));
        arrived(1);
        QCOMPARE(sourcedTexts(*log).size(), 50);
        port->close();
        QCOMPARE(static_cast<quint32>(POOL_close(0)), 0x80008000U); // with a buffer out it would still be open
        QVERIFY(port->open(QIODevice::ReadWrite));
        QCOMPARE(port->write("x", 1), 1);
    }

    void aStatedLengthThatCannotBeIsLoggedAndCut_data()
    {
        QTest::addColumn<quint32>("payloadLength");
        QTest::addColumn<int>("present");
        QTest::addColumn<int>("delivered");
        QTest::addColumn<QString>("logged");
        QTest::newRow("2020 is the largest") << 2020U << 2028 << 2028 << "";
        QTest::newRow("2092: data of 2100") << 2092U << 2028 << 2028 << "2100";
        QTest::newRow("2100") << 2100U << 2028 << 2028 << "2108";
        QTest::newRow("one too many") << 2021U << 2028 << 2028 << "2029";
        QTest::newRow("does not wrap in 32 bits") << 0xFFFFFFFFU << 2028 << 2028 << "4294967303";
        QTest::newRow("wraps to nothing in 32 bits") << 0xFFFFFFF8U << 2028 << 2028 << "4294967296";
        QTest::newRow("negative when signed") << 0x80000000U << 2028 << 2028 << "2147483656";
        QTest::newRow("more than the buffer holds") << 200U << 108 << 108 << "208";
        QTest::newRow("far more than the buffer holds") << 0xFFFFFFFFU << 108 << 108 << "4294967303";
        QTest::newRow("less than the buffer holds") << 4U << 108 << 12 << "";
        QTest::newRow("no payload") << 0U << 2028 << 8 << "";
    }

    void aStatedLengthThatCannotBeIsLoggedAndCut()
    {
        QFETCH(const quint32, payloadLength);
        QFETCH(const int, present);
        QFETCH(const int, delivered);
        QFETCH(const QString, logged);
        openPort();
        const QByteArray sent = DspPeer::words({dataType, payloadLength}).leftJustified(present, 'p');
        QVERIFY(peer->sendMessage(sent));
        arrived(1);
        QCOMPARE(next(), sent.first(delivered));
        QCOMPARE(sourcedTexts(*log),
                 logged.isEmpty()
                     ? QStringList()
                     : QStringList{"DspPort: DspLink: Received message with invalid data length = " + logged});
    }

    void messagesShorterThanTheirWordsAreDeliveredAsTheyAre()
    {
        openPort();
        const QByteArray whole = DspPeer::words({ackType, 0xFFFFFFFFU});
        for (int size = 0; size < 8; ++size) {
            QVERIFY(peer->sendMessage(whole.first(size)));
            arrived(size + 1);
            QCOMPARE(port->bytesAvailable(), size);
            char buffer[64]{};
            QCOMPARE(port->readLine(buffer, sizeof buffer), size);
            QCOMPARE(QByteArray(buffer, size), whole.first(size));
        }
        QCOMPARE(sourcedTexts(*log), QStringList());
    }

    void anAcknowledgementOvertakesWaitingData()
    {
        openPort();
        for (int number = 0; number < 50; ++number)
            QVERIFY(peer->sendMessage(message(dataType, 40)));
        QVERIFY(peer->sendMessage(message(nakType, 12)));
        QVERIFY(peer->sendMessage(message(ackType, 12)));
        arrived(52);
        QCOMPARE(next(), message(ackType, 12));
        for (int number = 0; number < 50; ++number)
            QCOMPARE(next(), message(dataType, 40));
        QCOMPARE(next(), message(nakType, 12));
    }

    void theFullWarningIsGivenOnceAnExcursion()
    {
        openPort();
        const QStringList warning{"DspPort: DSP data buffer too large"};
        int sent = 0;
        const auto send = [&](int count) {
            for (int number = 0; number < count; ++number)
                QVERIFY(peer->sendMessage(message(dataType, 8)));
            sent += count;
            arrived(sent);
        };
        send(100);
        QCOMPARE(sourcedTexts(*log), QStringList());
        send(1);
        QCOMPARE(sourcedTexts(*log), warning);
        send(50);
        for (int number = 0; number < 121; ++number) // leaves 30
            QCOMPARE(next().size(), 8);
        send(1); // 31: still the same excursion
        send(100);
        QCOMPARE(sourcedTexts(*log), QStringList());
        for (int number = 0; number < 102; ++number) // leaves 29
            QCOMPARE(next().size(), 8);
        send(1); // 30: over
        send(70);
        QCOMPARE(sourcedTexts(*log), QStringList());
        send(1); // 101
        QCOMPARE(sourcedTexts(*log), warning);
        for (int number = 0; number < 101; ++number) // nothing was dropped
            QCOMPARE(next().size(), 8);
    }

    void aBurstOfAThousandLosesNothing()
    {
        openPort();
        for (quint32 number = 0; number < 1000; ++number)
            QVERIFY(peer->sendMessage(DspPeer::words({dataType, 4, number})));
        arrived(1000);
        for (quint32 number = 0; number < 1000; ++number)
            QCOMPARE(next(), DspPeer::words({dataType, 4, number}));
    }
};

QTEST_GUILESS_MAIN(DspPortReadingTest)
#include "DspPortReadingTest.moc"
