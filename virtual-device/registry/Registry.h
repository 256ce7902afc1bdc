// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/registry/ControlSpec.h"

#include <QHash>
#include <QJsonValue>
#include <QObject>
#include <QString>

#include <mutex>
#include <optional>

namespace VirtualDevice
{

/// The state of the virtual device as a person and a test see it: the value of every control of `controlTable()`.
///
/// Threads: lives in the thread that makes it; the values may be read and written from any thread. `changed` is emitted
/// on the thread that made the change, after the lock is released; connect with the automatic or a queued connection.
class Registry : public QObject
{
    Q_OBJECT

public:
    explicit Registry(QObject* parent = nullptr);

    [[nodiscard]] static const ControlSpec* find(const QString& name);
    /// What a person may give for the control, for help and error texts: "-10..10 uV", "true or false", "on|off".
    [[nodiscard]] static QString allowed(const ControlSpec& spec);
    /// Whether the value has the control's type and lies in its range, whoever may set it.
    [[nodiscard]] static bool accepts(const ControlSpec& spec, const QJsonValue& value);
    /// A word from the command line as the control's JSON type; null when it is none.
    [[nodiscard]] static QJsonValue parsed(const ControlSpec& spec, const QString& word);

    /// Names that are not in the table are a programming error.
    [[nodiscard]] QJsonValue value(const QString& name) const;
    [[nodiscard]] qint64 integer(const QString& name) const;
    [[nodiscard]] bool flag(const QString& name) const;
    [[nodiscard]] QString text(const QString& name) const;

    /// The operator's door: checks name, access, type and range. Returns what is wrong, or nothing when the value is in
    /// force; a refused value changes nothing.
    [[nodiscard]] std::optional<QString> set(const QString& name, const QJsonValue& value);

    /// The device's door: what a model observes or changes by itself. The type must fit; no other check.
    void publish(const QString& name, const QJsonValue& value);
    /// Adds to a counter without losing a concurrent step.
    void count(const QString& name, qint64 step = 1);

signals:
    void changed(const QString& name, const QJsonValue& value);

private:
    void store(const QString& name, const QJsonValue& value);

    mutable std::mutex mutex;
    QHash<QString, QJsonValue> values;
};

} // namespace VirtualDevice
