// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QWidget>

#include <memory>

class Ui_ButtonsTest;

namespace Presentation
{

/// The keypad panel: lights the label of a key while it is held and turns key presses into the signals that drive the
/// RF panel and the trigger test. Holds the keyboard grab for its whole life, so that every key event of the
/// application comes here, whatever has the focus.
///
/// | Key                  | Label                    | Signal on press                     |
/// |----------------------|--------------------------|-------------------------------------|
/// | Return               | Sel                      | enterPressed()                      |
/// | arrows               | Left, Up, Right, Down    | leftPressed() ... downPressed()     |
/// | F5, F6, F7           | Soft1, Soft2, Soft3      | soft1Pressed() ... soft3Pressed()   |
/// | F10 (trigger input)  | none                     | triggerPressed()                    |
/// | F11 (radio line)     | none                     | radioPressed()                      |
/// | F12                  | Power                    | powerPressed(), then "1" to the latch |
/// | any other            | Unknown, with its code   | none                                |
///
/// Auto-repeats count as presses. The label is on the screen before the signal is emitted, for its receivers may hold
/// the GUI thread for seconds.
///
/// Lives in the GUI thread.
class ButtonsTest : public QWidget
{
    Q_OBJECT

public:
    explicit ButtonsTest(QWidget* parent);
    ~ButtonsTest() override;

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
    void triggerPressed();
    void radioPressed();

protected:
    void keyPressEvent(QKeyEvent* event) override;
    void keyReleaseEvent(QKeyEvent* event) override;
    bool focusNextPrevChild(bool next) override;

private:
    const std::unique_ptr<Ui_ButtonsTest> ui;
};

} // namespace Presentation
