// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/XmlConfigurationData.h"

#include <QDir>
#include <QFile>
#include <QTemporaryDir>

#include <cstdint>
#include <cstdlib>

namespace
{

using DataSource::XmlConfigurationData;

constexpr auto firstKey = XmlConfigurationData::Volume;

/// Every rewriting waits for its disk, unless there is none.
QString inMemory()
{
    const QString folder = QStringLiteral("/dev/shm");
    return (QFile::exists(folder) ? folder : QDir::tempPath()) + QStringLiteral("/configuration-XXXXXX");
}

void write(const QString& path, const QByteArray& content)
{
    QFile file(path);
    if (!file.open(QIODevice::WriteOnly) || file.write(content) != content.size())
        std::abort();
}

/// Carriage returns do not come back.
QByteArray read(const QString& path)
{
    QFile file(path);
    if (!file.open(QIODevice::ReadOnly))
        std::abort();
    return file.readAll().replace("\r", "");
}

/// Loads the settings and has them written again as they are.
void rewrite(const QString& path)
{
    XmlConfigurationData configuration(path);
    configuration.setData(firstKey, configuration.data(firstKey));
}

} // namespace

// Any file of settings: whatever of it has been read survives every further start.
extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* bytes, std::size_t size)
{
    static const QTemporaryDir directory(inMemory());
    static const QString path = directory.filePath(QStringLiteral("configuration"));
    write(path, QByteArray(reinterpret_cast<const char*>(bytes), static_cast<qsizetype>(size)));
    rewrite(path);
    const QByteArray written = read(path);
    const XmlConfigurationData reloaded(path);
    for (int key = XmlConfigurationData::First; key < XmlConfigurationData::Last; ++key) {
        if (!reloaded.data(static_cast<XmlConfigurationData::ConfigurationData>(key)).isValid())
            std::abort();
    }
    rewrite(path);
    if (read(path) != written)
        std::abort();
    return 0;
}
