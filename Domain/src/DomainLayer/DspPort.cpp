// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/DspPort.h"

#include "Domain/src/DomainLayer/DspCommand.h"
#include "Domain/src/DomainLayer/ReadThread.h"
#include "utilities/Debug.h"

#include <QCoreApplication>
#include <QElapsedTimer>
#include <QList>
#include <QMutex>
#include <QMutexLocker>
#include <QSemaphore>
#include <QtEndian>

#include <algorithm>
#include <array>
#include <atomic>
#include <csignal>
#include <cstring>
#include <optional>

extern "C" {
#include <dsplink.h>
#include <msgq.h>
#include <pool.h>
#include <proc.h>
}

namespace Domain
{

using Utilities::Debug;

namespace
{

// The interface takes names and tables by pointers to writable memory.
char processorMessageQueueName[] = "GPPMSGQ1";
char dspMessageQueueName[] = "DSPMSGQ0";
Uint32 messageQueueBufferSizes[] = {2048, 128, 128, 128};
Uint32 messageQueueBufferCounts[] = {10, 2, 2, 4};
constexpr Uint32 bufferPools = 4;
static_assert(std::size(messageQueueBufferSizes) == bufferPools && std::size(messageQueueBufferCounts) == bufferPools);

SMAPOOL_Attrs poolAttributes = {bufferPools, messageQueueBufferSizes, messageQueueBufferCounts, TRUE};

constexpr ProcessorId dspProcessorId = 0;
constexpr Uint16 messageBufferSize = 2048;
constexpr qint64 headerSize = sizeof(MSGQ_MsgHeader);
constexpr qint64 maximumDataSize = messageBufferSize - headerSize;
/// Type and length words, which are part of the data.
constexpr qint64 wordsSize = 8;

constexpr Uint16 outgoingMessageId = 0x41;
constexpr Uint16 incomingMessageId = 100;

constexpr int getTimeout = 500;        // ms
constexpr int threadEndTimeout = 5000; // ms
constexpr qsizetype fullAbove = 100;
constexpr qsizetype emptiedBelow = 31;

/// The program ends in order on a termination signal. The device's library sets handlers of its own when a process
/// attaches, which end it wherever it is: what was set before comes back, and the link is closed by the port.
class TerminationActionsKept
{
public:
    TerminationActionsKept()
    {
        for (Action& action : actions)
            sigaction(action.signal, nullptr, &action.before);
    }
    ~TerminationActionsKept()
    {
        for (const Action& action : actions)
            sigaction(action.signal, &action.before, nullptr);
    }
    TerminationActionsKept(const TerminationActionsKept&) = delete;
    TerminationActionsKept& operator=(const TerminationActionsKept&) = delete;

private:
    struct Action
    {
        int signal;
        struct sigaction before;
    };
    std::array<Action, 2> actions{{{SIGTERM, {}}, {SIGINT, {}}}};
};

/// DSPLink's result codes are negative numbers when they fail; logs show the 32 bits.
QString hexadecimal(DSP_STATUS status)
{
    return QString::number(static_cast<quint32>(status), 16);
}

void reportFailure(int line, const char* call, DSP_STATUS status)
{
    if (DSP_FAILED(status))
        Debug::fatalMessage(__FILE__, line,
                            QStringLiteral("%1. Status = 0x%2").arg(QLatin1String(call), hexadecimal(status)));
}

char* dataOf(MSGQ_Msg message)
{
    return reinterpret_cast<char*>(message) + headerSize;
}

/// A word of the data; bytes beyond the end of the message count as zero.
quint32 wordAt(const char* data, qint64 size, qint64 offset)
{
    quint32 word = 0;
    const qint64 present = std::clamp<qint64>(size - offset, 0, sizeof word);
    if (present > 0)
        std::memcpy(&word, data + offset, static_cast<size_t>(present));
    return qFromLittleEndian(word);
}

/// The data of a message that arrived: as long as its length word says, but no longer than what is there.
QByteArray extractData(MSGQ_Msg message)
{
    const char* const data = dataOf(message);
    const qint64 present = std::max<qint64>(MSGQ_getMsgSize(message) - headerSize, 0);
    // A message without both words cannot state a length.
    const qint64 stated = present < wordsSize ? present : qint64{wordAt(data, present, 4)} + wordsSize;
    const qint64 largest = std::min(maximumDataSize, present);
    if (stated > largest)
        Debug::warningMessage(__FILE__, __LINE__,
                              QStringLiteral("DspLink: Received message with invalid data length = %1").arg(stated));
    return {data, std::min(stated, largest)};
}

/// Null if the message is not for the port. Gives the buffer back: the pool is small.
std::optional<QByteArray> unpack(MSGQ_Msg message)
{
    std::optional<QByteArray> data;
    const Uint16 id = MSGQ_getMsgId(message);
    if (id == incomingMessageId)
        data = extractData(message);
    else
        Debug::warningMessage(__FILE__, __LINE__,
                              QStringLiteral("DspLink: Received message with invalid ID = %1").arg(id));
    MSGQ_free(message);
    return data;
}

} // namespace

struct DspPort::PrivateData
{
    PrivateData(DspPort* port, const QString& executablePath) : owner(port), dspExecutablePath(executablePath) {}

    void openLink();
    void closeLink();
    [[nodiscard]] bool startReading();
    void stopReading();
    [[nodiscard]] std::optional<QByteArray> receive();
    void store(const QByteArray& data);

    DspPort* owner;
    // Both are set before the read thread starts: set by the loop itself, a close that comes at once would be undone.
    std::atomic<bool> keepRunning = false;
    std::atomic<bool> readLoopFinished = true;
    bool receiveListFull = false;
    MSGQ_Queue processorMessageQueue = MSGQ_INVALIDMSGQ;
    MSGQ_Queue dspMessageQueue = MSGQ_INVALIDMSGQ;
    PoolId applicationPoolId = 0;
    QString dspExecutablePath;
    QList<QByteArray> receiveList;
    mutable QMutex lock; ///< receive list and full flag
    QSemaphore stopRequest;
    ReadThread readThread;
};

DspPort::DspPort(const QString& dspExecutablePath, QObject* parent)
    : QIODevice(parent), privateData(std::make_unique<PrivateData>(this, dspExecutablePath))
{
    // Direct: the loop runs where the signal is emitted, on the thread itself.
    connect(&privateData->readThread, SIGNAL(started()), this, SLOT(pollPort()), Qt::DirectConnection);
}

DspPort::~DspPort()
{
    if (isOpen())
        DspPort::close();
    // A close that gave up on the thread must not be followed by the end of what that thread uses.
    privateData->readThread.wait();
}

bool DspPort::isSequential() const
{
    return true;
}

bool DspPort::open(OpenMode mode)
{
    if (!QIODevice::open(mode | Unbuffered)) {
        Debug::warningMessage(__FILE__, __LINE__, QStringLiteral("Unable to open DSP port"));
        return false;
    }
    // The base class finds out on first use that the device is sequential, and remembers it. That must not happen in a
    // reading and a writing thread at once.
    (void)QIODevice::bytesAvailable();
    privateData->openLink();
    if ((mode & ReadOnly) != 0 && !privateData->startReading()) {
        Debug::warningMessage(__FILE__, __LINE__, QStringLiteral("Previous read thread is not finished."));
        return false;
    }
    Debug::info(QStringLiteral("DspPort: open complete."));
    return true;
}

void DspPort::PrivateData::openLink()
{
    {
        const TerminationActionsKept kept;
        reportFailure(__LINE__, "PROC_setup(NULL)", PROC_setup(nullptr));
        reportFailure(__LINE__, "PROC_attach(dspProcessorId, NULL)", PROC_attach(dspProcessorId, nullptr));
    }
    reportFailure(__LINE__, "POOL_open(this->privateData->applicationPoolId, &poolAttributes)",
                  POOL_open(applicationPoolId, &poolAttributes));
    reportFailure(__LINE__, "MSGQ_open(processorMessageQueueName, &this->privateData->processorMessageQueue, NULL)",
                  MSGQ_open(processorMessageQueueName, &processorMessageQueue, nullptr));
    reportFailure(
        __LINE__,
        "MSGQ_setErrorHandler(this->privateData->processorMessageQueue, this->privateData->applicationPoolId)",
        MSGQ_setErrorHandler(processorMessageQueue, applicationPoolId));
    reportFailure(__LINE__, "PROC_load(dspProcessorId, this->privateData->dspExecutablePath.toAscii().data(), 0, NULL)",
                  PROC_load(dspProcessorId, dspExecutablePath.toLatin1().data(), 0, nullptr));
    reportFailure(__LINE__, "PROC_start(dspProcessorId)", PROC_start(dspProcessorId));
    Debug::info(QStringLiteral("DspLink: DSP execution started successfully."));
    ZCPYMQT_Attrs mqtAttrs = {applicationPoolId};
    reportFailure(__LINE__, "MSGQ_transportOpen(dspProcessorId, &mqtAttrs)",
                  MSGQ_transportOpen(dspProcessorId, &mqtAttrs));
    MSGQ_LocateAttrs syncLocateAttrs = {WAIT_FOREVER};
    reportFailure(__LINE__, "MSGQ_locate(dspMessageQueueName, &this->privateData->dspMessageQueue, &syncLocateAttrs)",
                  MSGQ_locate(dspMessageQueueName, &dspMessageQueue, &syncLocateAttrs));
}

bool DspPort::PrivateData::startReading()
{
    if (!readThread.wait(0))
        return false;
    stopRequest.tryAcquire(stopRequest.available());
    {
        // A reader fetches one message for each announcement: with those of the time before it would stay behind.
        const QMutexLocker locker(&lock);
        receiveList.clear();
        receiveListFull = false;
    }
    keepRunning = true;
    readLoopFinished = false;
    if (readThread.begin())
        return true;
    // The machine has no thread left: nobody will ever end the loop.
    readLoopFinished = true;
    return false;
}

void DspPort::close()
{
    if (!isOpen())
        return;
    privateData->stopReading();
    privateData->closeLink();
    QIODevice::close();
}

void DspPort::PrivateData::stopReading()
{
    keepRunning = false;
    stopRequest.release();
    while (!readLoopFinished)
        QCoreApplication::processEvents(QEventLoop::ExcludeUserInputEvents);
    if (!readThread.queueQuit())
        Debug::warningMessage(__FILE__, __LINE__, QStringLiteral("Invoke of quit for read thread failed"));
    if (!readThread.wait(threadEndTimeout))
        Debug::warningMessage(__FILE__, __LINE__, QStringLiteral("Read thread took too long to finish"));
}

void DspPort::PrivateData::closeLink()
{
    MSGQ_transportClose(dspProcessorId);
    PROC_stop(dspProcessorId);
    MSGQ_close(processorMessageQueue);
    POOL_close(applicationPoolId);
    PROC_detach(dspProcessorId);
}

qint64 DspPort::bytesAvailable() const
{
    const QMutexLocker locker(&privateData->lock);
    const auto& list = privateData->receiveList;
    return (list.isEmpty() ? 0 : list.first().size()) + QIODevice::bytesAvailable();
}

bool DspPort::canReadLine() const
{
    return false;
}

qint64 DspPort::maxBytesAvailable() const
{
    return maximumDataSize;
}

qint64 DspPort::readData(char* /*data*/, qint64 /*maxSize*/)
{
    return -1;
}

qint64 DspPort::readLineData(char* data, qint64 maxSize)
{
    if (privateData->readLoopFinished)
        return -1;
    const QMutexLocker locker(&privateData->lock);
    auto& list = privateData->receiveList;
    if (list.isEmpty()) {
        Debug::warningMessage(__FILE__, __LINE__, QStringLiteral("Reading when no data available"));
        return 0;
    }
    QByteArray& first = list.first();
    const qint64 size = std::min<qint64>(first.size(), maxSize);
    std::copy_n(first.constData(), size, data);
    if (size == first.size())
        list.removeFirst();
    else
        first.remove(0, size);
    return size;
}

qint64 DspPort::writeData(const char* data, qint64 size)
{
    MSGQ_Msg message = nullptr;
    const DSP_STATUS allocated = MSGQ_alloc(privateData->applicationPoolId, messageBufferSize, &message);
    if (DSP_FAILED(allocated)) {
        Debug::warningMessage(__FILE__, __LINE__,
                              QStringLiteral("MSGQ_alloc() failed. Status = 0x%1").arg(hexadecimal(allocated)));
        return -1;
    }
    const qint64 length = std::min(size, maximumDataSize);
    MSGQ_setMsgId(message, outgoingMessageId);
    std::copy_n(data, length, dataOf(message));
    // The whole buffer travels, and it still holds what it was last used for.
    std::fill_n(dataOf(message) + length, maximumDataSize - length, '\0');
    const DSP_STATUS sent = MSGQ_put(privateData->dspMessageQueue, message);
    if (DSP_FAILED(sent)) {
        MSGQ_free(message);
        reportFailure(__LINE__, "MSGQ_put(this->privateData->dspMessageQueue, message.messageQueueMessage)", sent);
        return -1;
    }
    return length;
}

void DspPort::pollPort()
{
    while (privateData->keepRunning) {
        if (const auto data = privateData->receive()) {
            privateData->store(*data);
            emit readyRead();
        }
    }
    privateData->readLoopFinished = true;
}

std::optional<QByteArray> DspPort::PrivateData::receive()
{
    QElapsedTimer elapsed;
    elapsed.start();
    MSGQ_Msg message = nullptr;
    const DSP_STATUS status = MSGQ_get(processorMessageQueue, getTimeout, &message);
    if (DSP_SUCCEEDED(status))
        return unpack(message);
    // Normally the time is over. Without a DSP the call fails at once, for ever: that must not cost the processor.
    const auto rest = static_cast<int>(std::max<qint64>(getTimeout - elapsed.elapsed(), 0));
    if (stopRequest.tryAcquire(1, rest))
        stopRequest.release();
    return std::nullopt;
}

void DspPort::PrivateData::store(const QByteArray& data)
{
    bool overflowing = false;
    {
        const QMutexLocker locker(&lock);
        if (wordAt(data.constData(), data.size(), 0) == MessageAck)
            receiveList.prepend(data);
        else
            receiveList.append(data);
        overflowing = !receiveListFull && receiveList.size() > fullAbove;
        if (overflowing)
            receiveListFull = true;
        else if (receiveListFull && receiveList.size() < emptiedBelow)
            receiveListFull = false;
    }
    if (overflowing)
        Debug::warningMessage(__FILE__, __LINE__, QStringLiteral("DSP data buffer too large"));
}

} // namespace Domain
