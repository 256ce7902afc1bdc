// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/dsp/DspFirmware.h"

#include "virtual-device/dsp/DspPacket.h"
#include "virtual-device/registry/Registry.h"

#include <QTimer>

#include <utility>

namespace VirtualDevice
{

using namespace DspProtocol;
using namespace std::chrono_literals;

namespace
{

/// The program gives a command up after 800 ms; the rest is for a model that was scheduled late.
constexpr auto patience = 500ms;

const CommandShape* shapeOf(quint32 command)
{
    for (const auto& shape : commandShapes)
        if (static_cast<quint32>(shape.command) == command)
            return &shape;
    return nullptr;
}

QList<qint32> wordsOf(const QByteArray& payload)
{
    QList<qint32> words;
    for (qsizetype at = 0; at < payload.size(); at += 4)
        words.append(static_cast<qint32>(dspWord(payload, at)));
    return words;
}

QString hexWord(quint32 word)
{
    return QStringLiteral("0x%1").arg(word, 0, 16);
}

/// "MAJOR.MINOR" as two bytes; 0 for what is no number.
QByteArray versionBytes(const QString& text)
{
    const auto parts = text.split(u'.');
    const uint major = parts.value(0).toUInt();
    const uint minor = parts.value(1).toUInt();
    return QByteArray(1, static_cast<char>(major & 0xFFU)).append(static_cast<char>(minor & 0xFFU));
}

} // namespace

const std::array<DspFirmware::Action, commandShapes.size()> DspFirmware::actions{{
    {Command::RequestVersion, &DspFirmware::requestVersion},
    {Command::ReceiverEnable, &DspFirmware::receiverEnable},
    {Command::LongRangeAntennaEnable, &DspFirmware::longRangeAntennaEnable},
    {Command::SetTrigger, &DspFirmware::setTrigger},
    {Command::UpsamplingEnable, &DspFirmware::upsamplingEnable},
    {Command::ConfigureLineNoiseDetection, &DspFirmware::configureLineNoiseDetection},
    {Command::PairingUpgradeMode, &DspFirmware::pairingUpgradeMode},
    {Command::DataGathering, &DspFirmware::dataGathering},
    {Command::DspEnable, &DspFirmware::dspEnable},
    {Command::RunHardwareTest, &DspFirmware::runHardwareTest},
}};

DspFirmware::DspFirmware(Registry& controls, QObject* parent) : QObject(parent), registry(controls) {}

void DspFirmware::restart()
{
    ++life;
    awaiting = false;
    version.clear();
    for (const char* flag :
         {"dsp.gathering", "dsp.long_range_antenna", "dsp.upsampling", "dsp.pairing_mode", "dsp.enabled"})
        publish(flag, false);
    for (const char* number : {"dsp.receiver", "dsp.hardware_test", "dsp.base_address", "dsp.trigger",
                               "dsp.line_noise_detection", "dsp.pairing_parameter"})
        publish(number, 0);
    publish("dsp.channels", QString());
}

void DspFirmware::handle(const QByteArray& data)
{
    if (!isWellFormed(data))
        return;
    const quint32 command = dspWord(data, 0);
    const QByteArray payload = data.mid(wordsSize, static_cast<qsizetype>(dspWord(data, 4)));
    registry.count(QStringLiteral("dsp.commands"));
    publish("dsp.last_command",
            QStringLiteral("%1 %2").arg(hexWord(command), QString::fromLatin1(payload.toHex())).trimmed());
    track(command);
    const QString manner = registry.text(QStringLiteral("dsp.ack"));
    if (manner == u"off")
        return;
    if (manner == u"nak")
        return answer(MessageType::Nak, command);
    execute(command, payload);
}

bool DspFirmware::isWellFormed(const QByteArray& data)
{
    const qint64 length = dspWord(data, 4);
    if (data.size() >= wordsSize && length <= data.size() - wordsSize)
        return true;
    emit violated(QStringLiteral("payload length %1 in a message of %2 bytes").arg(length).arg(data.size()));
    return false;
}

void DspFirmware::track(quint32 command)
{
    const auto now = std::chrono::steady_clock::now();
    if (awaiting && now - awaitingSince < patience)
        emit violated(QStringLiteral("command %1 while another is unacknowledged").arg(hexWord(command)));
    awaiting = true;
    awaitingSince = now;
}

void DspFirmware::execute(quint32 command, const QByteArray& payload)
{
    const auto* shape = shapeOf(command);
    if (shape == nullptr || payload.size() != shape->payloadSize) {
        emit violated(QStringLiteral("command %1 with %2 payload bytes").arg(hexWord(command)).arg(payload.size()));
        return answer(MessageType::Nak, command);
    }
    const auto words = wordsOf(payload);
    for (const auto& action : actions)
        if (action.command == shape->command)
            (this->*action.run)(words);
    answer(MessageType::Ack, command);
}

void DspFirmware::answer(MessageType type, quint32 command)
{
    const QString manner = registry.text(QStringLiteral("dsp.ack"));
    if (manner != u"late")
        return sendAnswer(type, command, manner);
    const auto delay = std::chrono::milliseconds(registry.integer(QStringLiteral("dsp.ack_delay")));
    QTimer::singleShot(delay, Qt::PreciseTimer, this, [this, type, command, mine = life] {
        if (mine == life)
            sendAnswer(type, command, QString());
    });
}

void DspFirmware::sendAnswer(MessageType type, quint32 command, const QString& manner)
{
    QByteArray data;
    appendDspWord(data, command);
    if (manner == u"short")
        data.chop(1);
    else if (manner != u"lost" && manner != u"wrong-id")
        awaiting = false;
    const auto code = static_cast<quint32>(type);
    if (manner == u"wrong-id")
        emit sendMisnamed(code, data);
    else if (manner != u"lost")
        emit send(code, data);
    const QByteArray reply = std::exchange(version, {});
    if (!reply.isEmpty())
        emit send(static_cast<quint32>(MessageType::VersionData), reply);
}

void DspFirmware::requestVersion(const QList<qint32>&)
{
    const QString manner = registry.text(QStringLiteral("dsp.version_reply"));
    version = manner == u"off" ? QByteArray() : versionBytes(registry.text(QStringLiteral("dsp.version")));
    if (manner == u"short")
        version.chop(1);
}

void DspFirmware::receiverEnable(const QList<qint32>& words)
{
    publish("dsp.receiver", words[0]);
}

void DspFirmware::longRangeAntennaEnable(const QList<qint32>& words)
{
    publish("dsp.long_range_antenna", words[0] != 0);
}

void DspFirmware::setTrigger(const QList<qint32>& words)
{
    publish("dsp.trigger", words[0]);
}

void DspFirmware::upsamplingEnable(const QList<qint32>& words)
{
    publish("dsp.upsampling", words[0] != 0);
}

void DspFirmware::configureLineNoiseDetection(const QList<qint32>& words)
{
    publish("dsp.line_noise_detection", words[0]);
}

void DspFirmware::pairingUpgradeMode(const QList<qint32>& words)
{
    publish("dsp.pairing_parameter", words[1]);
    publish("dsp.pairing_mode", words[0] != 0);
}

void DspFirmware::dataGathering(const QList<qint32>& words)
{
    QStringList channels;
    for (const qint32 channel : words.mid(1, 4))
        channels.append(QString::number(channel));
    publish("dsp.channels", channels.join(u' '));
    publish("dsp.base_address", words[5]);
    publish("dsp.gathering", words[0] != 0);
}

void DspFirmware::dspEnable(const QList<qint32>& words)
{
    publish("dsp.enabled", words[0] != 0);
}

void DspFirmware::runHardwareTest(const QList<qint32>& words)
{
    publish("dsp.hardware_test", words[0]);
}

void DspFirmware::publish(const char* name, const QJsonValue& value)
{
    registry.publish(QString::fromLatin1(name), value);
}

} // namespace VirtualDevice
