// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QRect>
#include <QString>

class QLabel;
class QWidget;

namespace TestSupport
{

inline const QString green = QStringLiteral("background-color: green;");
inline const QString red = QStringLiteral("background-color: red;");

/// Compares the form of a test that is one framed, centred label: names, title, designer size, rectangle, frame, text.
/// An empty family stands for the application's own font.
void compareLabelForm(QWidget& form, const QString& formName, const QLabel& label, QRect rectangle, const QString& text,
                      const QString& family);

} // namespace TestSupport
