// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/support/DspPeer.h"

#include <QElapsedTimer>
#include <QFile>
#include <QScopeGuard>
#include <QTest>

#include <msgq.h>
#include <pool.h>
#include <proc.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/un.h>
#include <time.h>
#include <unistd.h>

#include <cstring>
#include <future>
#include <memory>
#include <set>
#include <thread>
#include <vector>

using TestSupport::DspPeer;

namespace
{

constexpr Uint32 longWait = 20000; // ms, for what comes sooner
Uint32 sizes[] = {2048, 128, 128, 128};
Uint32 counts[] = {10, 2, 2, 4};
SMAPOOL_Attrs pool{4, sizes, counts, TRUE};
ZCPYMQT_Attrs transport{0};
char imagePath[] = "/dsp.out";
char hostName[] = "GPPMSGQ1";
char dspName[] = "DSPMSGQ0";

Uint32 bits(DSP_STATUS status)
{
    return static_cast<Uint32>(status);
}

QByteArray dataOf(MSGQ_Msg message)
{
    return {reinterpret_cast<const char*>(message) + sizeof(MSGQ_MsgHeader),
            static_cast<qsizetype>(MSGQ_getMsgSize(message) - sizeof(MSGQ_MsgHeader))};
}

double threadSeconds()
{
    timespec time{};
    ::clock_gettime(CLOCK_PROCESS_CPUTIME_ID, &time);
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_nsec) * 1e-9;
}

} // namespace

/// The library's manners, each against a peer behind a real socket. Result codes are compared as the unsigned words in
/// which the interface's documents give them.
class DspLinkHostTest : public QObject
{
    Q_OBJECT

private:
    std::unique_ptr<DspPeer> peer;
    std::vector<MSGQ_Queue> openQueues;
    MSGQ_Queue hostQueue = MSGQ_INVALIDMSGQ;
    MSGQ_Queue dspQueue = MSGQ_INVALIDMSGQ;

    DSP_STATUS openQueue(const char* name, MSGQ_Queue* queue)
    {
        QByteArray writable(name);
        const DSP_STATUS status = MSGQ_open(writable.data(), queue, nullptr);
        if (DSP_SUCCEEDED(status))
            openQueues.push_back(*queue);
        return status;
    }

    void attach()
    {
        QCOMPARE(bits(PROC_setup(nullptr)), 0x8000U);
        QCOMPARE(bits(PROC_attach(0, nullptr)), 0x8000U);
    }

    void start()
    {
        attach();
        QCOMPARE(bits(POOL_open(0, &pool)), 0x8000U);
        QCOMPARE(bits(openQueue(hostName, &hostQueue)), 0x8000U);
        QCOMPARE(bits(PROC_load(0, imagePath, 0, nullptr)), 0x8000U);
        QCOMPARE(bits(PROC_start(0)), 0x8000U);
    }

    DSP_STATUS locate(Uint32 timeout)
    {
        MSGQ_LocateAttrs attributes{timeout};
        return MSGQ_locate(dspName, &dspQueue, &attributes);
    }

    void openAll()
    {
        start();
        QCOMPARE(bits(MSGQ_transportOpen(0, &transport)), 0x8000U);
        QCOMPARE(bits(locate(WAIT_FOREVER)), 0x8000U);
        QCOMPARE(dspQueue, DspPeer::dspQueue);
    }

    /// The data of the next message, or "none".
    QByteArray fetched(Uint32 timeout = longWait)
    {
        MSGQ_Msg message = nullptr;
        const DSP_STATUS status = MSGQ_get(hostQueue, timeout, &message);
        if (DSP_FAILED(status))
            return "none";
        const QByteArray data = dataOf(message);
        MSGQ_free(message);
        return data;
    }

    DSP_STATUS put(const QByteArray& data, Uint16 id = 65)
    {
        MSGQ_Msg message = nullptr;
        const DSP_STATUS status = MSGQ_alloc(0, 2048, &message);
        if (DSP_FAILED(status))
            return status;
        MSGQ_setMsgId(message, id);
        char* const to = reinterpret_cast<char*>(message) + sizeof(MSGQ_MsgHeader);
        std::memset(to, 0, 2028);
        std::memcpy(to, data.constData(), static_cast<size_t>(data.size()));
        const DSP_STATUS sent = MSGQ_put(dspQueue, message);
        if (DSP_FAILED(sent))
            MSGQ_free(message);
        return sent;
    }

private slots:
    void init()
    {
        QFile image(imagePath);
        QVERIFY(image.open(QIODevice::WriteOnly));
        image.write("firmware");
        peer = std::make_unique<DspPeer>();
    }

    void cleanup()
    {
        MSGQ_transportClose(0);
        PROC_stop(0);
        for (const MSGQ_Queue queue : openQueues)
            MSGQ_close(queue);
        openQueues.clear();
        const DSP_STATUS closed = POOL_close(0);
        PROC_detach(0);
        hostQueue = dspQueue = MSGQ_INVALIDMSGQ;
        peer.reset();
        QFile::remove(imagePath);
        QVERIFY2(closed == DSP_SCLOSED || closed == DSP_EACCESSDENIED, "a buffer was not given back");
    }

    void nothingWorksWithoutSetup()
    {
        peer.reset();
        QCOMPARE(bits(PROC_setup(nullptr)), 0x80008008U);
        QCOMPARE(bits(PROC_attach(0, nullptr)), 0x8000801BU);
        QCOMPARE(bits(POOL_open(0, &pool)), 0x80008000U);
        QCOMPARE(bits(openQueue(hostName, &hostQueue)), 0x80008008U);
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
        const double before = threadSeconds();
        QTest::qSleep(500);
        QVERIFY2(threadSeconds() - before < 0.1, "something spins after the peer has gone");
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

QTEST_GUILESS_MAIN(DspLinkHostTest)
#include "DspLinkHostTest.moc"
