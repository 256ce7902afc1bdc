// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QWidget>

#include <memory>

namespace Domain
{
class AbstractBeaconProcessor;
class AbstractDsp;
} // namespace Domain

namespace Presentation
{

/// The radio panel: makes the radio microcontroller transmit a continuous test packet on one of three channels
/// (2, 40, 74: 2402, 2440, 2474 MHz) at one of four levels (-18, -12, -6, 0 dBm), tells the DSP which antenna path its
/// receiver uses, pings the microcontroller every 3 seconds and shows whether it answers, and shows whether the radio's
/// signal line keeps arriving (at least every 2 seconds).
///
/// Threads: lives in the GUI thread and blocks it while the microcontroller works on a command, without returning to
/// the event loop: the beacon processor completes its commands on a thread of its own.
///
/// A command that the link refuses is not waited for, and none after it: the link counts as dead ("Beacon Micro" red)
/// until no command is pending any more. A ping reply lets the panel wait again, but for 4 seconds at most until the
/// pending command has been seen done: after a refused command it may never be. Nothing is waited for, and the DSP is
/// asked for nothing, once the program is to end (TerminationSignals).
class RfTest : public QWidget
{
    Q_OBJECT

public:
    RfTest(Domain::AbstractBeaconProcessor& beaconProcessor, Domain::AbstractDsp& dsp, QWidget* parent);
    ~RfTest() override;

    void start();
    void stop();

public slots:
    void frequencyDown();
    void frequencyUp();
    void powerLevelDown();
    void powerLevelUp();
    void toggleState();
    void toggleExternalAntenna();
    void communicationFail();
    void communicationSuccess();
    void sendPing();
    void updateTransmitIndicator();
    void radioResponseReceived();
    void radioTimeout();

private:
    void setChannel(qint8 channel);
    void setPowerLevel(int level);

    struct PrivateData;
    const std::unique_ptr<PrivateData> d;
};

} // namespace Presentation
