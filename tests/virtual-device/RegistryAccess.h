// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/registry/Registry.h"

#include <QObject>
#include <QTest>

#include <memory>

namespace TestSupport
{

/// For tests of what follows a registry, which each of them makes anew; it outlives the members of the test.
class RegistryAccess : public QObject
{
protected:
    std::unique_ptr<VirtualDevice::Registry> registry;

    void set(const char* name, const QJsonValue& value) const
    {
        const auto wrong = registry->set(QString::fromLatin1(name), value);
        QVERIFY2(!wrong, qPrintable(wrong.value_or(QString())));
    }
    [[nodiscard]] qint64 number(const char* name) const { return registry->integer(QString::fromLatin1(name)); }
    [[nodiscard]] QString text(const char* name) const { return registry->text(QString::fromLatin1(name)); }
    [[nodiscard]] bool flag(const char* name) const { return registry->flag(QString::fromLatin1(name)); }
};

} // namespace TestSupport
