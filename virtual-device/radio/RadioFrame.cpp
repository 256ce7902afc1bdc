// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/radio/RadioFrame.h"

#include "virtual-device/radio/RadioProtocol.h"

#include <QtEndian>

#include <numeric>

namespace VirtualDevice
{

namespace
{

void appendNumber(QByteArray& to, quint16 number)
{
    std::array<char, 2> bytes{};
    qToBigEndian(number, bytes.data());
    to.append(bytes.data(), bytes.size());
}

} // namespace

quint16 radioChecksum(QByteArrayView bytes)
{
    return std::accumulate(bytes.begin(), bytes.end(), quint16{0}, [](quint16 sum, char byte) {
        return static_cast<quint16>(sum + static_cast<quint8>(byte));
    });
}

QByteArray radioFrame(QByteArrayView payload)
{
    QByteArray frame;
    frame.reserve(payload.size() + static_cast<qsizetype>(RadioProtocol::envelopeSize));
    frame.append(static_cast<char>(RadioProtocol::startByte));
    appendNumber(frame, static_cast<quint16>(payload.size()));
    appendNumber(frame, radioChecksum(payload));
    appendNumber(frame, radioChecksum(frame));
    frame.append(payload);
    frame.append(static_cast<char>(RadioProtocol::endByte));
    return frame;
}

} // namespace VirtualDevice
