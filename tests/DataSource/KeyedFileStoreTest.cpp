// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/KeyedFileStore.h"

#include "tests/DataSource/FileStoreFixture.h"

#include <QTest>

using DataSource::KeyedFileStore;
using TestSupport::FileStoreFixture;
using TestSupport::loggedTexts;
using TestSupport::Space;
using TestSupport::SpaceCalls;

class KeyedFileStoreTest : public FileStoreFixture
{
    Q_OBJECT

private slots:
    void storeOnAMissingDirectoryCreatesIt();
    void filesAreNamedInsideTheDirectory();
    void createFileCreatesNothing();
    void deletingReturnsWhetherTheFileIsGone();
    void deletingAMissingNameLogsNothing();
    void namesThatLeadOutOfTheDirectoryDeleteNothing_data();
    void namesThatLeadOutOfTheDirectoryDeleteNothing();
    void oddNamesAreDeleted();
    void deletingALinkLeavesItsTarget();
    void deletingADirectoryFails();
    void onlyVisibleFilesOfTheDirectoryItselfAreUsed();
    void largeFilesAreSummedIn64Bits();
    void spaceIsTheFileSystems();
    void spaceIsCountedInBlocksWithTheSuperusersReserve();
    void vanishedDirectoryIsEmptyAndLogsNothing();
    void refusedSpaceIsLogged();
    void fileInPlaceOfTheDirectory();
};

void KeyedFileStoreTest::storeOnAMissingDirectoryCreatesIt()
{
    const KeyedFileStore store(root() + "/a/b/c");
    QVERIFY(QFileInfo(root() + "/a/b/c").isDir());
    QCOMPARE(store.bytesUsed(), 0);
}

void KeyedFileStoreTest::filesAreNamedInsideTheDirectory()
{
    makeFile("there", 4);
    const KeyedFileStore store(directory());
    QCOMPARE(store.file("there").size(), 4);
    QCOMPARE(store.file("there").absoluteFilePath(), path("there"));
    QVERIFY(!store.file("missing").exists());
    QCOMPARE(store.file("missing").absoluteFilePath(), path("missing"));
}

void KeyedFileStoreTest::createFileCreatesNothing()
{
    KeyedFileStore store(directory());
    QCOMPARE(store.createFile("new").absoluteFilePath(), path("new"));
    QVERIFY(!QFile::exists(path("new")));
}

void KeyedFileStoreTest::deletingReturnsWhetherTheFileIsGone()
{
    makeFile("there", 4);
    KeyedFileStore store(directory());
    QVERIFY(store.deleteFile("there"));
    QVERIFY(!QFile::exists(path("there")));
    QVERIFY(!store.deleteFile("there"));
}

void KeyedFileStoreTest::deletingAMissingNameLogsNothing()
{
    KeyedFileStore store(directory());
    QVERIFY(!store.deleteFile("missing"));
    QCOMPARE(loggedTexts(log()), QStringList());
}

void KeyedFileStoreTest::namesThatLeadOutOfTheDirectoryDeleteNothing_data()
{
    QTest::addColumn<QString>("name");
    for (const char* const name : {"../outside", "", ".", "..", "link/outside", "/tmp/outside", "sub/../../outside"})
        QTest::addRow("\"%s\"", name) << QString(name);
}

void KeyedFileStoreTest::namesThatLeadOutOfTheDirectoryDeleteNothing()
{
    QFETCH(const QString, name);
    QTest::failOnWarning(QRegularExpression(".*"));
    makeFile("../outside", 4);
    QVERIFY(QDir(directory()).mkpath("sub"));
    QVERIFY(QFile::link(root(), path("link")));
    KeyedFileStore store(directory());
    QVERIFY(!store.deleteFile(name));
    QVERIFY(QFile::exists(root() + "/outside"));
    QVERIFY(QFileInfo(directory()).isDir());
}

void KeyedFileStoreTest::oddNamesAreDeleted()
{
    for (const auto& name : oddNames())
        makeFile(name, 3);
    KeyedFileStore store(directory());
    qsizetype left = oddNames().size();
    for (const auto& name : oddNames()) {
        QCOMPARE(store.bytesUsed(), 3 * left);
        QVERIFY(store.deleteFile(name));
        QCOMPARE(listing().size(), --left);
    }
}

void KeyedFileStoreTest::deletingALinkLeavesItsTarget()
{
    makeFile("../outside", 4);
    QVERIFY(QFile::link(root() + "/outside", path("link")));
    KeyedFileStore store(directory());
    QVERIFY(store.deleteFile("link"));
    QCOMPARE(QFileInfo(root() + "/outside").size(), 4);
}

void KeyedFileStoreTest::deletingADirectoryFails()
{
    QVERIFY(QDir(directory()).mkpath("sub"));
    KeyedFileStore store(directory());
    QVERIFY(!store.deleteFile("sub"));
    QVERIFY(QFileInfo(path("sub")).isDir());
}

void KeyedFileStoreTest::onlyVisibleFilesOfTheDirectoryItselfAreUsed()
{
    makeFile("visible", 10);
    makeFile("another", 5);
    makeFile(".hidden", 100);
    QVERIFY(QDir(directory()).mkpath("sub"));
    makeFile("sub/inner", 1000);
    const KeyedFileStore store(directory());
    QCOMPARE(store.bytesUsed(), 15);
}

void KeyedFileStoreTest::largeFilesAreSummedIn64Bits()
{
    constexpr qint64 size = 3LL << 30;
    makeFile("one", size);
    makeFile("two", size);
    QCOMPARE(KeyedFileStore(directory()).bytesUsed(), 2 * size);
}

void KeyedFileStoreTest::spaceIsTheFileSystems()
{
    const KeyedFileStore store(directory());
    checkThatSpaceIsTheFileSystems([&] { return Space::of(store); });
}

void KeyedFileStoreTest::spaceIsCountedInBlocksWithTheSuperusersReserve()
{
    const KeyedFileStore store(directory());
    checkThatSpaceIsCountedInBlocksWithTheSuperusersReserve([&] { return Space::of(store); });
}

void KeyedFileStoreTest::vanishedDirectoryIsEmptyAndLogsNothing()
{
    makeFile("there", 4);
    const KeyedFileStore store(directory());
    QVERIFY(QDir(directory()).removeRecursively());
    QCOMPARE(store.bytesUsed(), 0);
    QCOMPARE(store.bytesFree(), 0);
    QCOMPARE(store.bytesCapacity(), 0);
    QCOMPARE(loggedTexts(log()), QStringList());
}

void KeyedFileStoreTest::refusedSpaceIsLogged()
{
    const KeyedFileStore store(directory());
    const QString text = "DataSource/src/KeyedFileStore.cpp, %1, Unable to obtain file system information";
    SpaceCalls::failing = 1;
    QCOMPARE(store.bytesFree(), 0);
    QCOMPARE(loggedTexts(log()), QStringList{text.arg(159)});
    SpaceCalls::failing = 1;
    QCOMPARE(store.bytesCapacity(), 0);
    QCOMPARE(loggedTexts(log()), QStringList{text.arg(186)});
}

void KeyedFileStoreTest::fileInPlaceOfTheDirectory()
{
    makeFile("plain", 5);
    KeyedFileStore store(path("plain"));
    QCOMPARE(store.bytesUsed(), 0);
    QCOMPARE(store.bytesFree(), 0);
    QVERIFY(!store.deleteFile("x"));
    QCOMPARE(QFileInfo(path("plain")).size(), 5);
}

QTEST_GUILESS_MAIN(KeyedFileStoreTest)
#include "KeyedFileStoreTest.moc"
