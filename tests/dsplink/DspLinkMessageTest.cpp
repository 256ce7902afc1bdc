// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "dsplink/host/Connection.h"
#include "tests/dsplink/DspLinkTestCase.h"

#include <QElapsedTimer>
#include <QScopeGuard>

#include <atomic>
#include <future>
#include <set>
#include <thread>
#include <vector>

/// Messages both ways, the waits for them and for the peer, and what remains when the peer is lost.
class DspLinkMessageTest : public DspLinkTestCase
{
    Q_OBJECT

private:
    static constexpr int kept = 1024; ///< all that the library holds

    /// Waits until the library has all that it keeps, and whoever counts up `sent` stands still.
    static bool isHeldBackAboveWhatIsKept(const std::atomic<int>& sent)
    {
        int before = 0;
        return QTest::qWaitFor(
            [&] {
                before = sent;
                QTest::qSleep(200);
                return before > kept && before == sent;
            },
            20000);
    }

    /// A reply comes after the messages that were sent before it.
    bool everythingSentHasArrived() { return locate(longWait) == DSP_SOK; }

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
        QVERIFY(everythingSentHasArrived());
        MSGQ_Msg message = nullptr;
        QCOMPARE(bits(MSGQ_get(hostQueue, 200, &message)), 0x8000800CU);
        auto result = std::async(std::launch::async, [this] { return fetched(); });
        MSGQ_free(held.back());
        held.pop_back();
        QCOMPARE(result.get(), QByteArray(2028, 'x'));
        for (const MSGQ_Msg buffer : held)
            MSGQ_free(buffer);
    }

    void messagesInFlightShareThePoolWhicheverWayTheyGo()
    {
        constexpr char large = 'a';
        openAll();
        for (char number = 0; number < 12; ++number)
            QVERIFY(peer->sendMessage(QByteArray(2028, static_cast<char>(large + number))));
        QVERIFY(everythingSentHasArrived());
        // Two have waited for a buffer and take the first that are given back.
        for (char number = 0; number < 12; ++number) {
            QCOMPARE(bits(put("no room")), number < 3 ? 0x8000800CU : 0x8000U);
            QCOMPARE(fetched(), QByteArray(2028, static_cast<char>(large + number)));
        }
    }

    void smallMessagesLeaveTheLargeBuffersAlone()
    {
        openAll();
        for (int number = 0; number < 8; ++number)
            QVERIFY(peer->sendMessage(QByteArray(108, 'x')));
        QVERIFY(everythingSentHasArrived());
        QVERIFY(!canAllocate(128) && canAllocate());
        for (int number = 0; number < 10; ++number)
            QVERIFY(peer->sendMessage(QByteArray(108, 'y')));
        QVERIFY(everythingSentHasArrived());
        QVERIFY(!canAllocate()); // with the small ones out they do for small messages, too
        for (int number = 0; number < 18; ++number)
            QCOMPARE(fetched(), QByteArray(108, number < 8 ? 'x' : 'y'));
    }

    void aMessageThatNoBufferHoldsIsDropped()
    {
        static Uint32 smallSizes[] = {128};
        static Uint32 four[] = {4};
        SMAPOOL_Attrs small{1, smallSizes, four, TRUE};
        attach();
        QCOMPARE(bits(POOL_open(0, &small)), 0x8000U);
        QCOMPARE(bits(openQueue(hostName, &hostQueue)), 0x8000U);
        QCOMPARE(bits(PROC_load(0, imagePath, 0, nullptr)), 0x8000U);
        QCOMPARE(bits(PROC_start(0)), 0x8000U);
        QCOMPARE(bits(MSGQ_transportOpen(0, &transport)), 0x8000U);
        QVERIFY(peer->sendMessage(QByteArray(109, 'x')));
        QVERIFY(peer->sendMessage(QByteArray(108, 'x')));
        QCOMPARE(fetched(), QByteArray(108, 'x'));
    }

    void closingAQueueGivesBackWhatNobodyFetched_data()
    {
        QTest::addColumn<bool>("peerGoes");
        QTest::newRow("with the peer") << false;
        QTest::newRow("without") << true;
    }

    void closingAQueueGivesBackWhatNobodyFetched()
    {
        QFETCH(const bool, peerGoes);
        openAll();
        for (int number = 0; number < 12; ++number)
            QVERIFY(peer->sendMessage(QByteArray(2028, 'x')));
        QVERIFY(everythingSentHasArrived());
        QVERIFY(!canAllocate());
        if (peerGoes) {
            peer->hangUp();
            QTRY_COMPARE(bits(PROC_attach(0, nullptr)), 0x8000801BU);
        }
        QCOMPARE(bits(POOL_close(0)), 0x80008008U);
        QCOMPARE(bits(MSGQ_close(hostQueue)), 0x8000U);
        openQueues.clear();
        QCOMPARE(bits(POOL_close(0)), 0x800DU);
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
        // Who owes a reply is dead: the next to ask does not wait.
        MSGQ_Queue queue = 0;
        QCOMPARE(bits(openQueue("other", &queue)), 0x80008008U);
        QVERIFY(!peer->requestKinds().contains(DspPeer::QueueOpen));
        QTRY_COMPARE(bits(PROC_attach(0, nullptr)), 0x8000801BU);
        // And like any lost peer it is connected to anew.
        peer->answer(DspPeer::Attach, DspPeer::done);
        attach();
    }

    void aPeerThatRepliesToNothingIsWaitedForOnceAtTheEnd_data()
    {
        QTest::addColumn<int>("kind");
        QTest::addColumn<QList<DspPeer::Kind>>("asked");
        const QList<DspPeer::Kind> closing{DspPeer::TransportClose, DspPeer::Stop, DspPeer::QueueClose,
                                           DspPeer::Detach};
        const QList<const char*> names{"transport close", "stop", "queue close", "detach"};
        for (int first = 0; first < closing.size(); ++first)
            QTest::newRow(names[first]) << int{closing[first]} << closing.first(first + 1);
    }

    void aPeerThatRepliesToNothingIsWaitedForOnceAtTheEnd()
    {
        QFETCH(const int, kind);
        QFETCH(const QList<DspPeer::Kind>, asked);
        openAll();
        peer->keepSilentOn(static_cast<DspPeer::Kind>(kind));
        const auto before = peer->requestKinds().size();
        QElapsedTimer timer;
        timer.start();
        MSGQ_transportClose(0);
        PROC_stop(0);
        MSGQ_close(hostQueue);
        POOL_close(0);
        PROC_detach(0);
        openQueues.clear();
        QVERIFY2(timer.elapsed() < 3000, qPrintable(QString::number(timer.elapsed())));
        QCOMPARE(peer->requestKinds().mid(before), asked);
    }

    void aLocateNeverOutlivesTheTransport()
    {
        struct Nobody : DspLinkHost::ConnectionListener
        {
            void messageArrived(std::uint32_t, DspLinkHost::ByteView) override {}
            void messageSent(const void*) override {}
            bool hasRoomForMessages() override { return true; }
            void connectionLost() override {}
        } nobody;
        peer->keepSilentOn(DspPeer::Locate);
        DSP_STATUS status = DSP_EFAIL;
        const auto connection = DspLinkHost::Connection::open("/dev/dsplink", nobody, status);
        QVERIFY(connection);
        const auto locate = [&](std::uint32_t limit) {
            return bits(connection->request(DspLinkHost::PacketKind::Locate, DspLinkHost::textPayload("Q"), limit));
        };
        connection->openTransport();
        QCOMPARE(locate(100), 0x80008017U);
        // A thread that found the transport open may come too late to be woken by its end.
        connection->closeTransport();
        QCOMPARE(locate(100), 0x80008008U);
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
        QTRY_VERIFY(canAllocate());
        peer->setReading(true);
        // The peer has little time to find the request behind all that it has not read.
        const auto result = closing.get();
        QVERIFY2(result == 0x800DU || result == 0x80008017U, qPrintable(QString::number(result, 16)));
    }

    void nothingIsLostWhenNobodyFetchesForAWhile()
    {
        constexpr int burst = 3000;
        openAll();
        std::atomic<int> sent = 0;
        auto sender = std::async(std::launch::async, [this, &sent] {
            for (; sent < burst; ++sent) {
                if (!peer->sendMessage(DspPeer::words({static_cast<quint32>(sent)}) + QByteArray(500, 'x')))
                    return false;
            }
            return true;
        });
        QVERIFY(isHeldBackAboveWhatIsKept(sent));
        QVERIFY(sent < burst);
        for (quint32 number = 0; number < burst; ++number)
            QCOMPARE(fetched().first(4), DspPeer::words({number}));
        QVERIFY(sender.get());
    }

    void aRequestGetsThroughWhileMessagesPileUp()
    {
        openAll();
        std::atomic<int> sent = 0;
        auto sender = std::async(std::launch::async, [this, &sent] {
            while (peer->sendMessage(QByteArray(2028, 'x')))
                ++sent;
        });
        const auto silence = qScopeGuard([this] { peer->hangUp(); });
        QVERIFY(isHeldBackAboveWhatIsKept(sent));
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
