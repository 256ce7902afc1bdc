// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/XmlConfigurationData.h"

#include "utilities/Debug.h"
#include "utilities/SourceWarnings.h"

#include <QFile>
#include <QMetaEnum>
#include <QSaveFile>
#include <QXmlStreamReader>
#include <QXmlStreamWriter>

#include <array>

namespace DataSource
{

const QString startElementName = QStringLiteral("Configuration_Data");
const QString arraySeparater = QStringLiteral(", ");

namespace
{

using Key = AbstractConfigurationData::ConfigurationData;

/// Line numbers that monitoring matches in the log.
constexpr int unreadableFileLine = 60;
constexpr int wrongRootLine = 70;
constexpr int wrongElementLine = 94;
constexpr int unwritableFileLine = 107;

constexpr bool isStored(int key)
{
    return key >= AbstractConfigurationData::First && key < AbstractConfigurationData::Last;
}

QString nameOf(int key)
{
    static const auto keys = QMetaEnum::fromType<Key>();
    return QString::fromLatin1(keys.valueToKey(key));
}

const Utilities::SourceWarnings warn(QStringLiteral(__FILE__));

void warnUnwritable(const QString& reason)
{
    warn(unwritableFileLine,
         QStringLiteral("Unable to open XML file for writing: %1").arg(Utilities::Debug::literal(reason)));
}

/// Name of the start element that the reader stands on or finds next; empty at the end of the document, well-formed or
/// not. The token that the reader stands on counts: an element that one key refused is offered to the next.
QString nextElementName(QXmlStreamReader& reader)
{
    while (!reader.isStartElement() && !reader.atEnd())
        reader.readNext();
    return reader.isStartElement() ? reader.name().toString() : QString();
}

/// Whether XML 1.0 can carry a character outside the surrogate range at all.
constexpr bool isXmlCharacter(char16_t character)
{
    return character == u'\t' || character == u'\n' || character == u'\r' || (character >= 0x20 && character < 0xFFFE);
}

QString withoutForbiddenCharacters(const QString& text)
{
    QString clean;
    clean.reserve(text.size());
    for (qsizetype index = 0; index < text.size(); ++index) {
        const QChar character = text[index];
        const bool isPair = character.isHighSurrogate() && index + 1 < text.size() && text[index + 1].isLowSurrogate();
        if (isPair)
            clean.append(character).append(text[++index]);
        else if (!character.isSurrogate() && isXmlCharacter(character.unicode()))
            clean.append(character);
    }
    return clean;
}

} // namespace

class XmlConfigurationData::PrivateData
{
public:
    explicit PrivateData(const QString& fileName) : file(fileName) {}

    void loadFile();
    void storeFile();

    std::array<QVariant, Last> values;

private:
    void readData(QXmlStreamReader& reader, int key);
    [[nodiscard]] QByteArray document() const;
    [[nodiscard]] QString reasonNotWritable(const QString& fallback);

    QFile file;
};

void XmlConfigurationData::PrivateData::loadFile()
{
    if (!file.open(QIODevice::ReadOnly | QIODevice::Text)) {
        warn(unreadableFileLine, QStringLiteral("Unable to open configuration file"));
        return;
    }
    QXmlStreamReader reader(&file);
    const QString root = nextElementName(reader);
    if (root == startElementName) {
        reader.readNext();
        for (int key = First; key < Last; ++key)
            readData(reader, key);
    } else {
        warn(wrongRootLine, QStringLiteral("Invalid element name.  Expected Configuration Data, got %1")
                                .arg(Utilities::Debug::literal(root)));
    }
    file.close();
}

void XmlConfigurationData::PrivateData::readData(QXmlStreamReader& reader, int key)
{
    const QString expected = nameOf(key);
    const QString found = nextElementName(reader);
    if (found != expected) {
        warn(wrongElementLine,
             QStringLiteral("XML name error.  Expected %1 got %2").arg(expected, Utilities::Debug::literal(found)));
        return;
    }
    values.at(static_cast<std::size_t>(key)) = reader.readElementText();
}

void XmlConfigurationData::PrivateData::storeFile()
{
    QSaveFile replacement(file.fileName());
    // A file that may be written in a directory that may not: better written in place than not at all.
    replacement.setDirectWriteFallback(true);
    if (!replacement.open(QIODevice::WriteOnly)) {
        warnUnwritable(reasonNotWritable(replacement.errorString()));
        return;
    }
    // Whatever is still buffered when the save file commits is written unchecked: on a full disk an empty file would
    // take the place of the settings. Hence the flush.
    const QByteArray content = document();
    if (replacement.write(content) != content.size() || !replacement.flush()) {
        warnUnwritable(replacement.errorString());
        replacement.cancelWriting();
    } else if (!replacement.commit()) {
        warnUnwritable(replacement.errorString());
    }
}

QByteArray XmlConfigurationData::PrivateData::document() const
{
    QByteArray content;
    QXmlStreamWriter writer(&content);
    writer.setAutoFormatting(true);
    writer.writeStartDocument();
    writer.writeStartElement(startElementName);
    for (int key = First; key < Last; ++key)
        writer.writeTextElement(nameOf(key),
                                withoutForbiddenCharacters(values.at(static_cast<std::size_t>(key)).toString()));
    writer.writeEndElement();
    writer.writeEndDocument();
    return content;
}

/// The system's own words ("Permission denied") rather than the save file's, which has its own for a file that is there
/// already. Opened for appending, so that nothing is lost if it can be opened after all.
QString XmlConfigurationData::PrivateData::reasonNotWritable(const QString& fallback)
{
    if (!file.exists())
        return fallback;
    if (!file.open(QIODevice::WriteOnly | QIODevice::Append | QIODevice::ExistingOnly))
        return file.errorString();
    file.close();
    return fallback;
}

XmlConfigurationData::XmlConfigurationData(const QString& fileName) : d(std::make_unique<PrivateData>(fileName))
{
    d->loadFile();
}

XmlConfigurationData::~XmlConfigurationData() = default;

void XmlConfigurationData::setData(ConfigurationData key, const QVariant& value)
{
    if (!isStored(key))
        return;
    d->values.at(static_cast<std::size_t>(key)) = value;
    d->storeFile();
}

QVariant XmlConfigurationData::data(ConfigurationData key) const
{
    return isStored(key) ? d->values.at(static_cast<std::size_t>(key)) : QVariant();
}

QVariant XmlConfigurationData::data(ConfigurationData key, const QVariant& defaultValue)
{
    QVariant stored = data(key);
    if (stored.isValid())
        return stored;
    setData(key, defaultValue);
    return defaultValue;
}

} // namespace DataSource
