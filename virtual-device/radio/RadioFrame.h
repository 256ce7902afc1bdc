// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QByteArrayView>

namespace VirtualDevice
{

/// One message on the radio's serial line. Numbers are big-endian, sums are over unsigned bytes, modulo 65536.
///
/// | Offset | Size | Field                                   |
/// |--------|------|-----------------------------------------|
/// | 0      | 1    | 0x7C                                    |
/// | 1      | 2    | n, the payload's length, at most 100    |
/// | 3      | 2    | sum of the payload                      |
/// | 5      | 2    | sum of the five bytes before            |
/// | 7      | n    | payload, a code byte and its data       |
/// | 7 + n  | 1    | 0x0A                                    |
///
/// No state; any thread. The length is not checked here, so that tests can build what a healthy peer would not send.
[[nodiscard]] QByteArray radioFrame(QByteArrayView payload);

/// The 16-bit sum that both checks of a frame use.
[[nodiscard]] quint16 radioChecksum(QByteArrayView bytes);

} // namespace VirtualDevice
