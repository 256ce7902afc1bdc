// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QtGlobal>

namespace Domain
{

/// What the accelerometer of the radio microcontroller and its users share.
class AbstractAccelerometer
{
public:
    /// One byte whose values the microcontroller's firmware defines: every value passes through unchanged.
    enum AccelMode : quint8
    {
    };

    AbstractAccelerometer() = delete;
};

} // namespace Domain
