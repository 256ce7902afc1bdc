// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QObject>
#include <QSocketNotifier>

#include <memory>

namespace VirtualDevice
{

/// SIGINT, SIGTERM and SIGHUP as an event of the main thread. One at a time in a process.
class EndSignals : public QObject
{
    Q_OBJECT

public:
    explicit EndSignals(QObject* parent = nullptr);
    ~EndSignals() override;

signals:
    void requested();

private:
    std::unique_ptr<QSocketNotifier> notifier;
};

} // namespace VirtualDevice
