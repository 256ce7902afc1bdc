// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT
#pragma once

#include "tests/support/DspPeer.h"
#include "tests/support/ProcessorTime.h"

#include <QFile>
#include <QObject>
#include <QTest>

#include <msgq.h>
#include <pool.h>
#include <proc.h>

#include <cstring>
#include <memory>
#include <vector>

/// What every test of the library needs: a peer behind a real socket, an image to load, and the steps of an orderly
/// life. After each test function everything is closed again, and no buffer may be missing. Result codes are compared
/// as the unsigned words in which the interface's documents give them.
class DspLinkTestCase : public QObject
{
    Q_OBJECT

protected:
    using DspPeer = TestSupport::DspPeer;

    static constexpr Uint32 longWait = 20000; // ms, for what comes sooner
    static inline Uint32 sizes[] = {2048, 128, 128, 128};
    static inline Uint32 counts[] = {10, 2, 2, 4};
    static inline SMAPOOL_Attrs pool{4, sizes, counts, TRUE};
    static inline ZCPYMQT_Attrs transport{0};
    static inline char imagePath[] = "/dsp.out";
    static inline char hostName[] = "GPPMSGQ1";
    static inline char dspName[] = "DSPMSGQ0";

    std::unique_ptr<DspPeer> peer;
    std::vector<MSGQ_Queue> openQueues;
    MSGQ_Queue hostQueue = MSGQ_INVALIDMSGQ;
    MSGQ_Queue dspQueue = MSGQ_INVALIDMSGQ;

    static Uint32 bits(DSP_STATUS status) { return static_cast<Uint32>(status); }

    static QByteArray dataOf(MSGQ_Msg message)
    {
        return {reinterpret_cast<const char*>(message) + sizeof(MSGQ_MsgHeader),
                static_cast<qsizetype>(MSGQ_getMsgSize(message) - sizeof(MSGQ_MsgHeader))};
    }

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

    /// False when all buffers of this size are out.
    static bool canAllocate(Uint16 size = 2048)
    {
        MSGQ_Msg message = nullptr;
        return MSGQ_alloc(0, size, &message) == DSP_SOK && MSGQ_free(message) == DSP_SOK;
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
};
