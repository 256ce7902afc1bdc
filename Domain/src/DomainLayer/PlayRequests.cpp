// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/PlayRequests.h"

#include <algorithm>

namespace Domain
{

void PlayRequests::add(QIODevice* sound)
{
    const std::lock_guard lock(mutex);
    requests.push_back({sound, sound});
}

PlayRequests::State PlayRequests::take(const QIODevice* sound)
{
    const std::lock_guard lock(mutex);
    const auto oldest = std::find_if(requests.begin(), requests.end(),
                                     [&](const Request& request) { return request.address == sound; });
    if (oldest == requests.end())
        return State::Waiting;
    const Request request = *oldest;
    requests.erase(oldest);
    if (request.answered)
        return State::Answered;
    return request.device ? State::Waiting : State::Gone;
}

void PlayRequests::answer(const QIODevice* sound)
{
    const std::lock_guard lock(mutex);
    for (auto request = requests.begin(); request != requests.end() && request->address == sound; ++request)
        request->answered = true;
}

} // namespace Domain
