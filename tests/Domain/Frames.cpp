// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/Domain/Frames.h"

#include <QtGlobal>

#include <algorithm>
#include <optional>

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

/// An event of each byte with the same probability. Draws how many bytes go by until the next, not every byte's fate:
/// the streams have millions of them.
class RareEvent
{
public:
    RareEvent(Generator& source, double probability) : generator(source)
    {
        if (probability <= 0)
            return;
        bytesBetween.emplace(probability);
        bytesLeft = (*bytesBetween)(generator);
    }

    bool happens()
    {
        if (!bytesBetween || bytesLeft-- > 0)
            return false;
        bytesLeft = (*bytesBetween)(generator);
        return true;
    }

private:
    Generator& generator;
    std::optional<std::geometric_distribution<int>> bytesBetween; ///< empty: never
    int bytesLeft = 0;
};

/// Decides for each byte how the line treats it.
class BadLine
{
public:
    BadLine(Generator& source, const DamageRates& rates)
        : generator(source),
          altered(source, rates.altered),
          dropped(source, rates.dropped),
          inserted(source, rates.inserted)
    {
    }

    /// Returns whether the byte went through alone and unchanged.
    bool transmit(char byte, QByteArray& received)
    {
        bool whole = true;
        if (inserted.happens()) {
            received.append(static_cast<char>(generator()));
            whole = false;
        }
        if (dropped.happens())
            return false;
        if (altered.happens()) {
            byte = static_cast<char>(byte ^ randomBetween(generator, 1, 255));
            whole = false;
        }
        received.append(byte);
        return whole;
    }

private:
    Generator& generator;
    RareEvent altered;
    RareEvent dropped;
    RareEvent inserted;
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
