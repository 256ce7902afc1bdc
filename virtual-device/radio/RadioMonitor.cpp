// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/radio/RadioMonitor.h"

#include "virtual-device/radio/RadioProtocol.h"

namespace VirtualDevice
{

using namespace RadioProtocol;

namespace
{

QString hexCode(quint8 code)
{
    return QStringLiteral("0x%1").arg(code, 2, 16, QLatin1Char('0'));
}

QString describe(const RadioFrameReader::Event& event)
{
    using Finding = RadioFrameReader::Finding;
    switch (event.finding) {
    case Finding::Frame:
        return {};
    case Finding::StrayBytes:
        return QStringLiteral("bytes outside a frame");
    case Finding::BadHeaderChecksum:
        return QStringLiteral("bad header checksum");
    case Finding::LengthOverLimit:
        return QStringLiteral("length %1 over the limit of %2").arg(event.length).arg(longestPayload);
    case Finding::BadDataChecksum:
        return QStringLiteral("bad data checksum");
    case Finding::BadEndByte:
        return QStringLiteral("bad end byte");
    }
    return {};
}

bool isAcknowledgement(const QByteArray& payload)
{
    const auto code = static_cast<Reply>(payload.isEmpty() ? 0 : payload.front());
    return (code == Reply::Ack && payload.size() == 1) || (code == Reply::Nak && payload.size() == 2);
}

} // namespace

void RadioMonitor::programSent(QByteArrayView bytes)
{
    for (const auto& event : fromProgram.feed(bytes)) {
        if (event.finding == RadioFrameReader::Finding::Frame)
            examine(event.payload);
        else
            emit violated(describe(event));
    }
}

void RadioMonitor::radioSent(QByteArrayView bytes)
{
    for (const auto& event : fromRadio.feed(bytes))
        if (isAcknowledgement(event.payload))
            awaiting = false;
}

void RadioMonitor::clear()
{
    fromProgram.clear();
    fromRadio.clear();
    awaiting = false;
}

void RadioMonitor::examine(const QByteArray& command)
{
    if (command.isEmpty()) {
        emit violated(QStringLiteral("empty message"));
        return;
    }
    const auto code = static_cast<quint8>(command.front());
    const auto* shape = shapeOf(code);
    const auto length = command.size() - 1;
    if (shape == nullptr)
        emit violated(QStringLiteral("unknown command %1").arg(hexCode(code)));
    else if (length < shape->shortest || length > shape->longest)
        emit violated(QStringLiteral("command %1 with %2 data bytes").arg(hexCode(code)).arg(length));
    track(command);
}

void RadioMonitor::track(const QByteArray& command)
{
    const auto code = static_cast<quint8>(command.front());
    const auto now = Clock::now();
    if (awaiting && now - awaitingSince < patience)
        emit violated(
            QStringLiteral("command %1 while %2 is unacknowledged").arg(hexCode(code), hexCode(awaitingCode)));
    awaiting = true;
    awaitingCode = code;
    awaitingSince = now;
}

} // namespace VirtualDevice
