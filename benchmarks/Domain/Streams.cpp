// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "benchmarks/Domain/Streams.h"

#include "tests/Domain/Frames.h"

namespace Benchmarks
{

namespace
{

using TestSupport::frameOf;
using TestSupport::Generator;

template <int shortest, int longest> QByteArray frames(qsizetype size)
{
    Generator generator(1);
    QByteArray stream;
    while (stream.size() < size)
        stream +=
            frameOf(TestSupport::randomBytes(generator, TestSupport::randomBetween(generator, shortest, longest)));
    return stream;
}

template <int shortest, int longest> QByteArray onePercentAltered(qsizetype size)
{
    Generator generator(2);
    std::bernoulli_distribution altered(0.01);
    QByteArray stream = frames<shortest, longest>(size);
    for (char& byte : stream) {
        if (altered(generator))
            byte = static_cast<char>(generator());
    }
    return stream;
}

template <char value> QByteArray all(qsizetype size)
{
    return QByteArray(size, value);
}

QByteArray randomStream(qsizetype size)
{
    Generator generator(1);
    return TestSupport::randomBytes(generator, static_cast<int>(size));
}

/// Headers side by side, each of which claims the hundred bytes behind it.
QByteArray headersWithWrongDataSums(qsizetype size)
{
    const QByteArray header = frameOf({}, 100, 1).first(7);
    return header.repeated(size / header.size() + 1);
}

constexpr Content contents[] = {
    {"payloads of 1", false, frames<1, 1>},
    {"payloads of 10", false, frames<10, 10>},
    {"payloads of 46", false, frames<46, 46>},
    {"payloads of 100", false, frames<100, 100>},
    {"payloads of 1..100", true, frames<1, 100>},
    {"payloads of 1, 1 % altered", false, onePercentAltered<1, 1>},
    {"payloads of 10, 1 % altered", false, onePercentAltered<10, 10>},
    {"payloads of 46, 1 % altered", false, onePercentAltered<46, 46>},
    {"payloads of 100, 1 % altered", false, onePercentAltered<100, 100>},
    {"payloads of 1..100, 1 % altered", false, onePercentAltered<1, 100>},
    {"all zero", false, all<'\0'>},
    {"random", true, randomStream},
    {"all start bytes", true, all<'|'>},
    {"headers with wrong data sums", false, headersWithWrongDataSums},
};

} // namespace

std::span<const Content> allContents()
{
    return contents;
}

} // namespace Benchmarks
