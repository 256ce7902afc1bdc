// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QStringList>

#include <cstddef>
#include <cstdint>

/// The whole DSPLink interface in this process, without socket or peer: linked in front of the library, it shows what
/// the program itself costs and what it does with any message. Acknowledges every command at once.
///
/// It keeps the calls that open and close the link, with their arguments: "PROC_attach(0, null)"; numbers of 32 bits in
/// hexadecimal, a pool's attributes as "4: 10 x 2048, ... exact".
///
/// Threads: `deliver`, `fetches` and `fetchTimeout` may be called from any, the others from the one that opens and
/// closes.
namespace TestSupport::InstantDsp
{

/// A message for the program's queue: `data` behind the header. Waits while as many
/// messages are under way as the pool has large buffers.
void deliver(const QByteArray& data, std::uint16_t id = 100);

/// The calls kept since the last time.
[[nodiscard]] QStringList takeCalls();

/// How often the program has asked for a message.
[[nodiscard]] std::size_t fetches();
/// How long the last of these wanted to wait, in milliseconds.
[[nodiscard]] std::uint32_t fetchTimeout();

/// What happens during this call, one that is kept, from now on; no name: nothing. The name must last.
void during(const char* call = "", void (*happens)() = nullptr);

/// From now on the call of this name, one that is kept or MSGQ_get, gives `refusal` and has no effect; no name: none
/// does. The name must last.
void refuse(const char* call = "");
inline constexpr std::uint32_t refusal = 0x80008028; // out of some resource

} // namespace TestSupport::InstantDsp
