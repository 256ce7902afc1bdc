// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "DataSource/src/AbstractConfigurationData.h"

#include <memory>

namespace DataSource
{

/// Name of the settings file's root element.
extern const QString startElementName;
/// Separates the members of list values. No setting is a list so far.
extern const QString arraySeparater;

/// The settings in one small XML file, which is read when the object is made and rewritten by every `setData`.
///
/// File: UTF-8, one element a line, four blanks of indentation.
///
///     <?xml version="1.0" encoding="UTF-8"?>
///     <Configuration_Data>
///         <Volume>3</Volume>
///         ...
///     </Configuration_Data>
///
/// The root holds exactly one text-only element for each stored key, in the order of the keys and named after them; a
/// value is its `QVariant::toString()`, and a key without a value is an empty element. Values read from the file are
/// strings; an empty element gives an empty string, which is a value.
///
/// Reading takes the elements in that order and does not search: a key whose turn finds another element stays without
/// a value, and the reader stays where it is for the next key.
///
/// The file is replaced as a whole: whenever the device loses power, the next start finds the old settings or the new
/// ones. Characters that XML cannot carry (control characters, halves of surrogate pairs) are left out of the file: one
/// of them would make all the settings unreadable. Carriage returns do not come back.
///
/// Errors are logged with fixed line numbers, and the program goes on with what it has in memory. Keys that name no
/// stored setting are ignored and have no value.
///
/// Threads: lives in one thread; nothing is locked. `setData` blocks for the write.
class XmlConfigurationData : public AbstractConfigurationData
{
    Q_OBJECT

public:
    explicit XmlConfigurationData(const QString& fileName);
    ~XmlConfigurationData() override;
    Q_DISABLE_COPY_MOVE(XmlConfigurationData)

    void setData(ConfigurationData key, const QVariant& value) override;
    QVariant data(ConfigurationData key) const override;
    QVariant data(ConfigurationData key, const QVariant& defaultValue) override;

private:
    class PrivateData;
    std::unique_ptr<PrivateData> d;
};

} // namespace DataSource
