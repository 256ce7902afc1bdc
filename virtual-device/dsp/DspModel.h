// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/dsp/DspFirmware.h"
#include "virtual-device/dsp/DspPacket.h"
#include "virtual-device/dsp/DspSocket.h"
#include "virtual-device/dsp/DspStimuli.h"
#include "virtual-device/dsp/SensorSource.h"

#include <QHash>
#include <QObject>

#include <optional>

namespace VirtualDevice
{

class Registry;

/// The DSP, the driver and the shared memory behind `/dev/dsplink`, as docs/dsplink-host-protocol.md describes them: a
/// Unix socket on which the program's library attaches, loads and starts the firmware and exchanges messages with it.
/// Controls and reports are the `dsp.` rows of the control table.
///
/// A connection that ends stops the DSP. Lives in the thread that makes it, which must run an event loop.
class DspModel : public QObject
{
    Q_OBJECT

public:
    explicit DspModel(Registry& registry, QObject* parent = nullptr);

    /// Serves the socket at `path`, or leaves it out, as `dsp.presence` says now and whenever it changes. Returns what
    /// went wrong.
    [[nodiscard]] std::optional<QString> open(const QString& path);
    void close();

signals:
    /// The program has broken the rules (also `dsp.violations` and `dsp.last_violation`).
    void violated(const QString& what);

private:
    enum class State
    {
        Off,
        Attached,
        Loaded,
        Started,
        Connected, ///< started, and the transport is open
    };
    using Handler = void (DspModel::*)(const DspPacket& request);
    struct Rule
    {
        DspProtocol::PacketKind kind;
        const char* name; ///< as in `dsp.refuse`
        qsizetype shortestBody;
        State from; ///< first state in which the request is in order
        State upTo; ///< last one
        Handler handle;
    };
    static const std::array<Rule, 10> rules;

    [[nodiscard]] std::optional<QString> adoptPresence();
    void controlChanged(const QString& name);
    void received(const QByteArray& bytes);
    void request(const DspPacket& packet);
    void message(const DspPacket& packet);
    void disconnected();
    void setState(State next);
    void reply(const DspPacket& request, DspProtocol::Status status, quint32 value = 0);
    void report(const QString& what);

    void attach(const DspPacket& request);
    void queueOpen(const DspPacket& request);
    void load(const DspPacket& request);
    void start(const DspPacket& request);
    void transportOpen(const DspPacket& request);
    void locate(const DspPacket& request);
    void transportClose(const DspPacket& request);
    void stop(const DspPacket& request);
    void queueClose(const DspPacket& request);
    void detach(const DspPacket& request);

    void replyLocated(const DspPacket& request);
    void sendMessage(quint32 type, const QByteArray& data);
    void sendMisnamed(quint32 type, const QByteArray& data);
    void sendData(const QByteArray& data, quint16 messageId);

    Registry& registry;
    QString path;
    DspSocket socket;
    DspFirmware firmware;
    SensorSource sensors;
    DspStimuli stimuli;
    State state = State::Off;
    QHash<QByteArray, quint32> queues; ///< of the program, by name
};

} // namespace VirtualDevice
