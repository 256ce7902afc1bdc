// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/DataSourceLayer.h"

#include "DataSource/src/FileStore.h"
#include "DataSource/src/KeyedFileStore.h"
#include "DataSource/src/XmlConfigurationData.h"

namespace DataSource
{

/// The order of the members is the order of construction.
class DataSourceLayer::PrivateData
{
public:
    explicit PrivateData(const QString& root)
        : defaultWirelessProtocols(root + QStringLiteral("mnt/boot/protocols/wireless")),
          defaultTetheredProtocols(root + QStringLiteral("mnt/boot/protocols/tethered")),
          defaultSounds(root + QStringLiteral("mnt/boot/sounds")),
          wirelessProtocols(root + QStringLiteral("mnt/data/protocols/wireless")),
          tetheredProtocols(root + QStringLiteral("mnt/data/protocols/tethered")),
          sounds(root + QStringLiteral("mnt/data/sounds")),
          configuration(root + QStringLiteral("mnt/sysdata/configuration")),
          data(root + QStringLiteral("mnt/data/data")),
          systemSounds(root + QStringLiteral("etc/sounds"))
    {
    }

    FileStore defaultWirelessProtocols;
    FileStore defaultTetheredProtocols;
    KeyedFileStore defaultSounds;
    FileStore wirelessProtocols;
    FileStore tetheredProtocols;
    KeyedFileStore sounds;
    XmlConfigurationData configuration;
    FileStore data;
    KeyedFileStore systemSounds;
};

DataSourceLayer::DataSourceLayer(const QString& rootPath) : d(std::make_unique<PrivateData>(rootPath)) {}

DataSourceLayer::~DataSourceLayer() = default;

AbstractFileStore& DataSourceLayer::defaultWirelessProtocolFileStore() const
{
    return d->defaultWirelessProtocols;
}

AbstractFileStore& DataSourceLayer::defaultTetheredProtocolFileStore() const
{
    return d->defaultTetheredProtocols;
}

AbstractKeyedFileStore& DataSourceLayer::defaultSoundFileStore() const
{
    return d->defaultSounds;
}

AbstractFileStore& DataSourceLayer::wirelessProtocolFileStore() const
{
    return d->wirelessProtocols;
}

AbstractFileStore& DataSourceLayer::tetheredProtocolFileStore() const
{
    return d->tetheredProtocols;
}

AbstractKeyedFileStore& DataSourceLayer::soundFileStore() const
{
    return d->sounds;
}

AbstractConfigurationData& DataSourceLayer::configurationData() const
{
    return d->configuration;
}

AbstractFileStore& DataSourceLayer::dataFileStore() const
{
    return d->data;
}

AbstractKeyedFileStore& DataSourceLayer::systemSoundFileStore() const
{
    return d->systemSounds;
}

} // namespace DataSource
