// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/TriggerTest.h"

#include "presentation/WidgetUpdates.h"
#include "presentation/ui_TriggerTest.h"

#include <QTimer>

namespace Presentation
{

namespace
{

const QString disconnectedStyleSheet = QStringLiteral("background-color: red;");
const QString connectedStyleSheet = QStringLiteral("background-color: green;");
constexpr int timeoutMs = 1000;

} // namespace

struct TriggerTest::PrivateData
{
    Ui_TriggerTest ui{};
    QTimer timer;
    bool running = false;
};

TriggerTest::TriggerTest(QWidget* parent) : QWidget(parent), d(std::make_unique<PrivateData>())
{
    d->ui.setupUi(this);
    // A coarse timer may fire 50 ms early and would show a trigger as lost that still comes within its second.
    d->timer.setTimerType(Qt::PreciseTimer);
    connect(&d->timer, &QTimer::timeout, this, &TriggerTest::timerExpired);
}

TriggerTest::~TriggerTest() = default;

void TriggerTest::start()
{
    d->running = true;
}

void TriggerTest::stop()
{
    d->running = false;
}

void TriggerTest::triggerInput()
{
    if (!d->running)
        return;
    d->timer.stop();
    d->timer.start(timeoutMs);
    WidgetUpdates::showStyle(*d->ui.connectedLabel, connectedStyleSheet);
}

void TriggerTest::timerExpired()
{
    WidgetUpdates::showStyle(*d->ui.connectedLabel, disconnectedStyleSheet);
}

} // namespace Presentation
