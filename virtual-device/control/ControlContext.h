// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

namespace VirtualDevice
{

class LogStore;
class Monitor;
class RegionWatch;
class Registry;
class Screen;

/// What the control socket gives access to. Everything in it outlives the server.
///
/// Threads: the main thread, where all of it lives.
struct ControlContext
{
    Registry& registry;
    LogStore& log;
    Screen& screen;
    RegionWatch& regions;
    Monitor& monitor;
};

} // namespace VirtualDevice
