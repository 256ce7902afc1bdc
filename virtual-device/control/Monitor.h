// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QJsonObject>
#include <QObject>
#include <QString>

namespace VirtualDevice
{

/// Where the models of the device report what they have seen that is neither a control's value nor a log line: a
/// command of the program, a frame that was damaged, a reply that was held back. Whoever subscribed to the control
/// socket's monitor events gets them.
///
/// Threads: `raise` may be called from any; the signal is emitted on the caller's.
class Monitor : public QObject
{
    Q_OBJECT

public:
    using QObject::QObject;

    /// `source` is the model ("radio"), `event` what happened ("command"), `details` whatever describes it.
    void raise(const QString& source, const QString& event, const QJsonObject& details = {})
    {
        emit raised(source, event, details);
    }

signals:
    void raised(const QString& source, const QString& event, const QJsonObject& details);
};

} // namespace VirtualDevice
