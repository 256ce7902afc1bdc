// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "Domain/src/DomainLayer/AbstractButtons.h"

namespace TestSupport
{

/// A keypad without keys: the DSP listens to its assertion line only.
class AssertionLine : public Domain::AbstractButtons
{
public:
    bool buttonsLocked() override { return false; }
    void setButtonLock(bool /*locked*/) override {}
};

} // namespace TestSupport
