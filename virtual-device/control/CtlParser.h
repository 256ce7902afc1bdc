// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QString>
#include <QStringList>

namespace VirtualDevice
{

/// The command line of `virtual-device ctl`, taken apart and checked for its form; names and values are the device's
/// to judge.
///
/// Threads: a value; one owner, any thread.
struct CtlRequest
{
    QString problem; ///< what is wrong; empty when nothing is
    QString help;    ///< asked for; empty when it is not
    QString command;
    QStringList words; ///< behind the command
    QString device;
    bool isJson = false;
    bool follows = false;
    double within = 10;
};

/// `arguments` begin behind the word "ctl". Options may stand anywhere; a negative number is no option.
[[nodiscard]] CtlRequest parseCtl(const QStringList& arguments);

} // namespace VirtualDevice
