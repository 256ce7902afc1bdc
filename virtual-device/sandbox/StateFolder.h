// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QByteArray>
#include <QString>

#include <optional>

namespace VirtualDevice
{

/// Lays out the device's ordinary files below `folder`: mnt/boot, mnt/data, mnt/sysdata, etc/sounds/TestSound.wav and
/// the DSP's firmware image dsp.out. What is there already stays as it is. Returns what went wrong.
///
/// Threads: any, one at a time for a folder.
[[nodiscard]] std::optional<QString> prepareState(const QString& folder);

/// The test sound: a WAV file of one second of a tone that rises from 500 to 1500 Hz, 16 kHz, signed 16 bit
/// little-endian, mono. No part of it is like another, so that a buffer that is lost, repeated or swapped is seen.
[[nodiscard]] QByteArray testSound();

} // namespace VirtualDevice
