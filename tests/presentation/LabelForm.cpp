// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/presentation/LabelForm.h"

#include <QApplication>
#include <QLabel>
#include <QTest>

namespace TestSupport
{

void compareLabelForm(QWidget& form, const QString& formName, const QLabel& label, QRect rectangle, const QString& text,
                      const QString& family)
{
    QCOMPARE(form.objectName(), formName);
    QCOMPARE(form.windowTitle(), QStringLiteral("Form"));
    QCOMPARE(form.size(), QSize(240, 320));
    QCOMPARE(label.parentWidget(), &form);
    QCOMPARE(label.geometry(), rectangle);
    QCOMPARE(label.text(), text);
    QCOMPARE(label.frameShape(), QFrame::Box);
    QCOMPARE(label.alignment(), Qt::AlignCenter);
    QCOMPARE(label.font().family(), family.isEmpty() ? QApplication::font().family() : family);
    QCOMPARE(label.font().pointSizeF(), QApplication::font().pointSizeF());
}

} // namespace TestSupport
