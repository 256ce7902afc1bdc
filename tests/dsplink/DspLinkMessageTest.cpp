// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/dsplink/DspLinkTestCase.h"

#include <QElapsedTimer>
#include <QScopeGuard>

#include <future>
#include <set>
#include <thread>
#include <vector>

/// Messages both ways, the waits for them and for the peer, and what remains when the peer is lost.
class DspLinkMessageTest : public DspLinkTestCase
{
    Q_OBJECT

private slots:
    void aMessageTravelsWhole()
    {
        openAll();
        QCOMPARE(bits(put("to the DSP", 0x41)), 0x8000U);
        QTRY_COMPARE(peer->messages().size(), 1);
        const auto sent = peer->messages().first();
        QCOMPARE(sent.destination, DspPeer::dspQueue);
        QCOMPARE(sent.header, QByteArray::fromHex("0000000000000000"
                                                  "0100"
                                                  "0000"
                                                  "0008"
                                                  "0300"
                                                  "ffff"
                                                  "4100"));
        QCOMPARE(sent.data, QByteArray("to the DSP").leftJustified(2028, '\0'));

        QVERIFY(peer->sendMessage("from the DSP", 77));
        MSGQ_Msg message = nullptr;
        QCOMPARE(bits(MSGQ_get(hostQueue, longWait, &message)), 0x8000U);
        QCOMPARE(MSGQ_getMsgId(message), 77);
        QCOMPARE(MSGQ_getMsgSize(message), 32);
        QCOMPARE(dataOf(message), QByteArray("from the DSP"));
        QCOMPARE(bits(MSGQ_free(message)), 0x8000U);
    }

    void everySizeFromTheBareHeaderUpArrives()
    {
        openAll();
        for (const int size : {0, 1, 7, 8, 107, 108, 109, 2027, 2028}) {
            QVERIFY(peer->sendMessage(QByteArray(size, 'x')));
            QCOMPARE(fetched(), QByteArray(size, 'x'));
        }
    }

    void theSizeFieldIsWhatReallyArrived()
    {
        openAll();
        QVERIFY(peer->sendMessage("four", 100, 0xFFFF));
        QVERIFY(peer->sendMessage("five!", 100, 3));
        QCOMPARE(fetched(), QByteArray("four"));
        QCOMPARE(fetched(), QByteArray("five!"));
    }

    void packetsOutOfTheProtocolAreIgnored()
    {
        openAll();
        QVERIFY(peer->sendMessage(QByteArray(2029, 'x')));         // longer than any buffer
        QVERIFY(peer->sendMessageTo(0x00010005, "nobody's"));      // no such queue
        QVERIFY(peer->sendMessageTo(0x00000000, "the DSP's own")); // not on this processor
        for (const QByteArray& packet :
             {QByteArray(), QByteArray("\0", 1), QByteArray("\200\0\0\0\1\0\0\0", 8), QByteArray("\0\1\0\0\0\0\0\0", 8),
              QByteArray("\0\1\0\0\0\0\0\0\0\0\1\0", 12), QByteArray("\77\77\77\77\77\77\77\77", 8),
              QByteArray("\200\0\0\0\377\377\377\377\0\200\0\0\0\0\0\0", 16), QByteArray(65000, '\1')})
            QVERIFY(peer->sendPacket(packet));
        QVERIFY(peer->sendMessage("sound"));
        QCOMPARE(fetched(), QByteArray("sound"));
    }

    void fetchingTimesOut()
    {
        openAll();
        MSGQ_Msg message = nullptr;
        QElapsedTimer timer;
        timer.start();
        QCOMPARE(bits(MSGQ_get(hostQueue, 300, &message)), 0x80008017U);
        QVERIFY(timer.elapsed() >= 299);
        QCOMPARE(bits(MSGQ_get(hostQueue, WAIT_NONE, &message)), 0x80008051U);
        QVERIFY(message == nullptr);
    }

    void fetchingEndsWithTheMessageNotWithTheTime()
    {
        openAll();
        auto result = std::async(std::launch::async, [this] { return fetched(WAIT_FOREVER); });
        QVERIFY(result.wait_for(std::chrono::milliseconds(50)) == std::future_status::timeout);
        QVERIFY(peer->sendMessage("late"));
        QCOMPARE(result.get(), QByteArray("late"));
    }

    void fetchingWithAllBuffersOutWaitsForOne()
    {
        openAll();
        std::vector<MSGQ_Msg> held;
        for (int number = 0; number < 10; ++number) {
            MSGQ_Msg message = nullptr;
            QCOMPARE(bits(MSGQ_alloc(0, 2048, &message)), 0x8000U);
            held.push_back(message);
        }
        QVERIFY(peer->sendMessage(QByteArray(2028, 'x')));
        MSGQ_Msg message = nullptr;
        QCOMPARE(bits(MSGQ_get(hostQueue, 200, &message)), 0x8000800CU);
        auto result = std::async(std::launch::async, [this] { return fetched(); });
        MSGQ_free(held.back());
        held.pop_back();
        QCOMPARE(result.get(), QByteArray(2028, 'x'));
        for (const MSGQ_Msg buffer : held)
            MSGQ_free(buffer);
    }

    void locatingWaitsUntilTheFirmwareHasMadeItsQueue()
    {
        peer->keepSilentOn(DspPeer::Locate);
        start();
        QCOMPARE(bits(MSGQ_transportOpen(0, &transport)), 0x8000U);
        auto result = std::async(std::launch::async, [this] { return bits(locate(WAIT_FOREVER)); });
        QTRY_VERIFY(peer->requestKinds().contains(DspPeer::Locate));
        // Messages pass meanwhile.
        QVERIFY(peer->sendMessage("meanwhile"));
        QCOMPARE(fetched(), QByteArray("meanwhile"));
        QVERIFY(result.wait_for(std::chrono::milliseconds(0)) == std::future_status::timeout);
        peer->answerLocate();
        QCOMPARE(result.get(), 0x8000U);
        QCOMPARE(dspQueue, DspPeer::dspQueue);
    }

    void locatingHasATimeLimitOfItsOwn()
    {
        peer->keepSilentOn(DspPeer::Locate);
        start();
        QCOMPARE(bits(MSGQ_transportOpen(0, &transport)), 0x8000U);
        QCOMPARE(bits(locate(100)), 0x80008017U);
        QCOMPARE(bits(locate(WAIT_NONE)), 0x80008051U);
        QCOMPARE(dspQueue, MSGQ_Queue{MSGQ_INVALIDMSGQ});
        // Answers too late harm nobody.
        peer->answerLocate();
        QCOMPARE(bits(locate(longWait)), 0x8000U);
    }

    void locatingEndsWithTheTransportOrThePeer_data()
    {
        QTest::addColumn<bool>("peerGoes");
        QTest::newRow("transport closes") << false;
        QTest::newRow("peer goes") << true;
    }

    void locatingEndsWithTheTransportOrThePeer()
    {
        QFETCH(const bool, peerGoes);
        peer->keepSilentOn(DspPeer::Locate);
        start();
        QCOMPARE(bits(MSGQ_transportOpen(0, &transport)), 0x8000U);
        auto result = std::async(std::launch::async, [this] { return bits(locate(WAIT_FOREVER)); });
        QTRY_VERIFY(peer->requestKinds().contains(DspPeer::Locate));
        if (peerGoes)
            peer->hangUp();
        else
            MSGQ_transportClose(0);
        QCOMPARE(result.get(), 0x80008008U);
    }

    void aRequestThatIsNeverAnsweredTimesOut()
    {
        peer->keepSilentOn(DspPeer::Attach);
        QCOMPARE(bits(PROC_setup(nullptr)), 0x8000U);
        QCOMPARE(bits(PROC_attach(0, nullptr)), 0x80008017U);
    }

    void messagesBeforeTheTransportIsOpenAreKept()
    {
        start();
        QVERIFY(peer->sendMessage("early"));
        QCOMPARE(bits(MSGQ_transportOpen(0, &transport)), 0x8000U);
        QCOMPARE(fetched(), QByteArray("early"));
    }

    void messagesAfterTheTransportHasClosedAreDropped()
    {
        openAll();
        QVERIFY(peer->sendMessage("unfetched"));
        QCOMPARE(bits(MSGQ_transportClose(0)), 0x800DU);
        QVERIFY(peer->sendMessage("too late"));
        MSGQ_Queue other = 0;
        QCOMPARE(bits(openQueue("other", &other)), 0x8000U); // its reply comes after that message
        MSGQ_Msg message = nullptr;
        QCOMPARE(bits(MSGQ_get(hostQueue, WAIT_FOREVER, &message)), 0x80008008U);
        QCOMPARE(bits(MSGQ_transportOpen(0, &transport)), 0x8000U);
        QVERIFY(peer->sendMessage("new"));
        QCOMPARE(fetched(), QByteArray("new"));
    }

    void aLostPeerIsAFailureCode()
    {
        openAll();
        QVERIFY(peer->sendMessage("last words"));
        peer->hangUp();
        QTRY_COMPARE(bits(put("to nobody")), 0x80008008U); // and no SIGPIPE
        QCOMPARE(fetched(), QByteArray("last words"));
        MSGQ_Msg message = nullptr;
        QCOMPARE(bits(MSGQ_get(hostQueue, WAIT_FOREVER, &message)), 0x80008008U);
        QTRY_COMPARE(bits(PROC_attach(0, nullptr)), 0x8000801BU);
        QCOMPARE(bits(locate(WAIT_FOREVER)), 0x80008008U);
        QCOMPARE(bits(MSGQ_close(hostQueue)), 0x8000U);
        QCOMPARE(bits(POOL_close(0)), 0x800DU);
        openQueues.clear();
        openAll();
    }

    void aFullQueueIsFetchedEvenWhenNobodyServesTheDriverAnyMore()
    {
        constexpr int kept = 1024; // all that the library holds
        openAll();
        for (quint32 number = 0; number < kept; ++number)
            QVERIFY(peer->sendMessage(DspPeer::words({number})));
        peer->hangUp();
        QTRY_COMPARE(bits(PROC_attach(0, nullptr)), 0x8000801BU);
        peer.reset();
        QCOMPARE(bits(PROC_setup(nullptr)), 0x80008008U);
        for (quint32 number = 0; number < kept; ++number)
            QCOMPARE(fetched(), DspPeer::words({number}));
        MSGQ_Msg message = nullptr;
        QCOMPARE(bits(MSGQ_get(hostQueue, WAIT_FOREVER, &message)), 0x80008008U);
    }

    void aWaitEndsWhenThePeerIsLost()
    {
        openAll();
        auto result = std::async(std::launch::async, [this] {
            MSGQ_Msg message = nullptr;
            return bits(MSGQ_get(hostQueue, WAIT_FOREVER, &message));
        });
        QVERIFY(result.wait_for(std::chrono::milliseconds(50)) == std::future_status::timeout);
        peer->hangUp();
        QCOMPARE(result.get(), 0x80008008U);
    }

    void aRequestEndsWhenThePeerIsLost()
    {
        peer->keepSilentOn(DspPeer::Attach);
        QCOMPARE(bits(PROC_setup(nullptr)), 0x8000U);
        auto result = std::async(std::launch::async, [] { return bits(PROC_attach(0, nullptr)); });
        QTRY_VERIFY(peer->requestKinds().contains(DspPeer::Attach));
        peer->hangUp();
        QCOMPARE(result.get(), 0x80008008U);
    }

    void waitingCostsNoProcessorTime()
    {
        openAll();
        peer->hangUp();
        QTRY_COMPARE(bits(PROC_attach(0, nullptr)), 0x8000801BU);
        const double before = TestSupport::processSeconds();
        QTest::qSleep(500);
        QVERIFY2(TestSupport::processSeconds() - before < 0.1, "something spins after the peer has gone");
    }

    void aSocketThatIsNoneIsADeadDriver()
    {
        peer.reset();
        QFile plain("/dev/dsplink");
        QVERIFY(plain.open(QIODevice::WriteOnly));
        QCOMPARE(bits(PROC_setup(nullptr)), 0x80008008U);
        QVERIFY(plain.remove());
    }

    void aPeerThatDoesNotReadExhaustsThePool()
    {
        openAll();
        peer->setReading(false);
        int sent = 0;
        DSP_STATUS status = DSP_SOK;
        while (DSP_SUCCEEDED(status) && sent < 10000) {
            status = put(QByteArray::number(sent));
            sent += DSP_SUCCEEDED(status) ? 1 : 0;
        }
        QCOMPARE(bits(status), 0x8000800CU);
        peer->setReading(true);
        QTRY_COMPARE(peer->messages().size(), sent);
        for (int number = 0; number < sent; ++number)
            QCOMPARE(peer->messages().at(number).data.first(6), QByteArray::number(number).leftJustified(6, '\0'));
        QCOMPARE(bits(put("on we go")), 0x8000U);
    }

    void closingGivesBackWhatThePeerNeverTook()
    {
        openAll();
        peer->setReading(false);
        while (put("stuck") == DSP_SOK) {
        }
        auto closing = std::async(std::launch::async, [] { return bits(MSGQ_transportClose(0)); });
        QTRY_COMPARE(bits(put("closed")), 0x80008008U);
        QVERIFY(QTest::qWaitFor([] {
            MSGQ_Msg message = nullptr;
            return MSGQ_alloc(0, 2048, &message) == DSP_SOK && MSGQ_free(message) == DSP_SOK;
        }));
        peer->setReading(true);
        QCOMPARE(closing.get(), 0x800DU);
    }

    void nothingIsLostWhenNobodyFetchesForAWhile()
    {
        constexpr int burst = 3000;
        openAll();
        auto sender = std::async(std::launch::async, [this] {
            for (quint32 number = 0; number < burst; ++number) {
                if (!peer->sendMessage(DspPeer::words({number}) + QByteArray(500, 'x')))
                    return false;
            }
            return true;
        });
        QVERIFY(sender.wait_for(std::chrono::milliseconds(200)) == std::future_status::timeout); // held back
        for (quint32 number = 0; number < burst; ++number)
            QCOMPARE(fetched().first(4), DspPeer::words({number}));
        QVERIFY(sender.get());
    }

    void aRequestGetsThroughWhileMessagesPileUp()
    {
        openAll();
        auto sender = std::async(std::launch::async, [this] {
            while (peer->sendMessage(QByteArray(2028, 'x'))) {
            }
        });
        const auto silence = qScopeGuard([this] { peer->hangUp(); });
        QTest::qSleep(100);
        QCOMPARE(bits(locate(longWait)), 0x8000U);
        QCOMPARE(bits(MSGQ_transportClose(0)), 0x800DU);
        QCOMPARE(bits(PROC_stop(0)), 0x800CU);
    }

    void severalThreadsMaySendWhileOneFetches()
    {
        constexpr int senders = 4;
        constexpr int each = 500;
        peer->onMessage(
            [](DspPeer& device, const DspPeer::HostMessage& message) { device.sendMessage(message.data.first(8)); });
        openAll();
        std::vector<std::thread> threads;
        for (quint32 sender = 0; sender < senders; ++sender) {
            threads.emplace_back([this, sender] {
                for (quint32 number = 0; number < each;) {
                    const DSP_STATUS status = put(DspPeer::words({sender, number}));
                    if (DSP_SUCCEEDED(status))
                        ++number;
                    else if (status != DSP_EMEMORY)
                        return;
                }
            });
        }
        std::set<QByteArray> seen;
        for (int number = 0; number < senders * each; ++number)
            seen.insert(fetched());
        for (auto& thread : threads)
            thread.join();
        QCOMPARE(seen.size(), static_cast<size_t>(senders * each));
        QVERIFY(!seen.contains("none"));
    }
};

QTEST_GUILESS_MAIN(DspLinkMessageTest)
#include "DspLinkMessageTest.moc"
