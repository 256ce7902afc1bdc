// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QByteArrayView>
#include <QList>

#include <optional>

namespace VirtualDevice
{

/// Cuts the bytes of the radio's serial line into frames (layout: RadioFrame.h).
///
/// What is no frame is skipped byte by byte up to the next start byte that begins one; each stretch of it is reported
/// once, with what was wrong at its beginning. Holds at most one unfinished frame. One thread.
class RadioFrameReader
{
public:
    enum class Finding
    {
        Frame,
        StrayBytes, ///< something else where a start byte was due
        BadHeaderChecksum,
        LengthOverLimit,
        BadDataChecksum,
        BadEndByte,
    };

    struct Event
    {
        Finding finding = Finding::Frame;
        QByteArray payload; ///< of a frame
        int length = 0;     ///< that the header claims

        bool operator==(const Event&) const = default;
    };

    [[nodiscard]] QList<Event> feed(QByteArrayView bytes);
    /// Forgets an unfinished frame.
    void clear();

private:
    [[nodiscard]] std::optional<Event> next();
    [[nodiscard]] std::optional<Event> examined();
    void skip(qsizetype count) { cursor += count; }

    QByteArray buffer;
    qsizetype cursor = 0;
    bool inSync = true; ///< false while the bytes after a finding are skipped
};

} // namespace VirtualDevice
