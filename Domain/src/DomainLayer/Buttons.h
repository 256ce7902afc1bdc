// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "Domain/src/DomainLayer/AbstractButtons.h"

#include <memory>

namespace DataSource
{
class AbstractConfigurationData;
}

namespace Domain
{

/// Turns the windowing system's key events into button signals. An invisible widget grabs the keyboard, so that the
/// keys arrive here whatever has the focus, until another widget takes the grab.
///
/// Arrow keys repeat while they are held; enter, the soft keys and the DSP's line fire once for a press. The power key
/// fires when it has been held for three repeats, once for a press. `anyButtonPressed()` follows every key event.
/// Releases are not looked at, and the button lock does not change what is emitted.
///
/// Threads: the GUI thread. `configuration` must outlive the object.
class Buttons : public AbstractButtons
{
    Q_OBJECT

public:
    explicit Buttons(DataSource::AbstractConfigurationData& configuration);
    ~Buttons() override;
    Q_DISABLE_COPY_MOVE(Buttons)

    bool buttonsLocked() override;
    void setButtonLock(bool locked) override;

    /// With false only `anyButtonPressed()` is emitted, and unknown keys are not logged. True at first.
    void enableIndividualSignals(bool enable);

private:
    class PrivateData;
    std::unique_ptr<PrivateData> d;
};

} // namespace Domain
