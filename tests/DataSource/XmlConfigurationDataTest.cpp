// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/XmlConfigurationData.h"

#include "tests/support/LoggedTexts.h"

#include <QDir>
#include <QFile>
#include <QMetaEnum>
#include <QProcess>
#include <QSignalSpy>
#include <QTemporaryDir>
#include <QTest>

#include <signal.h>
#include <sys/resource.h>
#include <sys/stat.h>

#include <array>

using DataSource::AbstractConfigurationData;
using DataSource::XmlConfigurationData;
using TestSupport::LogCapture;
using TestSupport::loggedTexts;

namespace
{

using Key = AbstractConfigurationData::ConfigurationData;

const QStringList storedNames{"Volume",           "TimeOffset", "BacklightBrightness", "BacklightTimeout",
                              "PowerDownTimeout", "TimeFormat", "DateFormat",          "ButtonLock",
                              "DefaultChannels",  "KeepAlive",  "UsbChargeEnable"};

QString warning(int line, const QString& text)
{
    return QStringLiteral("DataSource/src/XmlConfigurationData.cpp, %1, %2").arg(line).arg(text);
}

QString nameError(const QString& expected, const QString& found)
{
    return warning(94, QStringLiteral("XML name error.  Expected %1 got %2").arg(expected, found));
}

/// As the device writes it: text of one key per element, in the given order.
QByteArray documentOf(const QList<std::pair<QString, QString>>& elements, const QByteArray& lineEnd = "\n",
                      const QByteArray& indentation = "    ")
{
    QByteArray document = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>" + lineEnd + "<Configuration_Data>" + lineEnd;
    for (const auto& [name, text] : elements)
        document += indentation + "<" + name.toUtf8() + ">" + text.toUtf8() + "</" + name.toUtf8() + ">" + lineEnd;
    return document + "</Configuration_Data>" + lineEnd;
}

/// Eleven elements in key order, the value of each being its index.
QList<std::pair<QString, QString>> regularElements()
{
    QList<std::pair<QString, QString>> elements;
    for (const auto& name : storedNames)
        elements.append({name, QString::number(elements.size())});
    return elements;
}

QStringList valuesOf(const AbstractConfigurationData& configuration)
{
    QStringList texts;
    for (int key = Key::First; key < Key::Last; ++key) {
        const QVariant value = configuration.data(static_cast<Key>(key));
        texts.append(value.isValid() ? value.toString() : QStringLiteral("(none)"));
    }
    return texts;
}

/// Writes settings for ever, as fast as it can, until it is killed.
int writeForEver(const QString& path)
{
    XmlConfigurationData configuration(path);
    for (int round = 0;; ++round)
        configuration.setData(Key::DateFormat, QString(round % 2 == 0 ? 5 : 4000, QChar(u'0' + round % 10)));
}

} // namespace

class XmlConfigurationDataTest : public QObject
{
    Q_OBJECT

private slots:
    void init();
    void cleanup();

    void keysHaveTheirValuesAndNames();
    void missingFileIsLoggedAndLeavesEveryKeyWithoutValue();
    void firstReadWithDefaultWritesACompleteFile();
    void emptyElementsAreValuesAfterRestart();
    void storedTextIsWhatTheValueConvertsTo_data();
    void storedTextIsWhatTheValueConvertsTo();
    void theSameValueTwiceWritesTheFileTwice();
    void readingAStoredValueWithDefaultDoesNotWrite();
    void emptyStringCountsAsValue();
    void destructionDoesNotWrite();
    void noChangeSignalIsEmitted();
    void rootElementOfAnotherNameIsRejected();
    void nothingIsReadUnderAnotherRoot();
    void emptyFileIsAnInvalidElement();
    void garbageIsAnInvalidElement();
    void irregularFiles_data();
    void irregularFiles();
    void elementNameBeyondAsciiIsLoggedAsItIs();
    void missingDirectoryKeepsTheValueInMemory();
    void missingFileInAnUnwritableDirectoryIsLogged();
    void unwritableDirectoryOfAWritableFileIsWrittenInPlace();
    void directoryInPlaceOfTheFileIsLoggedBothWays();
    void readOnlyFileKeepsItsOldContent();
    void fullDiskKeepsTheOldSettings();
    void symbolicLinkStaysALink();
    void keysOutsideTheStoredOnesAreIgnored();
    void charactersThatXmlCannotCarryDoNotCostTheOtherSettings();
    void killedWriterLeavesACompleteFile();

private:
    [[nodiscard]] QString path() const { return directory->filePath("configuration"); }
    void write(const QByteArray& content) const;
    [[nodiscard]] QByteArray content() const;
    [[nodiscard]] ino_t inode() const;

    std::unique_ptr<QTemporaryDir> directory;
    std::unique_ptr<LogCapture> log;
};

void XmlConfigurationDataTest::init()
{
    directory = std::make_unique<QTemporaryDir>();
    log = std::make_unique<LogCapture>();
}

void XmlConfigurationDataTest::cleanup()
{
    log.reset();
    QFile::setPermissions(directory->path(), QFile::ReadOwner | QFile::WriteOwner | QFile::ExeOwner);
    directory.reset();
}

void XmlConfigurationDataTest::write(const QByteArray& content) const
{
    QFile file(path());
    QVERIFY(file.open(QIODevice::WriteOnly));
    QCOMPARE(file.write(content), content.size());
}

QByteArray XmlConfigurationDataTest::content() const
{
    QFile file(path());
    return file.open(QIODevice::ReadOnly) ? file.readAll() : QByteArray("(unreadable)");
}

ino_t XmlConfigurationDataTest::inode() const
{
    struct stat status
    {
    };
    return ::stat(qPrintable(path()), &status) == 0 ? status.st_ino : 0;
}

void XmlConfigurationDataTest::keysHaveTheirValuesAndNames()
{
    const auto keys = QMetaEnum::fromType<Key>();
    QCOMPARE(keys.name(), "ConfigurationData");
    for (int value = 0; value < 11; ++value)
        QCOMPARE(QString(keys.valueToKey(value)), storedNames.at(value));
    QCOMPARE(keys.keyToValue("First"), 0);
    QCOMPARE(keys.keyToValue("Last"), 11);
    QCOMPARE(keys.keyToValue("Invalid"), -1);
    QCOMPARE(DataSource::startElementName, "Configuration_Data");
    QCOMPARE(DataSource::arraySeparater, ", ");
}

void XmlConfigurationDataTest::missingFileIsLoggedAndLeavesEveryKeyWithoutValue()
{
    const XmlConfigurationData configuration(path());
    QCOMPARE(loggedTexts(*log), QStringList{warning(60, "Unable to open configuration file")});
    for (int key = Key::First; key < Key::Last; ++key)
        QVERIFY(!configuration.data(static_cast<Key>(key)).isValid());
    QVERIFY(!QFile::exists(path()));
}

void XmlConfigurationDataTest::firstReadWithDefaultWritesACompleteFile()
{
    XmlConfigurationData configuration(path());
    QCOMPARE(configuration.data(Key::Volume, 5), QVariant(5));
    auto elements = regularElements();
    for (auto& [name, text] : elements)
        text = name == "Volume" ? "5" : "";
    QCOMPARE(content(), documentOf(elements));
}

void XmlConfigurationDataTest::emptyElementsAreValuesAfterRestart()
{
    XmlConfigurationData(path()).data(Key::Volume, 5);
    const auto written = inode();
    XmlConfigurationData configuration(path());
    QCOMPARE(configuration.data(Key::Volume), QVariant(QString("5")));
    QCOMPARE(configuration.data(Key::Volume).typeId(), static_cast<int>(QMetaType::QString));
    for (int key = Key::TimeOffset; key < Key::Last; ++key)
        QCOMPARE(configuration.data(static_cast<Key>(key)), QVariant(QString("")));
    QCOMPARE(configuration.data(Key::TimeOffset, 3), QVariant(QString("")));
    QCOMPARE(inode(), written);
    QCOMPARE(loggedTexts(*log), QStringList{warning(60, "Unable to open configuration file")});
}

void XmlConfigurationDataTest::storedTextIsWhatTheValueConvertsTo_data()
{
    QTest::addColumn<QVariant>("value");
    QTest::addColumn<QByteArray>("text");
    QTest::addRow("integer") << QVariant(-17) << QByteArray("-17");
    QTest::addRow("true") << QVariant(true) << QByteArray("true");
    QTest::addRow("false") << QVariant(false) << QByteArray("false");
    QTest::addRow("string") << QVariant("HH:mm") << QByteArray("HH:mm");
    QTest::addRow("not ASCII") << QVariant(QStringLiteral("\u00fcber \u20ac"))
                               << QByteArray("\xc3\xbc"
                                             "ber \xe2\x82\xac");
    QTest::addRow("markup") << QVariant("<a & b>") << QByteArray("&lt;a &amp; b&gt;");
    QTest::addRow("no text form") << QVariant(QVariantList{1, 2}) << QByteArray();
}

void XmlConfigurationDataTest::storedTextIsWhatTheValueConvertsTo()
{
    QFETCH(const QVariant, value);
    QFETCH(const QByteArray, text);
    XmlConfigurationData configuration(path());
    configuration.setData(Key::ButtonLock, value);
    QVERIFY(content().contains("\n    <ButtonLock>" + text + "</ButtonLock>\n"));
    QCOMPARE(content().count("</"), 12);
    QCOMPARE(configuration.data(Key::ButtonLock), value);
}

void XmlConfigurationDataTest::theSameValueTwiceWritesTheFileTwice()
{
    XmlConfigurationData configuration(path());
    configuration.setData(Key::ButtonLock, true);
    const auto complete = content();
    write("spoilt");
    configuration.setData(Key::ButtonLock, true);
    QCOMPARE(content(), complete);
}

void XmlConfigurationDataTest::readingAStoredValueWithDefaultDoesNotWrite()
{
    XmlConfigurationData configuration(path());
    configuration.setData(Key::Volume, 4);
    write("untouched");
    QCOMPARE(configuration.data(Key::Volume, 3), QVariant(4));
    QCOMPARE(content(), QByteArray("untouched"));
}

void XmlConfigurationDataTest::emptyStringCountsAsValue()
{
    XmlConfigurationData configuration(path());
    configuration.setData(Key::TimeFormat, QString());
    QCOMPARE(configuration.data(Key::TimeFormat, "HH"), QVariant(QString()));
}

void XmlConfigurationDataTest::destructionDoesNotWrite()
{
    {
        XmlConfigurationData configuration(path());
        configuration.setData(Key::Volume, 1);
        write("afterwards");
    }
    QCOMPARE(content(), QByteArray("afterwards"));
}

void XmlConfigurationDataTest::noChangeSignalIsEmitted()
{
    XmlConfigurationData configuration(path());
    const QSignalSpy changed(&configuration, &AbstractConfigurationData::configurationDataChanged);
    configuration.setData(Key::Volume, 1);
    QCOMPARE(changed.count(), 0);
}

void XmlConfigurationDataTest::rootElementOfAnotherNameIsRejected()
{
    write(documentOf(regularElements()).replace("Configuration_Data", "ConfigurationData"));
    const XmlConfigurationData configuration(path());
    QCOMPARE(loggedTexts(*log),
             QStringList{warning(70, "Invalid element name.  Expected Configuration Data, got ConfigurationData")});
}

void XmlConfigurationDataTest::nothingIsReadUnderAnotherRoot()
{
    write(documentOf(regularElements()).replace("Configuration_Data", "Other"));
    const XmlConfigurationData configuration(path());
    for (int key = Key::First; key < Key::Last; ++key)
        QVERIFY(!configuration.data(static_cast<Key>(key)).isValid());
}

void XmlConfigurationDataTest::emptyFileIsAnInvalidElement()
{
    write({});
    const XmlConfigurationData configuration(path());
    QCOMPARE(loggedTexts(*log), QStringList{warning(70, "Invalid element name.  Expected Configuration Data, got ")});
}

void XmlConfigurationDataTest::garbageIsAnInvalidElement()
{
    write(QByteArray::fromHex("00ff3c00feff253325") + QByteArray(100000, '\xee'));
    const XmlConfigurationData configuration(path());
    QCOMPARE(loggedTexts(*log), QStringList{warning(70, "Invalid element name.  Expected Configuration Data, got ")});
}

void XmlConfigurationDataTest::irregularFiles_data()
{
    QTest::addColumn<QByteArray>("document");
    QTest::addColumn<QStringList>("values");
    QTest::addColumn<QStringList>("warnings");
    const QStringList all{"0", "1", "2", "3", "4", "5", "6", "7", "8", "9", "10"};
    const auto regular = regularElements();
    const QString none = "(none)";

    QTest::addRow("indented") << documentOf(regular) << all << QStringList();
    QTest::addRow("compact") << documentOf(regular, "", "") << all << QStringList();
    QTest::addRow("CR LF") << documentOf(regular, "\r\n") << all << QStringList();

    auto missing = regular;
    missing.removeFirst();
    auto withoutFirst = all;
    withoutFirst[0] = none;
    QTest::addRow("first element missing")
        << documentOf(missing) << withoutFirst << QStringList{nameError("Volume", "TimeOffset")};

    auto swapped = regular;
    swapped.swapItemsAt(0, 1);
    QStringList onlySecond(11, none);
    onlySecond[1] = "1";
    QStringList swappedWarnings{nameError("Volume", "TimeOffset")};
    for (const auto& name : storedNames.mid(2))
        swappedWarnings.append(nameError(name, "Volume"));
    QTest::addRow("first two swapped") << documentOf(swapped) << onlySecond << swappedWarnings;

    auto unknown = regular;
    unknown.insert(3, {"Contrast", "9"});
    QStringList firstThree{"0", "1", "2"};
    QStringList unknownWarnings;
    for (const auto& name : storedNames.mid(3)) {
        firstThree.append(none);
        unknownWarnings.append(nameError(name, "Contrast"));
    }
    QTest::addRow("unknown element") << documentOf(unknown) << firstThree << unknownWarnings;

    QStringList endWarnings;
    for (const auto& name : storedNames.mid(3))
        endWarnings.append(nameError(name, ""));
    QTest::addRow("ends early") << documentOf(regular.mid(0, 3)) << firstThree << endWarnings;
    QTest::addRow("cut short") << documentOf(regular).left(documentOf(regular).indexOf("<BacklightTimeout>") + 9)
                               << firstThree << endWarnings;
    QTest::addRow("more than the stored keys")
        << documentOf(regular + QList<std::pair<QString, QString>>{{"Contrast", "9"}}) << all << QStringList();
}

void XmlConfigurationDataTest::irregularFiles()
{
    QFETCH(const QByteArray, document);
    write(document);
    const XmlConfigurationData configuration(path());
    QTEST(valuesOf(configuration), "values");
    QTEST(loggedTexts(*log), "warnings");
}

void XmlConfigurationDataTest::elementNameBeyondAsciiIsLoggedAsItIs()
{
    auto elements = regularElements();
    elements.insert(0, {QStringLiteral("\u00e9l\u00e9ment"), "x"});
    write(documentOf(elements));
    const XmlConfigurationData configuration(path());
    QCOMPARE(loggedTexts(*log).value(0), nameError("Volume", QStringLiteral("\u00e9l\u00e9ment")));
}

void XmlConfigurationDataTest::missingDirectoryKeepsTheValueInMemory()
{
    XmlConfigurationData configuration(directory->filePath("missing/configuration"));
    QCOMPARE(configuration.data(Key::Volume, 3), QVariant(3));
    QCOMPARE(configuration.data(Key::Volume), QVariant(3));
    QCOMPARE(loggedTexts(*log),
             (QStringList{warning(60, "Unable to open configuration file"),
                          warning(107, "Unable to open XML file for writing: No such file or directory")}));
}

void XmlConfigurationDataTest::missingFileInAnUnwritableDirectoryIsLogged()
{
    XmlConfigurationData configuration(path());
    loggedTexts(*log);
    QVERIFY(QFile::setPermissions(directory->path(), QFile::ReadOwner | QFile::ExeOwner));
    configuration.setData(Key::Volume, 6);
    QCOMPARE(loggedTexts(*log), QStringList{warning(107, "Unable to open XML file for writing: Permission denied")});
    QCOMPARE(configuration.data(Key::Volume), QVariant(6));
    QVERIFY(!QFile::exists(path()));
}

void XmlConfigurationDataTest::unwritableDirectoryOfAWritableFileIsWrittenInPlace()
{
    write(documentOf(regularElements()));
    XmlConfigurationData configuration(path());
    QVERIFY(QFile::setPermissions(directory->path(), QFile::ReadOwner | QFile::ExeOwner));
    configuration.setData(Key::Volume, 6);
    QVERIFY(content().contains("<Volume>6</Volume>"));
    QCOMPARE(loggedTexts(*log), QStringList());
}

void XmlConfigurationDataTest::directoryInPlaceOfTheFileIsLoggedBothWays()
{
    QVERIFY(QDir().mkpath(path()));
    XmlConfigurationData configuration(path());
    configuration.setData(Key::Volume, 6);
    QCOMPARE(loggedTexts(*log), (QStringList{warning(60, "Unable to open configuration file"),
                                             warning(107, "Unable to open XML file for writing: Is a directory")}));
}

void XmlConfigurationDataTest::readOnlyFileKeepsItsOldContent()
{
    const auto old = documentOf(regularElements());
    write(old);
    XmlConfigurationData configuration(path());
    QVERIFY(QFile::setPermissions(path(), QFile::ReadOwner));
    configuration.setData(Key::Volume, 6);
    QCOMPARE(content(), old);
    QCOMPARE(configuration.data(Key::Volume), QVariant(6));
    QCOMPARE(loggedTexts(*log), QStringList{warning(107, "Unable to open XML file for writing: Permission denied")});
}

void XmlConfigurationDataTest::fullDiskKeepsTheOldSettings()
{
    const auto old = documentOf(regularElements());
    write(old);
    XmlConfigurationData configuration(path());
    // No byte more may be written to any file, which is what a full disk looks like from here.
    ::signal(SIGXFSZ, SIG_IGN);
    rlimit before{};
    ::getrlimit(RLIMIT_FSIZE, &before);
    const rlimit nothing{0, before.rlim_max};
    ::setrlimit(RLIMIT_FSIZE, &nothing);
    configuration.setData(Key::Volume, 6);
    ::setrlimit(RLIMIT_FSIZE, &before);
    QCOMPARE(content(), old);
    QCOMPARE(QDir(directory->path()).entryList(QDir::Files), QStringList{"configuration"});
    QCOMPARE(configuration.data(Key::Volume), QVariant(6));
    QCOMPARE(loggedTexts(*log), QStringList{warning(107, "Unable to open XML file for writing: File too large")});
}

void XmlConfigurationDataTest::symbolicLinkStaysALink()
{
    QVERIFY(QFile::link(directory->filePath("elsewhere"), path()));
    XmlConfigurationData configuration(path());
    configuration.setData(Key::Volume, 6);
    QVERIFY(QFileInfo(path()).isSymLink());
    QVERIFY(content().contains("<Volume>6</Volume>"));
}

void XmlConfigurationDataTest::keysOutsideTheStoredOnesAreIgnored()
{
    XmlConfigurationData configuration(path());
    for (const int key : {-1, 11, 1000000, -1000000}) {
        configuration.setData(static_cast<Key>(key), 1);
        QVERIFY(!configuration.data(static_cast<Key>(key)).isValid());
        QCOMPARE(configuration.data(static_cast<Key>(key), 7), QVariant(7));
    }
    QVERIFY(!QFile::exists(path()));
}

void XmlConfigurationDataTest::charactersThatXmlCannotCarryDoNotCostTheOtherSettings()
{
    XmlConfigurationData configuration(path());
    const char16_t odd[]{u'a', u'\x01', u'\0', 0xD800, u'b', 0xDC00, 0xD83D, 0xDE00, 0xFFFE, u'c'};
    configuration.setData(Key::Volume, QString::fromUtf16(odd, std::size(odd)));
    configuration.setData(Key::UsbChargeEnable, true);
    const XmlConfigurationData restarted(path());
    QCOMPARE(restarted.data(Key::Volume).toString(), QStringLiteral("ab\U0001F600c"));
    QCOMPARE(restarted.data(Key::UsbChargeEnable).toString(), "true");
}

void XmlConfigurationDataTest::killedWriterLeavesACompleteFile()
{
    XmlConfigurationData(path()).setData(Key::Volume, 2);
    constexpr int kills = 25;
    for (int kill = 0; kill < kills; ++kill) {
        QProcess writer;
        writer.start(QCoreApplication::applicationFilePath(), {"--write-for-ever", path()});
        QVERIFY(writer.waitForStarted());
        const auto before = inode();
        QTRY_VERIFY_WITH_TIMEOUT(inode() != before, 20000);
        writer.kill();
        QVERIFY(writer.waitForFinished());
        loggedTexts(*log);
        const XmlConfigurationData restarted(path());
        QCOMPARE(restarted.data(Key::Volume).toString(), "2");
        QVERIFY(restarted.data(Key::UsbChargeEnable).isValid());
        QCOMPARE(loggedTexts(*log), QStringList());
    }
}

int main(int argc, char* argv[])
{
    if (argc == 3 && QString(argv[1]) == "--write-for-ever")
        return writeForEver(argv[2]);
    const QCoreApplication application(argc, argv);
    XmlConfigurationDataTest test;
    return QTest::qExec(&test, argc, argv);
}

#include "XmlConfigurationDataTest.moc"
