// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QObject>
#include <QVariant>

namespace DataSource
{

/// The device's persistent user settings, read and written by key. There are no built-in defaults: a setting that was
/// never stored has no value (an invalid `QVariant`), and each caller brings its own default.
///
/// Threads: one thread at a time, the one that the implementation lives in; nothing is locked.
class AbstractConfigurationData : public QObject
{
    Q_OBJECT

public:
    /// The stored settings are the values from `First` up to but not including `Last`. The enumerators' names are the
    /// element names of the settings file, which is why `Volume` stands before its alias `First`: the meta-object
    /// system names a value after the first enumerator that has it.
    enum ConfigurationData
    {
        Invalid = -1,
        Volume = 0,
        First = 0,
        TimeOffset = 1,
        BacklightBrightness = 2,
        BacklightTimeout = 3,
        PowerDownTimeout = 4,
        TimeFormat = 5,
        DateFormat = 6,
        ButtonLock = 7,
        DefaultChannels = 8,
        KeepAlive = 9,
        UsbChargeEnable = 10,
        Last = 11,
    };
    Q_ENUM(ConfigurationData)

    AbstractConfigurationData() = default;
    ~AbstractConfigurationData() override = default;
    Q_DISABLE_COPY_MOVE(AbstractConfigurationData)

    /// Stores `value`, whether or not it differs from the stored one. `key` must name a stored setting.
    virtual void setData(ConfigurationData key, const QVariant& value) = 0;
    /// The stored value; invalid if there is none.
    virtual QVariant data(ConfigurationData key) const = 0;
    /// The stored value; if there is none, stores `defaultValue` and returns it.
    virtual QVariant data(ConfigurationData key, const QVariant& defaultValue) = 0;

signals:
    void configurationDataChanged();
};

} // namespace DataSource
