// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>

#include <optional>

namespace VirtualDevice
{

/// Cuts a byte stream into lines that end in a line feed (a carriage return before it is dropped), however the bytes
/// arrive. A line longer than the limit is not kept: it comes out once, marked, when its end arrives, so that its
/// sender can be told and nothing of it is mistaken for a message.
///
/// Threads: a value; one owner, any thread.
class LineSplitter
{
public:
    struct Line
    {
        QByteArray text; ///< without its end
        bool isTooLong = false;
    };

    explicit LineSplitter(qsizetype longestLine) : limit(longestLine) {}

    void append(const QByteArray& bytes) { buffer.append(bytes); }
    /// The next complete line; nothing while its end has not arrived.
    [[nodiscard]] std::optional<Line> next();

private:
    qsizetype limit;
    QByteArray buffer;
    qsizetype searched = 0;
    bool isSkipping = false;
};

} // namespace VirtualDevice
