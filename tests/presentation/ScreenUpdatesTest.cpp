// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/ButtonsTest.h"
#include "tests/presentation/RfPanel.h"

#include <QApplication>
#include <QKeyEvent>
#include <QScreen>
#include <QTest>

using Presentation::ButtonsTest;
using TestSupport::child;
using TestSupport::Panel;

namespace
{

/// What the platform's screen holds where the label stands: the picture that the framebuffer shows, or that a viewer
/// is sent.
QImage onTheScreen(const QWidget& label)
{
    const QRect place(label.mapToGlobal(QPoint(0, 0)), label.size());
    return QGuiApplication::primaryScreen()->grabWindow(0).copy(place).toImage().convertToFormat(QImage::Format_RGB32);
}

QImage painted(QWidget& label)
{
    return label.grab().toImage().convertToFormat(QImage::Format_RGB32);
}

} // namespace

/// What is on a real platform's screen while a slot holds the GUI thread: the platform copies a window to its screen by
/// an event of its own, which a held thread does not come to.
class ScreenUpdatesTest : public QObject
{
    Q_OBJECT

private slots:
    void aKeysLabelIsOnTheScreenBeforeItsSignal()
    {
        ButtonsTest test(nullptr);
        auto& label = child<QLabel>(test, "soft3Label");
        test.show();
        QTRY_COMPARE_WITH_TIMEOUT(onTheScreen(label), painted(label), 20'000);
        QColor colour;
        connect(&test, &ButtonsTest::soft3Pressed, this, [&] { colour = onTheScreen(label).pixelColor(2, 2); });
        QKeyEvent press(QEvent::KeyPress, Qt::Key_F7, Qt::NoModifier);
        QCoreApplication::sendEvent(&test, &press);
        QCOMPARE(colour, QColor(0, 128, 0));
    }

    void theEndOfTheTransmissionIsOnTheScreenWhileTheAmplifierIsWaitedFor()
    {
        Panel panel;
        auto& label = child<QLabel>(panel.test, "labelTransmitting");
        panel.test.show();
        panel.test.start();
        QTRY_COMPARE_WITH_TIMEOUT(onTheScreen(label), painted(label), 20'000);
        QImage atLastLook;
        panel.beacon.onLook = [&] { atLastLook = onTheScreen(label); };
        panel.test.toggleState();
        panel.beacon.onLook = nullptr;
        QCOMPARE(label.text(), QStringLiteral("| X"));
        QCOMPARE(atLastLook, painted(label));
    }

    void nothingButUpdatesHappensMeanwhile()
    {
        ButtonsTest test(nullptr);
        test.show();
        QVERIFY(QTest::qWaitForWindowExposed(&test));
        bool delivered = false;
        QMetaObject::invokeMethod(
            this, [&] { delivered = true; }, Qt::QueuedConnection);
        QKeyEvent press(QEvent::KeyPress, Qt::Key_F7, Qt::NoModifier);
        QCoreApplication::sendEvent(&test, &press);
        QVERIFY(!delivered);
        QCoreApplication::processEvents();
        QVERIFY(delivered);
    }
};

int main(int argc, char** argv)
{
    qputenv("QT_QPA_PLATFORM", "vnc:size=640x640");
    const QApplication application(argc, argv);
    ScreenUpdatesTest test;
    return QTest::qExec(&test, argc, argv);
}

#include "ScreenUpdatesTest.moc"
