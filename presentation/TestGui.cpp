// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/TestGui.h"

#include "DataSource/src/AbstractDataSourceLayer.h"
#include "Domain/src/DomainLayer/Buttons.h"
#include "presentation/ButtonsTest.h"
#include "presentation/FuelGuageTest.h"
#include "presentation/RtcTest.h"
#include "presentation/SdCardTest.h"
#include "presentation/TriggerTest.h"
#include "presentation/UsbDeviceTest.h"
#include "presentation/UsbGadgetTest.h"
#include "presentation/ui_TestGui.h"

namespace Presentation
{

namespace
{

constexpr QRect screenRectangle(0, 0, 240, 320);

void place(QWidget& test, const QWidget* region)
{
    test.setGeometry(region->geometry());
}

} // namespace

/// The order of the members is the order of construction; they go in the reverse order, the screen last.
struct TestGui::PrivateData
{
    PrivateData(TestGui& testGui, DataSource::AbstractDataSourceLayer& layer, QWidget* parent);

    void startTests();

    TestGui& owner;
    QWidget screen;
    Ui_TestGui ui{};
    DataSource::AbstractDataSourceLayer& dataSourceLayer;
    Domain::Buttons buttons;
    RtcTest rtcTest;
    ButtonsTest buttonsTest;
    UsbDeviceTest usbDeviceTest;
    FuelGuageTest fuelGaugeTest;
    UsbGadgetTest usbGadgetTest;
    TriggerTest triggerTest;
    SdCardTest sdCardTest;
};

TestGui::PrivateData::PrivateData(TestGui& testGui, DataSource::AbstractDataSourceLayer& layer, QWidget* parent)
    : owner(testGui),
      screen(parent),
      dataSourceLayer(layer),
      buttons(dataSourceLayer.configurationData()),
      rtcTest(&screen),
      buttonsTest(&screen),
      usbDeviceTest(&screen),
      fuelGaugeTest(&screen),
      usbGadgetTest(&screen),
      triggerTest(&screen),
      sdCardTest(&screen)
{
    ui.setupUi(&screen);
    screen.setGeometry(screenRectangle);
    startTests();
}

void TestGui::PrivateData::startTests()
{
    place(rtcTest, ui.rtcTestRegion);
    rtcTest.start();
    place(buttonsTest, ui.buttonsTestWidget);
    place(usbDeviceTest, ui.usbDeviceTestWidget);
    usbDeviceTest.start();
    place(fuelGaugeTest, ui.fuelGaugeWidget);
    fuelGaugeTest.start();
    place(usbGadgetTest, ui.usbGadgetTestWidget);
    usbGadgetTest.start();
    place(triggerTest, ui.triggerTestWidget);
    triggerTest.start();
    connect(&buttonsTest, &ButtonsTest::triggerPressed, &triggerTest, &TriggerTest::triggerInput);
    place(sdCardTest, ui.sdCardTestWidget);
    sdCardTest.start();
}

TestGui::TestGui(DataSource::AbstractDataSourceLayer& dataSourceLayer, QWidget* parent)
    : d(std::make_unique<PrivateData>(*this, dataSourceLayer, parent))
{
}

TestGui::~TestGui() = default;

void TestGui::show()
{
    d->screen.setVisible(true);
}

void TestGui::hide()
{
    d->screen.setVisible(false);
}

} // namespace Presentation
