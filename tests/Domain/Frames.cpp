// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/Domain/Frames.h"

#include <QtGlobal>

#include <algorithm>

namespace TestSupport
{

namespace
{

int sumOf(const QByteArray& bytes)
{
    int sum = 0;
    for (const char byte : bytes)
        sum += static_cast<unsigned char>(byte);
    return sum % 65536;
}

QByteArray twoBytes(int value)
{
    QByteArray bytes(2, '\0');
    bytes[0] = static_cast<char>(value / 256);
    bytes[1] = static_cast<char>(value % 256);
    return bytes;
}

} // namespace

QByteArray frameOf(const QByteArray& payload)
{
    return frameOf(payload, static_cast<int>(payload.size()), sumOf(payload));
}

QByteArray frameOf(const QByteArray& payload, int length, int dataChecksum, char end)
{
    const QByteArray header = "|" + twoBytes(length) + twoBytes(dataChecksum);
    return header + twoBytes(sumOf(header)) + payload + end;
}

QByteArray payloadOf(const QByteArray& frame)
{
    const QByteArray payload = frame.mid(7, frame.size() - 8);
    if (frame != frameOf(payload))
        qFatal("Not a frame: %s", frame.toHex().constData());
    return payload;
}

QByteArray randomBytes(Generator& generator, int count)
{
    QByteArray bytes(count, '\0');
    std::generate(bytes.begin(), bytes.end(), [&] { return static_cast<char>(generator()); });
    return bytes;
}

int randomBetween(Generator& generator, int lowest, int highest)
{
    return std::uniform_int_distribution<int>(lowest, highest)(generator);
}

QList<QByteArray> randomPayloads(Generator& generator, int count)
{
    QList<QByteArray> payloads;
    for (int index = 0; index < count; ++index)
        payloads.append(randomBytes(generator, randomBetween(generator, 0, 100)));
    return payloads;
}

QList<QByteArray> randomPieces(Generator& generator, const QByteArray& bytes, int longest)
{
    QList<QByteArray> pieces;
    for (qsizetype done = 0; done < bytes.size(); done += pieces.last().size())
        pieces.append(bytes.mid(done, randomBetween(generator, 1, longest)));
    return pieces;
}

namespace
{

/// Decides for each byte how the line treats it.
class BadLine
{
public:
    BadLine(Generator& source, const DamageRates& rates)
        : generator(source), altered(rates.altered), dropped(rates.dropped), inserted(rates.inserted)
    {
    }

    /// Returns whether the byte went through alone and unchanged.
    bool transmit(char byte, QByteArray& received)
    {
        bool whole = true;
        if (inserted(generator)) {
            received.append(static_cast<char>(generator()));
            whole = false;
        }
        if (dropped(generator))
            return false;
        if (altered(generator)) {
            byte = static_cast<char>(byte ^ randomBetween(generator, 1, 255));
            whole = false;
        }
        received.append(byte);
        return whole;
    }

private:
    Generator& generator;
    std::bernoulli_distribution altered;
    std::bernoulli_distribution dropped;
    std::bernoulli_distribution inserted;
};

} // namespace

DamagedStream damaged(Generator& generator, const QList<QByteArray>& payloads, const DamageRates& rates)
{
    BadLine line(generator, rates);
    DamagedStream stream;
    for (const auto& payload : payloads) {
        bool intact = true;
        for (const char byte : frameOf(payload))
            intact &= line.transmit(byte, stream.bytes);
        if (intact)
            stream.intactPayloads.append(payload);
    }
    return stream;
}

} // namespace TestSupport
