// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QList>
#include <QString>
#include <QStringList>

class QObject;

namespace TestSupport
{

/// Keeps the order in which objects are made and destroyed, through the hooks that Qt offers to tools. One at a time;
/// objects of all threads are seen.
class ObjectRecorder
{
public:
    ObjectRecorder();
    ~ObjectRecorder();
    ObjectRecorder(const ObjectRecorder&) = delete;
    ObjectRecorder& operator=(const ObjectRecorder&) = delete;

    /// The objects made since then that still live, in the order of their making.
    [[nodiscard]] QList<QObject*> living() const;
    /// From here on the destruction of these objects is kept: `names` runs parallel to them.
    void watch(const QList<QObject*>& objects, const QStringList& names);
    /// The names of the watched objects in the order of their destruction.
    [[nodiscard]] QStringList destroyed() const;
};

} // namespace TestSupport
