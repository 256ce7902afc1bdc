// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "benchmarks/presentation/FirstFrame.h"

#include <arpa/inet.h>
#include <netinet/in.h>
#include <rfb/rfbclient.h>
#include <sys/socket.h>
#include <unistd.h>

#include <array>
#include <chrono>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <thread>

namespace Benchmarks
{

namespace
{

using Clock = std::chrono::steady_clock;
using namespace std::chrono_literals;

constexpr auto patience = 60s;
constexpr auto retryInterval = 1ms;

bool listens(int port)
{
    const int probe = ::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC, 0);
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_port = htons(static_cast<std::uint16_t>(port));
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    const bool connected = ::connect(probe, reinterpret_cast<const sockaddr*>(&address), sizeof address) == 0;
    ::close(probe);
    return connected;
}

/// The server's screen is black where no window has painted yet.
bool isPainted(const rfbClient& client, int x, int y)
{
    std::uint32_t pixel = 0;
    std::memcpy(&pixel, client.frameBuffer + (y * client.width + x) * 4, sizeof pixel);
    return (pixel & 0xffffffU) != 0;
}

bool isComplete(const rfbClient& client)
{
    return client.width == 240 && client.height == 320 && isPainted(client, 5, 5) && isPainted(client, 20, 205) &&
           isPainted(client, 235, 314);
}

rfbClient* connectTo(int port)
{
    rfbEnableClientLogging = FALSE;
    rfbClient* const client = rfbGetClient(8, 3, 4);
    client->appData.encodingsString = "raw";
    client->serverHost = ::strdup("127.0.0.1");
    client->serverPort = port;
    return rfbInitClient(client, nullptr, nullptr) != 0 ? client : nullptr; // which frees a client that failed
}

} // namespace

bool waitForFirstFrame(int port)
{
    const auto limit = Clock::now() + patience;
    while (!listens(port)) {
        if (Clock::now() > limit)
            return false;
        std::this_thread::sleep_for(retryInterval);
    }
    rfbClient* const client = connectTo(port);
    if (client == nullptr)
        return false;
    while (!isComplete(*client) && Clock::now() < limit) {
        if (WaitForMessage(client, 100'000) > 0 && HandleRFBServerMessage(client) == 0)
            break;
    }
    const bool complete = isComplete(*client);
    std::free(client->frameBuffer);
    client->frameBuffer = nullptr;
    rfbClientCleanup(client);
    return complete;
}

} // namespace Benchmarks
