// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/control/ControlServer.h"
#include "virtual-device/control/Monitor.h"
#include "virtual-device/log/LogStore.h"
#include "virtual-device/registry/Registry.h"
#include "virtual-device/screen/RegionWatch.h"
#include "virtual-device/screen/Screen.h"

#include <QTemporaryDir>

namespace TestSupport
{

/// Everything that the control socket gives access to, without a program: the values, a log service, a screen that is
/// not connected, and the server itself.
struct ControlBench
{
    ControlBench()
    {
        if (log.open(logPath()) || server.listen(socketPath()))
            qFatal("The control bench cannot make its sockets");
    }

    [[nodiscard]] QString logPath() const { return folder.filePath("log"); }
    [[nodiscard]] QString socketPath() const { return folder.filePath("control"); }

    QTemporaryDir folder;
    VirtualDevice::Registry registry;
    VirtualDevice::LogStore log;
    VirtualDevice::Screen screen;
    VirtualDevice::RegionWatch regions{screen};
    VirtualDevice::Monitor monitor;
    VirtualDevice::ControlServer server{VirtualDevice::ControlContext{registry, log, screen, regions, monitor}};
};

/// Sends one message to a log service, as the C library does.
[[nodiscard]] bool sendLog(const QString& socketPath, const QByteArray& datagram);

} // namespace TestSupport
