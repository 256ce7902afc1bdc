// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/dsp/DspProtocol.h"

#include <QByteArray>
#include <QList>
#include <QObject>

#include <chrono>

namespace VirtualDevice
{

class Registry;

/// The part of the DSP's firmware that takes commands: carries them out, publishes what it has been told
/// (`dsp.receiver`, `dsp.gathering`, ...) and acknowledges as `dsp.ack` says. It knows the data of messages only;
/// queues and the socket are DspModel's.
///
/// A command is carried out and published before it is acknowledged. Lives in the thread of its owner, which must run
/// an event loop.
class DspFirmware : public QObject
{
    Q_OBJECT

public:
    explicit DspFirmware(Registry& registry, QObject* parent = nullptr);

    /// The state after a start; answers still under way are lost.
    void restart();
    /// The data of a message to the DSP: command word, length word, payload.
    void handle(const QByteArray& data);

signals:
    void send(quint32 type, const QByteArray& data);
    /// An answer under another message id than the one that the program expects.
    void sendMisnamed(quint32 type, const QByteArray& data);
    void violated(const QString& what);

private:
    using Handler = void (DspFirmware::*)(const QList<qint32>& words);
    struct Action
    {
        DspProtocol::Command command;
        Handler run;
    };
    static const std::array<Action, DspProtocol::commandShapes.size()> actions;

    [[nodiscard]] bool isWellFormed(const QByteArray& data);
    void track(quint32 command);
    void execute(quint32 command, const QByteArray& payload);
    void answer(DspProtocol::MessageType type, quint32 command);
    void sendAnswer(DspProtocol::MessageType type, quint32 command, const QString& manner);

    void requestVersion(const QList<qint32>& words);
    void receiverEnable(const QList<qint32>& words);
    void longRangeAntennaEnable(const QList<qint32>& words);
    void setTrigger(const QList<qint32>& words);
    void upsamplingEnable(const QList<qint32>& words);
    void configureLineNoiseDetection(const QList<qint32>& words);
    void pairingUpgradeMode(const QList<qint32>& words);
    void dataGathering(const QList<qint32>& words);
    void dspEnable(const QList<qint32>& words);
    void runHardwareTest(const QList<qint32>& words);

    void publish(const char* name, const QJsonValue& value);

    Registry& registry;
    quint32 life = 0; ///< counts starts: an answer that was delayed across one is dropped
    bool awaiting = false;
    std::chrono::steady_clock::time_point awaitingSince;
    QByteArray version; ///< to follow the acknowledgement; empty when none is due
};

} // namespace VirtualDevice
