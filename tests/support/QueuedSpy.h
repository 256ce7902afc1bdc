// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QList>
#include <QObject>
#include <QVariant>

#include <type_traits>

namespace TestSupport
{

/// QSignalSpy for a signal of another thread: that class appends to its list in the emitting thread, while the test
/// reads it. Here the emissions travel to the test's thread as any receiver's do, and are there once its event loop
/// has run. One list of arguments an emission.
class QueuedSpy : public QList<QVariantList>
{
public:
    template <typename Class, typename... Parameters>
    QueuedSpy(const std::type_identity_t<Class>* sender, void (Class::*signal)(Parameters...))
    {
        QObject::connect(
            sender, signal, &context,
            [this](Parameters... values) { append(QVariantList{QVariant::fromValue(values)...}); },
            Qt::QueuedConnection);
    }
    QueuedSpy(const QueuedSpy&) = delete;
    QueuedSpy& operator=(const QueuedSpy&) = delete;

private:
    QObject context;
};

} // namespace TestSupport
