// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/Dsp.h"
#include "Domain/src/DomainLayer/DspPort.h"
#include "tests/support/AssertionLine.h"
#include "tests/support/InstantDsp.h"

#include <QCoreApplication>
#include <QSemaphore>

#include <algorithm>
#include <atomic>
#include <cstdint>
#include <cstdlib>
#include <cstring>

namespace
{

/// The whole receiving side: port, read thread, worker.
class Receiver
{
public:
    Receiver() : dsp(port, buttons)
    {
        QObject::connect(
            &dsp, &Domain::Dsp::stopTriggerDetected, &dsp,
            [this](quint16 /*frame*/, qint32 time) {
                if (time == round)
                    finished.release();
            },
            Qt::DirectConnection);
        QObject::connect(
            &dsp, &Domain::Dsp::sensorReadingsReceived, &dsp,
            [](const QVector<Domain::WirelessSensorReading>& readings) {
                if (readings.size() != 16)
                    std::abort();
            },
            Qt::DirectConnection);
    }

    /// Waits until everything delivered so far has been handled.
    void settle()
    {
        ++round;
        QByteArray end("\x08\x10\x01\x00\x06\x00\x00\x00\x00\x00", 10);
        const qint32 time = round;
        end.append(reinterpret_cast<const char*>(&time), sizeof time);
        TestSupport::InstantDsp::deliver(end);
        finished.acquire();
        finished.tryAcquire(finished.available());
    }

private:
    TestSupport::AssertionLine buttons;
    Domain::DspPort port{QStringLiteral("/dsp.out")};
    Domain::Dsp dsp;
    std::atomic<qint32> round = 0;
    QSemaphore finished;
};

} // namespace

// Any messages through the port: two bytes of length and one that chooses the message id before each.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* bytes, std::size_t size)
{
    static int argumentCount = 1;
    static char name[] = "DspReceiveFuzz";
    static char* arguments[] = {name, nullptr};
    static const QCoreApplication application(argumentCount, arguments); // threads have no event loop without
    static Receiver receiver;
    constexpr std::size_t prefix = 3;
    constexpr std::size_t longest = 2028;
    while (size >= prefix) {
        const std::size_t stated = bytes[0] | static_cast<std::size_t>(bytes[1]) << 8U;
        const std::size_t length = std::min({stated, longest, size - prefix});
        const std::uint16_t id = bytes[2] == 0 ? 100 : bytes[2];
        TestSupport::InstantDsp::deliver(
            QByteArray(reinterpret_cast<const char*>(bytes) + prefix, static_cast<qsizetype>(length)), id);
        bytes += prefix + length;
        size -= prefix + length;
    }
    receiver.settle();
    return 0;
}
