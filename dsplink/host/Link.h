// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "dsplink/host/BufferPool.h"
#include "dsplink/host/Connection.h"

#include <msgq.h>
#include <pool.h>
#include <proc.h>

#include <condition_variable>
#include <deque>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>

namespace DspLinkHost
{

/// The DSP as one process sees it: how far set-up has got, the pool, the local queues. Behind the C calls of the
/// interface stands the one `instance()`.
///
/// Threads: every operation may be called from any thread. Operations that change the state of the link run one after
/// the other; `locate`, `put`, `get`, `allocate` and `free` wait for none of them.
class Link final : private ConnectionListener
{
public:
    [[nodiscard]] static Link& instance();

    [[nodiscard]] DSP_STATUS setup();
    [[nodiscard]] DSP_STATUS attach();
    [[nodiscard]] DSP_STATUS load(const char* imagePath);
    [[nodiscard]] DSP_STATUS start();
    [[nodiscard]] DSP_STATUS stop();
    [[nodiscard]] DSP_STATUS detach();

    [[nodiscard]] DSP_STATUS openPool(const SMAPOOL_Attrs* attributes);
    [[nodiscard]] DSP_STATUS closePool();

    [[nodiscard]] DSP_STATUS openQueue(const char* name, MSGQ_Queue* queue);
    [[nodiscard]] DSP_STATUS closeQueue(MSGQ_Queue queue);
    [[nodiscard]] DSP_STATUS checkErrorHandler(MSGQ_Queue queue);
    [[nodiscard]] DSP_STATUS openTransport();
    [[nodiscard]] DSP_STATUS closeTransport();
    [[nodiscard]] DSP_STATUS locate(const char* name, MSGQ_Queue* queue, Uint32 milliseconds);

    [[nodiscard]] DSP_STATUS allocate(Uint16 size, MSGQ_Msg* message);
    [[nodiscard]] DSP_STATUS free(MSGQ_Msg message);
    [[nodiscard]] DSP_STATUS put(MSGQ_Queue queue, MSGQ_Msg message);
    [[nodiscard]] DSP_STATUS get(MSGQ_Queue queue, Uint32 milliseconds, MSGQ_Msg* message);

private:
    /// How far the link has come; each stage includes the ones before.
    enum class Stage
    {
        Idle,
        SetUp,
        Attached,
        Loaded,
        Started,
        TransportOpen
    };

    struct LocalQueue
    {
        std::string name;
        std::deque<MSGQ_Msg> messages;   ///< not yet fetched
        std::deque<Bytes> withoutBuffer; ///< after those: what the DSP could send only once the pool has room for it
    };

    Link() = default;
    ~Link() override;

    void messageArrived(std::uint32_t queue, ByteView message) override;
    void messageSent(const void* buffer) override;
    bool hasRoomForMessages() override;
    void connectionLost() override;

    [[nodiscard]] DSP_STATUS connect();
    [[nodiscard]] Stage currentStage() const;
    [[nodiscard]] DSP_STATUS ask(PacketKind kind, ByteView payload, Uint32 milliseconds,
                                 std::uint32_t* value = nullptr);
    /// Asks the DSP's side; success takes the link to `reached` and returns `success`, failure the DSP's own code.
    [[nodiscard]] DSP_STATUS advance(PacketKind kind, ByteView payload, Stage reached, DSP_STATUS success);
    [[nodiscard]] std::shared_ptr<Connection> currentConnection() const;
    [[nodiscard]] LocalQueue* localQueue(MSGQ_Queue queue);
    [[nodiscard]] std::uint16_t freeQueueNumber() const;
    [[nodiscard]] MSGQ_Msg takeMessage(LocalQueue& from);
    /// A message in flight holds a buffer of the pool whichever way it goes: gives what is free to those that wait.
    void giveBuffers();
    void giveBuffers(LocalQueue& queue);
    void dropMessages(LocalQueue& queue);
    [[nodiscard]] DSP_STATUS tryGet(MSGQ_Queue queue, MSGQ_Msg* message);
    void setAcceptsMessages(bool accepts);

    std::mutex operationMutex; ///< taken before `mutex`
    mutable std::mutex mutex;
    std::condition_variable changed; ///< a message, a free buffer, another stage
    std::shared_ptr<Connection> connection;
    Stage stage = Stage::Idle;
    bool acceptsMessages = false; ///< from the start of the DSP to the end of the transport
    std::optional<BufferPool> pool;
    std::map<std::uint16_t, LocalQueue> queues;
    std::size_t waitingMessages = 0; ///< in all queues, with a buffer or without
};

} // namespace DspLinkHost
