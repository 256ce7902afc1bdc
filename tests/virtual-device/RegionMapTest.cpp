// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/screen/RegionMap.h"

#include "presentation/ui_ButtonsTest.h"
#include "presentation/ui_FuelGuageTest.h"
#include "presentation/ui_RfTest.h"
#include "presentation/ui_RtcTest.h"
#include "presentation/ui_SdCardTest.h"
#include "presentation/ui_TestGui.h"
#include "presentation/ui_TriggerTest.h"
#include "presentation/ui_UsbDeviceTest.h"
#include "presentation/ui_UsbGadgetTest.h"
#include "virtual-device/registry/Values.h"

#include <QApplication>
#include <QSet>
#include <QTest>
#include <QWidget>

#include <memory>

using namespace VirtualDevice;

namespace
{

/// The window's forms, laid out as the program lays them out, without the devices behind them.
class FormWindow
{
public:
    FormWindow()
    {
        // The program's own font, and the texts that it gives the panel at once: both decide what the layouts do.
        QFont font = QApplication::font();
        font.setPointSize(9);
        QApplication::setFont(font);
        window.setupUi(&screen);
        add(rtc, window.rtcTestRegion);
        add(buttons, window.buttonsTestWidget);
        add(usbDevice, window.usbDeviceTestWidget);
        add(rf, window.rfTestWidget);
        add(fuelGauge, window.fuelGaugeWidget);
        add(usbGadget, window.usbGadgetTestWidget);
        add(trigger, window.triggerTestWidget);
        add(sdCard, window.sdCardTestWidget);
        rf.labelFrequencyValue->setText(QStringLiteral("2402 MHz"));
        rf.labelPowerValue->setText(QStringLiteral("-18 dBm"));
        screen.show();
        settle();
    }

    void settle() { QTest::qWait(1); }

    /// Where the widget "FORM/objectName" is; "FORM/" is the form itself.
    [[nodiscard]] QRect place(const QString& path) const
    {
        const auto* form = screen.findChild<QWidget*>(path.section(u'/', 0, 0));
        const QString name = path.section(u'/', 1);
        const auto* widget = form == nullptr || name.isEmpty() ? form : form->findChild<QWidget*>(name);
        return widget == nullptr ? QRect() : QRect(widget->mapTo(&screen, QPoint()), widget->size());
    }

    QWidget screen;
    Ui_TestGui window{};
    Ui_RtcTest rtc{};
    Ui_ButtonsTest buttons{};
    Ui_UsbDeviceTest usbDevice{};
    Ui_RfTest rf{};
    Ui_FuelGuageTest fuelGauge{};
    Ui_UsbGadgetTest usbGadget{};
    Ui_TriggerTest trigger{};
    Ui_SdCardTest sdCard{};

private:
    template <typename Form> void add(Form& form, const QWidget* region)
    {
        auto* widget = new QWidget(&screen);
        form.setupUi(widget);
        widget->setGeometry(region->geometry());
    }
};

bool isPlacedByALayout(const Region& region)
{
    const QString name = fromView(region.name);
    return name.startsWith(u"key.") || name.startsWith(u"rf.");
}

} // namespace

class RegionMapTest : public QObject
{
    Q_OBJECT

private slots:
    void everyRegionHasAUniqueNameAndSaysWhatItShows();
    void regionIsWhereItsWidgetIs_data();
    void regionIsWhereItsWidgetIs();
    void radioLabelsStayInTheirRegionsWhateverTheySay();
    void everyLabelHasARegion();
    void dominantColourIsTheMostFrequentOne();

private:
    static void compare(const FormWindow& window, const Region& region);
};

void RegionMapTest::everyRegionHasAUniqueNameAndSaysWhatItShows()
{
    const QStringList names = RegionMap::names();
    QCOMPARE(QSet<QString>(names.begin(), names.end()).size(), names.size());
    for (const auto& name : names) {
        QVERIFY(RegionMap::find(name) != nullptr);
        QVERIFY2(!RegionMap::find(name)->help.empty(), qPrintable(name));
    }
    QCOMPARE(RegionMap::find("nowhere"), nullptr);
}

void RegionMapTest::compare(const FormWindow& window, const Region& region)
{
    const QRect widget = window.place(fromView(region.widget));
    const QByteArray seen = QStringLiteral("%1: %2,%3 %4x%5")
                                .arg(fromView(region.widget))
                                .arg(widget.x())
                                .arg(widget.y())
                                .arg(widget.width())
                                .arg(widget.height())
                                .toUtf8();
    if (!isPlacedByALayout(region)) {
        QVERIFY2(widget == region.rectangle(), seen.constData());
        return;
    }
    // Inside the label, and most of it.
    QVERIFY2(widget.contains(region.rectangle()), seen.constData());
    QVERIFY2(2 * region.width * region.height > widget.width() * widget.height(), seen.constData());
}

void RegionMapTest::regionIsWhereItsWidgetIs_data()
{
    QTest::addColumn<QString>("name");
    for (const auto& name : RegionMap::names())
        QTest::addRow("%s", qPrintable(name)) << name;
}

void RegionMapTest::regionIsWhereItsWidgetIs()
{
    QFETCH(const QString, name);
    const FormWindow window;
    compare(window, *RegionMap::find(name));
}

void RegionMapTest::radioLabelsStayInTheirRegionsWhateverTheySay()
{
    FormWindow window;
    for (const auto* frequency : {"2402 MHz", "2440 MHz", "2474 MHz"})
        for (const auto* power : {"-18 dBm", "-6 dBm", "0 dBm"})
            for (const auto* transmitting : {"|", "| X", "| ) ) )"})
                for (const auto* radios : {"Internal RF", "External RF"}) {
                    window.rf.labelFrequencyValue->setText(frequency);
                    window.rf.labelPowerValue->setText(power);
                    window.rf.labelTransmitting->setText(transmitting);
                    window.rf.labelRadios->setText(radios);
                    window.settle();
                    for (const auto* name : {"rf.frequency.label", "rf.frequency", "rf.power.label", "rf.power",
                                             "rf.transmitting", "rf.beacon", "rf.radios"}) {
                        compare(window, *RegionMap::find(name));
                        if (QTest::currentTestFailed())
                            return;
                    }
                }
}

void RegionMapTest::everyLabelHasARegion()
{
    const FormWindow window;
    QSet<QString> shown;
    for (const auto& region : RegionMap::regions())
        shown.insert(fromView(region.widget).section(u'/', 1));
    for (const auto* label : window.screen.findChildren<QLabel*>())
        QVERIFY2(shown.contains(label->objectName()), qPrintable(label->objectName()));
}

void RegionMapTest::dominantColourIsTheMostFrequentOne()
{
    QImage picture(10, 10, QImage::Format_RGB32);
    picture.fill(qRgb(0, 128, 0));
    for (int x = 0; x < 10; ++x)
        for (int y = 0; y < 4; ++y)
            picture.setPixelColor(x, y, Qt::black);
    QCOMPARE(RegionMap::dominantColour(picture, {0, 0, 10, 10}), RegionColour::Green);
    QCOMPARE(RegionMap::dominantColour(picture, {0, 0, 10, 5}), RegionColour::Other);
    QCOMPARE(RegionMap::dominantColour(picture, {0, 9, 100, 100}), RegionColour::Green);
    QCOMPARE(RegionMap::dominantColour(picture, {10, 10, 5, 5}), RegionColour::None);
    QCOMPARE(RegionMap::dominantColour(QImage(), {0, 0, 10, 10}), RegionColour::None);
    picture.fill(qRgb(0, 127, 0));
    QCOMPARE(RegionMap::dominantColour(picture, {0, 0, 10, 10}), RegionColour::Other);
    picture.fill(qRgb(255, 0, 0));
    QCOMPARE(RegionMap::dominantColour(picture, {0, 0, 10, 10}), RegionColour::Red);
    picture.fill(Qt::white);
    QCOMPARE(RegionMap::dominantColour(picture, {0, 0, 10, 10}), RegionColour::White);
}

int main(int argc, char** argv)
{
    // Fonts and style are those of the device's screen.
    qputenv("QT_QPA_PLATFORM", "vnc:size=240x320");
    QApplication application(argc, argv);
    RegionMapTest test;
    return QTest::qExec(&test, argc, argv);
}

#include "RegionMapTest.moc"
