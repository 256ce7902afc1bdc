// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/dsp/DspModel.h"

#include "virtual-device/registry/Registry.h"

#include <QTimer>

namespace VirtualDevice
{

using namespace DspProtocol;

namespace
{

constexpr quint16 misnamedId = 101;

QByteArray name(std::string_view text)
{
    return {text.data(), static_cast<qsizetype>(text.size())};
}

bool isAnswer(quint32 type)
{
    return type == static_cast<quint32>(MessageType::Ack) || type == static_cast<quint32>(MessageType::Nak);
}

} // namespace

const std::array<DspModel::Rule, 10> DspModel::rules{{
    {PacketKind::Attach, "attach", 4, State::Off, State::Off, &DspModel::attach},
    {PacketKind::QueueOpen, "queue", 5, State::Attached, State::Connected, &DspModel::queueOpen},
    {PacketKind::Load, "load", 1, State::Attached, State::Loaded, &DspModel::load},
    {PacketKind::Start, "start", 0, State::Loaded, State::Loaded, &DspModel::start},
    {PacketKind::TransportOpen, "transport", 0, State::Started, State::Started, &DspModel::transportOpen},
    {PacketKind::Locate, "locate", 1, State::Connected, State::Connected, &DspModel::locate},
    {PacketKind::TransportClose, "transport-close", 0, State::Connected, State::Connected, &DspModel::transportClose},
    {PacketKind::Stop, "stop", 0, State::Started, State::Started, &DspModel::stop},
    {PacketKind::QueueClose, "queue-close", 4, State::Attached, State::Connected, &DspModel::queueClose},
    {PacketKind::Detach, "detach", 0, State::Attached, State::Loaded, &DspModel::detach},
}};

DspModel::DspModel(Registry& controls, QObject* parent)
    : QObject(parent),
      registry(controls),
      socket(this),
      firmware(controls, this),
      sensors(controls, this),
      stimuli(controls, this)
{
    connect(&socket, &DspSocket::connected, this, [this] { registry.count(QStringLiteral("dsp.connections")); });
    connect(&socket, &DspSocket::received, this, &DspModel::received);
    connect(&socket, &DspSocket::disconnected, this, &DspModel::disconnected);
    connect(&firmware, &DspFirmware::send, this, &DspModel::sendMessage);
    connect(&firmware, &DspFirmware::sendMisnamed, this, &DspModel::sendMisnamed);
    connect(&firmware, &DspFirmware::violated, this, &DspModel::report);
    connect(&sensors, &SensorSource::send, this, &DspModel::sendMessage);
    connect(&stimuli, &DspStimuli::send, this, &DspModel::sendMessage);
    connect(&stimuli, &DspStimuli::sendRaw, this, [this](const QByteArray& data) {
        sendData(data, static_cast<quint16>(registry.integer(QStringLiteral("dsp.message_id"))));
    });
    connect(&registry, &Registry::changed, this, &DspModel::controlChanged);
}

std::optional<QString> DspModel::open(const QString& socketPath)
{
    path = socketPath;
    return adoptPresence();
}

void DspModel::close()
{
    socket.close();
    path.clear();
}

std::optional<QString> DspModel::adoptPresence()
{
    if (path.isEmpty())
        return std::nullopt;
    const QString presence = registry.text(QStringLiteral("dsp.presence"));
    if (presence == u"present")
        return socket.listen(path);
    if (presence == u"refusing")
        return socket.refuse(path);
    socket.close();
    return std::nullopt;
}

void DspModel::controlChanged(const QString& control)
{
    if (control != u"dsp.presence")
        return;
    if (const auto problem = adoptPresence())
        report(*problem);
}

void DspModel::received(const QByteArray& bytes)
{
    const auto packet = DspPacket::parsed(bytes);
    if (!packet)
        return;
    if (packet->kind == PacketKind::Message)
        message(*packet);
    else
        request(*packet);
}

void DspModel::request(const DspPacket& packet)
{
    for (const auto& rule : rules) {
        if (rule.kind != packet.kind || packet.body.size() < rule.shortestBody)
            continue;
        registry.count(QStringLiteral("dsp.requests"));
        if (!registry.flag(QStringLiteral("dsp.replies")))
            return;
        if (state < rule.from || state > rule.upTo) {
            report(QStringLiteral("%1 out of order").arg(QLatin1String(rule.name)));
            reply(packet, Status::WrongState);
        } else if (registry.text(QStringLiteral("dsp.refuse")) == QLatin1String(rule.name)) {
            reply(packet, Status::Failed);
        } else {
            (this->*rule.handle)(packet);
        }
    }
}

void DspModel::reply(const DspPacket& request, Status status, quint32 value)
{
    socket.send(DspPacket::reply(request.serial, status, value), DspSocket::Urgency::Answer);
}

void DspModel::message(const DspPacket& packet)
{
    constexpr qsizetype dataOffset = destinationSize + messageHeaderSize;
    if (packet.body.size() < dataOffset || dspWord(packet.body, 0) != dspQueueHandle)
        return report(QStringLiteral("message of %1 bytes for queue 0x%2")
                          .arg(packet.body.size())
                          .arg(dspWord(packet.body, 0), 0, 16));
    if (state != State::Connected)
        return report(QStringLiteral("message while the transport is closed"));
    registry.count(QStringLiteral("dsp.messages_received"));
    const quint16 messageId = dspHalfWord(packet.body, dataOffset - 2);
    if (messageId != commandMessageId)
        return report(QStringLiteral("message id %1").arg(messageId));
    firmware.handle(packet.body.mid(dataOffset));
}

void DspModel::disconnected()
{
    queues.clear();
    registry.publish(QStringLiteral("dsp.image"), QString());
    setState(State::Off);
}

void DspModel::setState(State next)
{
    static constexpr std::array names{"off", "attached", "loaded", "started", "connected"};
    const bool ran = state >= State::Started;
    const bool runs = next >= State::Started;
    state = next;
    if (ran != runs) {
        firmware.restart();
        sensors.restart();
    }
    registry.publish(QStringLiteral("dsp.state"), QLatin1String(names[static_cast<std::size_t>(next)]));
    stimuli.setRunning(next == State::Connected);
}

void DspModel::report(const QString& what)
{
    registry.publish(QStringLiteral("dsp.last_violation"), what);
    registry.count(QStringLiteral("dsp.violations"));
    emit violated(what);
}

void DspModel::attach(const DspPacket& request)
{
    if (dspWord(request.body, 0) != protocolVersion)
        return reply(request, Status::WrongVersion);
    setState(State::Attached);
    reply(request, Status::Done);
}

void DspModel::queueOpen(const DspPacket& request)
{
    const QByteArray opened = request.body.mid(4);
    if (opened == name(dspQueueName)) // unique over both processors
        return reply(request, Status::Failed);
    queues.insert(opened, dspWord(request.body, 0));
    reply(request, Status::Done);
}

void DspModel::load(const DspPacket& request)
{
    registry.publish(QStringLiteral("dsp.image"), QString::fromLocal8Bit(request.body));
    setState(State::Loaded);
    reply(request, Status::Done);
}

void DspModel::start(const DspPacket& request)
{
    setState(State::Started);
    reply(request, Status::Done);
}

void DspModel::transportOpen(const DspPacket& request)
{
    reply(request, Status::Done); // before anything that the operator had waiting
    setState(State::Connected);
}

void DspModel::locate(const DspPacket& request)
{
    const QString manner = registry.text(QStringLiteral("dsp.locate"));
    if (manner == u"never")
        return;
    if (manner == u"missing" || request.body != name(dspQueueName))
        return reply(request, Status::NotFound);
    if (manner != u"late")
        return replyLocated(request);
    const auto delay = std::chrono::milliseconds(registry.integer(QStringLiteral("dsp.ack_delay")));
    QTimer::singleShot(delay, this, [this, request, of = registry.integer(QStringLiteral("dsp.connections"))] {
        if (of == registry.integer(QStringLiteral("dsp.connections")))
            replyLocated(request);
    });
}

void DspModel::replyLocated(const DspPacket& request)
{
    reply(request, Status::Done, dspQueueHandle);
}

void DspModel::transportClose(const DspPacket& request)
{
    setState(State::Started);
    reply(request, Status::Done);
}

void DspModel::stop(const DspPacket& request)
{
    setState(State::Attached);
    reply(request, Status::Done);
}

void DspModel::queueClose(const DspPacket& request)
{
    queues.removeIf([&](const auto& queue) { return queue.value() == dspWord(request.body, 0); });
    reply(request, Status::Done);
}

void DspModel::detach(const DspPacket& request)
{
    queues.clear();
    setState(State::Off);
    reply(request, Status::Done);
}

void DspModel::sendMessage(quint32 type, const QByteArray& data)
{
    const auto lengthError = static_cast<qint32>(registry.integer(QStringLiteral("dsp.length_error")));
    sendData(dspData(type, data, lengthError),
             static_cast<quint16>(registry.integer(QStringLiteral("dsp.message_id"))));
}

void DspModel::sendMisnamed(quint32 type, const QByteArray& data)
{
    sendData(dspData(type, data), misnamedId);
}

void DspModel::sendData(const QByteArray& data, quint16 messageId)
{
    const auto queue = queues.constFind(name(armQueueName));
    if (queue == queues.constEnd() || state < State::Started)
        return;
    const auto urgency = isAnswer(dspWord(data, 0)) ? DspSocket::Urgency::Answer : DspSocket::Urgency::Data;
    const QByteArray packet = DspPacket::message(*queue, messageId, data.first(std::min(data.size(), longestData)));
    const bool sent = socket.send(packet, urgency);
    registry.count(sent ? QStringLiteral("dsp.messages_sent") : QStringLiteral("dsp.messages_lost"));
}

} // namespace VirtualDevice
