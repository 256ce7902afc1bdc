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

QByteArray repeated(const QByteArray& piece, qsizetype size)
{
    return piece.repeated(size / piece.size() + 1);
}

QByteArray framesOf(Generator& generator, int shortest, int longest, qsizetype size)
{
    QByteArray stream;
    while (stream.size() < size)
        stream +=
            frameOf(TestSupport::randomBytes(generator, TestSupport::randomBetween(generator, shortest, longest)));
    return stream;
}

QByteArray onePercentAltered(Generator& generator, QByteArray stream)
{
    std::bernoulli_distribution altered(0.01);
    for (char& byte : stream) {
        if (altered(generator))
            byte = static_cast<char>(generator());
    }
    return stream;
}

} // namespace

QByteArray makeStream(Content content, qsizetype size)
{
    Generator generator(1);
    switch (content) {
    case Content::Payloads1:
        return framesOf(generator, 1, 1, size);
    case Content::Payloads10:
        return framesOf(generator, 10, 10, size);
    case Content::Payloads46:
        return framesOf(generator, 46, 46, size);
    case Content::Payloads100:
        return framesOf(generator, 100, 100, size);
    case Content::PayloadsMixed:
        return framesOf(generator, 1, 100, size);
    case Content::PayloadsMixedAltered:
        return onePercentAltered(generator, framesOf(generator, 1, 100, size));
    case Content::Zeros:
        return QByteArray(size, '\0');
    case Content::Random:
        return TestSupport::randomBytes(generator, static_cast<int>(size));
    case Content::StartBytes:
        return QByteArray(size, '|');
    case Content::WrongDataChecksums:
        break;
    }
    // Headers side by side, each of which claims the hundred bytes behind it.
    return repeated(frameOf({}, 100, 1).first(7), size);
}

const char* nameOf(Content content)
{
    switch (content) {
    case Content::Payloads1:
        return "payloads of 1";
    case Content::Payloads10:
        return "payloads of 10";
    case Content::Payloads46:
        return "payloads of 46";
    case Content::Payloads100:
        return "payloads of 100";
    case Content::PayloadsMixed:
        return "payloads of 1..100";
    case Content::PayloadsMixedAltered:
        return "payloads of 1..100, 1 % altered";
    case Content::Zeros:
        return "all zero";
    case Content::Random:
        return "random";
    case Content::StartBytes:
        return "all start bytes";
    case Content::WrongDataChecksums:
        break;
    }
    return "headers with wrong data sums";
}

} // namespace Benchmarks
