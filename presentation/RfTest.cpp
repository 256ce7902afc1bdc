// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/RfTest.h"

#include "Domain/src/DomainLayer/AbstractBeaconProcessor.h"
#include "Domain/src/DomainLayer/AbstractDsp.h"
#include "presentation/TerminationSignals.h"
#include "presentation/WidgetUpdates.h"
#include "presentation/ui_RfTest.h"

#include <QDeadlineTimer>
#include <QFile>
#include <QTextStream>
#include <QTimer>

#include <algorithm>
#include <array>
#include <chrono>
#include <thread>

namespace Presentation
{

namespace
{

using Domain::AbstractBeaconProcessor;
using namespace std::chrono_literals;

const QString passStyleSheet = QStringLiteral("background-color: green");
const QString failStyleSheet = QStringLiteral("background-color: red");

constexpr auto pingInterval = 3000ms;
constexpr auto indicatorInterval = 500ms;
constexpr auto radioTimeoutInterval = 2000ms;
/// Between two looks at the pending flag: short beside a command's few milliseconds on the line.
constexpr auto pendingPollInterval = 200us;
/// How long waits may last after a ping reply of a link that was dead: longer than the beacon processor itself waits
/// for an acknowledgement (3 s).
constexpr auto recoveryLimit = 4000ms;

constexpr qint8 lowChannel = 2;
constexpr qint8 middleChannel = 40;
constexpr qint8 highChannel = 74;
constexpr int highestPowerLevel = AbstractBeaconProcessor::ZeroDBm;

constexpr std::array indicatorTexts{"| )", "| ) )", "| ) ) )", "|"};

qint8 channelAbove(qint8 channel)
{
    switch (channel) {
    case lowChannel:
        return middleChannel;
    case middleChannel:
    case highChannel:
        return highChannel;
    default:
        return lowChannel;
    }
}

qint8 channelBelow(qint8 channel)
{
    return channel == highChannel ? middleChannel : lowChannel;
}

} // namespace

struct RfTest::PrivateData
{
    PrivateData(AbstractBeaconProcessor& beacon, Domain::AbstractDsp& signalProcessor)
        : beaconProcessor(beacon), dsp(signalProcessor)
    {
    }

    /// Sends a command and takes note of its result: a refused one leaves the pending flag set with nobody to clear it.
    /// A program that is to end sends none: a full line would keep it for half a second.
    template <typename... Parameters, typename... Arguments>
    void send(bool (AbstractBeaconProcessor::*command)(Parameters...), Arguments... arguments)
    {
        if (TerminationSignals::isEndRequested())
            return;
        if (!waitLimit.isForever() && !beaconProcessor.isCommandPending())
            waitLimit = QDeadlineTimer::Forever;
        if ((beaconProcessor.*command)(arguments...))
            return;
        waitLimit = QDeadlineTimer(0);
        showBeacon(failStyleSheet);
    }

    template <typename... Parameters, typename... Arguments>
    void sendAndWait(bool (AbstractBeaconProcessor::*command)(Parameters...), Arguments... arguments)
    {
        send(command, arguments...);
        wait();
    }

    /// Nor does it ask the DSP, whose answer may take 0.8 s.
    void send(bool (Domain::AbstractDsp::*command)(qint32), qint32 argument)
    {
        if (!TerminationSignals::isEndRequested())
            (dsp.*command)(argument);
    }

    void wait();
    void startPacket();
    void stopPacket();
    void restartPacket();
    void showBeacon(const QString& styleSheet) { WidgetUpdates::showStyle(*ui.labelBeacon, styleSheet); }
    void showFrequency();
    void showPowerLevel();

    AbstractBeaconProcessor& beaconProcessor;
    Domain::AbstractDsp& dsp;
    qint8 channel = lowChannel;
    AbstractBeaconProcessor::PowerLevel powerLevel = AbstractBeaconProcessor::Minus18dBm;
    bool transmitting = false;
    bool externalAntenna = false;
    quint8 indicatorPhase = 0;
    QTimer pingTimer;
    QTimer indicatorTimer;
    QTimer radioTimer;
    Ui_RfTest ui{};
    std::array<QFile, 2> files; ///< reserved: nothing opens them
    std::array<QTextStream, 2> streams;
    /// When to give up waiting. Never as long as commands are accepted: each of them ends, by its acknowledgement or
    /// the link's own time-out. At once after a refused one.
    QDeadlineTimer waitLimit = QDeadlineTimer::Forever;
};

RfTest::RfTest(AbstractBeaconProcessor& beaconProcessor, Domain::AbstractDsp& dsp, QWidget* parent)
    : QWidget(parent), d(std::make_unique<PrivateData>(beaconProcessor, dsp))
{
    d->ui.setupUi(this);
    d->showFrequency();
    d->showPowerLevel();
    connect(&beaconProcessor, &AbstractBeaconProcessor::error, this, &RfTest::communicationFail);
    connect(&beaconProcessor, &AbstractBeaconProcessor::pingResponse, this, &RfTest::communicationSuccess);
    connect(&d->pingTimer, &QTimer::timeout, this, &RfTest::sendPing);
    connect(&d->indicatorTimer, &QTimer::timeout, this, &RfTest::updateTransmitIndicator);
    connect(&d->radioTimer, &QTimer::timeout, this, &RfTest::radioTimeout);
    // A coarse timer may fire 100 ms early and would show a signal as lost that still comes within its two seconds.
    d->radioTimer.setTimerType(Qt::PreciseTimer);
    d->pingTimer.start(pingInterval);
    d->indicatorTimer.start(indicatorInterval);
}

RfTest::~RfTest()
{
    for (auto& file : d->files)
        file.close();
}

void RfTest::start()
{
    d->sendAndWait(&AbstractBeaconProcessor::setPowerAmpEnable, true);
    d->startPacket();
    d->transmitting = true;
}

void RfTest::stop()
{
    d->stopPacket();
    d->sendAndWait(&AbstractBeaconProcessor::setPowerAmpEnable, false);
    d->transmitting = false;
}

void RfTest::toggleState()
{
    d->transmitting = !d->transmitting;
    if (d->transmitting) {
        d->startPacket();
        d->sendAndWait(&AbstractBeaconProcessor::setPowerAmpEnable, true);
        return;
    }
    d->stopPacket();
    d->send(&AbstractBeaconProcessor::setPowerAmpEnable, false);
    d->ui.labelTransmitting->setText(QStringLiteral("| X"));
    WidgetUpdates::showNow(*d->ui.labelTransmitting); // The wait keeps the event loop from doing it.
    d->wait();
}

void RfTest::frequencyUp()
{
    setChannel(channelAbove(d->channel));
}

void RfTest::frequencyDown()
{
    setChannel(channelBelow(d->channel));
}

void RfTest::powerLevelUp()
{
    setPowerLevel(std::min(d->powerLevel + 1, highestPowerLevel));
}

void RfTest::powerLevelDown()
{
    setPowerLevel(std::max(d->powerLevel - 1, 0));
}

void RfTest::toggleExternalAntenna()
{
    d->externalAntenna = !d->externalAntenna;
    d->ui.labelRadios->setText(d->externalAntenna ? QStringLiteral("External RF") : QStringLiteral("Internal RF"));
    d->send(&Domain::AbstractDsp::runHardwareTest, 0);
    if (d->transmitting) {
        d->stopPacket();
        d->sendAndWait(&AbstractBeaconProcessor::setPowerAmpEnable, false);
    }
    d->send(&Domain::AbstractDsp::setReceiverEnableTest, 0);
    d->send(&Domain::AbstractDsp::setReceiverEnableTest, d->externalAntenna ? 2 : 1);
    if (d->transmitting) {
        d->startPacket();
        d->sendAndWait(&AbstractBeaconProcessor::setPowerAmpEnable, true);
    }
    d->send(&Domain::AbstractDsp::runHardwareTest, 1);
}

void RfTest::communicationFail()
{
    d->showBeacon(failStyleSheet);
}

void RfTest::communicationSuccess()
{
    // The reply may have been under way when the link died: it is no promise that the pending command ends.
    if (!d->waitLimit.isForever())
        d->waitLimit = QDeadlineTimer(recoveryLimit);
    d->showBeacon(passStyleSheet);
}

void RfTest::sendPing()
{
    d->send(&AbstractBeaconProcessor::sendPing);
}

void RfTest::updateTransmitIndicator()
{
    if (!d->transmitting)
        return;
    d->ui.labelTransmitting->setText(QLatin1String(indicatorTexts[d->indicatorPhase]));
    d->indicatorPhase = static_cast<quint8>((d->indicatorPhase + 1U) % indicatorTexts.size());
}

void RfTest::radioResponseReceived()
{
    d->radioTimer.stop();
    d->radioTimer.start(radioTimeoutInterval);
    WidgetUpdates::showStyle(*d->ui.labelRadios, passStyleSheet);
}

void RfTest::radioTimeout()
{
    WidgetUpdates::showStyle(*d->ui.labelRadios, failStyleSheet);
}

void RfTest::PrivateData::wait()
{
    // A silent microcontroller takes 3 s a command; a program that is to end has no more than that altogether.
    while (!TerminationSignals::isEndRequested() && beaconProcessor.isCommandPending()) {
        if (waitLimit.hasExpired()) {
            showBeacon(failStyleSheet);
            return;
        }
        std::this_thread::sleep_for(pendingPollInterval);
    }
    waitLimit = QDeadlineTimer::Forever;
}

void RfTest::PrivateData::startPacket()
{
    sendAndWait(&AbstractBeaconProcessor::startTransmittingRfTestPacket, static_cast<unsigned char>(channel),
                powerLevel);
}

void RfTest::PrivateData::stopPacket()
{
    sendAndWait(&AbstractBeaconProcessor::stopTransmittingRfTestPacket);
}

/// The microcontroller takes channel and level at the start of the packet only. The amplifier stays as it is.
void RfTest::PrivateData::restartPacket()
{
    if (!transmitting)
        return;
    stopPacket();
    startPacket();
}

void RfTest::setChannel(qint8 channel)
{
    d->channel = channel;
    d->restartPacket();
    d->showFrequency();
}

void RfTest::setPowerLevel(int level)
{
    d->powerLevel = static_cast<AbstractBeaconProcessor::PowerLevel>(level);
    d->restartPacket();
    d->showPowerLevel();
}

void RfTest::PrivateData::showFrequency()
{
    ui.sliderFrequency->setValue(channel);
    ui.labelFrequencyValue->setText(QStringLiteral("%1 MHz").arg(2400 + channel));
}

void RfTest::PrivateData::showPowerLevel()
{
    ui.sliderPower->setValue(powerLevel);
    ui.labelPowerValue->setText(QStringLiteral("%1 dBm").arg(6 * powerLevel - 18));
}

} // namespace Presentation
