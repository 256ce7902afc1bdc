// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QObject>

namespace VirtualDevice
{

class Registry;

/// What the operator makes the DSP say: the controls `dsp.log`, `dsp.line_noise`, `dsp.start_trigger`,
/// `dsp.stop_trigger`, `dsp.pairing_packet`, `dsp.message` and `dsp.raw`. Each is sent once and goes back to its
/// initial value; while the firmware does not run it stays as it is and is sent when it does. Lives in the thread of
/// its owner.
class DspStimuli : public QObject
{
    Q_OBJECT

public:
    explicit DspStimuli(Registry& registry, QObject* parent = nullptr);

    void setRunning(bool runs);

signals:
    void send(quint32 type, const QByteArray& data);
    /// The whole data of a message, its words included.
    void sendRaw(const QByteArray& data);

private:
    void serve(const QString& name);

    Registry& registry;
    bool isRunning = false;
};

} // namespace VirtualDevice
