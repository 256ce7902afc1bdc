// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "utilities/VersionNumber.h"

#include <QObject>

namespace Domain
{

/// The DSP as the test screens see it: each slot sends one command and blocks its caller until the DSP has
/// acknowledged it, 800 ms at most. The result is true only for an acknowledged command; why another one failed is in
/// the log.
///
/// Threads: the slots are for the GUI thread (any thread but the implementation's own worker, which takes the
/// acknowledgement); signals may come from that worker.
class AbstractDsp : public QObject
{
    Q_OBJECT

public:
    AbstractDsp() = default;
    ~AbstractDsp() override = default;
    Q_DISABLE_COPY_MOVE(AbstractDsp)

public slots:
    /// The version itself follows as `versionReceived`.
    virtual bool requestVersion() = 0;
    /// `type` goes to the firmware as it is.
    virtual bool setReceiverEnableTest(qint32 type) = 0;
    virtual bool runHardwareTest(qint32 testId) = 0;

signals:
    void versionReceived(Utilities::VersionNumber version);
};

} // namespace Domain
