// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/DataSourceLayer.h"
#include "Domain/src/DomainLayer/Audio.h"
#include "presentation/ButtonsTest.h"
#include "presentation/TestGui.h"
#include "tests/presentation/LabelForm.h"
#include "tests/presentation/ObjectRecorder.h"
#include "tests/presentation/WidgetProbe.h"
#include "tests/support/LogCapture.h"

#include <QLabel>
#include <QSlider>
#include <QTest>

#include <fcntl.h>
#include <stdlib.h>
#include <termios.h>
#include <unistd.h>

using Presentation::TestGui;
using TestSupport::child;
using TestSupport::ObjectRecorder;
using TestSupport::writeFile;

namespace
{

const QString sound = QStringLiteral("/etc/sounds/TestSound.wav");
const QString radioLine = QStringLiteral("/dev/ttyS1");

/// Devices and tests in the order of their construction; the screen, which is the first, goes by its object name.
const QStringList members{"TestGui",
                          "Domain::SerialPort",
                          "Domain::Audio",
                          "Domain::BeaconProcessor",
                          "Domain::Buttons",
                          "Domain::DspPort",
                          "Domain::Dsp",
                          "Presentation::AudioTest",
                          "Presentation::RtcTest",
                          "Presentation::ButtonsTest",
                          "Presentation::UsbDeviceTest",
                          "Presentation::RfTest",
                          "Presentation::FuelGuageTest",
                          "Presentation::UsbGadgetTest",
                          "Presentation::TriggerTest",
                          "Presentation::SdCardTest"};

QString nameOf(const QObject* object)
{
    const QString className = QString::fromLatin1(object->metaObject()->className());
    return className == u"QWidget" ? object->objectName() : className;
}

QList<QObject*> membersAmong(const QList<QObject*>& objects)
{
    QList<QObject*> found;
    for (auto* const object : objects) {
        if (members.contains(nameOf(object)))
            found.append(object);
    }
    return found;
}

QStringList namesOf(const QList<QObject*>& objects)
{
    QStringList names;
    for (const auto* const object : objects)
        names.append(nameOf(object));
    return names;
}

struct Bench
{
    DataSource::DataSourceLayer dataSourceLayer{QStringLiteral("/")};
    std::unique_ptr<TestGui> gui = std::make_unique<TestGui>(dataSourceLayer);

    [[nodiscard]] static QWidget& screen()
    {
        for (auto* const widget : QApplication::topLevelWidgets()) {
            if (widget->objectName() == u"TestGui")
                return *widget;
        }
        qFatal("no screen");
    }
};

} // namespace

/// The window with its devices, of which the sandbox has none: they are built, fail and are destroyed all the same.
class AssemblyTest : public QObject
{
    Q_OBJECT

private slots:
    void cleanup()
    {
        TestSupport::removePath(sound);
        TestSupport::removePath(radioLine);
    }

    void devicesAndTestsAreBuiltInTheirOrderAndDestroyedInReverse()
    {
        ObjectRecorder recorder;
        Bench bench;
        const auto built = membersAmong(recorder.living());
        QCOMPARE(namesOf(built), members);
        recorder.watch(built, members);
        bench.gui.reset();
        QCOMPARE(recorder.destroyed(), QStringList(members.rbegin(), members.rend()));
    }

    void theRadiosLineRunsAt115200Baud()
    {
        const int line = ::posix_openpt(O_RDWR | O_NOCTTY | O_CLOEXEC);
        QVERIFY(line >= 0 && ::unlockpt(line) == 0);
        QVERIFY(QFile::link(QString::fromLocal8Bit(::ptsname(line)), radioLine));
        const Bench bench;
        termios settings{};
        QCOMPARE(::tcgetattr(line, &settings), 0);
        ::close(line);
        QCOMPARE(::cfgetospeed(&settings), speed_t(B115200));
        QCOMPARE(::cfgetispeed(&settings), speed_t(B115200));
    }

    void theDspsTestsAreSwitchedOnBeforeTheRadioPanelStarts()
    {
        const TestSupport::LogCapture log;
        const Bench bench;
        QVERIFY(log.waitFor(QStringLiteral("Unable to send serial packet")));
        const auto texts = log.texts();
        const auto command = [&](qsizetype from) {
            return texts.indexOf(QRegularExpression(QStringLiteral(".*/Dsp\\.cpp, \\d+, sendCommand failed")), from);
        };
        const auto receiverEnable = command(0);
        QVERIFY(receiverEnable >= 0);
        const auto hardwareTest = command(receiverEnable + 1);
        QVERIFY(hardwareTest > receiverEnable);
        const auto radio = texts.indexOf(QRegularExpression(QStringLiteral(".*Unable to send serial packet")));
        QVERIFY(radio > hardwareTest);
    }

    void theAudioTestIsStoppedBeforeAnythingIsDestroyed()
    {
        writeFile(sound, "not a sound, but readable");
        ObjectRecorder recorder;
        Bench bench;
        const auto built = membersAmong(recorder.living());
        auto* const audioTest = built.at(members.indexOf("Presentation::AudioTest"));
        auto* const sdCardTest = built.at(members.indexOf("Presentation::SdCardTest"));
        auto* const audio = qobject_cast<Domain::Audio*>(built.at(members.indexOf("Domain::Audio")));
        std::atomic<int> plays = 0;
        connect(
            audio, &Domain::Audio::audioSet, audio, [&] { ++plays; }, Qt::DirectConnection);
        QVERIFY(QMetaObject::invokeMethod(audioTest, "playAudio"));
        QCOMPARE(plays.load(), 1);

        int playsAtDestruction = -1;
        connect(sdCardTest, &QObject::destroyed, audioTest, [&] {
            plays = 0;
            QMetaObject::invokeMethod(audioTest, "playAudio");
            playsAtDestruction = plays;
        });
        bench.gui.reset();
        QCOMPARE(playsAtDestruction, 0);
    }

    void theKeysDriveTheRadioPanelAndTheTriggerTest()
    {
        const Bench bench;
        auto& screen = Bench::screen();
        auto& buttons = *screen.findChild<Presentation::ButtonsTest*>();
        const auto frequency = [&] { return child<QSlider>(screen, "sliderFrequency").value(); };
        const auto power = [&] { return child<QSlider>(screen, "sliderPower").value(); };
        emit buttons.upPressed();
        QCOMPARE(frequency(), 40);
        emit buttons.upPressed();
        QCOMPARE(frequency(), 74);
        emit buttons.downPressed();
        QCOMPARE(frequency(), 40);
        emit buttons.rightPressed();
        QCOMPARE(power(), 1);
        emit buttons.rightPressed();
        emit buttons.leftPressed();
        QCOMPARE(power(), 1);
        emit buttons.enterPressed();
        QCOMPARE(child<QLabel>(screen, "labelTransmitting").text(), QStringLiteral("| X"));
        emit buttons.soft3Pressed();
        QCOMPARE(child<QLabel>(screen, "labelRadios").text(), QStringLiteral("External RF"));
        emit buttons.radioPressed();
        QCOMPARE(child<QLabel>(screen, "labelRadios").styleSheet(), QStringLiteral("background-color: green"));
        emit buttons.triggerPressed();
        QCOMPARE(child<QLabel>(*screen.findChild<QWidget*>("TriggerTest"), "connectedLabel").styleSheet(),
                 TestSupport::green);
    }

    void theOtherKeysAreNotConnected()
    {
        const Bench bench;
        auto& buttons = *Bench::screen().findChild<Presentation::ButtonsTest*>();
        for (const char* const signal : {"soft1Pressed()", "soft2Pressed()", "powerPressed()"})
            QCOMPARE(receivers(buttons, signal), 0);
        for (const char* const signal : {"upPressed()", "downPressed()", "leftPressed()", "rightPressed()",
                                         "enterPressed()", "soft3Pressed()", "radioPressed()", "triggerPressed()"})
            QCOMPARE(receivers(buttons, signal), 1);
    }

    void withoutAnyDeviceTheWindowStandsAndEveryKeyAnswers()
    {
        Bench bench;
        bench.gui->show();
        auto& screen = Bench::screen();
        QVERIFY(QTest::qWaitForWindowExposed(&screen));
        for (const char* const label : {"labelBeacon", "labelRadios"})
            QCOMPARE(TestSupport::paintedColour(child<QWidget>(screen, label)), QColor(255, 0, 0));
        for (const auto key : {Qt::Key_Up, Qt::Key_Down, Qt::Key_Left, Qt::Key_Right, Qt::Key_Return, Qt::Key_F7}) {
            QTest::keyPress(screen.windowHandle(), key);
            QTest::keyRelease(screen.windowHandle(), key);
        }
        QTRY_COMPARE_WITH_TIMEOUT(child<QLabel>(screen, "labelRadios").text(), QStringLiteral("External RF"), 20'000);
    }

private:
    /// QObject keeps the number of receivers to the class itself.
    static int receivers(const QObject& sender, const char* signal)
    {
        struct Opened : QObject
        {
            static int count(const QObject& object, const char* signalName)
            {
                return (object.*(&Opened::receivers))(signalName);
            }
        };
        return Opened::count(sender, QByteArray('2' + QByteArray(signal)).constData());
    }
};

QTEST_MAIN(AssemblyTest)
#include "AssemblyTest.moc"
