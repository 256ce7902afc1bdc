// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/ButtonsTest.h"

#include "tests/presentation/DebugOutput.h"
#include "tests/presentation/LabelForm.h"
#include "tests/presentation/WidgetProbe.h"

#include <QGridLayout>
#include <QKeyEvent>
#include <QLabel>
#include <QMetaMethod>
#include <QSignalSpy>
#include <QSpinBox>
#include <QTest>

using Presentation::ButtonsTest;
using TestSupport::child;
using TestSupport::green;

namespace
{

const QString white = QStringLiteral("background-color: white;");
const QString latch = QStringLiteral("/sys/class/leds/power_latch/brightness");
const QStringList allLabels{QStringLiteral("soft1Label"),  QStringLiteral("soft2Label"), QStringLiteral("soft3Label"),
                            QStringLiteral("selLabel"),    QStringLiteral("upLabel"),    QStringLiteral("downLabel"),
                            QStringLiteral("leftLabel"),   QStringLiteral("rightLabel"), QStringLiteral("powerLabel"),
                            QStringLiteral("unknownLabel")};

void send(QWidget& widget, QEvent::Type type, int key, bool autoRepeat = false)
{
    QKeyEvent event(type, key, Qt::NoModifier, QString(), autoRepeat);
    QCoreApplication::sendEvent(&widget, &event);
}

/// The style sheets of the ten labels by name, to see which one a key changes.
QMap<QString, QString> styles(ButtonsTest& test)
{
    QMap<QString, QString> all;
    for (const auto& name : allLabels)
        all[name] = child<QLabel>(test, qPrintable(name)).styleSheet();
    return all;
}

} // namespace

class ButtonsTestTest : public QObject
{
    Q_OBJECT

private slots:
    void init() { TestSupport::writeFile(latch, ""); }
    void cleanup() { TestSupport::removePath(QStringLiteral("/sys/class")); }

    void theFormIsAGridOfFramedLabels_data()
    {
        QTest::addColumn<QString>("name");
        QTest::addColumn<QString>("text");
        QTest::addColumn<QString>("styleSheet");
        QTest::addColumn<QList<int>>("cell");
        const auto row = [](const char* name, const char* text, const QString& styleSheet, const QList<int>& cell) {
            QTest::newRow(name) << QString::fromLatin1(name) << QString::fromLatin1(text) << styleSheet << cell;
        };
        row("soft1Label", "Soft1", white, {0, 0, 1, 1});
        row("soft2Label", "Soft2", white, {0, 1, 1, 1});
        row("soft3Label", "Soft3", white, {0, 2, 1, 1});
        row("selLabel", "Sel", white, {0, 3, 1, 1});
        row("upLabel", "Up", white, {1, 0, 1, 1});
        row("downLabel", "Down", white, {1, 1, 1, 1});
        row("leftLabel", "Left", white, {1, 2, 1, 1});
        row("rightLabel", "Right", white, {1, 3, 1, 1});
        row("powerLabel", "Power", white, {2, 0, 1, 1});
        row("unknownLabel", "Unknown:", QString(), {2, 1, 1, 3});
    }

    void theFormIsAGridOfFramedLabels()
    {
        QFETCH(QString, name);
        QFETCH(QList<int>, cell);
        ButtonsTest test(nullptr);
        auto& label = child<QLabel>(test, qPrintable(name));
        QTEST(label.text(), "text");
        QTEST(label.styleSheet(), "styleSheet");
        QCOMPARE(label.frameShape(), QFrame::Box);
        QCOMPARE(label.alignment(), Qt::AlignCenter);
        QCOMPARE(label.font().family(), QStringLiteral("DejaVu Sans"));
        const auto& grid = child<QGridLayout>(test, "gridLayout");
        QList<int> position(4);
        grid.getItemPosition(grid.indexOf(&label), &position[0], &position[1], &position[2], &position[3]);
        QCOMPARE(position, cell);
    }

    void theGridFillsItsPartOfTheForm()
    {
        ButtonsTest test(nullptr);
        QCOMPARE(test.objectName(), QStringLiteral("ButtonsTest"));
        QCOMPARE(test.windowTitle(), QStringLiteral("Form"));
        QCOMPARE(test.size(), QSize(240, 68));
        auto& part = child<QWidget>(test, "layoutWidget");
        QCOMPARE(part.geometry(), QRect(0, 0, 231, 61));
        QCOMPARE(part.layout()->objectName(), QStringLiteral("gridLayout"));
        QCOMPARE(part.layout()->contentsMargins(), QMargins());
        QCOMPARE(part.layout()->count(), 10);
    }

    void theSignalsStandInTheirOrder()
    {
        QStringList names;
        const auto& meta = ButtonsTest::staticMetaObject;
        for (int index = meta.methodOffset(); index < meta.methodCount(); ++index)
            names.append(QString::fromLatin1(meta.method(index).methodSignature()));
        QCOMPARE(names, QStringList({"soft1Pressed()", "soft2Pressed()", "soft3Pressed()", "powerPressed()",
                                     "upPressed()", "downPressed()", "leftPressed()", "rightPressed()",
                                     "enterPressed()", "triggerPressed()", "radioPressed()"}));
    }

    void takesTheKeyboardForItsWholeLife()
    {
        {
            const ButtonsTest test(nullptr);
            QCOMPARE(QWidget::keyboardGrabber(), &test);
        }
        QCOMPARE(QWidget::keyboardGrabber(), nullptr);
    }

    void aKeyLightsItsLabelWhileItIsHeld_data()
    {
        QTest::addColumn<int>("key");
        QTest::addColumn<QString>("label");
        QTest::addColumn<QString>("name");
        QTest::addColumn<QByteArray>("signal");
        const auto row = [](int key, const char* label, const char* name, const char* signal) {
            QTest::newRow(name) << key << QString::fromLatin1(label) << QString::fromLatin1(name) << QByteArray(signal);
        };
        row(0x01000004, "selLabel", "Enter", SIGNAL(enterPressed()));
        row(0x01000012, "leftLabel", "Left", SIGNAL(leftPressed()));
        row(0x01000013, "upLabel", "Up", SIGNAL(upPressed()));
        row(0x01000014, "rightLabel", "Right", SIGNAL(rightPressed()));
        row(0x01000015, "downLabel", "Down", SIGNAL(downPressed()));
        row(0x01000034, "soft1Label", "Soft 1", SIGNAL(soft1Pressed()));
        row(0x01000035, "soft2Label", "Soft 2", SIGNAL(soft2Pressed()));
        row(0x01000036, "soft3Label", "Soft 3", SIGNAL(soft3Pressed()));
        row(0x0100003B, "powerLabel", "Power", SIGNAL(powerPressed()));
    }

    void aKeyLightsItsLabelWhileItIsHeld()
    {
        QFETCH(int, key);
        QFETCH(QString, label);
        QFETCH(QString, name);
        QFETCH(QByteArray, signal);
        TestSupport::DebugOutput output;
        ButtonsTest test(nullptr);
        const auto idle = styles(test);
        auto expected = idle;
        QSignalSpy spy(&test, signal.constData());
        const auto spies = spiesOnAllSignals(test);

        send(test, QEvent::KeyPress, key);
        expected[label] = green;
        QCOMPARE(styles(test), expected);
        QCOMPARE(TestSupport::paintedColour(child<QLabel>(test, qPrintable(label))), QColor(0, 128, 0));
        QCOMPARE(output.take(), QStringList({name + QStringLiteral(" pressed")}));
        QCOMPARE(spy.count(), 1);

        send(test, QEvent::KeyRelease, key);
        QCOMPARE(styles(test), idle);
        QCOMPARE(TestSupport::paintedColour(child<QLabel>(test, qPrintable(label))), QColor(255, 255, 255));
        QCOMPARE(output.take(), QStringList({name + QStringLiteral(" released")}));
        QCOMPARE(emissions(spies), 1);
        QCOMPARE(child<QLabel>(test, "unknownLabel").text(), QStringLiteral("Unknown:"));
    }

    void autoRepeatsCountAsPresses()
    {
        TestSupport::DebugOutput output;
        ButtonsTest test(nullptr);
        const QSignalSpy spy(&test, &ButtonsTest::upPressed);
        send(test, QEvent::KeyPress, Qt::Key_Up);
        for (int repeat = 0; repeat < 3; ++repeat) {
            send(test, QEvent::KeyRelease, Qt::Key_Up, true);
            QCOMPARE(child<QLabel>(test, "upLabel").styleSheet(), white);
            send(test, QEvent::KeyPress, Qt::Key_Up, true);
            QCOMPARE(child<QLabel>(test, "upLabel").styleSheet(), green);
        }
        QCOMPARE(spy.count(), 4);
        QCOMPARE(output.count(QStringLiteral("Up pressed")), 4);
        QCOMPARE(output.count(QStringLiteral("Up released")), 3);
    }

    void theSignalLinesChangeNoLabelAndEmitOnPressOnly_data()
    {
        QTest::addColumn<int>("key");
        QTest::addColumn<QByteArray>("signal");
        QTest::newRow("trigger") << 0x01000039 << QByteArray(SIGNAL(triggerPressed()));
        QTest::newRow("radio") << 0x0100003A << QByteArray(SIGNAL(radioPressed()));
    }

    void theSignalLinesChangeNoLabelAndEmitOnPressOnly()
    {
        QFETCH(int, key);
        QFETCH(QByteArray, signal);
        const TestSupport::DebugOutput output;
        ButtonsTest test(nullptr);
        const auto idle = styles(test);
        const QSignalSpy spy(&test, signal.constData());
        const auto spies = spiesOnAllSignals(test);
        send(test, QEvent::KeyPress, key);
        QCOMPARE(spy.count(), 1);
        send(test, QEvent::KeyPress, key, true);
        QCOMPARE(spy.count(), 2);
        send(test, QEvent::KeyRelease, key);
        QCOMPARE(emissions(spies), 2);
        QCOMPARE(styles(test), idle);
        QCOMPARE(child<QLabel>(test, "unknownLabel").text(), QStringLiteral("Unknown:"));
        QCOMPARE(output.texts(), QStringList());
    }

    void anyOtherKeyShowsItsCode_data()
    {
        QTest::addColumn<int>("key");
        QTest::newRow("Escape") << int(Qt::Key_Escape);
        QTest::newRow("Enter of the number pad") << int(Qt::Key_Enter);
        QTest::newRow("A") << int(Qt::Key_A);
        QTest::newRow("F4") << int(Qt::Key_F4);
        QTest::newRow("F13") << int(Qt::Key_F13);
        QTest::newRow("Tab") << int(Qt::Key_Tab);
        QTest::newRow("Backtab") << int(Qt::Key_Backtab);
        QTest::newRow("Space") << int(Qt::Key_Space);
        QTest::newRow("none") << 0;
    }

    void anyOtherKeyShowsItsCode()
    {
        QFETCH(int, key);
        TestSupport::DebugOutput output;
        ButtonsTest test(nullptr);
        QSpinBox focusable(&test); // Tab would move the focus to it.
        const auto spies = spiesOnAllSignals(test);
        auto& label = child<QLabel>(test, "unknownLabel");
        const auto others = [&] {
            auto all = styles(test);
            all.remove(QStringLiteral("unknownLabel"));
            return all;
        };
        const auto idle = others();
        const QString text = QStringLiteral("Unknown key: %1").arg(key);

        send(test, QEvent::KeyPress, key);
        QCOMPARE(output.take(), QStringList({QStringLiteral("Unknown key pressed : %1").arg(key)}));
        QCOMPARE(label.styleSheet(), green);
        QCOMPARE(label.text(), text);

        label.setText(QString());
        send(test, QEvent::KeyRelease, key);
        QCOMPARE(output.take(), QStringList({QStringLiteral("Unknown key released : %1").arg(key)}));
        QCOMPARE(label.styleSheet(), white);
        QCOMPARE(label.text(), text);
        QCOMPARE(others(), idle);
        QCOMPARE(emissions(spies), 0);
    }

    void escapeShowsItsDecimalCode()
    {
        ButtonsTest test(nullptr);
        send(test, QEvent::KeyPress, Qt::Key_Escape);
        QCOMPARE(child<QLabel>(test, "unknownLabel").text(), QStringLiteral("Unknown key: 16777216"));
    }

    void modifiersDoNotMatter()
    {
        ButtonsTest test(nullptr);
        const QSignalSpy spy(&test, &ButtonsTest::soft2Pressed);
        QKeyEvent event(QEvent::KeyPress, Qt::Key_F6, Qt::ControlModifier | Qt::AltModifier | Qt::ShiftModifier);
        QCoreApplication::sendEvent(&test, &event);
        QCOMPARE(spy.count(), 1);
    }

    void theLabelIsOnTheScreenBeforeTheSignal()
    {
        ButtonsTest test(nullptr);
        test.show();
        QVERIFY(QTest::qWaitForWindowExposed(&test));
        TestSupport::paintWhatIsUnderWay(test);
        const TestSupport::PaintCounter counter(test);
        int paintsAtSignal = 0;
        QString styleAtSignal;
        connect(&test, &ButtonsTest::soft3Pressed, this, [&] {
            paintsAtSignal = counter.paints;
            styleAtSignal = child<QLabel>(test, "soft3Label").styleSheet();
        });
        send(test, QEvent::KeyPress, Qt::Key_F7);
        QCOMPARE(styleAtSignal, green);
        QVERIFY(paintsAtSignal > 0);
    }

    void everyPressOfPowerRaisesTheLatchAfterItsSignal()
    {
        TestSupport::DebugOutput output;
        ButtonsTest test(nullptr);
        QByteArray latchAtSignal("not emitted");
        connect(&test, &ButtonsTest::powerPressed, this, [&] { latchAtSignal = TestSupport::readFile(latch); });
        for (const bool repeat : {false, true, false}) {
            TestSupport::writeFile(latch, "0");
            send(test, QEvent::KeyPress, Qt::Key_F12, repeat);
            QCOMPARE(latchAtSignal, QByteArray("0"));
            QCOMPARE(TestSupport::readFile(latch), QByteArray("1"));
        }
        TestSupport::writeFile(latch, "0");
        send(test, QEvent::KeyRelease, Qt::Key_F12);
        QCOMPARE(TestSupport::readFile(latch), QByteArray("0"));
        QCOMPARE(output.count(QStringLiteral("Power pressed")), 3);
        QCOMPARE(output.texts().size(), 4);
    }

    void aMissingLatchIsToldAndNotCreated()
    {
        TestSupport::removePath(latch);
        TestSupport::DebugOutput output;
        ButtonsTest test(nullptr);
        const QSignalSpy spy(&test, &ButtonsTest::powerPressed);
        send(test, QEvent::KeyPress, Qt::Key_F12);
        QCOMPARE(output.take(),
                 QStringList({QStringLiteral("Power pressed"), QStringLiteral("Cannot open power latch file")}));
        QCOMPARE(spy.count(), 1);
        QCOMPARE(child<QLabel>(test, "powerLabel").styleSheet(), green);
        QVERIFY(!QFile::exists(latch));
        QCOMPARE(output.complaints(), QStringList());
    }

    void otherKeysLeaveTheLatchAlone()
    {
        ButtonsTest test(nullptr);
        for (const int key : {int(Qt::Key_Return), int(Qt::Key_F5), int(Qt::Key_F10), int(Qt::Key_F11), int(Qt::Key_A)})
            send(test, QEvent::KeyPress, key);
        QCOMPARE(TestSupport::readFile(latch), QByteArray());
    }

private:
    using Spies = std::vector<std::unique_ptr<QSignalSpy>>;

    static Spies spiesOnAllSignals(ButtonsTest& test)
    {
        Spies spies;
        const auto& meta = ButtonsTest::staticMetaObject;
        for (int index = meta.methodOffset(); index < meta.methodCount(); ++index)
            spies.push_back(std::make_unique<QSignalSpy>(&test, meta.method(index)));
        return spies;
    }

    static qsizetype emissions(const Spies& spies)
    {
        qsizetype sum = 0;
        for (const auto& spy : spies)
            sum += spy->count();
        return sum;
    }
};

QTEST_MAIN(ButtonsTestTest)
#include "ButtonsTestTest.moc"
