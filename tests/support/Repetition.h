// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>

namespace TestSupport
{

/// Whether any of the buffers of that size that the bytes consist of stands in them a second time, be it between two
/// buffers. In a sound without one, every buffer that is lost, repeated or swapped shows.
inline bool hasRepeatedBuffer(const QByteArray& bytes, qsizetype bufferSize)
{
    for (qsizetype start = 0; start < bytes.size(); start += bufferSize)
        if (bytes.count(bytes.mid(start, bufferSize)) != 1)
            return true;
    return false;
}

} // namespace TestSupport
