// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QObject>

namespace Domain
{

/// The keypad as the rest of the system sees it: one signal for each physical button, and the persistent button lock.
/// The lock is only stored and reported; whoever wants it obeyed asks `buttonsLocked()`.
///
/// Threads: the GUI thread; the signals are emitted while the key event is handled.
class AbstractButtons : public QObject
{
    Q_OBJECT

public:
    AbstractButtons() = default;
    ~AbstractButtons() override = default;
    Q_DISABLE_COPY_MOVE(AbstractButtons)

    /// Stores "not locked" when the setting has no value yet.
    virtual bool buttonsLocked() = 0;
    virtual void setButtonLock(bool locked) = 0;

signals:
    void soft1Pressed();
    void soft2Pressed();
    void soft3Pressed();
    void powerPressed();
    void upPressed();
    void downPressed();
    void leftPressed();
    void rightPressed();
    void enterPressed();
    /// Every key event, repeats and unknown keys included, after the key's own signal.
    void anyButtonPressed();
    /// Not a button: the DSP's assertion line, which the platform reports as a key.
    void dspAssert();
};

} // namespace Domain
