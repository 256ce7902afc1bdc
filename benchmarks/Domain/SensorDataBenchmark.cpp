// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/Dsp.h"
#include "Domain/src/DomainLayer/DspPort.h"
#include "Domain/src/DomainLayer/WirelessSensorReading.h"
#include "benchmarks/Domain/AllocationCount.h"
#include "tests/support/AssertionLine.h"
#include "tests/support/InstantDsp.h"

#include <QCoreApplication>
#include <QSemaphore>

#include <benchmark/benchmark.h>

#include <algorithm>
#include <array>
#include <cstdint>
#include <ctime>
#include <string>
#include <utility>
#include <vector>

/// One sensor-data message, 16 slots of type 0, decoded into readings, beside copying the same bytes into plain
/// containers: "of_plain" is the ratio of the times, both measured in turns in the same run. Then the whole way of such
/// a message, from the DSP's queue to the signal, with its heap allocations.
namespace
{

using Domain::WirelessSensorReading;

constexpr int slotCount = 16;
constexpr int blockPosition = 4;
constexpr int slotHeader = 5;
constexpr int diagnosticSize = 32;

int slotSizeFor(int ratio)
{
    return slotHeader + 60 * ratio;
}

QByteArray messageFor(int ratio)
{
    const int slotSize = slotSizeFor(ratio);
    const int length = slotCount * slotSize;
    QByteArray data(blockPosition + length + diagnosticSize, '\0');
    data[2] = static_cast<char>(length & 0xFF);
    data[3] = static_cast<char>(length >> 8);
    for (int byte = 0; byte < length; ++byte)
        data[blockPosition + byte] = static_cast<char>(byte);
    for (int slot = 0; slot < slotCount; ++slot)
        data.replace(blockPosition + slot * slotSize, slotHeader, QByteArray("\1\0\2\3\3", slotHeader));
    return data;
}

QVector<WirelessSensorReading> decoded(const QByteArray& data, int ratio)
{
    QVector<WirelessSensorReading> readings;
    readings.reserve(slotCount);
    const int slotSize = slotSizeFor(ratio);
    for (int slot = 0; slot < slotCount; ++slot)
        readings.append(
            WirelessSensorReading(static_cast<uchar>(slot), 1, ratio, data, blockPosition + slot * slotSize, slotSize));
    return readings;
}

struct PlainReading
{
    std::uint16_t frameNumber;
    std::array<unsigned char, slotHeader> header;
    std::vector<std::vector<char>> channels;
};

/// The same bytes in the same shape, with nothing checked and nothing reordered.
std::vector<PlainReading> copied(const QByteArray& data, int ratio)
{
    std::vector<PlainReading> readings;
    readings.reserve(slotCount);
    const char* slot = data.constData() + blockPosition;
    for (int number = 0; number < slotCount; ++number, slot += slotSizeFor(ratio)) {
        PlainReading reading{1, {}, {}};
        std::copy_n(slot, slotHeader, reading.header.begin());
        reading.channels.reserve(4);
        const char* from = slot + slotHeader;
        for (const int size : {54 * ratio, 2 * ratio, 2 * ratio, 2 * ratio}) {
            reading.channels.emplace_back(from, from + size);
            from += size;
        }
        readings.push_back(std::move(reading));
    }
    return readings;
}

/// Processor time of this thread: other programs must not count.
double processorSeconds()
{
    timespec used{};
    ::clock_gettime(CLOCK_THREAD_CPUTIME_ID, &used);
    return static_cast<double>(used.tv_sec) + static_cast<double>(used.tv_nsec) * 1e-9;
}

template <typename Work> double secondsFor(Work work)
{
    constexpr int rounds = 200;
    const double start = processorSeconds();
    for (int round = 0; round < rounds; ++round)
        work();
    return (processorSeconds() - start) / rounds;
}

template <typename Work> double allocationsOf(Work work)
{
    const auto before = Benchmarks::allocationCount();
    work();
    return static_cast<double>(Benchmarks::allocationCount() - before);
}

void decoding(benchmark::State& state)
{
    const int ratio = static_cast<int>(state.range(0));
    const QByteArray data = messageFor(ratio);
    if (!decoded(data, ratio).last().isValid())
        state.SkipWithError("the message does not decode");
    const auto decode = [&] { benchmark::DoNotOptimize(decoded(data, ratio)); };
    const auto copy = [&] { benchmark::DoNotOptimize(copied(data, ratio)); };
    double ours = 0;
    double plain = 0;
    for ([[maybe_unused]] auto iteration : state) {
        ours += secondsFor(decode);
        plain += secondsFor(copy);
    }
    const auto rounds = static_cast<double>(state.iterations());
    state.counters["decode_us"] = ours / rounds * 1e6;
    state.counters["plain_us"] = plain / rounds * 1e6;
    state.counters["of_plain"] = ours / plain;
    state.counters["allocations"] = allocationsOf(decode);
    state.counters["plain_allocations"] = allocationsOf(copy);
}

QByteArray littleEndian(std::uint32_t word)
{
    QByteArray bytes(4, '\0');
    for (char& byte : bytes) {
        byte = static_cast<char>(word & 0xFFU);
        word >>= 8U;
    }
    return bytes;
}

void receiving(benchmark::State& state)
{
    constexpr std::uint32_t sensorDataType = 0x11004;
    const QByteArray data = messageFor(1);
    const QByteArray message =
        littleEndian(sensorDataType) + littleEndian(static_cast<std::uint32_t>(data.size())) + data;
    TestSupport::AssertionLine buttons;
    Domain::DspPort port(QStringLiteral("/dsp.out"));
    Domain::Dsp dsp(port, buttons);
    QSemaphore received;
    QObject::connect(
        &dsp, &Domain::Dsp::sensorReadingsReceived, &dsp, [&] { received.release(); }, Qt::DirectConnection);
    const auto before = Benchmarks::allocationCount();
    for ([[maybe_unused]] auto iteration : state) {
        TestSupport::InstantDsp::deliver(message);
        received.acquire();
    }
    state.counters["allocations"] =
        static_cast<double>(Benchmarks::allocationCount() - before) / static_cast<double>(state.iterations());
}

BENCHMARK(decoding)->Name("decoding, upsample ratio")->Arg(1)->Arg(2)->MinTime(2);
BENCHMARK(receiving)->Name("receiving, queue to signal")->UseRealTime();

} // namespace

int main(int argc, char** argv)
{
    const QCoreApplication application(argc, argv);
    benchmark::Initialize(&argc, argv);
    benchmark::RunSpecifiedBenchmarks();
    return 0;
}
