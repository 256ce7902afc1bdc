// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "Domain/src/DomainLayer/FrameParser.h"
#include "tests/Domain/Frames.h"

#include <QList>

#include <algorithm>
#include <cstdint>

using Domain::FrameParser;

namespace
{

QList<QByteArray> payloadsIn(const QByteArray& stream, qsizetype pieceLength)
{
    QList<QByteArray> payloads;
    FrameParser parser;
    for (qsizetype done = 0; done < stream.size(); done += pieceLength) {
        parser.append(QByteArrayView(stream).sliced(done, std::min(pieceLength, stream.size() - done)));
        parser.parse([&](FrameParser::Outcome outcome, QByteArrayView payload) {
            if (outcome == FrameParser::Outcome::FrameReceived)
                payloads.append(payload.toByteArray());
        });
    }
    return payloads;
}

void require(bool condition)
{
    if (!condition)
        qFatal("The parser broke a promise");
}

} // namespace

/// The first byte is the size of the pieces in which the rest arrives. Whatever that is, what comes out does not depend
/// on the pieces, every payload's frame is in the input, and a good frame behind it is found.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* bytes, std::size_t size)
{
    if (size == 0)
        return 0;
    const QByteArray input(reinterpret_cast<const char*>(bytes + 1), static_cast<qsizetype>(size - 1));
    // Filled with what no claim of a frame can be pending for.
    const QByteArray stream = input + QByteArray(120, '\0') + TestSupport::frameOf("good");
    const auto payloads = payloadsIn(stream, std::max<qsizetype>(1, bytes[0]));
    require(payloads == payloadsIn(stream, stream.size()));
    require(!payloads.isEmpty() && payloads.last() == "good");
    require(std::all_of(payloads.begin(), payloads.end(), [&](const QByteArray& payload) {
        return payload.size() <= 100 && stream.contains(TestSupport::frameOf(payload));
    }));
    return 0;
}
