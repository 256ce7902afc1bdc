// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/device/RateTimer.h"
#include "virtual-device/radio/RadioProtocol.h"

#include <QByteArray>
#include <QList>
#include <QObject>

#include <array>

namespace VirtualDevice
{

class Registry;

/// The firmware of the radio microcontroller: carries out the commands that reach it, publishes what it has been told
/// (`radio.channel`, `radio.transmitting`, ...) and answers as the controls say (`radio.ack`, `radio.version`,
/// `radio.check`, `radio.text`, `radio.accel_rate`, ...). It knows messages only; frames and the line are RadioModel's.
///
/// A command is carried out and published before it is acknowledged, so whoever sees the acknowledgement finds the new
/// state. Silent until a first reset or command has shown that the program listens (`wake`): a terminal that is just
/// being opened throws away what is waiting in it. Lives in the thread of its owner, which must run an event loop.
class RadioFirmware : public QObject
{
    Q_OBJECT

public:
    explicit RadioFirmware(Registry& registry, QObject* parent = nullptr);

    /// Power-on state: nothing transmitted, nothing set; answers still under way are lost.
    void reset();
    /// The program listens.
    void wake();
    [[nodiscard]] bool isAwake() const { return awake; }
    /// A good frame's payload has arrived.
    void handle(const QByteArray& message);

signals:
    /// A message for the program, without its frame.
    void send(const QByteArray& message);

private:
    using Handler = void (RadioFirmware::*)(const QByteArray& data);
    struct Action
    {
        RadioProtocol::Command command;
        Handler run;
    };
    static const std::array<Action, RadioProtocol::commandShapes.size()> actions;

    void execute(quint8 code, const QByteArray& data);
    void answer(const QByteArray& acknowledgement);
    void refuse(quint8 reason);
    void reply(RadioProtocol::Reply code, const QByteArray& data = {});
    void flushReplies(const QByteArray& acknowledgement);
    [[nodiscard]] static bool valuesFit(RadioProtocol::Command command, const QByteArray& data);

    void transmitPacket(const QByteArray& data);
    void startBeacon(const QByteArray& data);
    void stopBeacon(const QByteArray& data);
    void updateBeacon(const QByteArray& data);
    void setAccelMode(const QByteArray& data);
    void startRfTest(const QByteArray& data);
    void stopRfTest(const QByteArray& data);
    void checkRadio(const QByteArray& data);
    void setPowerAmp(const QByteArray& data);
    void toggleFramePulse(const QByteArray& data);
    void requestVersion(const QByteArray& data);
    void ping(const QByteArray& data);

    void publish(const char* name, const QJsonValue& value);
    void controlChanged(const QString& name);
    void say(const QByteArray& message);
    void sendText();
    void sendMessage();
    void adoptVersion();
    void adoptAccelRate();
    void sendAccelFrame();

    Registry& registry;
    bool awake = false;
    quint32 life = 0;          ///< counts resets: an answer that was delayed across one is dropped
    QList<QByteArray> replies; ///< to follow the acknowledgement of the command that is being carried out
    QList<QByteArray> waiting; ///< for the program to listen
    QByteArray version;
    RateTimer accelTimer;
    quint16 accelFrame = 0;
};

} // namespace VirtualDevice
