// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/control/LineSplitter.h"

#include <utility>

namespace VirtualDevice
{

std::optional<LineSplitter::Line> LineSplitter::next()
{
    const auto end = buffer.indexOf('\n', searched);
    if (end < 0) {
        if (buffer.size() > limit) {
            isSkipping = true;
            buffer.clear();
        }
        searched = buffer.size();
        return std::nullopt;
    }
    Line line{buffer.left(end), std::exchange(isSkipping, false) || end > limit};
    buffer.remove(0, end + 1);
    searched = 0;
    if (line.isTooLong)
        line.text.clear();
    if (line.text.endsWith('\r'))
        line.text.chop(1);
    return line;
}

} // namespace VirtualDevice
