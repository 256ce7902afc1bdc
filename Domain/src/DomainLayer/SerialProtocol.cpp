// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/SerialProtocol.h"

#include "Domain/src/DomainLayer/FrameParser.h"
#include "utilities/SourceWarnings.h"

#include <QFile>
#include <QtEndian>

#include <algorithm>
#include <array>
#include <utility>

namespace Domain
{

namespace
{

const QString resetFileName = QStringLiteral("/sys/class/misc/msp430/reset");
constexpr char resetCommand = '1';
constexpr qsizetype chunkSize = 4096;
constexpr qint64 shareOfUnknownSize = 16 * chunkSize;

using Outcome = FrameParser::Outcome;

const Utilities::SourceWarnings warn(QStringLiteral(__FILE__));

struct Refusal
{
    int line;
    QString text;
};

/// In the order of the outcomes from the first refusal on. On a noisy line one of them is logged for every byte, so
/// they are made once.
const std::array<Refusal, 4> refusals{{
    {__LINE__, QStringLiteral("Received invalid header checksum")},
    {__LINE__, QStringLiteral("Received too large of a payload length")},
    {__LINE__, QStringLiteral("Received invalid data checksum")},
    {__LINE__, QStringLiteral("Did not receive end-of-packet byte")},
}};
constexpr auto firstRefusal = static_cast<std::size_t>(Outcome::InvalidHeaderChecksum);
static_assert(static_cast<std::size_t>(Outcome::PayloadTooLong) == firstRefusal + 1);
static_assert(static_cast<std::size_t>(Outcome::InvalidDataChecksum) == firstRefusal + 2);
static_assert(static_cast<std::size_t>(Outcome::MissingEndOfPacket) == firstRefusal + 3);

void warnOfRefusal(Outcome reason)
{
    const auto index = static_cast<std::size_t>(reason) - firstRefusal;
    if (index < refusals.size())
        return warn(refusals[index].line, refusals[index].text);
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
    [[nodiscard]] QByteArray messageOf(QByteArrayView payload);

    QIODevice& device;
    FrameParser parser{};
    QByteArray lastMessage{}; ///< null while its receivers look at it
};

/// Most receivers look at a message and let it go: then its memory serves for the next one. From one that is still kept
/// somewhere, the resizing detaches.
QByteArray SerialProtocol::PrivateData::messageOf(QByteArrayView payload)
{
    QByteArray message = std::exchange(lastMessage, {});
    if (message.isNull())
        message.reserve(Frame::longestPayload);
    message.resize(payload.size());
    std::copy(payload.begin(), payload.end(), message.data());
    return message;
}

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

/// Takes what is there now and no more: what comes meanwhile has an announcement of its own, and a line that is flooded
/// must not keep the thread from its other events. Nothing there is what a device says, too, that knows no size, and
/// one whose first bytes come just now: of these a fair share is taken.
void SerialProtocol::processData()
{
    std::array<char, chunkSize> chunk; // NOLINT(cppcoreguidelines-pro-type-member-init): written by read
    const auto announced = data->device.bytesAvailable();
    const auto limit = announced > 0 ? announced : shareOfUnknownSize;
    qint64 done = 0;
    qint64 count = 0;
    do {
        count = data->device.read(chunk.data(), chunkSize);
        if (count > 0)
            parse({chunk.data(), static_cast<qsizetype>(count)});
        done += count;
    } while (count > 0 && done < limit);
}

void SerialProtocol::parse(QByteArrayView bytes)
{
    data->parser.append(bytes);
    data->parser.parse([this](Outcome outcome, QByteArrayView payload) {
        if (outcome == Outcome::FrameReceived)
            deliver(payload);
        else
            warnOfRefusal(outcome);
    });
}

void SerialProtocol::deliver(QByteArrayView payload)
{
    QByteArray message = data->messageOf(payload);
    emit messageReceived(message);
    data->lastMessage = std::move(message);
}

} // namespace Domain
