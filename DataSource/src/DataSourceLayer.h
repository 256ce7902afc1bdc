// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "DataSource/src/AbstractDataSourceLayer.h"

#include <QString>

#include <memory>

namespace DataSource
{

/// The device's stores under one root, made in this order and destroyed in the reverse:
///
/// | Store                     | Under the root             | Holds                           |
/// |---------------------------|----------------------------|---------------------------------|
/// | default wireless protocol | mnt/boot/protocols/wireless | factory protocols              |
/// | default tethered protocol | mnt/boot/protocols/tethered | factory protocols              |
/// | default sounds            | mnt/boot/sounds             | factory sounds                 |
/// | wireless protocol         | mnt/data/protocols/wireless | the user's protocols           |
/// | tethered protocol         | mnt/data/protocols/tethered | the user's protocols           |
/// | sounds                    | mnt/data/sounds             | the user's sounds              |
/// | configuration             | mnt/sysdata/configuration   | the settings: the file itself  |
/// | data                      | mnt/data/data               | recordings                     |
/// | system sounds             | etc/sounds                  | sounds of the system image     |
///
/// The stores create their directories. Nothing creates mnt/sysdata: it is a partition of the device.
///
/// Threads: the GUI thread. Must outlive whoever keeps a reference to one of the stores.
class DataSourceLayer : public AbstractDataSourceLayer
{
public:
    /// `rootPath` is put before the paths as it is: it ends with a slash.
    explicit DataSourceLayer(const QString& rootPath);
    ~DataSourceLayer() override;
    Q_DISABLE_COPY_MOVE(DataSourceLayer)

    AbstractFileStore& defaultWirelessProtocolFileStore() const override;
    AbstractFileStore& defaultTetheredProtocolFileStore() const override;
    AbstractKeyedFileStore& defaultSoundFileStore() const override;
    AbstractFileStore& wirelessProtocolFileStore() const override;
    AbstractFileStore& tetheredProtocolFileStore() const override;
    AbstractKeyedFileStore& soundFileStore() const override;
    AbstractConfigurationData& configurationData() const override;
    AbstractFileStore& dataFileStore() const override;
    AbstractKeyedFileStore& systemSoundFileStore() const override;

private:
    class PrivateData;
    std::unique_ptr<PrivateData> d;
};

} // namespace DataSource
