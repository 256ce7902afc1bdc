// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/FrameParser.h"
#include "Domain/src/DomainLayer/SerialProtocol.h"
#include "benchmarks/Domain/Streams.h"

#include <QCoreApplication>
#include <QIODevice>

#include <benchmark/benchmark.h>

#include <algorithm>
#include <cstring>
#include <ctime>
#include <string>

/// Throughput of the frame parser in bytes of the line a second, beside a one-pass sum over the same bytes in the same
/// run: "of_sum" is the ratio, 1 for a parser that costs no more than adding the bytes up.
/// "parser" rows are the parser alone, "link" rows the object that reads a device and signals messages. The program
/// exists twice: with the log stubbed, and with the system's own.
namespace
{

using Benchmarks::Content;
using Domain::FrameParser;

constexpr qsizetype chunk = 46;
constexpr qsizetype page = 4096;
constexpr qsizetype megabytes8 = 8 * 1024 * 1024;

unsigned onePassSum(const QByteArray& bytes)
{
    unsigned sum = 0;
    for (const char byte : bytes)
        sum += static_cast<uchar>(byte);
    return sum;
}

/// Processor time, as the rows' own rates are: other programs must not count.
double processorSeconds()
{
    timespec used{};
    ::clock_gettime(CLOCK_THREAD_CPUTIME_ID, &used);
    return static_cast<double>(used.tv_sec) + static_cast<double>(used.tv_nsec) * 1e-9;
}

/// Bytes a second.
double sumRate(const QByteArray& stream)
{
    constexpr double span = 0.1;
    const auto start = processorSeconds();
    double bytes = 0;
    while (processorSeconds() - start < span) {
        benchmark::DoNotOptimize(onePassSum(stream));
        bytes += static_cast<double>(stream.size());
    }
    return bytes / (processorSeconds() - start);
}

/// A line whose driver always has the next piece.
class PieceDevice : public QIODevice
{
public:
    explicit PieceDevice(const QByteArray& bytes, qsizetype length) : stream(bytes), pieceLength(length) {}

    bool offerNext()
    {
        position += offered;
        offered = std::min(pieceLength, stream.size() - position);
        left = offered;
        return offered > 0;
    }
    void rewind() { position = offered = 0; }
    [[nodiscard]] bool isSequential() const override { return true; }
    [[nodiscard]] qint64 bytesAvailable() const override { return left + QIODevice::bytesAvailable(); }
    bool open(OpenMode mode) override { return QIODevice::open(mode | Unbuffered); }

protected:
    qint64 readData(char* destination, qint64 maximum) override
    {
        const auto count = std::min(maximum, static_cast<qint64>(left));
        std::memcpy(destination, stream.constData() + position + offered - left, static_cast<std::size_t>(count));
        left -= count;
        return count;
    }
    qint64 writeData(const char* /*bytes*/, qint64 count) override { return count; }

private:
    const QByteArray& stream;
    const qsizetype pieceLength;
    qsizetype position = 0;
    qsizetype offered = 0;
    qsizetype left = 0;
};

void report(benchmark::State& state, const QByteArray& stream, qint64 frames)
{
    const auto bytes = static_cast<double>(state.iterations()) * static_cast<double>(stream.size());
    state.SetBytesProcessed(static_cast<int64_t>(bytes));
    const auto sum = sumRate(stream);
    state.counters["sum"] = benchmark::Counter(sum, benchmark::Counter::kDefaults, benchmark::Counter::kIs1024);
    state.counters["of_sum"] = benchmark::Counter(bytes / sum, benchmark::Counter::kIsRate);
    state.counters["frames"] = static_cast<double>(frames) / static_cast<double>(state.iterations());
}

void parserAlone(benchmark::State& state, const Content& content, qsizetype size, qsizetype read)
{
    const QByteArray stream = content.stream(size);
    FrameParser parser;
    qint64 frames = 0;
    for ([[maybe_unused]] auto iteration : state) {
        for (qsizetype done = 0; done < stream.size(); done += read) {
            parser.append(QByteArrayView(stream).sliced(done, std::min(read, stream.size() - done)));
            parser.parse([&](FrameParser::Outcome outcome, QByteArrayView /*payload*/) {
                frames += outcome == FrameParser::Outcome::FrameReceived;
            });
        }
    }
    report(state, stream, frames);
}

void wholeLink(benchmark::State& state, const Content& content, qsizetype size, qsizetype read)
{
    const QByteArray stream = content.stream(size);
    PieceDevice device(stream, read);
    Domain::SerialProtocol protocol(device);
    qint64 frames = 0;
    QObject::connect(&protocol, &Domain::SerialProtocol::messageReceived, &protocol, [&] { ++frames; });
    for ([[maybe_unused]] auto iteration : state) {
        device.rewind();
        while (device.offerNext())
            protocol.processData();
    }
    report(state, stream, frames);
}

void addRows(const Content& content, qsizetype size, qsizetype read)
{
    const auto name = std::string(content.name) + ", reads of " + std::to_string(read);
    benchmark::RegisterBenchmark(("parser, " + name).c_str(), parserAlone, content, size, read);
    benchmark::RegisterBenchmark(("link, " + name).c_str(), wholeLink, content, size, read);
}

void addRows(qsizetype size)
{
    for (const auto& content : Benchmarks::allContents()) {
        addRows(content, size, chunk);
        addRows(content, size, page);
        if (content.isReadAtOnceToo && size >= megabytes8)
            addRows(content, size, size);
    }
}

} // namespace

int main(int argc, char** argv)
{
    const QCoreApplication application(argc, argv);
    benchmark::Initialize(&argc, argv);
    addRows(BENCHMARK_STREAM_SIZE);
    benchmark::RunSpecifiedBenchmarks();
    return 0;
}
