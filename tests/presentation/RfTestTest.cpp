// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/RfTest.h"

#include "tests/presentation/DebugOutput.h"
#include "tests/presentation/RfPanel.h"
#include "tests/presentation/WidgetProbe.h"

#include <QHBoxLayout>
#include <QMetaMethod>
#include <QTest>

using Domain::AbstractBeaconProcessor;
using Presentation::RfTest;
using TestSupport::child;
using TestSupport::Journal;
using TestSupport::Panel;
using TestSupport::restartAt;

namespace
{

const QString pass = QStringLiteral("background-color: green");
const QString fail = QStringLiteral("background-color: red");
const QString formRed = QStringLiteral("background-color: red;");

} // namespace

class RfTestTest : public QObject
{
    Q_OBJECT

private slots:
    void theFormIsTwoColumns()
    {
        Panel panel;
        QCOMPARE(panel.test.objectName(), QStringLiteral("RfTest"));
        QCOMPARE(panel.test.windowTitle(), QStringLiteral("Form"));
        QCOMPARE(panel.test.height(), 86);
        auto& columns = child<QHBoxLayout>(panel.test, "horizontalLayout");
        QCOMPARE(panel.test.layout(), &columns);
        QCOMPARE(objectNames(columns), QStringList({"verticalLayout", "verticalLayout_2"}));
        QCOMPARE(objectNames(*columns.itemAt(0)->layout()),
                 QStringList({"horizontalLayout_2", "sliderFrequency", "horizontalLayout_3", "sliderPower"}));
        QCOMPARE(objectNames(*columns.itemAt(1)->layout()),
                 QStringList({"labelTransmitting", "labelBeacon", "labelRadios"}));
        QCOMPARE(objectNames(child<QHBoxLayout>(panel.test, "horizontalLayout_2")),
                 QStringList({"label_2", "labelFrequencyValue"}));
        QCOMPARE(objectNames(child<QHBoxLayout>(panel.test, "horizontalLayout_3")),
                 QStringList({"label", "labelPowerValue"}));
    }

    void theLabelsStandAsTheyAreBeforeAnythingRuns()
    {
        Panel panel;
        QCOMPARE(panel.text("label_2"), QStringLiteral("Frequency"));
        QCOMPARE(child<QLabel>(panel.test, "label_2").font().pointSize(), 12);
        QCOMPARE(panel.text("labelFrequencyValue"), QStringLiteral("2402 MHz"));
        QCOMPARE(child<QLabel>(panel.test, "labelFrequencyValue").alignment(), Qt::AlignCenter);
        QCOMPARE(panel.text("label"), QStringLiteral("Power"));
        QCOMPARE(panel.text("labelPowerValue"), QStringLiteral("-18 dBm"));
        QCOMPARE(child<QLabel>(panel.test, "labelPowerValue").alignment(), Qt::AlignCenter);
        const auto& transmitting = child<QLabel>(panel.test, "labelTransmitting");
        QCOMPARE(transmitting.text(), QStringLiteral("| ) ) )"));
        QCOMPARE(transmitting.font().pointSize(), 12);
        QVERIFY(transmitting.font().bold());
        QCOMPARE(transmitting.alignment(), Qt::AlignLeft | Qt::AlignVCenter);
        QCOMPARE(panel.text("labelBeacon"), QStringLiteral("Beacon Micro"));
        QCOMPARE(panel.text("labelRadios"), QStringLiteral("Internal RF"));
        for (const char* const label : {"labelBeacon", "labelRadios"}) {
            QCOMPARE(child<QLabel>(panel.test, label).alignment(), Qt::AlignCenter);
            QCOMPARE(panel.style(label), formRed);
        }
    }

    void theSlidersShowChannelAndLevel()
    {
        Panel panel;
        const auto& frequency = child<QSlider>(panel.test, "sliderFrequency");
        QCOMPARE(frequency.orientation(), Qt::Horizontal);
        QCOMPARE(QList<int>({frequency.minimum(), frequency.maximum(), frequency.value()}), QList<int>({2, 74, 2}));
        const auto& power = child<QSlider>(panel.test, "sliderPower");
        QCOMPARE(power.orientation(), Qt::Horizontal);
        QCOMPARE(QList<int>({power.minimum(), power.maximum(), power.value()}), QList<int>({0, 3, 0}));
    }

    void movingASliderSendsNothing()
    {
        Panel panel;
        panel.test.start();
        panel.journal.clear();
        child<QSlider>(panel.test, "sliderFrequency").setValue(60);
        child<QSlider>(panel.test, "sliderPower").setValue(3);
        QCOMPARE(panel.taken(), Journal());
        QCOMPARE(panel.text("labelFrequencyValue"), QStringLiteral("2402 MHz"));
    }

    void theSlotsStandInTheirOrder()
    {
        QStringList names;
        const auto& meta = RfTest::staticMetaObject;
        for (int index = meta.methodOffset(); index < meta.methodCount(); ++index)
            names.append(QString::fromLatin1(meta.method(index).methodSignature()));
        QCOMPARE(names,
                 QStringList({"frequencyDown()", "frequencyUp()", "powerLevelDown()", "powerLevelUp()", "toggleState()",
                              "toggleExternalAntenna()", "communicationFail()", "communicationSuccess()", "sendPing()",
                              "updateTransmitIndicator()", "radioResponseReceived()", "radioTimeout()"}));
    }

    void constructionSendsNothing()
    {
        Panel panel;
        QCOMPARE(panel.taken(), Journal());
    }

    void startSwitchesTheAmplifierOnBeforeThePacket()
    {
        Panel panel;
        panel.test.start();
        QCOMPARE(panel.taken(), Journal({"amplifier on", "done", "start 2 0", "done"}));
    }

    void stopEndsThePacketBeforeTheAmplifier()
    {
        Panel panel;
        panel.test.start();
        QCOMPARE(panel.afterCalling(&RfTest::stop), Journal({"stop", "done", "amplifier off", "done"}));
        QCOMPARE(panel.afterCalling(&RfTest::frequencyUp), Journal());
    }

    void enterStopsAndStartsInItsOwnOrder()
    {
        Panel panel;
        panel.test.start();
        for (int round = 0; round < 3; ++round) {
            QCOMPARE(panel.afterCalling(&RfTest::toggleState), Journal({"stop", "done", "amplifier off", "done"}));
            QCOMPARE(panel.text("labelTransmitting"), QStringLiteral("| X"));
            QCOMPARE(panel.afterCalling(&RfTest::toggleState), Journal({"start 2 0", "done", "amplifier on", "done"}));
        }
    }

    void enterBeforeStartStartsTransmitting()
    {
        Panel panel;
        QCOMPARE(panel.afterCalling(&RfTest::toggleState), Journal({"start 2 0", "done", "amplifier on", "done"}));
    }

    void anEnterThatStopsShowsItWhileTheAmplifierIsStillWaitedFor()
    {
        Panel panel;
        panel.test.show();
        QVERIFY(QTest::qWaitForWindowExposed(&panel.test));
        panel.test.start();
        TestSupport::paintWhatIsUnderWay(panel.test);
        const TestSupport::PaintCounter counter(child<QLabel>(panel.test, "labelTransmitting"));
        QSet<QString> textsBefore;
        QSet<QString> textsAfter;
        int paintsAtLastLook = 0;
        panel.journal.clear();
        panel.beacon.onLook = [&] {
            auto& texts = panel.journal.contains(QStringLiteral("amplifier off")) ? textsAfter : textsBefore;
            texts.insert(panel.text("labelTransmitting"));
            paintsAtLastLook = counter.paints;
        };
        panel.test.toggleState();
        panel.beacon.onLook = nullptr;
        QCOMPARE(textsBefore, QSet<QString>{QStringLiteral("| ) ) )")});
        QCOMPARE(textsAfter, QSet<QString>{QStringLiteral("| X")});
        QVERIFY(paintsAtLastLook > 0);
    }

    void theIndicatorMovesWhileTransmittingOnly()
    {
        Panel panel;
        panel.test.updateTransmitIndicator();
        QCOMPARE(panel.text("labelTransmitting"), QStringLiteral("| ) ) )"));
        panel.test.start();
        for (int round = 0; round < 2; ++round) {
            for (const char* const text : {"| )", "| ) )", "| ) ) )", "|"}) {
                panel.test.updateTransmitIndicator();
                QCOMPARE(panel.text("labelTransmitting"), QString::fromLatin1(text));
            }
        }
        panel.test.toggleState();
        panel.test.updateTransmitIndicator();
        QCOMPARE(panel.text("labelTransmitting"), QStringLiteral("| X"));
        panel.test.toggleState();
        QCOMPARE(panel.text("labelTransmitting"), QStringLiteral("| X"));
        panel.test.updateTransmitIndicator();
        QCOMPARE(panel.text("labelTransmitting"), QStringLiteral("| )"));
    }

    void stopLeavesTheIndicatorAsItWas()
    {
        Panel panel;
        panel.test.start();
        panel.test.updateTransmitIndicator();
        panel.test.stop();
        panel.test.updateTransmitIndicator();
        QCOMPARE(panel.text("labelTransmitting"), QStringLiteral("| )"));
    }

    void upAndDownStepThroughThreeChannelsWithoutWrappingAround()
    {
        Panel panel;
        panel.test.start();
        const auto step = [&](void (RfTest::*slot)(), int channel) {
            QCOMPARE(panel.afterCalling(slot), restartAt(channel, 0));
            QCOMPARE(panel.slider("sliderFrequency"), channel);
            QCOMPARE(panel.text("labelFrequencyValue"), QStringLiteral("%1 MHz").arg(2400 + channel));
        };
        for (const int channel : {40, 74, 74})
            step(&RfTest::frequencyUp, channel);
        for (const int channel : {40, 2, 2})
            step(&RfTest::frequencyDown, channel);
    }

    void rightAndLeftStepThroughFourLevelsWithoutWrappingAround()
    {
        Panel panel;
        panel.test.start();
        const auto step = [&](void (RfTest::*slot)(), int level, const char* text) {
            QCOMPARE(panel.afterCalling(slot), restartAt(2, level));
            QCOMPARE(panel.slider("sliderPower"), level);
            QCOMPARE(panel.text("labelPowerValue"), QString::fromLatin1(text));
        };
        step(&RfTest::powerLevelUp, 1, "-12 dBm");
        step(&RfTest::powerLevelUp, 2, "-6 dBm");
        step(&RfTest::powerLevelUp, 3, "0 dBm");
        step(&RfTest::powerLevelUp, 3, "0 dBm");
        step(&RfTest::powerLevelDown, 2, "-6 dBm");
        step(&RfTest::powerLevelDown, 1, "-12 dBm");
        step(&RfTest::powerLevelDown, 0, "-18 dBm");
        step(&RfTest::powerLevelDown, 0, "-18 dBm");
    }

    void whileStoppedTheArrowsChangeWhatIsShownAndTheNextStart()
    {
        Panel panel;
        for (const auto slot : {&RfTest::frequencyUp, &RfTest::powerLevelUp})
            QCOMPARE(panel.afterCalling(slot), Journal());
        QCOMPARE(panel.text("labelFrequencyValue"), QStringLiteral("2440 MHz"));
        QCOMPARE(panel.text("labelPowerValue"), QStringLiteral("-12 dBm"));
        QCOMPARE(panel.slider("sliderFrequency"), 40);
        QCOMPARE(panel.slider("sliderPower"), 1);
        QCOMPARE(panel.afterCalling(&RfTest::toggleState), Journal({"start 40 1", "done", "amplifier on", "done"}));
    }

    void soft3ChangesTheAntennaAroundAPauseOfTheTransmission()
    {
        Panel panel;
        panel.test.start();
        const auto expected = [](int receiver) {
            return Journal({"dsp hardware test 0", "stop", "done", "amplifier off", "done", "dsp receiver 0",
                            QStringLiteral("dsp receiver %1").arg(receiver), "start 2 0", "done", "amplifier on",
                            "done", "dsp hardware test 1"});
        };
        QCOMPARE(panel.afterCalling(&RfTest::toggleExternalAntenna), expected(2));
        QCOMPARE(panel.text("labelRadios"), QStringLiteral("External RF"));
        QCOMPARE(panel.afterCalling(&RfTest::toggleExternalAntenna), expected(1));
        QCOMPARE(panel.text("labelRadios"), QStringLiteral("Internal RF"));
    }

    void whileStoppedSoft3SendsTheFourDspCommandsOnly()
    {
        Panel panel;
        QCOMPARE(panel.afterCalling(&RfTest::toggleExternalAntenna),
                 Journal({"dsp hardware test 0", "dsp receiver 0", "dsp receiver 2", "dsp hardware test 1"}));
        QCOMPARE(panel.text("labelRadios"), QStringLiteral("External RF"));
        QCOMPARE(panel.afterCalling(&RfTest::toggleExternalAntenna),
                 Journal({"dsp hardware test 0", "dsp receiver 0", "dsp receiver 1", "dsp hardware test 1"}));
        QCOMPARE(panel.beacon.looks, 0);
    }

    void aDspThatRefusesChangesNothing()
    {
        Panel panel;
        panel.dsp.acknowledges = false;
        panel.test.toggleExternalAntenna();
        QCOMPARE(panel.taken().size(), 4);
        QCOMPARE(panel.text("labelRadios"), QStringLiteral("External RF"));
    }

    void theBeaconLabelFollowsAnswersAndErrors()
    {
        Panel panel;
        emit panel.beacon.pingResponse();
        QCOMPARE(panel.style("labelBeacon"), pass);
        QCOMPARE(child<QLabel>(panel.test, "labelBeacon").grab().toImage().pixelColor(2, 2), QColor(0, 128, 0));
        for (const auto error : {AbstractBeaconProcessor::NakReceived, AbstractBeaconProcessor::TimedOut,
                                 AbstractBeaconProcessor::UnknownMessage, AbstractBeaconProcessor::EmptyMessage,
                                 AbstractBeaconProcessor::IncorrectLength, AbstractBeaconProcessor::OutOfRangeValue}) {
            emit panel.beacon.error(error);
            QCOMPARE(panel.style("labelBeacon"), fail);
            emit panel.beacon.pingResponse();
            QCOMPARE(panel.style("labelBeacon"), pass);
        }
        QCOMPARE(panel.style("labelRadios"), formRed);
    }

    void aPingIsNotWaitedFor()
    {
        Panel panel;
        QCOMPARE(panel.afterCalling(&RfTest::sendPing), Journal({"ping"}));
        QCOMPARE(panel.beacon.looks, 0);
        QCOMPARE(panel.style("labelBeacon"), formRed);
    }

    void pingsAndTheIndicatorRunFromTheConstructionOn()
    {
        const TestSupport::TimerProbe probe;
        Panel panel;
        QTRY_VERIFY_WITH_TIMEOUT(panel.journal.contains(QStringLiteral("ping")), 20'000);
        const auto timers = probe.timers();
        QCOMPARE(timers.size(), 2U);
        QCOMPARE(timers[0]->interval(), 500);
        QCOMPARE(timers[1]->interval(), 3000);
        for (const auto* const timer : timers)
            QVERIFY(!timer->isSingleShot() && timer->isActive());
        QTRY_VERIFY(probe.firings(timers[0]) >= 2);
    }

    void theRadioLabelIsGreenForTwoSecondsAfterEachSignal()
    {
        const TestSupport::TimerProbe probe;
        Panel panel;
        QElapsedTimer sinceSignal;
        sinceSignal.start();
        panel.test.radioResponseReceived();
        QCOMPARE(panel.style("labelRadios"), pass);
        QTRY_COMPARE_WITH_TIMEOUT(panel.style("labelRadios"), fail, 20'000);
        QVERIFY(sinceSignal.elapsed() >= 2000);

        const auto timers = probe.timers();
        const auto radio =
            std::find_if(timers.begin(), timers.end(), [](const QTimer* timer) { return timer->interval() == 2000; });
        QVERIFY(radio != timers.end());
        QCOMPARE((*radio)->timerType(), Qt::PreciseTimer);
        QVERIFY(!(*radio)->isSingleShot());

        QTRY_VERIFY_WITH_TIMEOUT((*radio)->remainingTime() < 1000, 20'000);
        panel.test.radioResponseReceived();
        QVERIFY((*radio)->remainingTime() > 1000);
        QCOMPARE(panel.style("labelRadios"), pass);
    }

    void redIsSetAgainEveryTwoSecondsAfterTheSignalStopped()
    {
        Panel panel;
        panel.test.radioResponseReceived();
        QTRY_COMPARE_WITH_TIMEOUT(panel.style("labelRadios"), fail, 20'000);
        child<QLabel>(panel.test, "labelRadios").setStyleSheet(pass);
        QTRY_COMPARE_WITH_TIMEOUT(panel.style("labelRadios"), fail, 20'000);
    }

    void theRadioLabelKeepsItsColourWhenTheAntennaChanges()
    {
        Panel panel;
        panel.test.radioResponseReceived();
        panel.test.toggleExternalAntenna();
        QCOMPARE(panel.style("labelRadios"), pass);
    }

    void aWaitDoesNotReturnToTheEventLoop()
    {
        Panel panel;
        bool delivered = false;
        QMetaObject::invokeMethod(
            &panel.test, [&] { delivered = true; }, Qt::QueuedConnection);
        bool deliveredInWait = false;
        panel.beacon.onLook = [&] { deliveredInWait = deliveredInWait || delivered; };
        panel.test.start();
        QVERIFY(!deliveredInWait);
        QVERIFY(!delivered);
        QCoreApplication::processEvents();
        QVERIFY(delivered);
    }

    void whatStaysIsNotPaintedAgain()
    {
        Panel panel;
        panel.test.show();
        QVERIFY(QTest::qWaitForWindowExposed(&panel.test));
        emit panel.beacon.pingResponse();
        panel.test.radioResponseReceived();
        TestSupport::paintWhatIsUnderWay(panel.test);
        const TestSupport::PaintCounter counter(panel.test);
        emit panel.beacon.pingResponse();
        panel.test.radioResponseReceived();
        panel.test.frequencyDown();
        panel.test.powerLevelDown();
        panel.test.updateTransmitIndicator();
        TestSupport::paintWhatIsUnderWay(panel.test);
        QCOMPARE(counter.paints, 0);
    }

    void reportsNothingItself()
    {
        const TestSupport::DebugOutput output;
        Panel panel;
        panel.beacon.accepts = false;
        panel.test.start();
        panel.test.toggleExternalAntenna();
        panel.test.toggleState();
        panel.test.stop();
        QCOMPARE(output.texts(), QStringList());
        QCOMPARE(output.complaints(), QStringList());
    }

private:
    static QStringList objectNames(const QLayout& layout)
    {
        QStringList names;
        for (int index = 0; index < layout.count(); ++index) {
            auto* const item = layout.itemAt(index);
            names.append(item->layout() != nullptr ? item->layout()->objectName() : item->widget()->objectName());
        }
        return names;
    }
};

QTEST_MAIN(RfTestTest)
#include "RfTestTest.moc"
