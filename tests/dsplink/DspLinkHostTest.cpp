// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/dsplink/DspLinkTestCase.h"

#include <sys/stat.h>

#include <set>
#include <vector>

/// The steps of an orderly life, each out of its order too, and what queues and pools refuse.
class DspLinkHostTest : public DspLinkTestCase
{
    Q_OBJECT

private slots:
    void nothingWorksWithoutSetup()
    {
        peer.reset();
        QCOMPARE(bits(PROC_setup(nullptr)), 0x80008008U);
        QCOMPARE(bits(PROC_attach(0, nullptr)), 0x8000801BU);
        QCOMPARE(bits(POOL_open(0, &pool)), 0x80008000U);
        QCOMPARE(bits(openQueue(hostName, &hostQueue)), 0x80008008U);
        QCOMPARE(bits(MSGQ_setErrorHandler(MSGQ_INVALIDMSGQ, 0)), 0x80008008U);
        QCOMPARE(bits(PROC_load(0, imagePath, 0, nullptr)), 0x8000800DU);
        QCOMPARE(bits(PROC_start(0)), 0x8000800DU);
        QCOMPARE(bits(MSGQ_transportOpen(0, &transport)), 0x80008002U);
        QCOMPARE(bits(locate(WAIT_FOREVER)), 0x80008008U);
        MSGQ_Msg message = nullptr;
        QCOMPARE(bits(MSGQ_get(hostQueue, WAIT_FOREVER, &message)), 0x8000800BU);
        QCOMPARE(bits(MSGQ_alloc(0, 2048, &message)), 0x80008008U);
        QCOMPARE(bits(MSGQ_transportClose(0)), 0x80008002U);
        QCOMPARE(bits(PROC_stop(0)), 0x8000800DU);
        QCOMPARE(bits(POOL_close(0)), 0x80008000U);
        QCOMPARE(bits(PROC_detach(0)), 0x8000800DU);
    }

    void nothingWorksWithoutAttach()
    {
        QCOMPARE(bits(PROC_setup(nullptr)), 0x8000U);
        QCOMPARE(bits(POOL_open(0, &pool)), 0x80008000U);
        QCOMPARE(bits(openQueue(hostName, &hostQueue)), 0x80008008U);
        QCOMPARE(bits(MSGQ_setErrorHandler(MSGQ_INVALIDMSGQ, 0)), 0x80008008U);
        QCOMPARE(bits(PROC_load(0, imagePath, 0, nullptr)), 0x80008002U);
        QCOMPARE(bits(PROC_start(0)), 0x80008002U);
        QCOMPARE(bits(PROC_stop(0)), 0x80008002U);
        QCOMPARE(bits(PROC_detach(0)), 0x80008002U);
        QCOMPARE(bits(locate(WAIT_FOREVER)), 0x80008008U);
    }

    void eachStepNeedsTheOneBefore()
    {
        attach();
        QCOMPARE(bits(PROC_start(0)), 0x80008052U); // no pool
        QCOMPARE(bits(POOL_open(0, &pool)), 0x8000U);
        QCOMPARE(bits(PROC_start(0)), 0x8000801BU); // no image
        QCOMPARE(bits(MSGQ_transportOpen(0, &transport)), 0x80008000U);
        QCOMPARE(bits(PROC_load(0, imagePath, 0, nullptr)), 0x8000U);
        QCOMPARE(bits(MSGQ_transportOpen(0, &transport)), 0x80008000U);
        QCOMPARE(bits(PROC_stop(0)), 0x8000800EU);
        QCOMPARE(bits(PROC_start(0)), 0x8000U);
        QCOMPARE(bits(locate(WAIT_FOREVER)), 0x80008008U); // no transport
        QCOMPARE(bits(MSGQ_transportClose(0)), 0x80008019U);
        QCOMPARE(bits(PROC_detach(0)), 0x8000801BU);
        QCOMPARE(bits(MSGQ_transportOpen(0, &transport)), 0x8000U);
        QCOMPARE(bits(PROC_stop(0)), 0x8000801BU); // transport still open
    }

    void anOrderlyLifeEndsWithCodesOfTheSuccessRange()
    {
        openAll();
        QCOMPARE(bits(MSGQ_transportClose(0)), 0x800DU);
        QCOMPARE(bits(PROC_stop(0)), 0x800CU);
        QCOMPARE(bits(MSGQ_close(hostQueue)), 0x8000U);
        QCOMPARE(bits(POOL_close(0)), 0x800DU);
        QCOMPARE(bits(PROC_detach(0)), 0x8009U);
        QCOMPARE(peer->requestKinds(),
                 (QList<DspPeer::Kind>{DspPeer::Attach, DspPeer::QueueOpen, DspPeer::Load, DspPeer::Start,
                                       DspPeer::TransportOpen, DspPeer::Locate, DspPeer::TransportClose, DspPeer::Stop,
                                       DspPeer::QueueClose, DspPeer::Detach}));
        const auto requests = peer->requests();
        QCOMPARE(requests.at(0).payload, QByteArray("\1\0\0\0", 4));
        QCOMPARE(requests.at(1).payload, DspPeer::words({hostQueue}) + "GPPMSGQ1");
        QCOMPARE(requests.at(2).payload, QByteArray("/dsp.out"));
        QCOMPARE(requests.at(5).payload, QByteArray("DSPMSGQ0"));
        QCOMPARE(requests.at(8).payload, DspPeer::words({hostQueue}));
        QCOMPARE(hostQueue >> 16, 1U);
    }

    void repeatedStepsSaySo()
    {
        openAll();
        QCOMPARE(bits(PROC_setup(nullptr)), 0x8007U);
        QCOMPARE(bits(PROC_attach(0, nullptr)), 0x8001U);
        QCOMPARE(bits(POOL_open(0, &pool)), 0x8004U);
        QCOMPARE(bits(PROC_start(0)), 0x800BU);
        QCOMPARE(bits(MSGQ_transportOpen(0, &transport)), 0x8004U);
    }

    void aLoadedImageIsNotLoadedTwice()
    {
        attach();
        QCOMPARE(bits(PROC_load(0, imagePath, 0, nullptr)), 0x8000U);
        QCOMPARE(bits(PROC_load(0, imagePath, 0, nullptr)), 0x800AU);
    }

    void everythingOpensAgainOnTheSameConnection()
    {
        openAll();
        MSGQ_transportClose(0);
        PROC_stop(0);
        MSGQ_close(hostQueue);
        POOL_close(0);
        PROC_detach(0);
        QCOMPARE(bits(PROC_setup(nullptr)), 0x8007U);
        QCOMPARE(bits(PROC_attach(0, nullptr)), 0x8000U);
        QCOMPARE(bits(POOL_open(0, &pool)), 0x8000U);
        QCOMPARE(bits(openQueue(hostName, &hostQueue)), 0x8000U);
        QCOMPARE(bits(PROC_load(0, imagePath, 0, nullptr)), 0x8000U);
        QCOMPARE(bits(PROC_start(0)), 0x8000U);
        QCOMPARE(bits(MSGQ_transportOpen(0, &transport)), 0x8000U);
        QCOMPARE(bits(locate(WAIT_FOREVER)), 0x8000U);
        QVERIFY(peer->sendMessage("again"));
        QCOMPARE(fetched(), QByteArray("again"));
    }

    void anImageMustBeAReadableFile()
    {
        attach();
        QVERIFY(QFile::remove(imagePath));
        QCOMPARE(bits(PROC_load(0, imagePath, 0, nullptr)), 0x80008009U);
        char folder[] = "/tmp";
        QCOMPARE(bits(PROC_load(0, folder, 0, nullptr)), 0x80008009U);
        QFile image(imagePath);
        QVERIFY(image.open(QIODevice::WriteOnly));
        QCOMPARE(::chmod(imagePath, 0), 0);
        QCOMPARE(bits(PROC_load(0, imagePath, 0, nullptr)), 0x80008009U);
        QCOMPARE(peer->requestKinds(), QList<DspPeer::Kind>{DspPeer::Attach});
    }

    void argumentsOfNobodyAreRefused()
    {
        openAll();
        MSGQ_Queue queue = 0;
        MSGQ_Msg message = nullptr;
        MSGQ_LocateAttrs once{WAIT_NONE};
        char longName[] = "a name of two and thirty letters";
        char emptyName[] = "";
        for (const DSP_STATUS status : {PROC_attach(1, nullptr),
                                        PROC_load(1, imagePath, 0, nullptr),
                                        PROC_load(0, nullptr, 0, nullptr),
                                        PROC_load(0, imagePath, 1, nullptr),
                                        PROC_start(1),
                                        PROC_stop(1),
                                        PROC_detach(1),
                                        POOL_open(1, &pool),
                                        POOL_open(0, nullptr),
                                        POOL_close(1),
                                        MSGQ_open(nullptr, &queue, nullptr),
                                        MSGQ_open(longName, &queue, nullptr),
                                        MSGQ_open(emptyName, &queue, nullptr),
                                        MSGQ_open(dspName, nullptr, nullptr),
                                        MSGQ_close(0x1234),
                                        MSGQ_setErrorHandler(0x1234, 0),
                                        MSGQ_setErrorHandler(hostQueue, 1),
                                        MSGQ_transportOpen(0, nullptr),
                                        MSGQ_transportOpen(1, &transport),
                                        MSGQ_transportClose(1),
                                        MSGQ_locate(nullptr, &queue, &once),
                                        MSGQ_locate(longName, &queue, &once),
                                        MSGQ_locate(dspName, &queue, nullptr),
                                        MSGQ_alloc(1, 2048, &message),
                                        MSGQ_alloc(0, 20, &message),
                                        MSGQ_alloc(0, 2048, nullptr),
                                        MSGQ_free(nullptr),
                                        MSGQ_put(dspQueue, nullptr),
                                        MSGQ_get(hostQueue, WAIT_NONE, nullptr),
                                        MSGQ_get(0x0003, WAIT_NONE, &message)})
            QCOMPARE(bits(status), 0x8000800BU);
        QCOMPARE(bits(MSGQ_setErrorHandler(hostQueue, 0)), 0x8000U);
        QCOMPARE(bits(MSGQ_setErrorHandler(MSGQ_INVALIDMSGQ, 0)), 0x8000U); // no queue any more
    }

    void queueNamesAreUniqueAndQueuesFinite()
    {
        attach();
        MSGQ_Queue queue = 0;
        std::set<MSGQ_Queue> handles;
        for (int number = 0; number < 16; ++number) {
            QCOMPARE(bits(openQueue(QByteArray("Q") + QByteArray::number(number), &queue)), 0x8000U);
            handles.insert(queue);
        }
        QCOMPARE(handles.size(), 16U);
        QCOMPARE(bits(openQueue("Q3", &queue)), 0x80008008U);
        QCOMPARE(bits(openQueue("Q16", &queue)), 0x8000802DU);
    }

    void aRefusalOfTheDspIsTheCallsResult_data()
    {
        QTest::addColumn<int>("kind");
        QTest::newRow("attach") << int{DspPeer::Attach};
        QTest::newRow("queue open") << int{DspPeer::QueueOpen};
        QTest::newRow("load") << int{DspPeer::Load};
        QTest::newRow("start") << int{DspPeer::Start};
        QTest::newRow("transport open") << int{DspPeer::TransportOpen};
        QTest::newRow("locate") << int{DspPeer::Locate};
    }

    void aRefusalOfTheDspIsTheCallsResult()
    {
        QFETCH(const int, kind);
        peer->answer(static_cast<DspPeer::Kind>(kind), 0x80008028U);
        QCOMPARE(bits(PROC_setup(nullptr)), 0x8000U);
        const auto steps = [this] {
            return QList<DSP_STATUS>{PROC_attach(0, nullptr),
                                     POOL_open(0, &pool),
                                     openQueue(hostName, &hostQueue),
                                     PROC_load(0, imagePath, 0, nullptr),
                                     PROC_start(0),
                                     MSGQ_transportOpen(0, &transport),
                                     locate(WAIT_FOREVER)};
        };
        const auto refused = [](const QList<DSP_STATUS>& all) {
            return all.count(static_cast<DSP_STATUS>(0x80008028U));
        };
        QCOMPARE(refused(steps()), 1);
        // A granted second attempt gets through: the refusal has changed nothing.
        peer->answer(static_cast<DspPeer::Kind>(kind), DspPeer::done);
        steps();
        QCOMPARE(bits(locate(WAIT_FOREVER)), 0x8000U);
    }

    void aPoolIsFinite()
    {
        attach();
        QCOMPARE(bits(POOL_open(0, &pool)), 0x8000U);
        MSGQ_Msg message = nullptr;
        std::vector<MSGQ_Msg> held;
        for (const auto& [size, count] : {std::pair{2048, 10}, std::pair{128, 8}}) {
            for (int number = 0; number < count; ++number) {
                QCOMPARE(bits(MSGQ_alloc(0, static_cast<Uint16>(size), &message)), 0x8000U);
                QCOMPARE(MSGQ_getMsgSize(message), size);
                held.push_back(message);
            }
            QCOMPARE(bits(MSGQ_alloc(0, static_cast<Uint16>(size), &message)), 0x8000800CU);
            QVERIFY(message == nullptr);
        }
        QCOMPARE(std::set(held.begin(), held.end()).size(), 18U);
        QCOMPARE(bits(POOL_close(0)), 0x80008008U);
        QCOMPARE(bits(MSGQ_free(held.front())), 0x8000U);
        QCOMPARE(bits(MSGQ_free(held.front())), 0x8000800BU);
        QCOMPARE(bits(MSGQ_alloc(0, 2048, &message)), 0x8000U);
        QCOMPARE(message, held.front());
        for (const MSGQ_Msg buffer : held)
            QCOMPARE(bits(MSGQ_free(buffer)), 0x8000U);
        MSGQ_MsgHeader foreign{};
        QCOMPARE(bits(MSGQ_free(&foreign)), 0x8000800BU);
    }

    void anExactPoolKnowsOnlyItsSizes()
    {
        attach();
        QCOMPARE(bits(POOL_open(0, &pool)), 0x8000U);
        MSGQ_Msg message = nullptr;
        for (const Uint16 size : {Uint16{21}, Uint16{127}, Uint16{129}, Uint16{2047}, Uint16{2049}})
            QCOMPARE(bits(MSGQ_alloc(0, size, &message)), 0x8000800BU);
    }

    void anInexactPoolTakesTheNextLargerSize()
    {
        attach();
        SMAPOOL_Attrs inexact = pool;
        inexact.exactMatchReq = FALSE;
        QCOMPARE(bits(POOL_open(0, &inexact)), 0x8000U);
        MSGQ_Msg message = nullptr;
        QCOMPARE(bits(MSGQ_alloc(0, 129, &message)), 0x8000U);
        QCOMPARE(MSGQ_getMsgSize(message), 129);
        QCOMPARE(bits(MSGQ_free(message)), 0x8000U);
        QCOMPARE(bits(MSGQ_alloc(0, 2049, &message)), 0x8000800BU);
        std::vector<MSGQ_Msg> held;
        for (int number = 0; number < 18; ++number) {
            QCOMPARE(bits(MSGQ_alloc(0, 100, &message)), 0x8000U);
            held.push_back(message);
        }
        QCOMPARE(bits(MSGQ_alloc(0, 100, &message)), 0x8000800CU);
        for (const MSGQ_Msg buffer : held)
            QCOMPARE(bits(MSGQ_free(buffer)), 0x8000U);
    }

    void impossiblePoolsAreRefused()
    {
        attach();
        Uint32 odd[] = {100};
        Uint32 one[] = {1};
        Uint32 none[] = {0};
        for (SMAPOOL_Attrs bad : {SMAPOOL_Attrs{0, sizes, counts, TRUE}, SMAPOOL_Attrs{17, sizes, counts, TRUE},
                                  SMAPOOL_Attrs{4, nullptr, counts, TRUE}, SMAPOOL_Attrs{4, sizes, nullptr, TRUE},
                                  SMAPOOL_Attrs{1, odd, one, TRUE}, SMAPOOL_Attrs{1, none, one, TRUE}})
            QCOMPARE(bits(POOL_open(0, &bad)), 0x8000800BU);
    }
};

QTEST_GUILESS_MAIN(DspLinkHostTest)
#include "DspLinkHostTest.moc"
