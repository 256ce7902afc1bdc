// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/TestGui.h"

#include "DataSource/src/AbstractDataSourceLayer.h"
#include "Domain/src/DomainLayer/Audio.h"
#include "Domain/src/DomainLayer/BeaconProcessor.h"
#include "Domain/src/DomainLayer/Buttons.h"
#include "Domain/src/DomainLayer/Dsp.h"
#include "Domain/src/DomainLayer/DspPort.h"
#include "Domain/src/DomainLayer/SerialPort.h"
#include "presentation/AudioTest.h"
#include "presentation/ButtonsTest.h"
#include "presentation/FuelGuageTest.h"
#include "presentation/RfTest.h"
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
const QString beaconSerialPortName = QStringLiteral("/dev/ttyS1");
const QString dspExecutablePath = QStringLiteral("/dsp.out");

void place(QWidget& test, const QWidget* region)
{
    test.setGeometry(region->geometry());
}

} // namespace

/// The order of the members is the order of construction; they go in the reverse order, the screen last.
struct TestGui::PrivateData
{
    PrivateData(TestGui& testGui, DataSource::AbstractDataSourceLayer& layer, QWidget* parent);
    ~PrivateData();
    Q_DISABLE_COPY_MOVE(PrivateData)

    void startTests();
    void connectRfTest();

    TestGui& owner;
    QWidget screen;
    Ui_TestGui ui{};
    DataSource::AbstractDataSourceLayer& dataSourceLayer;
    Domain::SerialPort serialPort;
    Domain::Audio audio;
    Domain::BeaconProcessor beaconProcessor;
    Domain::Buttons buttons;
    Domain::DspPort dspPort;
    Domain::Dsp dsp;
    AudioTest audioTest;
    RtcTest rtcTest;
    ButtonsTest buttonsTest; ///< built after `buttons`, so that its grab of the keyboard is the one in force
    UsbDeviceTest usbDeviceTest;
    RfTest rfTest;
    FuelGuageTest fuelGaugeTest;
    UsbGadgetTest usbGadgetTest;
    TriggerTest triggerTest;
    SdCardTest sdCardTest;
};

TestGui::PrivateData::PrivateData(TestGui& testGui, DataSource::AbstractDataSourceLayer& layer, QWidget* parent)
    : owner(testGui),
      screen(parent),
      dataSourceLayer(layer),
      serialPort(beaconSerialPortName, Domain::SerialPort::Baud115200),
      audio(dataSourceLayer.configurationData()),
      beaconProcessor(serialPort),
      buttons(dataSourceLayer.configurationData()),
      dspPort(dspExecutablePath),
      dsp(dspPort, buttons),
      audioTest(audio),
      rtcTest(&screen),
      buttonsTest(&screen),
      usbDeviceTest(&screen),
      rfTest(beaconProcessor, dsp, &screen),
      fuelGaugeTest(&screen),
      usbGadgetTest(&screen),
      triggerTest(&screen),
      sdCardTest(&screen)
{
    ui.setupUi(&screen);
    screen.setGeometry(screenRectangle);
    startTests();
}

TestGui::PrivateData::~PrivateData()
{
    audioTest.stop();
    // A window that hides delivers the key events that still wait. They must find everything alive, and nothing may
    // act on them any more.
    QObject::disconnect(&buttonsTest, nullptr, nullptr, nullptr);
    screen.hide();
}

void TestGui::PrivateData::startTests()
{
    audioTest.start();
    place(rtcTest, ui.rtcTestRegion);
    rtcTest.start();
    place(buttonsTest, ui.buttonsTestWidget);
    place(usbDeviceTest, ui.usbDeviceTestWidget);
    usbDeviceTest.start();
    dsp.setReceiverEnableTest(1);
    dsp.runHardwareTest(1);
    place(rfTest, ui.rfTestWidget);
    rfTest.start();
    connectRfTest();
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

void TestGui::PrivateData::connectRfTest()
{
    connect(&buttonsTest, &ButtonsTest::downPressed, &rfTest, &RfTest::frequencyDown);
    connect(&buttonsTest, &ButtonsTest::upPressed, &rfTest, &RfTest::frequencyUp);
    connect(&buttonsTest, &ButtonsTest::leftPressed, &rfTest, &RfTest::powerLevelDown);
    connect(&buttonsTest, &ButtonsTest::rightPressed, &rfTest, &RfTest::powerLevelUp);
    connect(&buttonsTest, &ButtonsTest::enterPressed, &rfTest, &RfTest::toggleState);
    connect(&buttonsTest, &ButtonsTest::soft3Pressed, &rfTest, &RfTest::toggleExternalAntenna);
    connect(&buttonsTest, &ButtonsTest::radioPressed, &rfTest, &RfTest::radioResponseReceived);
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
