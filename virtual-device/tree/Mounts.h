// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QString>
#include <QStringList>

namespace VirtualDevice
{

// Threads: any; the calls wait for the kernel, and for `fusermount3`.

/// Mount points at or below `folder`, however that is spelt, in this process's mount namespace, deepest first.
[[nodiscard]] QStringList mountedBelow(const QString& folder);

/// Detaches one FUSE mount point, also one whose server is dead or that is in use. An ordinary user's goes through
/// `fusermount3`.
void detachMount(const QString& mountPoint);

/// Detaches every mount below `folder`.
void unmountBelow(const QString& folder);

} // namespace VirtualDevice
