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

/// Brings the widget to the screen at once, for a caller that is about to hold the GUI thread. Painting alone reaches
/// the window's buffer: the framebuffer and the VNC platform note that it has changed and copy it to the screen, or
/// send it, by requests to update that wait for the event loop. Such requests are handled here, and no other event.
/// A viewer over VNC asks for a next picture with each that it gets; one whose question is still under way when the
/// thread is held gets the picture after that.
void showNow(QWidget& widget);

} // namespace Presentation::WidgetUpdates
