// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QStringList>

namespace VirtualDevice
{

/// `virtual-device ctl`: one command of the control socket from the command line.
///
/// Standard output carries the value alone (with --json, the result as JSON), standard error what went wrong. Exit
/// status 0: done; 1: a wait did not come true in time; 2: wrong use, an unknown name, a value out of range, or no
/// device to speak to.
///
/// Threads: the main thread. Needs an application object. `arguments` begin behind the word "ctl".
[[nodiscard]] int runCtl(const QStringList& arguments);

} // namespace VirtualDevice
