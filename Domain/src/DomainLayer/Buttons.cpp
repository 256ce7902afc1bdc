// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/Buttons.h"

#include "DataSource/src/AbstractConfigurationData.h"
#include "utilities/Debug.h"

#include <QKeyEvent>
#include <QWidget>

#include <algorithm>
#include <array>

namespace Domain
{

namespace
{

using DataSource::AbstractConfigurationData;

/// Line number that monitoring matches in the log.
constexpr int unknownKeyLine = 146;
/// The power key fires when the keyboard has repeated it this often.
constexpr qint32 powerRepeats = 3;

struct ButtonKey
{
    Qt::Key key;
    void (AbstractButtons::*pressed)();
    bool firesOnRepeat;
};

constexpr std::array buttonKeys{
    ButtonKey{Qt::Key_Return, &AbstractButtons::enterPressed, false},
    ButtonKey{Qt::Key_Left, &AbstractButtons::leftPressed, true},
    ButtonKey{Qt::Key_Up, &AbstractButtons::upPressed, true},
    ButtonKey{Qt::Key_Right, &AbstractButtons::rightPressed, true},
    ButtonKey{Qt::Key_Down, &AbstractButtons::downPressed, true},
    ButtonKey{Qt::Key_F5, &AbstractButtons::soft1Pressed, false},
    ButtonKey{Qt::Key_F6, &AbstractButtons::soft2Pressed, false},
    ButtonKey{Qt::Key_F7, &AbstractButtons::soft3Pressed, false},
    ButtonKey{Qt::Key_F11, &AbstractButtons::dspAssert, false},
};

} // namespace

class Buttons::PrivateData : public QWidget
{
public:
    PrivateData(Buttons* buttons, AbstractConfigurationData& settings) : owner(buttons), configuration(settings) {}

    Buttons* owner;
    AbstractConfigurationData& configuration;
    bool individualSignalsEnabled = true;

protected:
    void keyPressEvent(QKeyEvent* event) override;

private:
    void handleKey(const QKeyEvent& event);
    void handlePowerRepeat();

    qint32 powerRepeatCount = 0;
};

void Buttons::PrivateData::keyPressEvent(QKeyEvent* event)
{
    if (event->key() == Qt::Key_F12 && !event->isAutoRepeat())
        powerRepeatCount = 0;
    if (individualSignalsEnabled)
        handleKey(*event);
    emit owner->anyButtonPressed();
}

void Buttons::PrivateData::handleKey(const QKeyEvent& event)
{
    if (event.key() == Qt::Key_F12) {
        if (event.isAutoRepeat())
            handlePowerRepeat();
        return;
    }
    const auto* const button = std::find_if(buttonKeys.begin(), buttonKeys.end(),
                                            [&](const ButtonKey& candidate) { return candidate.key == event.key(); });
    if (button != buttonKeys.end()) {
        if (button->firesOnRepeat || !event.isAutoRepeat())
            emit(owner->*button->pressed)();
    } else if (!event.isAutoRepeat()) {
        Utilities::Debug::warningMessage(__FILE__, unknownKeyLine,
                                         QStringLiteral("Unknown key pressed : %1").arg(event.key()));
    }
}

void Buttons::PrivateData::handlePowerRepeat()
{
    if (++powerRepeatCount == powerRepeats)
        emit owner->powerPressed();
}

Buttons::Buttons(AbstractConfigurationData& configuration) : d(std::make_unique<PrivateData>(this, configuration))
{
    // The windowing system gives the grab only to a window that it knows, hence the short appearance.
    d->show();
    d->hide();
    d->grabKeyboard();
}

Buttons::~Buttons() = default;

bool Buttons::buttonsLocked()
{
    return d->configuration.data(AbstractConfigurationData::ButtonLock, false).toBool();
}

void Buttons::setButtonLock(bool locked)
{
    if (d->configuration.data(AbstractConfigurationData::ButtonLock).toBool() != locked)
        d->configuration.setData(AbstractConfigurationData::ButtonLock, locked);
}

void Buttons::enableIndividualSignals(bool enable)
{
    d->individualSignalsEnabled = enable;
}

} // namespace Domain
