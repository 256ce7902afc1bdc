// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/dsp/DspStimuli.h"

#include "virtual-device/dsp/DspPacket.h"
#include "virtual-device/registry/Registry.h"

#include <functional>
#include <optional>

namespace VirtualDevice
{

using DspProtocol::MessageType;

namespace
{

struct Event
{
    quint32 type = 0;
    QByteArray data;
};

Event event(MessageType type, const QByteArray& data)
{
    return {static_cast<quint32>(type), data};
}

std::optional<Event> logString(const QString& text)
{
    return event(MessageType::LogString, text.toLatin1() + '\0');
}

std::optional<Event> lineNoise(const QString& word)
{
    if (word == u"empty")
        return event(MessageType::LineNoise, {});
    return event(MessageType::LineNoise, QByteArray(1, word == u"detected" ? '\1' : '\0'));
}

/// "FRAME TIME", decimal.
std::optional<QByteArray> triggerData(const QString& words)
{
    const auto parts = words.simplified().split(u' ');
    bool isFrame = false;
    bool isTime = false;
    const quint16 frame = parts.value(0).toUShort(&isFrame);
    const qint32 time = parts.value(1).toInt(&isTime);
    if (parts.size() != 2 || !isFrame || !isTime)
        return std::nullopt;
    QByteArray data;
    appendDspHalfWord(data, frame);
    appendDspWord(data, static_cast<quint32>(time));
    return data;
}

std::optional<Event> startTrigger(const QString& words)
{
    const auto data = triggerData(words);
    return data ? std::optional(event(MessageType::StartTrigger, *data)) : std::nullopt;
}

std::optional<Event> stopTrigger(const QString& words)
{
    const auto data = triggerData(words);
    return data ? std::optional(event(MessageType::StopTrigger, *data)) : std::nullopt;
}

std::optional<Event> pairingPacket(const QString& digits)
{
    return event(MessageType::PairingUpgradePacket, QByteArray::fromHex(digits.toLatin1()));
}

/// "TYPE DATA", hexadecimal; the data may be missing.
std::optional<Event> anyMessage(const QString& words)
{
    const auto parts = words.simplified().split(u' ');
    bool isType = false;
    const quint32 type = parts.front().toUInt(&isType, 16);
    if (!isType)
        return std::nullopt;
    return Event{type, QByteArray::fromHex(parts.mid(1).join(QString()).toLatin1())};
}

struct Stimulus
{
    const char* control;
    const char* idle;
    std::optional<Event> (*encode)(const QString& value);
};

constexpr std::array stimuli{
    Stimulus{"dsp.log", "", &logString},
    Stimulus{"dsp.line_noise", "none", &lineNoise},
    Stimulus{"dsp.start_trigger", "", &startTrigger},
    Stimulus{"dsp.stop_trigger", "", &stopTrigger},
    Stimulus{"dsp.pairing_packet", "", &pairingPacket},
    Stimulus{"dsp.message", "", &anyMessage},
};

const QString rawControl = QStringLiteral("dsp.raw");

} // namespace

DspStimuli::DspStimuli(Registry& controls, QObject* parent) : QObject(parent), registry(controls)
{
    connect(&registry, &Registry::changed, this, &DspStimuli::serve);
}

void DspStimuli::setRunning(bool runs)
{
    isRunning = runs;
    for (const auto& stimulus : stimuli)
        serve(QString::fromLatin1(stimulus.control));
    serve(rawControl);
}

void DspStimuli::serve(const QString& name)
{
    if (!isRunning)
        return;
    if (name == rawControl && !registry.text(name).isEmpty()) {
        emit sendRaw(QByteArray::fromHex(registry.text(name).toLatin1()));
        registry.publish(name, QString());
    }
    for (const auto& stimulus : stimuli) {
        const QString idle = QString::fromLatin1(stimulus.idle);
        if (name != QLatin1String(stimulus.control) || registry.text(name) == idle)
            continue;
        if (const auto message = stimulus.encode(registry.text(name)))
            emit send(message->type, message->data);
        registry.publish(name, idle);
    }
}

} // namespace VirtualDevice
