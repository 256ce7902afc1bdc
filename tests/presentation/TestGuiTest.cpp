// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/TestGui.h"

#include "DataSource/src/DataSourceLayer.h"
#include "presentation/ButtonsTest.h"
#include "presentation/FuelGuageTest.h"
#include "presentation/RtcTest.h"
#include "presentation/SdCardTest.h"
#include "presentation/TriggerTest.h"
#include "presentation/UsbDeviceTest.h"
#include "presentation/UsbGadgetTest.h"
#include "tests/presentation/DebugOutput.h"
#include "tests/presentation/LabelForm.h"
#include "tests/presentation/WidgetProbe.h"

#include <QDoubleSpinBox>
#include <QLabel>
#include <QTest>
#include <QTranslator>

using Presentation::TestGui;
using TestSupport::child;
using TestSupport::green;
using TestSupport::writeFile;

namespace
{

/// The window on a device whose files the case has laid out.
struct Bench
{
    DataSource::DataSourceLayer dataSourceLayer{QStringLiteral("/")};
    TestGui gui{dataSourceLayer};
};

QWidget* screen()
{
    for (auto* const widget : QApplication::topLevelWidgets()) {
        if (widget->objectName() == u"TestGui")
            return widget;
    }
    return nullptr;
}

/// The test of that class, which is a child of the screen.
template <typename Test> Test& test()
{
    auto* const found = screen()->findChild<Test*>(QString(), Qt::FindDirectChildrenOnly);
    if (found == nullptr)
        qFatal("the screen lacks a test");
    return *found;
}

void layOutHealthyFiles()
{
    writeFile(QStringLiteral("/sys/class/power_supply/ds2780-battery.0/voltage_now"), "4100000\n");
    writeFile(QStringLiteral("/sys/class/power_supply/ds2780-battery.0/current_now"), "-123456\n");
    writeFile(QStringLiteral("/sys/devices/platform/musb_hdrc/mode"), "b_peripheral\n");
    for (const char* const folder : {"/sys/bus/usb/devices/1-1.4", "/sys/block/mmcblk0", "/mnt/data"})
        QDir().mkpath(QString::fromLatin1(folder));
}

void press(QWidget& widget, int key)
{
    QTest::keyPress(widget.windowHandle(), static_cast<Qt::Key>(key));
    QCoreApplication::processEvents();
}

void release(QWidget& widget, int key)
{
    QTest::keyRelease(widget.windowHandle(), static_cast<Qt::Key>(key));
    QCoreApplication::processEvents();
}

struct Region
{
    const char* name;
    QRect rectangle;
};

const std::array regions{
    Region{"rtcTestRegion", {0, 0, 240, 30}},        Region{"buttonsTestWidget", {0, 32, 240, 62}},
    Region{"usbDeviceTestWidget", {0, 94, 120, 25}}, Region{"rfTestWidget", {0, 237, 240, 83}},
    Region{"fuelGaugeWidget", {0, 119, 240, 75}},    Region{"usbGadgetTestWidget", {120, 94, 120, 25}},
    Region{"triggerTestWidget", {0, 220, 120, 18}},  Region{"sdCardTestWidget", {120, 220, 120, 18}},
};

class GermanTitle : public QTranslator
{
public:
    [[nodiscard]] bool isEmpty() const override { return false; }
    QString translate(const char* context, const char* text, const char* /*remark*/, int /*n*/) const override
    {
        const bool isTitle = qstrcmp(context, "TestGui") == 0 && qstrcmp(text, "Form") == 0;
        return isTitle ? QStringLiteral("Formular") : QString();
    }
};

} // namespace

class TestGuiTest : public QObject
{
    Q_OBJECT

private slots:
    void cleanup()
    {
        for (const char* const folder : {"bus", "block", "class", "devices"})
            TestSupport::removePath(QStringLiteral("/sys/%1").arg(QLatin1String(folder)));
        TestSupport::removePath(QStringLiteral("/mnt/data"));
    }

    void isAnObjectWithoutSignalsSlotsAndProperties()
    {
        const auto& meta = TestGui::staticMetaObject;
        QCOMPARE(meta.superClass(), &QObject::staticMetaObject);
        QCOMPARE(meta.methodCount(), meta.methodOffset());
        QCOMPARE(meta.propertyCount(), meta.propertyOffset());
        const Bench bench;
        QCOMPARE(bench.gui.parent(), nullptr);
    }

    void theScreenIs240By320PixelsAndHiddenUntilShown()
    {
        Bench bench;
        QCOMPARE(screen()->geometry(), QRect(0, 0, 240, 320));
        QCOMPARE(screen()->windowTitle(), QStringLiteral("Form"));
        QCOMPARE(screen()->parentWidget(), nullptr);
        QVERIFY(!screen()->isVisible());
        bench.gui.show();
        QVERIFY(screen()->isVisible());
        QVERIFY(QTest::qWaitForWindowExposed(screen()));
        QCOMPARE(screen()->size(), QSize(240, 320));
        bench.gui.hide();
        QVERIFY(!screen()->isVisible());
    }

    void theScreenTakesTheParentThatIsGiven()
    {
        QWidget parent;
        DataSource::DataSourceLayer dataSourceLayer(QStringLiteral("/"));
        const TestGui gui(dataSourceLayer, &parent);
        QCOMPARE(child<QWidget>(parent, "TestGui").parentWidget(), &parent);
    }

    void theTitleIsTranslated()
    {
        GermanTitle translator;
        QCoreApplication::installTranslator(&translator);
        const Bench bench;
        QCoreApplication::removeTranslator(&translator);
        QCOMPARE(screen()->windowTitle(), QStringLiteral("Formular"));
    }

    void theRegionsStandInTheirOrderAndPlaces()
    {
        const Bench bench;
        QStringList names;
        for (const auto* const part : screen()->findChildren<QWidget*>(QString(), Qt::FindDirectChildrenOnly)) {
            if (part->metaObject() == &QWidget::staticMetaObject)
                names.append(part->objectName());
        }
        QStringList expected;
        for (const auto& region : regions) {
            expected.append(QString::fromLatin1(region.name));
            const auto& placeholder = child<QWidget>(*screen(), region.name);
            QCOMPARE(placeholder.geometry(), region.rectangle);
            QCOMPARE(placeholder.parentWidget(), screen());
            QVERIFY(placeholder.children().isEmpty());
        }
        QCOMPARE(names, expected);
    }

    void everyTestTakesItsRegion()
    {
        const Bench bench;
        QCOMPARE(test<Presentation::RtcTest>().geometry(), QRect(0, 0, 240, 30));
        QCOMPARE(test<Presentation::ButtonsTest>().geometry(), QRect(0, 32, 240, 62));
        QCOMPARE(test<Presentation::UsbDeviceTest>().geometry(), QRect(0, 94, 120, 25));
        QCOMPARE(test<Presentation::FuelGuageTest>().geometry(), QRect(0, 119, 240, 75));
        QCOMPARE(test<Presentation::UsbGadgetTest>().geometry(), QRect(120, 94, 120, 25));
        QCOMPARE(test<Presentation::TriggerTest>().geometry(), QRect(0, 220, 120, 18));
        QCOMPARE(test<Presentation::SdCardTest>().geometry(), QRect(120, 220, 120, 18));
    }

    void theTestsAreRunningOnceTheWindowStands()
    {
        layOutHealthyFiles();
        const Bench bench;
        QCOMPARE(child<QLabel>(test<Presentation::UsbDeviceTest>(), "connectLabel").styleSheet(), green);
        QCOMPARE(child<QLabel>(test<Presentation::UsbGadgetTest>(), "connectLabel").styleSheet(), green);
        QCOMPARE(child<QLabel>(test<Presentation::SdCardTest>(), "connectedLabel").styleSheet(), green);
        QCOMPARE(child<QDoubleSpinBox>(*screen(), "voltageSpinBox").text(), QStringLiteral("Voltage = 4.100000 V"));
        QCOMPARE(child<QDoubleSpinBox>(*screen(), "currentSpinBox").text(), QStringLiteral("Current = -123.4560 mA"));
    }

    void withoutAnyDeviceTheWindowStandsAndIsRed()
    {
        Bench bench;
        bench.gui.show();
        QVERIFY(QTest::qWaitForWindowExposed(screen()));
        const auto colours = screen()->grab().toImage();
        for (const QPoint place : {QPoint(2, 97), QPoint(122, 97), QPoint(2, 222), QPoint(122, 222)})
            QCOMPARE(colours.pixelColor(place), QColor(255, 0, 0));
        QCOMPARE(child<QWidget>(*screen(), "dateTimeEdit").styleSheet(), QStringLiteral("background-color: red"));
    }

    void theBandWithoutATestStaysBlank()
    {
        Bench bench;
        bench.gui.show();
        QVERIFY(QTest::qWaitForWindowExposed(screen()));
        const auto picture = screen()->grab().toImage();
        const auto blank = picture.pixelColor(120, 31);
        for (int y = 194; y < 220; ++y) {
            for (int x = 0; x < 240; ++x)
                QCOMPARE(picture.pixelColor(x, y), blank);
        }
    }

    void theLabelsLieOverTheFirstRowOfTheRadioPanel()
    {
        layOutHealthyFiles();
        Bench bench;
        bench.gui.show();
        QVERIFY(QTest::qWaitForWindowExposed(screen()));
        // The last row of both labels is their frame.
        const auto picture = screen()->grab().toImage();
        QCOMPARE(picture.pixelColor(60, 237), picture.pixelColor(60, 220));
        QCOMPARE(picture.pixelColor(180, 237), picture.pixelColor(180, 220));
        QVERIFY(picture.pixelColor(60, 236) != picture.pixelColor(60, 237));
    }

    void keysReachTheButtonsTestWhateverHasTheFocus()
    {
        const TestSupport::DebugOutput output;
        Bench bench;
        bench.gui.show();
        QVERIFY(QTest::qWaitForWindowExposed(screen()));
        QCOMPARE(QWidget::keyboardGrabber(), &test<Presentation::ButtonsTest>());
        child<QWidget>(*screen(), "voltageSpinBox").setFocus();
        auto& unknown = child<QLabel>(*screen(), "unknownLabel");
        for (const int key : {int(Qt::Key_Tab), int(Qt::Key_Backtab), int(Qt::Key_A), int(Qt::Key_Escape)}) {
            press(*screen(), key);
            QCOMPARE(unknown.text(), QStringLiteral("Unknown key: %1").arg(key));
            QCOMPARE(unknown.styleSheet(), green);
            release(*screen(), key);
            QCOMPARE(unknown.styleSheet(), QStringLiteral("background-color: white;"));
        }
        press(*screen(), Qt::Key_Up);
        QCOMPARE(child<QLabel>(*screen(), "upLabel").styleSheet(), green);
        release(*screen(), Qt::Key_Up);
        QVERIFY(output.texts().contains(QStringLiteral("Up released")));
    }

    void theTriggerKeyReachesTheTriggerTest()
    {
        Bench bench;
        bench.gui.show();
        QVERIFY(QTest::qWaitForWindowExposed(screen()));
        press(*screen(), Qt::Key_F10);
        QCOMPARE(child<QLabel>(test<Presentation::TriggerTest>(), "connectedLabel").styleSheet(), green);
    }

    void soft1Soft2AndPowerChangeNothingOutsideTheButtonsTest()
    {
        Bench bench;
        bench.gui.show();
        QVERIFY(QTest::qWaitForWindowExposed(screen()));
        auto& buttons = test<Presentation::ButtonsTest>();
        const auto stylesElsewhere = [&] {
            QStringList styles;
            for (const auto* const widget : screen()->findChildren<QWidget*>()) {
                if (widget != &buttons && !buttons.isAncestorOf(widget))
                    styles.append(widget->styleSheet());
            }
            return styles;
        };
        const auto before = stylesElsewhere();
        for (const int key : {int(Qt::Key_F5), int(Qt::Key_F6), int(Qt::Key_F12)}) {
            press(*screen(), key);
            release(*screen(), key);
        }
        QCOMPARE(stylesElsewhere(), before);
        QVERIFY(screen()->isVisible());
    }

    void nothingIsLeftAfterDestruction()
    {
        {
            Bench bench;
            bench.gui.show();
        }
        QCOMPARE(screen(), nullptr);
        QCOMPARE(QWidget::keyboardGrabber(), nullptr);
    }
};

QTEST_MAIN(TestGuiTest)
#include "TestGuiTest.moc"
