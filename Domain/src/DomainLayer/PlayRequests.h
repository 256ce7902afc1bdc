// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QIODevice>
#include <QPointer>

#include <deque>
#include <mutex>

namespace Domain
{

/// The play requests that are on their way to the thread that loads sounds.
///
/// Loading from a slow flash may take longer than a caller's patience, who then asks again for the same sound. The
/// later request is answered by the load that is under way: otherwise each would restart the sound, for ever.
///
/// Threads: every operation may be called from any thread.
class PlayRequests
{
public:
    enum class State
    {
        Waiting,  ///< to be carried out
        Answered, ///< the sound has been started since it was asked for
        Gone,     ///< the device has been destroyed since
    };

    void add(QIODevice* sound);
    /// Takes the oldest request for a device. A device that nobody has asked for counts as waiting.
    [[nodiscard]] State take(const QIODevice* sound);
    /// The sound has just been started: answers the requests for it up to the first for another sound.
    void answer(const QIODevice* sound);

private:
    struct Request
    {
        const QIODevice* address;
        QPointer<QIODevice> device;
        bool answered = false;
    };

    std::mutex mutex;
    std::deque<Request> requests;
};

} // namespace Domain
