// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "Domain/src/DomainLayer/AbstractDsp.h"
#include "Domain/src/DomainLayer/DspCommand.h"
#include "Domain/src/DomainLayer/PairingUpgradeData.h"
#include "Domain/src/DomainLayer/WirelessSensorReading.h"

#include <QByteArray>
#include <QVector>

#include <memory>

class QIODevice;

namespace Domain
{

class AbstractButtons;

/// The DSP firmware's only client: turns calls into command messages, each acknowledged within 800 ms or failed, and
/// what the firmware sends into signals.
///
/// Message to the DSP (little-endian; one write on the port): command (4 bytes, `DspCommand`), payload length (4),
/// payload. Message from the DSP: type (4 bytes, `DspMessageType`), payload length (4, the port's business), data:
///
/// | Type    | Data                                                                                     |
/// |---------|------------------------------------------------------------------------------------------|
/// | 0x11000 | version: major, minor                                                                    |
/// | 0x11001 | discarded message, ignored                                                               |
/// | 0x11002 | text for the log, up to its first zero byte                                              |
/// | 0x11003 | pairing/upgrade packet (`PairingUpgradeData`)                                            |
/// | 0x11004 | sensor data: frame number (2), readings length (2, a multiple of 16), readings block     |
/// |         | (16 slots, see `WirelessSensorReading`), diagnostic block (32)                           |
/// | 0x11005 | sensor data at upsample ratio 2                                                          |
/// | 0x11006 | line noise: first byte non-zero                                                          |
/// | 0x11007 | start trigger: frame number (2), time (4, signed), little-endian                         |
/// | 0x11008 | stop trigger, likewise                                                                   |
/// | 0x1100B | acknowledgement: 4 bytes, not compared with the command                                  |
/// | 0x1100C | refusal, likewise                                                                        |
///
/// Threads: made and destroyed in the port's thread, lives on a worker thread of its own, from which all signals come.
/// The command slots are for any other thread and block it; called on the worker they would wait for an
/// acknowledgement that only the worker can take. `setChannels` and `setBaseAddress` belong to the commands' thread.
///
/// Errors: nothing is thrown; a command returns false and the reason is logged. A message that is too short or unknown
/// is logged and ignored. A port that cannot be opened is logged once, and every command then fails.
class Dsp : public AbstractDsp
{
    Q_OBJECT

public:
    enum AcquisitionMode : qint32
    {
        IdleMode = 0,
        PairingUpgradeModeA = 1,
        PairingUpgradeModeB = 2,
        DataGatheringMode = 3,
    };

    /// `port` is a `DspPort`; it is opened here and closed in the destructor.
    Dsp(QIODevice& port, AbstractButtons& buttons);
    ~Dsp() override;
    Q_DISABLE_COPY_MOVE(Dsp)

    /// RF channels for data gathering, each 2 to 74. Only stored.
    bool setChannels(uchar channel1, uchar channel2, uchar channel3, uchar channel4);
    /// Base address for data gathering, below 0x1000000; negative ones are the firmware's business. Only stored.
    bool setBaseAddress(int address);

public slots:
    bool requestVersion() override;
    bool setReceiverEnable(ReceiverEnableType type);
    bool setReceiverEnableTest(qint32 type) override;
    bool setLongRangeAntennaEnable(bool enabled);
    bool setUpsamplingEnable(bool enabled);
    bool configureLineNoiseDetection(LineNoiseDetectConfig configuration);
    bool setTrigger(DataGatherTrigger trigger);
    /// Sends two commands, the second even if the first failed; true if both were acknowledged.
    bool setAcquisitionMode(AcquisitionMode mode);
    bool setDspEnable(bool enabled);
    bool runHardwareTest(qint32 testId) override;

signals:
    void pairingUpgradeDataReceived(PairingUpgradeData data);
    /// Sixteen readings, slot 0 first, invalid ones included.
    void sensorReadingsReceived(QVector<WirelessSensorReading> readings);
    void lineNoiseDetected();
    void startTriggerDetected(quint16 frameNumber, qint32 time);
    void stopTriggerDetected(quint16 frameNumber, qint32 time);
    /// The 32 bytes at the end of a sensor-data message.
    void diagnosticDataReceived(quint16 frameNumber, QByteArray data);
    // Stages of receiving, for whoever watches.
    void messageReadStart();
    void sensorDataReceived();
    void rfDiagnosticDataEmitted();
    void wirelessSensorReadingsGenerated();

private slots:
    void receiveData();
    void dspAssert();

private:
    struct PrivateData;
    std::unique_ptr<PrivateData> privateData;
};

} // namespace Domain
