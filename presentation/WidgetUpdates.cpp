// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/WidgetUpdates.h"

#include <QCoreApplication>
#include <QDateTimeEdit>
#include <QDoubleSpinBox>
#include <QEvent>
#include <QWidget>

#include <algorithm>

namespace Presentation::WidgetUpdates
{

bool showStyle(QWidget& widget, const QString& styleSheet)
{
    if (widget.styleSheet() == styleSheet)
        return false;
    widget.setStyleSheet(styleSheet);
    return true;
}

void showNumber(QDoubleSpinBox& box, double value)
{
    const double shown = std::clamp(value, box.minimum(), box.maximum());
    if (box.cleanText() != box.textFromValue(shown))
        box.setValue(shown);
}

void showDateTime(QDateTimeEdit& edit, const QDateTime& dateTime)
{
    if (!dateTime.isValid())
        return;
    const auto shown = std::clamp(dateTime, edit.minimumDateTime(), edit.maximumDateTime());
    if (edit.dateTime() != shown)
        edit.setDateTime(shown);
}

void showNow(QWidget& widget)
{
    widget.repaint();
    // The platform's copy to its screen first; what a VNC server posts for its viewers thereby is left to a second
    // pass.
    for (int pass = 0; pass < 2; ++pass)
        QCoreApplication::sendPostedEvents(nullptr, QEvent::UpdateRequest);
}

} // namespace Presentation::WidgetUpdates
