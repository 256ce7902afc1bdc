// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/ButtonsTest.h"

#include "presentation/WidgetUpdates.h"
#include "presentation/ui_ButtonsTest.h"

#include <QFile>
#include <QKeyEvent>
#include <QTextStream>

#include <algorithm>
#include <array>

namespace Presentation
{

namespace
{

const QString releasedStyleSheet = QStringLiteral("background-color: white;");
const QString pressedStyleSheet = QStringLiteral("background-color: green;");
const QString powerLatchFileName = QStringLiteral("/sys/class/leds/power_latch/brightness");

struct Key
{
    Qt::Key code;
    const char* name;               ///< null for a signal line, which is neither logged nor shown
    QLabel* Ui_ButtonsTest::*label; ///< null for a signal line
    void (ButtonsTest::*pressed)();
};

constexpr std::array keys{
    Key{Qt::Key_Return, "Enter", &Ui_ButtonsTest::selLabel, &ButtonsTest::enterPressed},
    Key{Qt::Key_Left, "Left", &Ui_ButtonsTest::leftLabel, &ButtonsTest::leftPressed},
    Key{Qt::Key_Up, "Up", &Ui_ButtonsTest::upLabel, &ButtonsTest::upPressed},
    Key{Qt::Key_Right, "Right", &Ui_ButtonsTest::rightLabel, &ButtonsTest::rightPressed},
    Key{Qt::Key_Down, "Down", &Ui_ButtonsTest::downLabel, &ButtonsTest::downPressed},
    Key{Qt::Key_F5, "Soft 1", &Ui_ButtonsTest::soft1Label, &ButtonsTest::soft1Pressed},
    Key{Qt::Key_F6, "Soft 2", &Ui_ButtonsTest::soft2Label, &ButtonsTest::soft2Pressed},
    Key{Qt::Key_F7, "Soft 3", &Ui_ButtonsTest::soft3Label, &ButtonsTest::soft3Pressed},
    Key{Qt::Key_F10, nullptr, nullptr, &ButtonsTest::triggerPressed},
    Key{Qt::Key_F11, nullptr, nullptr, &ButtonsTest::radioPressed},
    Key{Qt::Key_F12, "Power", &Ui_ButtonsTest::powerLabel, &ButtonsTest::powerPressed},
};

const Key* keyFor(int code)
{
    const auto* key =
        std::find_if(keys.begin(), keys.end(), [=](const Key& candidate) { return candidate.code == code; });
    return key == keys.end() ? nullptr : key;
}

void showUnknown(QLabel& label, int code, const QString& styleSheet)
{
    WidgetUpdates::showStyle(label, styleSheet);
    label.setText(QStringLiteral("Unknown key: %1").arg(code));
}

void raisePowerLatch()
{
    // Without "existing only" a missing latch would be created as an ordinary file.
    QFile latch(powerLatchFileName);
    if (!latch.open(QIODevice::WriteOnly | QIODevice::ExistingOnly)) {
        qDebug("Cannot open power latch file");
        return;
    }
    QTextStream(&latch) << "1";
}

} // namespace

ButtonsTest::ButtonsTest(QWidget* parent) : QWidget(parent), ui(std::make_unique<Ui_ButtonsTest>())
{
    ui->setupUi(this);
    grabKeyboard();
}

ButtonsTest::~ButtonsTest() = default;

void ButtonsTest::keyPressEvent(QKeyEvent* event)
{
    const auto* key = keyFor(event->key());
    if (key == nullptr) {
        qDebug("Unknown key pressed : %d", event->key());
        showUnknown(*ui->unknownLabel, event->key(), pressedStyleSheet);
        return;
    }
    if (key->label != nullptr) {
        qDebug("%s pressed", key->name);
        auto& label = *((*ui).*(key->label));
        if (WidgetUpdates::showStyle(label, pressedStyleSheet))
            WidgetUpdates::showNow(label);
    }
    emit(this->*key->pressed)();
    if (key->code == Qt::Key_F12)
        raisePowerLatch();
}

void ButtonsTest::keyReleaseEvent(QKeyEvent* event)
{
    const auto* key = keyFor(event->key());
    if (key == nullptr) {
        qDebug("Unknown key released : %d", event->key());
        showUnknown(*ui->unknownLabel, event->key(), releasedStyleSheet);
    } else if (key->label != nullptr) {
        qDebug("%s released", key->name);
        WidgetUpdates::showStyle(*((*ui).*(key->label)), releasedStyleSheet);
    }
}

/// Tab is a key like any other here; a widget that moves the focus would keep its presses for itself.
bool ButtonsTest::focusNextPrevChild(bool /*next*/)
{
    return false;
}

} // namespace Presentation
