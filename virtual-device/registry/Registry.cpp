// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/registry/Registry.h"

#include "virtual-device/registry/ControlTable.h"
#include "virtual-device/registry/Values.h"

#include <QStringList>

#include <algorithm>

namespace VirtualDevice
{

namespace
{

QStringList choicesOf(const ControlSpec& spec)
{
    return fromView(spec.choices).split(u'|');
}

} // namespace

Registry::Registry(QObject* parent) : QObject(parent)
{
    for (const auto& spec : controlTable())
        values.insert(fromView(spec.name), parsed(spec, fromView(spec.initial)));
}

const ControlSpec* Registry::find(const QString& name)
{
    const auto table = controlTable();
    const auto found =
        std::find_if(table.begin(), table.end(), [&](const ControlSpec& spec) { return fromView(spec.name) == name; });
    return found == table.end() ? nullptr : &*found;
}

bool Registry::accepts(const ControlSpec& spec, const QJsonValue& value)
{
    switch (spec.type) {
    case ControlType::Integer:
        return isWholeNumberWithin(value, spec.minimum, spec.maximum);
    case ControlType::Boolean:
        return value.isBool();
    case ControlType::Choice:
        return value.isString() && choicesOf(spec).contains(value.toString());
    case ControlType::Text:
        return value.isString() && value.toString().size() <= spec.maximum;
    }
    return false;
}

QString Registry::allowed(const ControlSpec& spec)
{
    switch (spec.type) {
    case ControlType::Integer:
        return QStringLiteral("%1..%2 %3").arg(spec.minimum).arg(spec.maximum).arg(fromView(spec.unit)).trimmed();
    case ControlType::Boolean:
        return QStringLiteral("true or false");
    case ControlType::Choice:
        return fromView(spec.choices);
    case ControlType::Text:
        return QStringLiteral("text of at most %1 characters").arg(spec.maximum);
    }
    return {};
}

QJsonValue Registry::parsed(const ControlSpec& spec, const QString& word)
{
    bool isNumber = false;
    const qint64 number = word.toLongLong(&isNumber);
    switch (spec.type) {
    case ControlType::Integer:
        return isNumber ? QJsonValue(number) : QJsonValue();
    case ControlType::Boolean:
        if (word == u"true" || word == u"on" || word == u"1")
            return true;
        return word == u"false" || word == u"off" || word == u"0" ? QJsonValue(false) : QJsonValue();
    case ControlType::Choice:
    case ControlType::Text:
        return word;
    }
    return {};
}

QJsonValue Registry::value(const QString& name) const
{
    const std::lock_guard lock(mutex);
    const auto found = values.constFind(name);
    Q_ASSERT_X(found != values.constEnd(), "Registry::value", qPrintable(name));
    return found == values.constEnd() ? QJsonValue() : *found;
}

qint64 Registry::integer(const QString& name) const
{
    return value(name).toInteger();
}

bool Registry::flag(const QString& name) const
{
    return value(name).toBool();
}

QString Registry::text(const QString& name) const
{
    return value(name).toString();
}

std::optional<QString> Registry::set(const QString& name, const QJsonValue& value)
{
    const ControlSpec* spec = find(name);
    if (spec == nullptr)
        return QStringLiteral("unknown control \"%1\"").arg(name);
    if (spec->access == ControlAccess::Device)
        return QStringLiteral("control \"%1\" is read only").arg(name);
    if (!accepts(*spec, value))
        return QStringLiteral("control \"%1\" takes %2").arg(name, allowed(*spec));
    store(name, value);
    return std::nullopt;
}

void Registry::publish(const QString& name, const QJsonValue& value)
{
    Q_ASSERT_X(find(name) != nullptr, "Registry::publish", qPrintable(name));
    store(name, value);
}

void Registry::count(const QString& name, qint64 step)
{
    QJsonValue sum;
    {
        const std::lock_guard lock(mutex);
        sum = values.value(name).toInteger() + step;
        values.insert(name, sum);
    }
    emit changed(name, sum);
}

void Registry::store(const QString& name, const QJsonValue& value)
{
    {
        const std::lock_guard lock(mutex);
        auto& slot = values[name];
        if (slot == value)
            return;
        slot = value;
    }
    emit changed(name, value);
}

} // namespace VirtualDevice
