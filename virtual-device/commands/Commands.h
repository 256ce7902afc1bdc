// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QStringList>

namespace VirtualDevice
{

/// Exit statuses of every subcommand besides those that it passes on.
namespace ExitStatus
{
inline constexpr int success = 0;
inline constexpr int failure = 1;
inline constexpr int wrongUse = 2;
} // namespace ExitStatus

/// A subcommand of `virtual-device`: `arguments` begin with its own name, what it returns is the exit status. Needs a
/// QCoreApplication.
using Subcommand = int (*)(const QStringList& arguments);

/// Starts a device and the program in it; ends with the program, on SIGINT, SIGTERM or SIGHUP.
[[nodiscard]] int runCommand(const QStringList& arguments);
/// Starts a device and runs a command of the caller's in the program's place; returns the command's exit status.
[[nodiscard]] int execCommand(const QStringList& arguments);
/// One request to a running device.
[[nodiscard]] int ctlCommand(const QStringList& arguments);
/// Prints the table of controls.
[[nodiscard]] int controlsCommand(const QStringList& arguments);

} // namespace VirtualDevice
