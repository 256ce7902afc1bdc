// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/commands/Commands.h"
#include "virtual-device/control/ControlDescription.h"
#include "virtual-device/control/Ctl.h"

namespace VirtualDevice
{

int ctlCommand(const QStringList& arguments)
{
    return runCtl(arguments.mid(1));
}

int controlsCommand(const QStringList& arguments)
{
    return ControlDescription::run(arguments.mid(1));
}

} // namespace VirtualDevice
