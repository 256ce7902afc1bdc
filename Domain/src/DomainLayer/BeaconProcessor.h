// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "Domain/src/DomainLayer/AbstractBeaconProcessor.h"
#include "Domain/src/DomainLayer/AccelReading.h"

#include <memory>

namespace Domain
{

class SerialPort;

/// Drives the radio microcontroller over its serial line: one command in flight, the others queued in order, each
/// waiting for its acknowledgement for 3 seconds at the most and never repeated.
///
/// Threads: made and destroyed on one thread, lives on a worker thread of its own. Operations may be called from any
/// thread: a command that finds none in flight is written by its caller. Replies are handled on the worker thread, and
/// all signals are emitted there. The constructor opens the port and resets the microcontroller before it returns; the
/// destructor ends the worker thread and leaves the port open. Where the machine starts no thread for it (logged once),
/// it lives on its maker's, hears what the radio says there, and lets no command leave, as on a dead line.
///
/// Messages are a code byte and data, multi-byte fields big-endian; `Frame` is what carries them on the line.
///
/// | Command | Operation                     | Data                                                         |
/// |---------|-------------------------------|--------------------------------------------------------------|
/// | 0x02    | transmitPacket                | address (3 bytes), channel, argument, 1 to 32 bytes          |
/// | 0x20    | startTransmittingBeacon       | address (3 bytes), four channels, 2 bytes a valid packet     |
/// | 0x21    | stopTransmittingBeacon        | argument                                                     |
/// | 0x22    | updateBeacon                  | 2 bytes a valid packet                                       |
/// | 0x30    | setAccelMode                  | mode                                                         |
/// | 0x60    | startTransmittingRfTestPacket | channel, power level                                         |
/// | 0x61    | stopTransmittingRfTestPacket  |                                                              |
/// | 0x62    | checkRadioInterface           |                                                              |
/// | 0x64    | setPowerAmpEnable             | 1 or 0                                                       |
/// | 0x65    | toggleFramePulseLine          |                                                              |
/// | 0x70    | requestFirmwareVersion        |                                                              |
/// | 0x7E    | sendPing                      |                                                              |
///
/// | Reply | Meaning               | Data                                      | Signal                          |
/// |-------|-----------------------|-------------------------------------------|---------------------------------|
/// | 0x03  | transmit complete     |                                           | transmitPacketComplete          |
/// | 0x31  | accelerometer samples | frame (2 bytes), mode, 15 channel bytes   | accelReadingCreateStart, -Stop, |
/// |       |                       |                                           | accelReadingReceived            |
/// | 0x63  | radio check           | result, 0 to 3                            | checkRadioReplyReceived         |
/// | 0x71  | firmware version      | major, minor                              | firmwareVersionReceived         |
/// | 0x7B  | text                  | Latin-1, up to a zero byte                | (logged)                        |
/// | 0x7F  | ping reply            |                                           | pingResponse                    |
/// | 0xFE  | acknowledgement       |                                           | (sends the next command)        |
/// | 0xFF  | refusal               | reason                                    | error(NakReceived)              |
///
/// Errors: logged; where the microcontroller's answer is at fault, `error` is emitted as well. An operation whose
/// arguments are out of range returns false and sends nothing. So does one whose write fails; but its command counts as
/// pending from then on, with no time-out, and all that follow are queued, until the microcontroller acknowledges or
/// refuses something after all or a processor is made anew. A queued command whose write fails is lost, which the log
/// alone tells; nothing is pending then, and what is still queued follows the next command.
class BeaconProcessor : public AbstractBeaconProcessor
{
    Q_OBJECT

public:
    /// The port is not owned; it must outlive this object.
    explicit BeaconProcessor(SerialPort& serialPort);
    ~BeaconProcessor() override;

    bool isCommandPending() override;
    bool transmitPacket(unsigned int address, unsigned char channel, unsigned char argument,
                        const QByteArray& data) override;
    bool startTransmittingBeacon(unsigned int address, unsigned char channel1, unsigned char channel2,
                                 unsigned char channel3, unsigned char channel4,
                                 const QVector<Domain::BeaconPacket>& packets) override;
    bool stopTransmittingBeacon(unsigned char argument) override;
    bool updateBeacon(const QVector<Domain::BeaconPacket>& packets) override;
    bool setAccelMode(unsigned char mode) override;
    bool startTransmittingRfTestPacket(unsigned char channel,
                                       Domain::AbstractBeaconProcessor::PowerLevel level) override;
    bool stopTransmittingRfTestPacket() override;
    bool checkRadioInterface() override;
    bool setPowerAmpEnable(bool enable) override;
    bool toggleFramePulseLine() override;
    bool requestFirmwareVersion() override;
    bool sendPing() override;

public slots:
    /// For the worker thread only, as are the slots below.
    void createObjectsOnThread();
    void processMessage(QByteArray message);
    void timeout();

signals:
    void threadStarted();
    void accelReadingReceived(Domain::AccelReading reading);
    void accelReadingCreateStart();
    void accelReadingCreateStop();

private slots:
    void destroyObjectsOnThread();

private:
    class PrivateData;

    std::unique_ptr<PrivateData> data;
};

} // namespace Domain
