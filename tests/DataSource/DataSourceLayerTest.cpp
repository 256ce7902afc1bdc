// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/DataSourceLayer.h"

#include "DataSource/src/AbstractConfigurationData.h"
#include "DataSource/src/AbstractFileStore.h"
#include "DataSource/src/AbstractKeyedFileStore.h"
#include "tests/support/DirectoryEvents.h"
#include "tests/support/LoggedTexts.h"

#include <QDir>
#include <QTemporaryDir>
#include <QTest>

#include <sys/inotify.h>

#include <memory>

using DataSource::AbstractConfigurationData;
using DataSource::DataSourceLayer;
using TestSupport::LogCapture;
using TestSupport::loggedTexts;

namespace
{

const QStringList directories{"mnt/boot/protocols/wireless",
                              "mnt/boot/protocols/tethered",
                              "mnt/boot/sounds",
                              "mnt/data/protocols/wireless",
                              "mnt/data/protocols/tethered",
                              "mnt/data/sounds",
                              "mnt/data/data",
                              "etc/sounds"};
const QString noConfiguration = "DataSource/src/XmlConfigurationData.cpp, 60, Unable to open configuration file";

} // namespace

class DataSourceLayerTest : public QObject
{
    Q_OBJECT

private slots:
    void createsTheStoreDirectoriesUnderAnEmptyRoot();
    void doesNotCreateTheDirectoryOfTheSettings();
    void rootWithoutSlashIsPutBeforeThePathsAsItIs();
    void storesAreMadeInTheOrderOfTheAccessors();
    void storesGoInReverseOrder();
    void everyAccessorGivesItsStore();
    void accessorsReturnTheSameObjectEveryTime();
    void settingsAreKeptInTheFileUnderTheRoot();
    void missingSettingsDirectoryIsLoggedAndTheValueKept();
    void rootThatCannotBeWrittenGivesEmptyStores();
    void theDevicesOwnRoot();
};

void DataSourceLayerTest::createsTheStoreDirectoriesUnderAnEmptyRoot()
{
    const QTemporaryDir root;
    LogCapture log;
    const DataSourceLayer layer(root.path() + "/");
    for (const auto& directory : directories)
        QVERIFY2(QFileInfo(root.filePath(directory)).isDir(), qPrintable(directory));
    QCOMPARE(loggedTexts(log), QStringList{noConfiguration});
}

void DataSourceLayerTest::doesNotCreateTheDirectoryOfTheSettings()
{
    const QTemporaryDir root;
    const DataSourceLayer layer(root.path() + "/");
    QVERIFY(!QFile::exists(root.filePath("mnt/sysdata")));
}

void DataSourceLayerTest::rootWithoutSlashIsPutBeforeThePathsAsItIs()
{
    const QTemporaryDir root;
    const DataSourceLayer layer(root.path() + "/x");
    QVERIFY(QFileInfo(root.filePath("xmnt/boot/protocols/wireless")).isDir());
    QVERIFY(QFileInfo(root.filePath("xetc/sounds")).isDir());
    QVERIFY(!QFile::exists(root.filePath("x")));
}

void DataSourceLayerTest::storesAreMadeInTheOrderOfTheAccessors()
{
    const QTemporaryDir root;
    for (const char* const parent : {"mnt/boot/protocols", "mnt/data/protocols", "mnt/sysdata", "etc"})
        QVERIFY(QDir(root.path()).mkpath(parent));
    QFile configuration(root.filePath("mnt/sysdata/configuration"));
    QVERIFY(configuration.open(QIODevice::WriteOnly));
    configuration.close();
    QStringList expected;
    QStringList parents;
    for (const auto& directory : directories) {
        expected.append(root.filePath(directory));
        parents.append(QFileInfo(root.filePath(directory)).path());
    }
    expected.insert(6, configuration.fileName());
    parents.append(root.filePath("mnt/sysdata"));
    TestSupport::DirectoryEvents events(parents, IN_CREATE | IN_OPEN);
    const DataSourceLayer layer(root.path() + "/");
    QStringList seen;
    for (const auto& event : events.take()) {
        const bool isOpened = (event.mask & IN_OPEN) != 0 && event.path == configuration.fileName();
        if (isOpened || (event.mask & IN_CREATE) != 0)
            seen.append(event.path);
    }
    seen.removeDuplicates();
    QCOMPARE(seen, expected);
}

void DataSourceLayerTest::storesGoInReverseOrder()
{
    const QTemporaryDir root;
    auto layer = std::make_unique<DataSourceLayer>(root.path() + "/");
    // Those that can be seen to go; the rest are stores without a life of their own.
    const QList<std::pair<QString, QObject*>> stores{
        {"default wireless protocols", &layer->defaultWirelessProtocolFileStore()},
        {"default tethered protocols", &layer->defaultTetheredProtocolFileStore()},
        {"wireless protocols", &layer->wirelessProtocolFileStore()},
        {"tethered protocols", &layer->tetheredProtocolFileStore()},
        {"configuration", &layer->configurationData()},
        {"data", &layer->dataFileStore()}};
    QStringList gone;
    QStringList expected;
    for (const auto& [name, store] : stores) {
        connect(store, &QObject::destroyed, this, [&gone, name = name] { gone.append(name); });
        expected.prepend(name);
    }
    layer.reset();
    QCOMPARE(gone, expected);
}

void DataSourceLayerTest::everyAccessorGivesItsStore()
{
    const QTemporaryDir root;
    const DataSourceLayer layer(root.path() + "/");
    const QStringList paths{layer.defaultWirelessProtocolFileStore().createFile("f").absoluteFilePath(),
                            layer.defaultTetheredProtocolFileStore().createFile("f").absoluteFilePath(),
                            layer.defaultSoundFileStore().createFile("f").absoluteFilePath(),
                            layer.wirelessProtocolFileStore().createFile("f").absoluteFilePath(),
                            layer.tetheredProtocolFileStore().createFile("f").absoluteFilePath(),
                            layer.soundFileStore().createFile("f").absoluteFilePath(),
                            layer.dataFileStore().createFile("f").absoluteFilePath(),
                            layer.systemSoundFileStore().createFile("f").absoluteFilePath()};
    QStringList expected;
    for (const auto& directory : directories)
        expected.append(root.filePath(directory + "/f"));
    QCOMPARE(paths, expected);
}

void DataSourceLayerTest::accessorsReturnTheSameObjectEveryTime()
{
    const QTemporaryDir root;
    const DataSourceLayer layer(root.path() + "/");
    QCOMPARE(&layer.defaultWirelessProtocolFileStore(), &layer.defaultWirelessProtocolFileStore());
    QCOMPARE(&layer.defaultTetheredProtocolFileStore(), &layer.defaultTetheredProtocolFileStore());
    QCOMPARE(&layer.defaultSoundFileStore(), &layer.defaultSoundFileStore());
    QCOMPARE(&layer.wirelessProtocolFileStore(), &layer.wirelessProtocolFileStore());
    QCOMPARE(&layer.tetheredProtocolFileStore(), &layer.tetheredProtocolFileStore());
    QCOMPARE(&layer.soundFileStore(), &layer.soundFileStore());
    QCOMPARE(&layer.configurationData(), &layer.configurationData());
    QCOMPARE(&layer.dataFileStore(), &layer.dataFileStore());
    QCOMPARE(&layer.systemSoundFileStore(), &layer.systemSoundFileStore());
}

void DataSourceLayerTest::settingsAreKeptInTheFileUnderTheRoot()
{
    const QTemporaryDir root;
    QVERIFY(QDir(root.path()).mkpath("mnt/sysdata"));
    const DataSourceLayer layer(root.path() + "/");
    layer.configurationData().setData(AbstractConfigurationData::Volume, 4);
    QVERIFY(QFileInfo(root.filePath("mnt/sysdata/configuration")).isFile());
    const DataSourceLayer restarted(root.path() + "/");
    QCOMPARE(restarted.configurationData().data(AbstractConfigurationData::Volume).toString(), "4");
}

void DataSourceLayerTest::missingSettingsDirectoryIsLoggedAndTheValueKept()
{
    const QTemporaryDir root;
    LogCapture log;
    const DataSourceLayer layer(root.path() + "/");
    QCOMPARE(layer.configurationData().data(AbstractConfigurationData::Volume, 3), QVariant(3));
    QCOMPARE(loggedTexts(log),
             (QStringList{noConfiguration, "DataSource/src/XmlConfigurationData.cpp, 107, Unable to open XML file for "
                                           "writing: No such file or directory"}));
    QCOMPARE(layer.configurationData().data(AbstractConfigurationData::Volume), QVariant(3));
}

void DataSourceLayerTest::rootThatCannotBeWrittenGivesEmptyStores()
{
    LogCapture log;
    const DataSourceLayer layer("/proc/");
    QVERIFY(layer.dataFileStore().fileAt(0).fileName().isEmpty());
    QCOMPARE(layer.systemSoundFileStore().bytesUsed(), 0);
    QCOMPARE(loggedTexts(log), QStringList{noConfiguration});
}

void DataSourceLayerTest::theDevicesOwnRoot()
{
    const DataSourceLayer layer("/");
    QVERIFY(QFileInfo("/mnt/boot/protocols/wireless").isDir());
    QCOMPARE(layer.systemSoundFileStore().file("TestSound.wav").absoluteFilePath(), "/etc/sounds/TestSound.wav");
}

QTEST_GUILESS_MAIN(DataSourceLayerTest)
#include "DataSourceLayerTest.moc"
