// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/radio/RadioModel.h"

#include "virtual-device/radio/RadioFrame.h"
#include "virtual-device/registry/Registry.h"

namespace VirtualDevice
{

namespace
{

constexpr quint32 toRadioSalt = 0x7261'6469;
constexpr quint32 toProgramSalt = 0x7072'6F67;

} // namespace

RadioModel::RadioModel(Registry& controls, QObject* parent)
    : QObject(parent),
      registry(controls),
      line(this),
      toRadio(controls, QStringLiteral("radio.to_radio"), toRadioSalt, this),
      toProgram(controls, QStringLiteral("radio.to_program"), toProgramSalt, this),
      firmware(controls, this),
      monitor(this)
{
    connect(&line, &PtyLine::received, this, &RadioModel::received);
    connect(&toRadio, &LineDirection::delivered, this, &RadioModel::arrivedAtRadio);
    connect(&toProgram, &LineDirection::delivered, this, &RadioModel::arrivedAtProgram);
    connect(&firmware, &RadioFirmware::send, this, &RadioModel::sendMessage);
    connect(&monitor, &RadioMonitor::violated, this, &RadioModel::report);
    connect(&registry, &Registry::changed, this, &RadioModel::controlChanged);
    adoptSeed();
    adoptLineState();
}

void RadioModel::reset()
{
    pulses.fetch_add(1, std::memory_order_release);
    QMetaObject::invokeMethod(this, &RadioModel::takeResets, Qt::QueuedConnection);
}

/// Also called before any byte is looked at: the queued call may come after the bytes that followed the pulse.
void RadioModel::takeResets()
{
    const auto count = pulses.exchange(0, std::memory_order_acquire);
    if (count == 0)
        return;
    toRadio.clear();
    toProgram.clear();
    reader.clear();
    monitor.clear();
    firmware.reset();
    firmware.wake();
    registry.count(QStringLiteral("radio.resets"), count);
}

bool RadioModel::connected() const
{
    return registry.text(QStringLiteral("radio.line")) == u"connected";
}

void RadioModel::received(const QByteArray& bytes)
{
    takeResets();
    monitor.programSent(bytes);
    if (connected())
        toRadio.send(bytes);
}

void RadioModel::arrivedAtRadio(const QByteArray& bytes)
{
    firmware.wake();
    for (const auto& event : reader.feed(bytes)) {
        const bool good = event.finding == RadioFrameReader::Finding::Frame;
        registry.count(good ? QStringLiteral("radio.frames_good") : QStringLiteral("radio.frames_bad"));
        if (good)
            firmware.handle(event.payload);
    }
}

void RadioModel::arrivedAtProgram(const QByteArray& bytes)
{
    if (!connected() || !firmware.isAwake())
        return;
    // The program may answer the moment that the bytes are there: the monitor has to know them first.
    monitor.radioSent(bytes);
    const auto written = line.write(bytes);
    if (written < bytes.size())
        registry.count(QStringLiteral("radio.bytes_lost"), bytes.size() - written);
}

void RadioModel::sendMessage(const QByteArray& message)
{
    registry.count(QStringLiteral("radio.frames_sent"));
    toProgram.send(radioFrame(message));
}

void RadioModel::report(const QString& what)
{
    registry.publish(QStringLiteral("radio.last_violation"), what);
    registry.count(QStringLiteral("radio.violations"));
    emit violated(what);
}

void RadioModel::controlChanged(const QString& name)
{
    if (name == u"radio.line")
        adoptLineState();
    else if (name == u"radio.line_seed")
        adoptSeed();
    else if (name == u"radio.raw")
        sendRaw();
}

void RadioModel::adoptLineState()
{
    const bool hungUp = registry.text(QStringLiteral("radio.line")) == u"hung-up";
    if (hungUp)
        line.hangUp();
    else if (!line.isOpen())
        line.open();
    registry.publish(QStringLiteral("radio.device"), line.devicePath());
}

void RadioModel::adoptSeed()
{
    const auto seed = static_cast<quint32>(registry.integer(QStringLiteral("radio.line_seed")));
    toRadio.setSeed(seed);
    toProgram.setSeed(seed);
}

void RadioModel::sendRaw()
{
    const QString digits = registry.text(QStringLiteral("radio.raw"));
    if (digits.isEmpty())
        return;
    toProgram.send(QByteArray::fromHex(digits.toLatin1()));
    registry.publish(QStringLiteral("radio.raw"), QString());
}

} // namespace VirtualDevice
