// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QtGlobal>

namespace DataSource
{

class AbstractConfigurationData;
class AbstractFileStore;
class AbstractKeyedFileStore;

/// The door to everything that the device keeps on its file systems. The stores belong to the layer; each accessor
/// returns the same object on every call, and no one else deletes it.
///
/// Threads: made and used in the GUI thread.
class AbstractDataSourceLayer
{
public:
    AbstractDataSourceLayer() = default;
    virtual ~AbstractDataSourceLayer() = default;
    Q_DISABLE_COPY_MOVE(AbstractDataSourceLayer)

    virtual AbstractFileStore& defaultWirelessProtocolFileStore() const = 0;
    virtual AbstractFileStore& defaultTetheredProtocolFileStore() const = 0;
    virtual AbstractKeyedFileStore& defaultSoundFileStore() const = 0;
    virtual AbstractFileStore& wirelessProtocolFileStore() const = 0;
    virtual AbstractFileStore& tetheredProtocolFileStore() const = 0;
    virtual AbstractKeyedFileStore& soundFileStore() const = 0;
    virtual AbstractConfigurationData& configurationData() const = 0;
    virtual AbstractFileStore& dataFileStore() const = 0;
    virtual AbstractKeyedFileStore& systemSoundFileStore() const = 0;
};

} // namespace DataSource
