// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QtGlobal>

namespace Domain
{

/// What a sensor reading of any kind tells: which frame it came in and how densely that frame was sampled.
///
/// Threads: readings are values; any thread may have its own.
class AbstractSensorReading
{
public:
    virtual ~AbstractSensorReading() = default;

    /// The receiver's frame counter, which wraps.
    [[nodiscard]] virtual quint16 frameNumber() const = 0;
    /// 1 or 2.
    [[nodiscard]] virtual int upsampleRatio() const = 0;

protected:
    AbstractSensorReading() = default;
    AbstractSensorReading(const AbstractSensorReading&) = default;
    AbstractSensorReading& operator=(const AbstractSensorReading&) = default;
};

} // namespace Domain
