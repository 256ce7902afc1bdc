// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/commands/EndSignals.h"
#include "virtual-device/device/Device.h"

#include <optional>

class QCommandLineParser;

namespace VirtualDevice
{

/// What `run` and `exec` have in common: a device from its start to the end of what runs in it.
///
/// Threads: lives in the main thread.
class DeviceSession
{
public:
    explicit DeviceSession(const DeviceOptions& options);

    static void addOptions(QCommandLineParser& parser);
    /// Fills in what the common options say; an exit status when the command is over already (help, wrong use).
    [[nodiscard]] static std::optional<int> parse(QCommandLineParser& parser, const QStringList& arguments,
                                                  DeviceOptions& options);
    /// One line on the error output; returns `status`.
    static int complain(const QString& text, int status);

    [[nodiscard]] Device& device() { return virtualDevice; }
    /// Checks the machine, starts the device and returns the exit status when everything is gone again.
    [[nodiscard]] int run();

    /// Somebody interrupted us, so that whatever the program does now is no news.
    [[nodiscard]] bool isAskedToEnd() const { return isAsked; }

private:
    EndSignals endSignals;
    Device virtualDevice;
    bool isAsked = false;
};

} // namespace VirtualDevice
