// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QDateTime>
#include <QString>

class QDateTimeEdit;
class QDoubleSpinBox;
class QWidget;

/// What the polls show, written to a widget only when it differs from what stands there: a style sheet that is set
/// again is parsed and polished again, and a number that is set again is painted again, every second and for nothing.
///
/// Threads: the GUI thread.
namespace Presentation::WidgetUpdates
{

/// Returns whether the style sheet was another one before.
bool showStyle(QWidget& widget, const QString& styleSheet);
void showNumber(QDoubleSpinBox& box, double value);
/// An invalid date and time leaves what is shown.
void showDateTime(QDateTimeEdit& edit, const QDateTime& dateTime);

} // namespace Presentation::WidgetUpdates
