// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/XmlConfigurationData.h"
#include "tests/support/LoggedTexts.h"

#include <QFile>
#include <QRandomGenerator>
#include <QRegularExpression>
#include <QTemporaryDir>
#include <QTest>

using DataSource::AbstractConfigurationData;
using DataSource::XmlConfigurationData;
using TestSupport::LogCapture;
using TestSupport::loggedTexts;

namespace
{

using Key = AbstractConfigurationData::ConfigurationData;

/// Any text that XML can carry: no control characters but tabulator and line feed, whole surrogate pairs only.
QString randomText(QRandomGenerator& random)
{
    QString text;
    const int length = static_cast<int>(random.bounded(40));
    for (int index = 0; index < length; ++index) {
        switch (random.bounded(6)) {
        case 0:
            text += QStringLiteral("<>&\"'%]\t\n ;#")[static_cast<int>(random.bounded(12))];
            break;
        case 1:
            text += QString::fromUcs4(std::array{static_cast<char32_t>(random.bounded(0x10000, 0x110000))}.data(), 1);
            break;
        case 2:
            text += QChar(static_cast<char16_t>(random.bounded(0xE000, 0xFFFE)));
            break;
        default:
            text += QChar(static_cast<char16_t>(random.bounded(0x20, 0x7F)));
        }
    }
    return text;
}

int keysWithoutValue(const AbstractConfigurationData& configuration)
{
    int missing = 0;
    for (int key = Key::First; key < Key::Last; ++key)
        missing += configuration.data(static_cast<Key>(key)).isValid() ? 0 : 1;
    return missing;
}

} // namespace

/// Statements about all files and all values, tried on many.
class XmlConfigurationPropertyTest : public QObject
{
    Q_OBJECT

private slots:
    void init();
    void everyTextSurvivesARestart();
    void everyTruncatedFileLoadsWithOneWarningForEachKeyItLacks();
    void everyFlippedBitLoadsWithOneWarningForEachKeyItLacks();
    void randomBytesLoad();

private:
    void write(const QByteArray& content) const;
    /// Loads the file and adds up how many warnings the result calls for.
    void load();
    void checkWarnings();

    QTemporaryDir directory;
    QString path = directory.filePath("configuration");
    QByteArray complete;
    int expectedWarnings = 0;
    LogCapture log;
};

void XmlConfigurationPropertyTest::init()
{
    XmlConfigurationData configuration(path);
    for (int key = Key::First; key < Key::Last; ++key)
        configuration.setData(static_cast<Key>(key), QStringLiteral("value %1").arg(key));
    QFile file(path);
    QVERIFY(file.open(QIODevice::ReadOnly));
    complete = file.readAll();
    loggedTexts(log);
    expectedWarnings = 0;
}

void XmlConfigurationPropertyTest::write(const QByteArray& content) const
{
    QFile file(path);
    QVERIFY(file.open(QIODevice::WriteOnly));
    QCOMPARE(file.write(content), content.size());
}

void XmlConfigurationPropertyTest::load()
{
    const XmlConfigurationData configuration(path);
    expectedWarnings += keysWithoutValue(configuration);
}

void XmlConfigurationPropertyTest::checkWarnings()
{
    static const QRegularExpression nameError(
        "^DataSource/src/XmlConfigurationData\\.cpp, 94, XML name error\\.  Expected [A-Za-z]+ got .*$",
        QRegularExpression::DotMatchesEverythingOption);
    static const QString rootError =
        "DataSource/src/XmlConfigurationData.cpp, 70, Invalid element name.  Expected Configuration Data, got ";
    int counted = 0;
    for (const auto& text : loggedTexts(log)) {
        // A refused root element stands for all eleven keys.
        counted += text.startsWith(rootError) ? static_cast<int>(Key::Last) : 1;
        QVERIFY2(text.startsWith(rootError) || nameError.match(text).hasMatch(), qPrintable(text));
    }
    QCOMPARE(counted, expectedWarnings);
}

void XmlConfigurationPropertyTest::everyTextSurvivesARestart()
{
    QRandomGenerator random(20260101);
    for (int round = 0; round < 60; ++round) {
        QStringList texts;
        {
            XmlConfigurationData configuration(path);
            for (int key = Key::First; key < Key::Last; ++key) {
                texts.append(randomText(random));
                configuration.setData(static_cast<Key>(key), texts.back());
            }
        }
        const XmlConfigurationData restarted(path);
        for (int key = Key::First; key < Key::Last; ++key)
            QCOMPARE(restarted.data(static_cast<Key>(key)).toString(), texts.at(key));
    }
    checkWarnings();
}

void XmlConfigurationPropertyTest::everyTruncatedFileLoadsWithOneWarningForEachKeyItLacks()
{
    for (qsizetype length = 0; length < complete.size(); ++length) {
        write(complete.left(length));
        load();
    }
    QVERIFY(expectedWarnings > complete.size());
    checkWarnings();
}

void XmlConfigurationPropertyTest::everyFlippedBitLoadsWithOneWarningForEachKeyItLacks()
{
    for (qsizetype bit = 0; bit < complete.size() * 8; ++bit) {
        QByteArray flipped = complete;
        flipped[bit / 8] = static_cast<char>(flipped[bit / 8] ^ (1 << (bit % 8)));
        write(flipped);
        load();
    }
    QVERIFY(expectedWarnings > complete.size());
    checkWarnings();
}

void XmlConfigurationPropertyTest::randomBytesLoad()
{
    QRandomGenerator random(20260102);
    for (int round = 0; round < 500; ++round) {
        QByteArray bytes(static_cast<qsizetype>(random.bounded(2000)), '\0');
        for (auto& byte : bytes)
            byte = static_cast<char>(random.bounded(256));
        write(bytes);
        load();
    }
    checkWarnings();
}

QTEST_GUILESS_MAIN(XmlConfigurationPropertyTest)
#include "XmlConfigurationPropertyTest.moc"
