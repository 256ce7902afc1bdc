// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/SerialProtocol.h"

#include "Domain/src/DomainLayer/FrameParser.h"
#include "utilities/Debug.h"

#include <QFile>
#include <QtEndian>

namespace Domain
{

namespace
{

const QString resetFileName = QStringLiteral("/sys/class/misc/msp430/reset");
constexpr char resetCommand = '1';

/// No allocation: on a noisy line this is called for every byte.
void warn(int line, const QString& text)
{
    static const QString source = QStringLiteral(__FILE__);
    Utilities::Debug::warningMessage(source, line, text);
}

void warnOfRefusal(FrameParser::Outcome reason)
{
    switch (reason) {
    // NOLINTNEXTLINE(bugprone-branch-clone): the texts differ, but inside lambdas, which the check takes for the same
    case FrameParser::Outcome::InvalidHeaderChecksum:
        return warn(__LINE__, QStringLiteral("Received invalid header checksum"));
    case FrameParser::Outcome::PayloadTooLong:
        return warn(__LINE__, QStringLiteral("Received too large of a payload length"));
    case FrameParser::Outcome::InvalidDataChecksum:
        return warn(__LINE__, QStringLiteral("Received invalid data checksum"));
    case FrameParser::Outcome::MissingEndOfPacket:
        return warn(__LINE__, QStringLiteral("Did not receive end-of-packet byte"));
    case FrameParser::Outcome::NeedsMoreBytes:
    case FrameParser::Outcome::FrameReceived:
        break;
    }
    warn(__LINE__, QStringLiteral("ERROR: serial recieve parser in unknown state %1").arg(static_cast<int>(reason)));
}

/// The driver behind the file makes the pulse.
void pulseResetLine()
{
    // Of a link that leads nowhere a QFile object says that it exists.
    if (!QFile::exists(resetFileName))
        return warn(__LINE__,
                    QStringLiteral("Beacon processor reset line device file does not exist at") + resetFileName);
    QFile file(resetFileName);
    // Unbuffered: only then does the write tell of the driver's error.
    if (!file.open(QIODevice::WriteOnly | QIODevice::ExistingOnly | QIODevice::Unbuffered))
        return warn(__LINE__, QStringLiteral("Cannot open beacon processor reset line device file for writing"));
    if (!file.putChar(resetCommand))
        warn(__LINE__, QStringLiteral("Cannot write to beacon processor reset line device file"));
}

void appendField(QByteArray& frame, quint16 value)
{
    const auto bigEndian = qToBigEndian(value);
    frame.append(reinterpret_cast<const char*>(&bigEndian), sizeof bigEndian);
}

QByteArray framed(const QByteArray& payload)
{
    QByteArray frame;
    frame.reserve(payload.size() + Frame::overhead);
    frame.append(Frame::startByte);
    appendField(frame, static_cast<quint16>(payload.size()));
    appendField(frame, Frame::checksumOf(payload));
    appendField(frame, Frame::checksumOf(frame));
    frame.append(payload);
    frame.append(Frame::endOfPacket);
    return frame;
}

} // namespace

class SerialProtocol::PrivateData
{
public:
    QIODevice& device;
    FrameParser parser{};
};

SerialProtocol::SerialProtocol(QIODevice& device) : data(new PrivateData{device})
{
    if (!device.open(QIODevice::ReadWrite))
        warn(__LINE__, QStringLiteral("Unable to open beacon serial port"));
    pulseResetLine();
    connect(&device, SIGNAL(readyRead()), this, SLOT(processData()));
}

SerialProtocol::~SerialProtocol() = default;

/// Uses the device and its arguments alone: it may run while another thread parses.
bool SerialProtocol::sendMessage(const QByteArray& payload)
{
    const QByteArray frame = framed(payload);
    if (data->device.write(frame) >= frame.size())
        return true;
    warn(__LINE__, QStringLiteral("Unable to send serial packet"));
    return false;
}

void SerialProtocol::processData()
{
    data->parser.append(data->device.readAll());
    for (auto outcome = data->parser.advance(); outcome != FrameParser::Outcome::NeedsMoreBytes;
         outcome = data->parser.advance()) {
        if (outcome == FrameParser::Outcome::FrameReceived)
            emit messageReceived(data->parser.payload().toByteArray());
        else
            warnOfRefusal(outcome);
    }
}

} // namespace Domain
