// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/WidgetUpdates.h"

#include <QDateTimeEdit>
#include <QDoubleSpinBox>
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

} // namespace Presentation::WidgetUpdates
