// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include <QApplication>
#include <QLabel>

/// A green window and a word on the error output.
int main(int argc, char** argv)
{
    QApplication application(argc, argv);
    qInfo("window program in %s", qPrintable(QApplication::platformName()));
    QLabel label(QStringLiteral("window"));
    label.setStyleSheet(QStringLiteral("background-color: green"));
    label.setGeometry(0, 0, 240, 320);
    label.show();
    return QApplication::exec();
}
