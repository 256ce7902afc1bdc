// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/BeaconProcessor.h"

#include "Domain/src/DomainLayer/SerialPort.h"
#include "Domain/src/DomainLayer/SerialProtocol.h"
#include "utilities/Debug.h"
#include "utilities/SourceWarnings.h"

#include <QQueue>
#include <QThread>
#include <QTimer>
#include <QtCore/qtsan_impl.h>
#include <QtEndian>

#include <algorithm>
#include <array>
#include <atomic>
#include <future>
#include <mutex>

namespace Domain
{

namespace
{

constexpr int ackTimeoutMs = 3000;
constexpr qsizetype queueWarningLevel = 5;

constexpr unsigned int addressLimit = 0x1000000;
constexpr unsigned char lowestChannel = 2;
constexpr unsigned char highestChannel = 74;
constexpr qsizetype longestPacketData = 32;
constexpr qsizetype mostBeaconPackets = 5;
constexpr quint8 highestRadioCheckResult = 3;

enum class Command : quint8
{
    TransmitPacket = 0x02,
    StartTransmittingBeacon = 0x20,
    StopTransmittingBeacon = 0x21,
    UpdateBeacon = 0x22,
    SetAccelMode = 0x30,
    StartTransmittingRfTestPacket = 0x60,
    StopTransmittingRfTestPacket = 0x61,
    CheckRadioInterface = 0x62,
    SetPowerAmpEnable = 0x64,
    ToggleFramePulseLine = 0x65,
    RequestFirmwareVersion = 0x70,
    SendPing = 0x7E
};

const Utilities::SourceWarnings warn(QStringLiteral(__FILE__));

bool isValid(unsigned char channel)
{
    return channel >= lowestChannel && channel <= highestChannel;
}

bool isValid(const QVector<BeaconPacket>& packets)
{
    return !packets.isEmpty() && packets.size() <= mostBeaconPackets;
}

QByteArray bytesOf(std::initializer_list<unsigned char> values)
{
    return {reinterpret_cast<const char*>(values.begin()), static_cast<qsizetype>(values.size())};
}

/// The low 24 bits, most significant byte first.
QByteArray addressBytes(unsigned int address)
{
    QByteArray bytes(sizeof(quint32), '\0');
    qToBigEndian<quint32>(address, bytes.data());
    return bytes.sliced(1);
}

/// The valid packets, one after the other.
QByteArray packetBytes(const QVector<BeaconPacket>& packets)
{
    QByteArray bytes;
    for (qsizetype index = 0; index < packets.size(); ++index) {
        if (packets.at(index).isValid())
            bytes += packets.at(index).toByteArray();
        else
            warn(__LINE__, QStringLiteral("Beacon packet at index %1 is invalid.").arg(index));
    }
    return bytes;
}

} // namespace

class BeaconProcessor::PrivateData
{
public:
    PrivateData(BeaconProcessor& processor, SerialPort& port) : owner(processor), serialPort(port) {}

    struct Reply
    {
        quint8 code;
        qsizetype length;
        const char* name;
        void (PrivateData::*action)(const QByteArray& reply);
    };
    static const std::array<Reply, 8> replies;
    static constexpr qsizetype anyLength = -1;

    [[nodiscard]] static const Reply* replyWithCode(quint8 code);
    void handle(const Reply& reply, const QByteArray& payload);

    [[nodiscard]] bool send(Command command, const QByteArray& payload = {});
    void sendNext();
    [[nodiscard]] bool transmit(const QByteArray& message);
    [[nodiscard]] unsigned startAckTimer();
    void stopAckTimer();
    void stopAckTimerOf(unsigned attempt);

    void handleAck(const QByteArray& reply);
    void handleNak(const QByteArray& reply);
    void handleTransmitComplete(const QByteArray& reply);
    void handleAccelData(const QByteArray& reply);
    void handleRadioCheck(const QByteArray& reply);
    void handleFirmwareVersion(const QByteArray& reply);
    void handleText(const QByteArray& reply);
    void handlePingReply(const QByteArray& reply);

    BeaconProcessor& owner;
    SerialPort& serialPort;
    std::unique_ptr<SerialProtocol> protocol; ///< made and destroyed on the worker thread, as is the timer
    std::unique_ptr<QTimer> ackTimer;
    std::promise<void> objectsCreated;
    std::promise<void> objectsDestroyed;
    std::mutex lock; ///< guards the queue and the flag; never held across a write
    QQueue<QByteArray> queue;
    bool commandPending = false;
    std::atomic<unsigned> attempts = 0; ///< to write a command to the line
    QThread workerThread;
};

constexpr std::array<BeaconProcessor::PrivateData::Reply, 8> BeaconProcessor::PrivateData::replies{{
    {0x03, 0, "tx complete", &PrivateData::handleTransmitComplete},
    {0x31, 18, "accel data", &PrivateData::handleAccelData},
    {0x63, 1, "check radio", &PrivateData::handleRadioCheck},
    {0x71, 2, "fw version", &PrivateData::handleFirmwareVersion},
    {0x7B, anyLength, "text", &PrivateData::handleText},
    {0x7F, 0, "ping reply", &PrivateData::handlePingReply},
    {0xFE, 0, "ACK", &PrivateData::handleAck},
    {0xFF, 1, "NAK", &PrivateData::handleNak},
}};

const BeaconProcessor::PrivateData::Reply* BeaconProcessor::PrivateData::replyWithCode(quint8 code)
{
    const auto* const found =
        std::find_if(replies.begin(), replies.end(), [code](const Reply& reply) { return reply.code == code; });
    return found == replies.end() ? nullptr : found;
}

void BeaconProcessor::PrivateData::handle(const Reply& reply, const QByteArray& payload)
{
    if (reply.length == anyLength || payload.size() == reply.length)
        return (this->*reply.action)(payload);
    warn(__LINE__, QStringLiteral("Incorrect %1 length.  Expected: %2 Got: %3")
                       .arg(QLatin1String(reply.name))
                       .arg(reply.length)
                       .arg(payload.size()));
    emit owner.error(IncorrectLength);
}

/// Only the caller that finds no command pending writes. (Two writes meet only when the microcontroller acknowledges
/// what it has not got yet; the driver keeps each of them whole.)
bool BeaconProcessor::PrivateData::send(Command command, const QByteArray& payload)
{
    const QByteArray message = bytesOf({static_cast<unsigned char>(command)}) + payload;
    qsizetype waiting = 0;
    {
        const std::lock_guard guard(lock);
        if (commandPending) {
            queue.enqueue(message);
            waiting = queue.size();
        }
        commandPending = true;
    }
    if (waiting == 0)
        return transmit(message);
    if (waiting > queueWarningLevel)
        warn(__LINE__, QStringLiteral("Beacon processor message queue over maximum"));
    return true;
}

void BeaconProcessor::PrivateData::sendNext()
{
    QByteArray message;
    {
        const std::lock_guard guard(lock);
        commandPending = !queue.isEmpty();
        if (!commandPending)
            return;
        message = queue.dequeue();
    }
    if (transmit(message))
        return;
    const std::lock_guard guard(lock);
    commandPending = false;
}

/// The timer is on its way before the first byte is: the acknowledgement may come back before a write returns, and must
/// find the timer that it is to stop.
bool BeaconProcessor::PrivateData::transmit(const QByteArray& message)
{
    // On a machine without a thread for the worker nothing could answer a caller that waits: the line is a dead one.
    if (!workerThread.isRunning())
        return false;
    const auto attempt = startAckTimer();
    if (protocol->sendMessage(message))
        return true;
    stopAckTimerOf(attempt);
    return false;
}

unsigned BeaconProcessor::PrivateData::startAckTimer()
{
    const auto attempt = ++attempts;
    // Not by the slot's name: looking that up takes a good part of a ping's time.
    QMetaObject::invokeMethod(ackTimer.get(), [this] { ackTimer->start(ackTimeoutMs); });
    return attempt;
}

void BeaconProcessor::PrivateData::stopAckTimer()
{
    QMetaObject::invokeMethod(ackTimer.get(), &QTimer::stop);
}

/// By the time that a caller's failure comes to the worker thread, the timer may guard a command sent meanwhile, which
/// would otherwise stay pending for good.
void BeaconProcessor::PrivateData::stopAckTimerOf(unsigned attempt)
{
    QMetaObject::invokeMethod(ackTimer.get(), [this, attempt] {
        if (attempt == attempts)
            ackTimer->stop();
    });
}

void BeaconProcessor::PrivateData::handleAck(const QByteArray& /*reply*/)
{
    stopAckTimer();
    sendNext();
}

void BeaconProcessor::PrivateData::handleNak(const QByteArray& reply)
{
    stopAckTimer();
    warn(__LINE__,
         QStringLiteral("Received application-level NAK with data = %1").arg(static_cast<quint8>(reply.front())));
    emit owner.error(NakReceived);
    sendNext();
}

void BeaconProcessor::PrivateData::handleTransmitComplete(const QByteArray& /*reply*/)
{
    emit owner.transmitPacketComplete();
}

void BeaconProcessor::PrivateData::handleAccelData(const QByteArray& reply)
{
    constexpr qsizetype modeOffset = 2;
    constexpr qsizetype channelOffset = 3;
    emit owner.accelReadingCreateStart();
    AccelReading reading(qFromBigEndian<quint16>(reply.constData()),
                         static_cast<AbstractAccelerometer::AccelMode>(reply.at(modeOffset)));
    reading.setChannelData(reply.sliced(channelOffset));
    emit owner.accelReadingCreateStop();
    emit owner.accelReadingReceived(reading);
}

void BeaconProcessor::PrivateData::handleRadioCheck(const QByteArray& reply)
{
    const auto value = static_cast<quint8>(reply.front());
    if (value <= highestRadioCheckResult) {
        emit owner.checkRadioReplyReceived(static_cast<RadioCheckResult>(value));
        return;
    }
    warn(__LINE__, QStringLiteral("Received check radio response with out of range value %1")
                       .arg(Utilities::Debug::literal(QString(QLatin1Char(reply.front())))));
    emit owner.error(OutOfRangeValue);
}

void BeaconProcessor::PrivateData::handleFirmwareVersion(const QByteArray& reply)
{
    emit owner.firmwareVersionReceived(Utilities::VersionNumber::fromByteArray(reply));
}

void BeaconProcessor::PrivateData::handleText(const QByteArray& reply)
{
    const auto end = std::find(reply.begin(), reply.end(), '\0');
    warn(__LINE__, Utilities::Debug::literal(QString::fromLatin1(reply.first(end - reply.begin()))));
}

void BeaconProcessor::PrivateData::handlePingReply(const QByteArray& /*reply*/)
{
    emit owner.pingResponse();
}

BeaconProcessor::BeaconProcessor(SerialPort& serialPort) : data(std::make_unique<PrivateData>(*this, serialPort))
{
    qRegisterMetaType<Error>("Domain::AbstractBeaconProcessor::Error");
    data->workerThread.start(QThread::HighPriority);
    if (data->workerThread.isRunning())
        moveToThread(&data->workerThread);
    else
        warn(__LINE__, QStringLiteral("No thread for the radio's answers: every command is refused"));
    connect(this, SIGNAL(threadStarted()), this, SLOT(createObjectsOnThread()));
    emit threadStarted();
    // A command may follow at once, and needs the objects.
    data->objectsCreated.get_future().wait();
}

/// A timer can be stopped on its own thread only, and nothing may be destroyed while that thread still uses it.
BeaconProcessor::~BeaconProcessor()
{
    QtTsan::futexRelease(this); // the sanitizer cannot see into Qt's event queue
    QMetaObject::invokeMethod(this, "destroyObjectsOnThread", Qt::AutoConnection);
    data->objectsDestroyed.get_future().wait();
    data->workerThread.quit();
    data->workerThread.wait();
}

bool BeaconProcessor::isCommandPending()
{
    const std::lock_guard guard(data->lock);
    return data->commandPending;
}

bool BeaconProcessor::transmitPacket(unsigned int address, unsigned char channel, unsigned char argument,
                                     const QByteArray& packetData)
{
    if (address >= addressLimit) {
        warn(__LINE__, QStringLiteral("Attempt to send to invalid address %1").arg(address));
        return false;
    }
    if (!isValid(channel)) {
        warn(__LINE__, QStringLiteral("Attempt to send on invalid channel %1").arg(channel));
        return false;
    }
    if (packetData.isEmpty() || packetData.size() > longestPacketData) {
        warn(__LINE__, QStringLiteral("Attempt to send packet with invalid size %1").arg(packetData.size()));
        return false;
    }
    return data->send(Command::TransmitPacket, addressBytes(address) + bytesOf({channel, argument}) + packetData);
}

bool BeaconProcessor::startTransmittingBeacon(unsigned int address, unsigned char channel1, unsigned char channel2,
                                              unsigned char channel3, unsigned char channel4,
                                              const QVector<Domain::BeaconPacket>& packets)
{
    if (address >= addressLimit) {
        warn(__LINE__, QStringLiteral("Attempt to send to invalid address "));
        return false;
    }
    if (!isValid(channel1) || !isValid(channel2) || !isValid(channel3) || !isValid(channel4)) {
        warn(__LINE__, QStringLiteral("Attempt to send on invalid channel %1 %2 %3 %4")
                           .arg(channel1)
                           .arg(channel2)
                           .arg(channel3)
                           .arg(channel4));
        return false;
    }
    if (!isValid(packets)) {
        warn(__LINE__, QStringLiteral("Attempt to send an invalid number of packets %1").arg(packets.size()));
        return false;
    }
    return data->send(Command::StartTransmittingBeacon,
                      addressBytes(address) + bytesOf({channel1, channel2, channel3, channel4}) + packetBytes(packets));
}

bool BeaconProcessor::stopTransmittingBeacon(unsigned char argument)
{
    return data->send(Command::StopTransmittingBeacon, bytesOf({argument}));
}

bool BeaconProcessor::updateBeacon(const QVector<Domain::BeaconPacket>& packets)
{
    if (!isValid(packets)) {
        warn(__LINE__, QStringLiteral("Attempt to send an invalig number of packets %1").arg(packets.size()));
        return false;
    }
    return data->send(Command::UpdateBeacon, packetBytes(packets));
}

bool BeaconProcessor::setAccelMode(unsigned char mode)
{
    return data->send(Command::SetAccelMode, bytesOf({mode}));
}

bool BeaconProcessor::startTransmittingRfTestPacket(unsigned char channel,
                                                    Domain::AbstractBeaconProcessor::PowerLevel level)
{
    if (!isValid(channel)) {
        warn(__LINE__, QStringLiteral("Attempt to send on invalid channel %1").arg(channel));
        return false;
    }
    return data->send(Command::StartTransmittingRfTestPacket, bytesOf({channel, level}));
}

bool BeaconProcessor::stopTransmittingRfTestPacket()
{
    return data->send(Command::StopTransmittingRfTestPacket);
}

bool BeaconProcessor::checkRadioInterface()
{
    return data->send(Command::CheckRadioInterface);
}

bool BeaconProcessor::setPowerAmpEnable(bool enable)
{
    return data->send(Command::SetPowerAmpEnable, bytesOf({static_cast<unsigned char>(enable ? 1 : 0)}));
}

bool BeaconProcessor::toggleFramePulseLine()
{
    return data->send(Command::ToggleFramePulseLine);
}

bool BeaconProcessor::requestFirmwareVersion()
{
    return data->send(Command::RequestFirmwareVersion);
}

bool BeaconProcessor::sendPing()
{
    return data->send(Command::SendPing);
}

void BeaconProcessor::createObjectsOnThread()
{
    if (!data->protocol) {
        data->protocol = std::make_unique<SerialProtocol>(data->serialPort);
        connect(data->protocol.get(), SIGNAL(messageReceived(QByteArray)), this, SLOT(processMessage(QByteArray)));
    }
    if (!data->ackTimer) {
        data->ackTimer = std::make_unique<QTimer>();
        data->ackTimer->setSingleShot(true);
        data->ackTimer->setTimerType(Qt::PreciseTimer);
        connect(data->ackTimer.get(), SIGNAL(timeout()), this, SLOT(timeout()));
        data->objectsCreated.set_value();
    }
}

void BeaconProcessor::destroyObjectsOnThread()
{
    QtTsan::futexAcquire(this);
    data->protocol.reset();
    data->ackTimer.reset();
    data->objectsDestroyed.set_value();
}

void BeaconProcessor::processMessage(QByteArray message)
{
    if (message.isEmpty()) {
        warn(__LINE__, QStringLiteral("Received empty message"));
        emit error(EmptyMessage);
        return;
    }
    const auto* const reply = PrivateData::replyWithCode(static_cast<quint8>(message.front()));
    if (reply == nullptr) {
        warn(__LINE__, QStringLiteral("Received unknown message ") + QString::fromLatin1(message.toHex()));
        emit error(UnknownMessage);
        return;
    }
    data->handle(*reply, message.sliced(1));
}

/// An acknowledgement may have been handled while the timer's event was already on its way.
void BeaconProcessor::timeout()
{
    if (!isCommandPending())
        return;
    data->stopAckTimer();
    warn(__LINE__, QStringLiteral("Beacon processor timed out"));
    emit error(TimedOut);
    data->sendNext();
}

} // namespace Domain
