// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/radio/RadioFirmware.h"

#include "virtual-device/registry/Registry.h"

#include <QRegularExpression>
#include <QTimer>

#include <utility>

namespace VirtualDevice
{

using namespace RadioProtocol;

namespace
{

constexpr int accelChannelBytes = 15;
constexpr qsizetype mostWaiting = 16;

quint8 byteAt(const QByteArray& data, qsizetype index)
{
    return static_cast<quint8>(data[index]);
}

bool isChannel(quint8 channel)
{
    return channel >= lowestChannel && channel <= highestChannel;
}

QString hex(const QByteArray& bytes)
{
    return QString::fromLatin1(bytes.toHex());
}

} // namespace

const std::array<RadioFirmware::Action, commandShapes.size()> RadioFirmware::actions{{
    {Command::TransmitPacket, &RadioFirmware::transmitPacket},
    {Command::StartBeacon, &RadioFirmware::startBeacon},
    {Command::StopBeacon, &RadioFirmware::stopBeacon},
    {Command::UpdateBeacon, &RadioFirmware::updateBeacon},
    {Command::SetAccelMode, &RadioFirmware::setAccelMode},
    {Command::StartRfTest, &RadioFirmware::startRfTest},
    {Command::StopRfTest, &RadioFirmware::stopRfTest},
    {Command::CheckRadio, &RadioFirmware::checkRadio},
    {Command::SetPowerAmp, &RadioFirmware::setPowerAmp},
    {Command::ToggleFramePulse, &RadioFirmware::toggleFramePulse},
    {Command::RequestVersion, &RadioFirmware::requestVersion},
    {Command::Ping, &RadioFirmware::ping},
}};

RadioFirmware::RadioFirmware(Registry& controls, QObject* parent)
    : QObject(parent), registry(controls), accelTimer(this)
{
    connect(&accelTimer, &RateTimer::due, this, &RadioFirmware::sendAccelFrame);
    connect(&registry, &Registry::changed, this, &RadioFirmware::controlChanged);
    adoptVersion();
    adoptAccelRate();
    sendText();
    sendMessage();
}

void RadioFirmware::reset()
{
    ++life;
    replies.clear();
    accelFrame = 0;
    for (const char* flag : {"radio.transmitting", "radio.amplifier", "radio.beacon"})
        publish(flag, false);
    for (const char* number : {"radio.channel", "radio.power_level", "radio.frequency", "radio.accel_mode"})
        publish(number, 0);
    for (const char* text : {"radio.beacon_channels", "radio.beacon_address", "radio.beacon_packets", "radio.packet"})
        publish(text, QString());
}

void RadioFirmware::wake()
{
    awake = true;
    const auto due = std::exchange(waiting, {});
    for (const auto& message : due)
        emit send(message);
}

/// What the operator wants said, as soon as the program listens.
void RadioFirmware::say(const QByteArray& message)
{
    if (awake)
        emit send(message);
    else if (waiting.size() < mostWaiting)
        waiting.append(message);
}

void RadioFirmware::handle(const QByteArray& message)
{
    if (message.isEmpty())
        return;
    const quint8 code = byteAt(message, 0);
    publish("radio.last_command", hex(message));
    registry.count(QStringLiteral("radio.commands"));
    const QString manner = registry.text(QStringLiteral("radio.ack"));
    if (manner == u"off")
        return;
    if (manner == u"nak") {
        refuse(static_cast<quint8>(registry.integer(QStringLiteral("radio.nak_code"))));
        return;
    }
    execute(code, message.mid(1));
}

void RadioFirmware::execute(quint8 code, const QByteArray& data)
{
    const auto* shape = shapeOf(code);
    if (shape == nullptr)
        return refuse(static_cast<quint8>(NakReason::UnknownCommand));
    if (data.size() < shape->shortest || data.size() > shape->longest)
        return refuse(static_cast<quint8>(NakReason::WrongLength));
    if (!valuesFit(shape->command, data))
        return refuse(static_cast<quint8>(NakReason::WrongValue));
    for (const auto& action : actions)
        if (action.command == shape->command)
            (this->*action.run)(data);
    QByteArray acknowledgement(1, static_cast<char>(Reply::Ack));
    if (registry.text(QStringLiteral("radio.ack")) == u"wrong-length")
        acknowledgement.append('\0');
    answer(acknowledgement);
}

bool RadioFirmware::valuesFit(Command command, const QByteArray& data)
{
    switch (command) {
    case Command::TransmitPacket:
        return isChannel(byteAt(data, 3));
    case Command::StartBeacon:
        return isChannel(byteAt(data, 3)) && isChannel(byteAt(data, 4)) && isChannel(byteAt(data, 5)) &&
               isChannel(byteAt(data, 6)) && data.size() % 2 == 1;
    case Command::UpdateBeacon:
        return data.size() % 2 == 0;
    case Command::StartRfTest:
        return isChannel(byteAt(data, 0)) && byteAt(data, 1) <= highestPowerLevel;
    case Command::SetPowerAmp:
        return byteAt(data, 0) <= 1;
    default:
        return true;
    }
}

void RadioFirmware::refuse(quint8 reason)
{
    QByteArray refusal(1, static_cast<char>(Reply::Nak));
    refusal.append(static_cast<char>(reason));
    answer(refusal);
}

void RadioFirmware::answer(const QByteArray& acknowledgement)
{
    const QString manner = registry.text(QStringLiteral("radio.ack"));
    if (manner != u"late") {
        flushReplies(manner == u"lost" ? QByteArray() : acknowledgement);
        return;
    }
    const auto delay = std::chrono::milliseconds(registry.integer(QStringLiteral("radio.ack_delay")));
    const auto held = std::exchange(replies, {});
    QTimer::singleShot(delay, Qt::PreciseTimer, this, [this, acknowledgement, held, mine = life] {
        if (mine != life)
            return;
        replies = held + replies;
        flushReplies(acknowledgement);
    });
}

void RadioFirmware::flushReplies(const QByteArray& acknowledgement)
{
    if (!acknowledgement.isEmpty())
        emit send(acknowledgement);
    const auto due = std::exchange(replies, {});
    for (const auto& message : due)
        emit send(message);
}

/// Follows the acknowledgement of the command that is being carried out.
void RadioFirmware::reply(Reply code, const QByteArray& data)
{
    const QString manner = registry.text(QStringLiteral("radio.reply"));
    if (manner == u"off")
        return;
    QByteArray message(1, static_cast<char>(code));
    message.append(data);
    if (manner == u"wrong-length")
        message.append('\0');
    replies.append(message);
}

void RadioFirmware::transmitPacket(const QByteArray& data)
{
    publish("radio.packet", hex(data));
    registry.count(QStringLiteral("radio.packets"));
    reply(Reply::TransmitComplete);
}

void RadioFirmware::startBeacon(const QByteArray& data)
{
    QStringList channels;
    for (qsizetype index = 3; index < 7; ++index)
        channels.append(QString::number(byteAt(data, index)));
    publish("radio.beacon_address", hex(data.first(3)));
    publish("radio.beacon_channels", channels.join(u' '));
    publish("radio.beacon_packets", hex(data.mid(7)));
    publish("radio.beacon", true);
}

void RadioFirmware::stopBeacon(const QByteArray&)
{
    publish("radio.beacon", false);
}

void RadioFirmware::updateBeacon(const QByteArray& data)
{
    publish("radio.beacon_packets", hex(data));
}

void RadioFirmware::setAccelMode(const QByteArray& data)
{
    publish("radio.accel_mode", byteAt(data, 0));
}

void RadioFirmware::startRfTest(const QByteArray& data)
{
    publish("radio.channel", byteAt(data, 0));
    publish("radio.frequency", channelZeroMegahertz + byteAt(data, 0));
    publish("radio.power_level", byteAt(data, 1));
    publish("radio.transmitting", true);
}

void RadioFirmware::stopRfTest(const QByteArray&)
{
    publish("radio.transmitting", false);
}

void RadioFirmware::checkRadio(const QByteArray&)
{
    reply(Reply::CheckRadioResult, QByteArray(1, static_cast<char>(registry.integer(QStringLiteral("radio.check")))));
}

void RadioFirmware::setPowerAmp(const QByteArray& data)
{
    publish("radio.amplifier", byteAt(data, 0) == 1);
}

void RadioFirmware::toggleFramePulse(const QByteArray&)
{
    registry.count(QStringLiteral("radio.frame_pulses"));
}

void RadioFirmware::requestVersion(const QByteArray&)
{
    reply(Reply::FirmwareVersion, version);
}

void RadioFirmware::ping(const QByteArray&)
{
    registry.count(QStringLiteral("radio.pings"));
    reply(Reply::PingReply);
}

void RadioFirmware::publish(const char* name, const QJsonValue& value)
{
    registry.publish(QString::fromLatin1(name), value);
}

void RadioFirmware::controlChanged(const QString& name)
{
    if (name == u"radio.text")
        sendText();
    else if (name == u"radio.message")
        sendMessage();
    else if (name == u"radio.version")
        adoptVersion();
    else if (name == u"radio.accel_rate")
        adoptAccelRate();
}

void RadioFirmware::sendText()
{
    const QByteArray text = registry.text(QStringLiteral("radio.text")).toLatin1();
    if (text.isEmpty())
        return;
    say(QByteArray(1, static_cast<char>(Reply::Text)) + text);
    publish("radio.text", QString());
}

void RadioFirmware::sendMessage()
{
    const QString digits = registry.text(QStringLiteral("radio.message"));
    if (digits.isEmpty())
        return;
    say(QByteArray::fromHex(digits.toLatin1()));
    publish("radio.message", QString());
}

void RadioFirmware::adoptVersion()
{
    static const QRegularExpression form(QStringLiteral("^([0-9]{1,3})\\.([0-9]{1,3})$"));
    const auto match = form.match(registry.text(QStringLiteral("radio.version")));
    const uint major = match.captured(1).toUInt();
    const uint minor = match.captured(2).toUInt();
    if (match.hasMatch() && major <= 255 && minor <= 255)
        version = QByteArray(1, static_cast<char>(major)).append(static_cast<char>(minor));
    else // shows the operator that nothing has changed
        publish("radio.version", QStringLiteral("%1.%2").arg(byteAt(version, 0)).arg(byteAt(version, 1)));
}

void RadioFirmware::adoptAccelRate()
{
    accelTimer.setRate(registry.integer(QStringLiteral("radio.accel_rate")));
}

void RadioFirmware::sendAccelFrame()
{
    if (!awake)
        return;
    QByteArray message(1, static_cast<char>(Reply::AccelData));
    message.append(static_cast<char>(accelFrame >> 8)).append(static_cast<char>(accelFrame & 0xFF));
    message.append(static_cast<char>(registry.integer(QStringLiteral("radio.accel_mode"))));
    for (int index = 0; index < accelChannelBytes; ++index)
        message.append(static_cast<char>(accelFrame + index));
    ++accelFrame;
    emit send(message);
    registry.count(QStringLiteral("radio.accel_frames"));
}

} // namespace VirtualDevice
