// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>

#include <cstdint>

/// The whole DSPLink interface in this process, without socket or peer: linked in front of the library, it shows what
/// the program itself costs and what it does with any message. Acknowledges every command at once.
///
/// Threads: `deliver` may be called from any.
namespace TestSupport::InstantDsp
{

/// A message for the program's queue: `data` behind the header. Waits while as many
/// messages are under way as the pool has large buffers.
void deliver(const QByteArray& data, std::uint16_t id = 100);

} // namespace TestSupport::InstantDsp
