// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/DataSourceLayer.h"
#include "Domain/src/DomainLayer/Dsp.h"
#include "presentation/AudioTest.h"
#include "presentation/ButtonsTest.h"
#include "presentation/FuelGuageTest.h"
#include "presentation/RfTest.h"
#include "presentation/RtcTest.h"
#include "presentation/SdCardTest.h"
#include "presentation/TestGui.h"
#include "presentation/TriggerTest.h"
#include "presentation/UsbDeviceTest.h"
#include "presentation/UsbGadgetTest.h"

#include <QTest>

namespace
{

QStringList steps;

void note(const QString& step)
{
    steps.append(step);
}

bool isTest(const QObject* object)
{
    return QByteArray(object->metaObject()->className()).startsWith("Presentation::");
}

} // namespace

// The linker leads the window's calls of these functions here (--wrap) and gives the functions themselves another name.

#define OBSERVE(LENGTH, TEST, CALL, TEXT)                                                                              \
    void real_##CALL(Presentation::TEST* test) asm("__real__ZN12Presentation" LENGTH #TEST CALL##Symbol);              \
    void observed_##CALL(Presentation::TEST* test) asm("__wrap__ZN12Presentation" LENGTH #TEST CALL##Symbol);          \
    void observed_##CALL(Presentation::TEST* test)                                                                     \
    {                                                                                                                  \
        note(QStringLiteral(#TEST " " TEXT));                                                                          \
        real_##CALL(test);                                                                                             \
    }

#define startSymbol "5startEv"
#define stopSymbol "4stopEv"
OBSERVE("9", AudioTest, start, "starts")
OBSERVE("7", RtcTest, start, "starts")
OBSERVE("13", UsbDeviceTest, start, "starts")
OBSERVE("6", RfTest, start, "starts")
OBSERVE("13", FuelGuageTest, start, "starts")
OBSERVE("13", UsbGadgetTest, start, "starts")
OBSERVE("11", TriggerTest, start, "starts")
OBSERVE("10", SdCardTest, start, "starts")
OBSERVE("9", AudioTest, stop, "stops")

bool realReceiverEnable(Domain::Dsp* dsp, qint32 type) asm("__real__ZN6Domain3Dsp21setReceiverEnableTestEi");
bool observedReceiverEnable(Domain::Dsp* dsp, qint32 type) asm("__wrap__ZN6Domain3Dsp21setReceiverEnableTestEi");
bool observedReceiverEnable(Domain::Dsp* dsp, qint32 type)
{
    note(QStringLiteral("receiver enable test %1").arg(type));
    return realReceiverEnable(dsp, type);
}

bool realHardwareTest(Domain::Dsp* dsp, qint32 testId) asm("__real__ZN6Domain3Dsp15runHardwareTestEi");
bool observedHardwareTest(Domain::Dsp* dsp, qint32 testId) asm("__wrap__ZN6Domain3Dsp15runHardwareTestEi");
bool observedHardwareTest(Domain::Dsp* dsp, qint32 testId)
{
    note(QStringLiteral("hardware test %1").arg(testId));
    return realHardwareTest(dsp, testId);
}

void realGeometry(QWidget* widget, const QRect& rectangle) asm("__real__ZN7QWidget11setGeometryERK5QRect");
void observedGeometry(QWidget* widget, const QRect& rectangle) asm("__wrap__ZN7QWidget11setGeometryERK5QRect");
void observedGeometry(QWidget* widget, const QRect& rectangle)
{
    if (isTest(widget) || widget->objectName() == u"TestGui")
        note(QStringLiteral("%1 at %2 %3 %4 %5")
                 .arg(widget->objectName())
                 .arg(rectangle.x())
                 .arg(rectangle.y())
                 .arg(rectangle.width())
                 .arg(rectangle.height()));
    realGeometry(widget, rectangle);
}

#define CONNECT_SYMBOL                                                                                                 \
    "_ZN7QObject11connectImplEPKS_PPvS1_S3_PN9QtPrivate15QSlotObjectBaseEN2Qt14ConnectionTypeEPKiPK11QMetaObject"
QMetaObject::Connection realConnect(const QObject* sender, void** signal, const QObject* receiver, void** slotPointer,
                                    QtPrivate::QSlotObjectBase* slot, Qt::ConnectionType type, const int* types,
                                    const QMetaObject* meta) asm("__real_" CONNECT_SYMBOL);
QMetaObject::Connection observedConnect(const QObject* sender, void** signal, const QObject* receiver,
                                        void** slotPointer, QtPrivate::QSlotObjectBase* slot, Qt::ConnectionType type,
                                        const int* types, const QMetaObject* meta) asm("__wrap_" CONNECT_SYMBOL);
QMetaObject::Connection observedConnect(const QObject* sender, void** signal, const QObject* receiver,
                                        void** slotPointer, QtPrivate::QSlotObjectBase* slot, Qt::ConnectionType type,
                                        const int* types, const QMetaObject* meta)
{
    if (meta == &Presentation::ButtonsTest::staticMetaObject) {
        int index = -1;
        void* arguments[] = {&index, static_cast<void*>(signal)};
        meta->static_metacall(QMetaObject::IndexOfMethod, 0, arguments);
        note(QStringLiteral("%1 to %2, type %3")
                 .arg(QString::fromLatin1(meta->method(meta->methodOffset() + index).name()), receiver->objectName())
                 .arg(type));
    }
    return realConnect(sender, signal, receiver, slotPointer, slot, type, types, meta);
}

/// The window's start-up, step by step, on a machine without any of the devices.
class AssemblyOrderTest : public QObject
{
    Q_OBJECT

private slots:
    void testsArePlacedStartedAndConnectedInTheirOrder()
    {
        steps.clear();
        DataSource::DataSourceLayer dataSourceLayer(QStringLiteral("/"));
        const Presentation::TestGui gui(dataSourceLayer);
        const QStringList expected{"TestGui at 0 0 240 320",
                                   "AudioTest starts",
                                   "RtcTest at 0 0 240 30",
                                   "RtcTest starts",
                                   "ButtonsTest at 0 32 240 62",
                                   "UsbDeviceTest at 0 94 120 25",
                                   "UsbDeviceTest starts",
                                   "receiver enable test 1",
                                   "hardware test 1",
                                   "RfTest at 0 237 240 83",
                                   "RfTest starts",
                                   "downPressed to RfTest, type 0",
                                   "upPressed to RfTest, type 0",
                                   "leftPressed to RfTest, type 0",
                                   "rightPressed to RfTest, type 0",
                                   "enterPressed to RfTest, type 0",
                                   "soft3Pressed to RfTest, type 0",
                                   "radioPressed to RfTest, type 0",
                                   "FuelGuageTest at 0 119 240 75",
                                   "FuelGuageTest starts",
                                   "UsbGadgetTest at 120 94 120 25",
                                   "UsbGadgetTest starts",
                                   "TriggerTest at 0 220 120 18",
                                   "TriggerTest starts",
                                   "triggerPressed to TriggerTest, type 0",
                                   "SdCardTest at 120 220 120 18",
                                   "SdCardTest starts"};
        QCOMPARE(steps, expected);
    }

    void theLayoutIsBuiltOnceTheTestsExist()
    {
        DataSource::DataSourceLayer dataSourceLayer(QStringLiteral("/"));
        QWidget parent;
        const Presentation::TestGui gui(dataSourceLayer, &parent);
        QStringList names;
        for (const auto* const part : parent.findChild<QWidget*>(QStringLiteral("TestGui"))->children())
            names.append(part->objectName());
        QCOMPARE(names, QStringList({"RtcTest", "ButtonsTest", "UsbDeviceTest", "RfTest", "FuelGuageTest",
                                     "UsbGadgetTest", "TriggerTest", "SdCardTest", "rtcTestRegion", "buttonsTestWidget",
                                     "usbDeviceTestWidget", "rfTestWidget", "fuelGaugeWidget", "usbGadgetTestWidget",
                                     "triggerTestWidget", "sdCardTestWidget"}));
    }

    void closingDownStopsTheAudioTestBeforeAnythingIsDestroyed()
    {
        DataSource::DataSourceLayer dataSourceLayer(QStringLiteral("/"));
        QWidget parent;
        auto gui = std::make_unique<Presentation::TestGui>(dataSourceLayer, &parent);
        steps.clear();
        for (auto* const object : parent.findChildren<QObject*>())
            connect(object, &QObject::destroyed, [] { note(QStringLiteral("something goes")); });
        gui.reset();
        QCOMPARE(steps.first(2), QStringList({"AudioTest stops", "something goes"}));
    }
};

QTEST_MAIN(AssemblyOrderTest)
#include "AssemblyOrderTest.moc"
