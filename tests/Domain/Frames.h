// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QList>

#include <random>
#include <vector>

/// The radio microcontroller's frames as a test writes them: byte by byte, sharing nothing with the code under test.
namespace TestSupport
{

using Generator = std::mt19937;

[[nodiscard]] QByteArray frameOf(const QByteArray& payload);
/// A frame whose fields are what the arguments say, right or wrong.
[[nodiscard]] QByteArray frameOf(const QByteArray& payload, int length, int dataChecksum, char end = '\n');
/// The payload of one whole frame; aborts if it is none.
[[nodiscard]] QByteArray payloadOf(const QByteArray& frame);

[[nodiscard]] QByteArray randomBytes(Generator& generator, int count);
[[nodiscard]] int randomBetween(Generator& generator, int lowest, int highest);
[[nodiscard]] QList<QByteArray> randomPayloads(Generator& generator, int count);
/// The bytes in pieces of random sizes, 1 to `longest`.
[[nodiscard]] QList<QByteArray> randomPieces(Generator& generator, const QByteArray& bytes, int longest);

/// Each probability is for one byte.
struct DamageRates
{
    double altered = 0;
    double dropped = 0;
    double inserted = 0;
};

/// A stream of frames that has gone through a bad line, and which of them came through whole.
struct DamagedStream
{
    QByteArray bytes;
    QList<QByteArray> intactPayloads;
};

[[nodiscard]] DamagedStream damaged(Generator& generator, const QList<QByteArray>& payloads, const DamageRates& rates);

} // namespace TestSupport
