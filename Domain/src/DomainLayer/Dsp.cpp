// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/Dsp.h"

#include "Domain/src/DomainLayer/AbstractButtons.h"
#include "Domain/src/DomainLayer/DspPort.h"
#include "Domain/src/DomainLayer/WorkerThread.h"
#include "utilities/Debug.h"
#include "utilities/SourceWarnings.h"

#include <QDataStream>
#include <QDeadlineTimer>
#include <QMutex>
#include <QMutexLocker>
#include <QWaitCondition>
#include <QtEndian>

#include <algorithm>
#include <array>
#include <atomic>
#include <chrono>
#include <cstring>
#include <initializer_list>

namespace Domain
{

using Utilities::Debug;

namespace
{

constexpr std::chrono::milliseconds acknowledgementTimeout{800};
constexpr qsizetype messageHeaderSize = 8;
constexpr qsizetype shownUnknownBytes = 16;

constexpr uchar lowestChannel = 2;
constexpr uchar highestChannel = 74;
constexpr int maximumBaseAddress = 0xFFFFFF;

constexpr int sensorSlots = 16;
constexpr qsizetype diagnosticSize = 32;
constexpr qsizetype sensorHeaderSize = 4;

enum DspResponse : int
{
    NoResponse,
    AckResponse,
    NakResponse
};

/// Little-endian number of a message; bytes beyond its end count as zero.
template <typename Number> Number numberAt(const QByteArray& data, qsizetype offset)
{
    Number number = 0;
    const qsizetype present = std::clamp<qsizetype>(data.size() - offset, 0, sizeof number);
    if (present > 0)
        std::memcpy(&number, data.constData() + offset, static_cast<size_t>(present));
    return qFromLittleEndian(number);
}

QByteArray littleEndianWords(std::initializer_list<qint32> words)
{
    QByteArray bytes;
    QDataStream stream(&bytes, QIODevice::WriteOnly);
    stream.setByteOrder(QDataStream::LittleEndian);
    for (const qint32 word : words)
        stream << word;
    return bytes;
}

/// QWaitCondition gives the mutex up and takes it again inside Qt, which is not built for the thread sanitizer; said
/// here in the words of QMutex's own header, so that it sees who holds the mutex. Nothing in an ordinary build.
bool waitUnlocked(QWaitCondition& condition, QMutex& mutex, const QDeadlineTimer& deadline)
{
    QtTsan::mutexPreUnlock(&mutex, 0);
    QtTsan::mutexPostUnlock(&mutex, 0);
    const bool woken = condition.wait(&mutex, deadline);
    QtTsan::mutexPreLock(&mutex, 0);
    QtTsan::mutexPostLock(&mutex, 0, 0);
    return woken;
}

const Utilities::SourceWarnings warn(QStringLiteral(__FILE__));

} // namespace

struct Dsp::PrivateData
{
    PrivateData(Dsp* dsp, QIODevice& dspPort, AbstractButtons& buttonsObject)
        : owner(dsp), port(dspPort), buttons(buttonsObject)
    {
    }

    struct MessageKind
    {
        quint32 type;
        qsizetype minimumSize;
        const char* shortText; ///< %1 the size that came, %2 the size needed
        void (PrivateData::*handle)(const QByteArray& data);
    };
    static const std::array<MessageKind, 11> messageKinds;

    [[nodiscard]] bool synchronousDataSend(DspCommand command, const QByteArray& data);
    [[nodiscard]] bool awaitResponse(DspCommand command);
    [[nodiscard]] bool sendWord(DspCommand command, qint32 word);
    [[nodiscard]] bool setDataGatheringEnabled(bool enable);
    [[nodiscard]] bool setPairingUpgradeMode(AcquisitionMode mode);

    void dispatch(quint32 type, const QByteArray& data);
    void receiveVersion(const QByteArray& data);
    void ignore(const QByteArray& data);
    void receiveLogString(const QByteArray& data);
    void receivePairingUpgradePacket(const QByteArray& data);
    void receiveSensorData(const QByteArray& data);
    void receiveUpsampledSensorData(const QByteArray& data);
    void receiveLineNoise(const QByteArray& data);
    void receiveStartTrigger(const QByteArray& data);
    void receiveStopTrigger(const QByteArray& data);
    void receiveAck(const QByteArray& data);
    void receiveNak(const QByteArray& data);
    void receiveSensorReading(int upsampleRatio, const QByteArray& data);
    void takeResponse(DspResponse received);

    Dsp* owner;
    QIODevice& port;
    AbstractButtons& buttons;
    std::array<int, 4> channels{};
    bool channelsConfigured = false;
    int baseAddress = 0;
    bool baseAddressConfigured = false;
    QMutex responseMutex;
    QWaitCondition responseCondition;
    /// Written by the worker before it takes the mutex to wake the sender, who looks again under the mutex.
    std::atomic<int> response = NoResponse;
    QMutex sendMutex; ///< taken before responseMutex
    WorkerThread workerThread;
};

const std::array<Dsp::PrivateData::MessageKind, 11> Dsp::PrivateData::messageKinds{{
    {MessageVersionData, 2, "Received version data command with data size = %1.  expected %2",
     &PrivateData::receiveVersion},
    {MessageDiscarded, 0, "", &PrivateData::ignore},
    {MessageLogString, 0, "", &PrivateData::receiveLogString},
    {MessagePairingUpgradePacket, 1, "Pairing/upgrade packet size %1 too small",
     &PrivateData::receivePairingUpgradePacket},
    {MessageSensorData, 0, "", &PrivateData::receiveSensorData},
    {MessageUpsampledSensorData, 0, "", &PrivateData::receiveUpsampledSensorData},
    {MessageLineNoise, 0, "", &PrivateData::receiveLineNoise},
    {MessageStartTrigger, 6, "Received start trigger command with insufficent data. got %1 need %2",
     &PrivateData::receiveStartTrigger},
    {MessageStopTrigger, 6, "Received stop trigger command with insufficent data. got %1 need %2",
     &PrivateData::receiveStopTrigger},
    {MessageAck, 4, "Received Ack response with insufficent data. got %1 need %2", &PrivateData::receiveAck},
    {MessageNak, 4, "Received Nak response with insufficent data. got %1 need %2", &PrivateData::receiveNak},
}};

Dsp::Dsp(QIODevice& port, AbstractButtons& buttons) : privateData(std::make_unique<PrivateData>(this, port, buttons))
{
    moveToThread(&privateData->workerThread);
    privateData->workerThread.start(QThread::HighestPriority);
    // Connected before the port opens: a message is announced once, and one unheard would leave every later one a
    // message late.
    connect(&port, &QIODevice::readyRead, this, &Dsp::receiveData);
    connect(&buttons, &AbstractButtons::dspAssert, this, &Dsp::dspAssert);
    if (!port.open(QIODevice::ReadWrite))
        warn(__LINE__, QStringLiteral("Unable to open DSP port"));
}

Dsp::~Dsp()
{
    // The worker may be in the middle of a message: it ends before anything that it uses.
    disconnect(&privateData->port, nullptr, this, nullptr);
    disconnect(&privateData->buttons, nullptr, this, nullptr);
    privateData->workerThread.end();
    privateData->port.close();
}

bool Dsp::setChannels(uchar channel1, uchar channel2, uchar channel3, uchar channel4)
{
    const std::array<int, 4> wanted{channel1, channel2, channel3, channel4};
    const auto inRange = [](int channel) { return channel >= lowestChannel && channel <= highestChannel; };
    if (!std::all_of(wanted.begin(), wanted.end(), inRange)) {
        warn(__LINE__, QStringLiteral("At least one channel {%1, %2, %3, %4} outside of valid range range %5->%6")
                           .arg(channel1)
                           .arg(channel2)
                           .arg(channel3)
                           .arg(channel4)
                           .arg(lowestChannel)
                           .arg(highestChannel));
        return false;
    }
    privateData->channels = wanted;
    privateData->channelsConfigured = true;
    return true;
}

bool Dsp::setBaseAddress(int address)
{
    if (address > maximumBaseAddress) {
        warn(__LINE__, QStringLiteral("Addess %1 exceeds maximum address %2").arg(address).arg(maximumBaseAddress));
        return false;
    }
    privateData->baseAddress = address;
    privateData->baseAddressConfigured = true;
    return true;
}

bool Dsp::requestVersion()
{
    return privateData->synchronousDataSend(CommandRequestVersion, {});
}

bool Dsp::setReceiverEnable(ReceiverEnableType type)
{
    return privateData->sendWord(CommandReceiverEnable, type);
}

bool Dsp::setReceiverEnableTest(qint32 type)
{
    return privateData->sendWord(CommandReceiverEnable, type);
}

bool Dsp::setLongRangeAntennaEnable(bool enabled)
{
    return privateData->sendWord(CommandLongRangeAntennaEnable, enabled ? 1 : 0);
}

bool Dsp::setUpsamplingEnable(bool enabled)
{
    return privateData->sendWord(CommandUpsamplingEnable, enabled ? 1 : 0);
}

bool Dsp::configureLineNoiseDetection(LineNoiseDetectConfig configuration)
{
    return privateData->sendWord(CommandConfigureLineNoiseDetection, configuration);
}

bool Dsp::setTrigger(DataGatherTrigger trigger)
{
    return privateData->sendWord(CommandSetTrigger, trigger);
}

bool Dsp::setDspEnable(bool enabled)
{
    return privateData->sendWord(CommandDspEnable, enabled ? 1 : 0);
}

bool Dsp::runHardwareTest(qint32 testId)
{
    return privateData->sendWord(CommandRunHardwareTest, testId);
}

bool Dsp::setAcquisitionMode(AcquisitionMode mode)
{
    if (mode < IdleMode || mode > DataGatheringMode) {
        warn(__LINE__, QStringLiteral("Attempt to set invalid acquisition mode %1").arg(static_cast<qint32>(mode)));
        return false;
    }
    // The second step is taken even when the first has failed: half a change leaves the DSP nearer to what is wanted.
    if (mode == DataGatheringMode) {
        const bool pairingEnded = privateData->setPairingUpgradeMode(IdleMode);
        return privateData->setDataGatheringEnabled(true) && pairingEnded;
    }
    const bool gatheringEnded = privateData->setDataGatheringEnabled(false);
    return privateData->setPairingUpgradeMode(mode) && gatheringEnded;
}

bool Dsp::PrivateData::sendWord(DspCommand command, qint32 word)
{
    return synchronousDataSend(command, littleEndianWords({word}));
}

bool Dsp::PrivateData::setDataGatheringEnabled(bool enable)
{
    if (!channelsConfigured) {
        warn(__LINE__, QStringLiteral("Attempt to start data gathering without configuring channels"));
        return false;
    }
    if (!baseAddressConfigured) {
        warn(__LINE__, QStringLiteral("Attempt to start data gathering without configuring base address"));
        return false;
    }
    return synchronousDataSend(CommandDataGathering, littleEndianWords({enable ? 1 : 0, channels[0], channels[1],
                                                                        channels[2], channels[3], baseAddress}));
}

bool Dsp::PrivateData::setPairingUpgradeMode(AcquisitionMode mode)
{
    const qint32 enable = mode == IdleMode ? 0 : 1;
    const qint32 parameter = mode == PairingUpgradeModeA ? 12 : 8;
    return synchronousDataSend(CommandPairingUpgradeMode, littleEndianWords({enable, parameter, 0, 0, 0}));
}

bool Dsp::PrivateData::synchronousDataSend(DspCommand command, const QByteArray& data)
{
    const QMutexLocker sending(&sendMutex);
    response = NoResponse;
    const QByteArray message = littleEndianWords({command, static_cast<qint32>(data.size())}) + data;
    if (port.write(message) < message.size()) {
        warn(__LINE__, QStringLiteral("sendCommand failed"));
        return false;
    }
    return awaitResponse(command);
}

bool Dsp::PrivateData::awaitResponse(DspCommand command)
{
    int received = NoResponse;
    {
        // The answer may be here already; a wake-up without one is none, and does not start the time anew. Once the
        // time is over no answer counts any more.
        const QDeadlineTimer deadline(acknowledgementTimeout);
        const QMutexLocker waiting(&responseMutex);
        bool inTime = true;
        while (inTime && response == NoResponse)
            inTime = waitUnlocked(responseCondition, responseMutex, deadline);
        if (inTime)
            received = response;
    }
    if (received == AckResponse)
        return true;
    if (received == NoResponse)
        warn(__LINE__, QStringLiteral("Timed out waiting for DSP ACK"));
    else
        warn(__LINE__, QStringLiteral("Received Nak for DSP command 0x%1").arg(static_cast<quint32>(command), 0, 16));
    return false;
}

void Dsp::receiveData()
{
    emit messageReadStart();
    auto& port = dynamic_cast<DspPort&>(privateData->port);
    // An announcement may still be under way when the port closes.
    if (!port.isOpen())
        return;
    // One byte more than a message has: Qt keeps it for itself.
    QByteArray message = port.readLine(port.maxBytesAvailable() + 1);
    if (message.isEmpty())
        return;
    const auto type = numberAt<quint32>(message, 0);
    message.remove(0, messageHeaderSize);
    privateData->dispatch(type, message);
}

void Dsp::PrivateData::dispatch(quint32 type, const QByteArray& data)
{
    const auto kind = std::find_if(messageKinds.begin(), messageKinds.end(),
                                   [&](const MessageKind& candidate) { return candidate.type == type; });
    if (kind == messageKinds.end()) {
        warn(__LINE__, QStringLiteral("Received unknown message %1 with data %2 (first 16 bytes) from DSP")
                           .arg(QString::number(type, 16),
                                QString::fromLatin1(data.first(std::min(data.size(), shownUnknownBytes)).toHex())));
    } else if (data.size() < kind->minimumSize) {
        warn(__LINE__, QString::fromLatin1(kind->shortText)
                           .replace(QStringLiteral("%1"), QString::number(data.size()))
                           .replace(QStringLiteral("%2"), QString::number(kind->minimumSize)));
    } else {
        (this->*kind->handle)(data);
    }
}

void Dsp::PrivateData::receiveVersion(const QByteArray& data)
{
    Utilities::VersionNumber version;
    QDataStream stream(data);
    stream >> version;
    emit owner->versionReceived(version);
}

void Dsp::PrivateData::ignore(const QByteArray& /*data*/) {}

void Dsp::PrivateData::receiveLogString(const QByteArray& data)
{
    const qsizetype end = data.indexOf('\0');
    const auto text = QString::fromLatin1(end < 0 ? data : data.first(end));
    warn(__LINE__, QStringLiteral("DSP Log: ") + Debug::literal(text));
}

void Dsp::PrivateData::receivePairingUpgradePacket(const QByteArray& data)
{
    PairingUpgradeData packet;
    QDataStream stream(data);
    stream >> packet;
    emit owner->pairingUpgradeDataReceived(packet);
}

void Dsp::PrivateData::receiveSensorData(const QByteArray& data)
{
    receiveSensorReading(1, data);
}

void Dsp::PrivateData::receiveUpsampledSensorData(const QByteArray& data)
{
    receiveSensorReading(2, data);
}

void Dsp::PrivateData::receiveSensorReading(int upsampleRatio, const QByteArray& data)
{
    emit owner->sensorDataReceived();
    const int readingsLength = numberAt<quint16>(data, 2);
    if (readingsLength != data.size() - sensorHeaderSize - diagnosticSize) {
        warn(__LINE__, QStringLiteral("Received sensor data with incorrect readings length %1.  Data size = %2")
                           .arg(readingsLength)
                           .arg(data.size()));
        return;
    }
    if (readingsLength % sensorSlots != 0) {
        warn(__LINE__,
             QStringLiteral("Received sensor data with readings length %1 that is not evenly divisible by 16.")
                 .arg(readingsLength));
        return;
    }
    const auto frameNumber = numberAt<quint16>(data, 0);
    emit owner->diagnosticDataReceived(frameNumber, data.last(diagnosticSize));
    emit owner->rfDiagnosticDataEmitted();
    const int slotSize = readingsLength / sensorSlots;
    QVector<WirelessSensorReading> readings;
    readings.reserve(sensorSlots);
    for (int slot = 0; slot < sensorSlots; ++slot)
        readings.append(WirelessSensorReading(static_cast<uchar>(slot), frameNumber, upsampleRatio, data,
                                              static_cast<int>(sensorHeaderSize) + slot * slotSize, slotSize));
    emit owner->wirelessSensorReadingsGenerated();
    emit owner->sensorReadingsReceived(readings);
}

void Dsp::PrivateData::receiveLineNoise(const QByteArray& data)
{
    if (!data.isEmpty() && data.front() != 0)
        emit owner->lineNoiseDetected();
}

void Dsp::PrivateData::receiveStartTrigger(const QByteArray& data)
{
    emit owner->startTriggerDetected(numberAt<quint16>(data, 0), numberAt<qint32>(data, 2));
}

void Dsp::PrivateData::receiveStopTrigger(const QByteArray& data)
{
    emit owner->stopTriggerDetected(numberAt<quint16>(data, 0), numberAt<qint32>(data, 2));
}

void Dsp::PrivateData::receiveAck(const QByteArray& /*data*/)
{
    takeResponse(AckResponse);
}

void Dsp::PrivateData::receiveNak(const QByteArray& /*data*/)
{
    takeResponse(NakResponse);
}

void Dsp::PrivateData::takeResponse(DspResponse received)
{
    response = received;
    // Only under the mutex is the sender certain to be either before its look at the response or in its wait.
    const QMutexLocker locker(&responseMutex);
    responseCondition.wakeAll();
}

void Dsp::dspAssert()
{
    // Further asserts may be on their way to this thread already: only the one that ends the connection counts.
    if (disconnect(&privateData->buttons, &AbstractButtons::dspAssert, this, &Dsp::dspAssert))
        warn(__LINE__, QStringLiteral("DSP Assert"));
}

} // namespace Domain
