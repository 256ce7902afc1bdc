// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/FileStore.h"
#include "tests/DataSource/FileStoreFixture.h"
#include "tests/support/DirectoryEvents.h"

#include <QTest>

#include <sys/inotify.h>

#include <algorithm>
#include <climits>

using DataSource::FileStore;
using TestSupport::DirectoryEvents;
using TestSupport::FileStoreFixture;

namespace
{

/// How often the directory was opened for listing since the last call. Equal events in a row come as one, so every
/// access is counted by itself.
qsizetype listingsOf(DirectoryEvents& events)
{
    const auto opened = events.take();
    return std::count_if(opened.begin(), opened.end(), [](const auto& event) { return (event.mask & IN_ISDIR) != 0; });
}

} // namespace

/// The cache shows in two ways: which records `fileAt` gives, and whether it had to list the directory for them.
class FileStoreCacheTest : public FileStoreFixture
{
    Q_OBJECT

private slots:
    void hitOpensNoListing();
    void smallDirectoryRepeatsItsLastFile();
    void beyondTheCopiesThereIsNoFile();
    void positionThirtyMovesTheRangeForwardByFifteen();
    void positionJustBeforeTheRangeMovesItBackByFifteen();
    void positionNearTheStartFillsTheCacheAnew();
    void farPositionRestartsTheCacheWithOneRecord();
    void pagingListsOncePerFifteenEntries();
    void negativePositionsGiveAnEmptyRecord();
    void positionsBeyondTheEndGiveAnEmptyRecord();
    void emptyDirectoryIsListedAnewEveryTime();
    void hitShowsTheCachedRecordUntilTheNextScan();
    void directoryThatHasShrunkMeanwhile();

private:
    /// Whether a position is served without a listing; the record must be the right one.
    bool isCached(FileStore& store, int index);
};

bool FileStoreCacheTest::isCached(FileStore& store, int index)
{
    const auto names = listing();
    DirectoryEvents counter({directory()}, IN_OPEN);
    const auto record = store.fileAt(index);
    const auto opened = listingsOf(counter);
    if (index < names.size() && record.fileName() != names.at(index))
        qWarning("Position %d is %s, not %s", index, qPrintable(record.fileName()), qPrintable(names.at(index)));
    return opened == 0;
}

void FileStoreCacheTest::hitOpensNoListing()
{
    QTest::failOnWarning(QRegularExpression(".*"));
    makeFiles(31, 1);
    FileStore store(directory());
    for (int index = 0; index < 30; ++index)
        QVERIFY(isCached(store, index));
    QVERIFY(!isCached(store, 30));
}

void FileStoreCacheTest::smallDirectoryRepeatsItsLastFile()
{
    makeFiles(3, 1);
    FileStore store(directory());
    const auto names = listing();
    for (int index = 0; index < 3; ++index)
        QCOMPARE(store.fileAt(index).fileName(), names.at(index));
    for (int index = 3; index < 30; ++index)
        QCOMPARE(store.fileAt(index).fileName(), names.at(2));
}

void FileStoreCacheTest::beyondTheCopiesThereIsNoFile()
{
    makeFiles(3, 1);
    FileStore store(directory());
    QVERIFY(store.fileAt(30).fileName().isEmpty());
    QVERIFY(store.fileAt(31).fileName().isEmpty());
    QCOMPARE(store.fileAt(2).fileName(), listing().at(2));
}

void FileStoreCacheTest::positionThirtyMovesTheRangeForwardByFifteen()
{
    QTest::failOnWarning(QRegularExpression(".*"));
    makeFiles(60, 1);
    FileStore store(directory());
    QVERIFY(!isCached(store, 30));
    for (int index = 15; index < 45; ++index)
        QVERIFY2(isCached(store, index), qPrintable(QString::number(index)));
    QVERIFY(isCached(store, 29));
    QVERIFY(!isCached(store, 45));
    for (int index = 30; index < 60; ++index)
        QVERIFY(isCached(store, index));
}

void FileStoreCacheTest::positionJustBeforeTheRangeMovesItBackByFifteen()
{
    QTest::failOnWarning(QRegularExpression(".*"));
    makeFiles(80, 1);
    FileStore store(directory());
    QVERIFY(!isCached(store, 30));
    QVERIFY(!isCached(store, 45)); // 30 to 59
    QVERIFY(!isCached(store, 29)); // 15 to 44
    for (int index = 15; index < 45; ++index)
        QVERIFY2(isCached(store, index), qPrintable(QString::number(index)));
    QVERIFY(!isCached(store, 45));
}

void FileStoreCacheTest::positionNearTheStartFillsTheCacheAnew()
{
    QTest::failOnWarning(QRegularExpression(".*"));
    makeFiles(60, 1);
    FileStore store(directory());
    QVERIFY(!isCached(store, 40)); // far: 40 alone
    QVERIFY(!isCached(store, 13)); // far: 13 alone
    QVERIFY(!isCached(store, 12)); // just before: filled from the start
    for (int index = 0; index < 30; ++index)
        QVERIFY2(isCached(store, index), qPrintable(QString::number(index)));
    QVERIFY(!isCached(store, 40)); // far: 40 alone
    QVERIFY(!isCached(store, 14)); // far: 14 alone
    QVERIFY(!isCached(store, 13)); // just before: the last position for which it is filled from the start
    for (int index = 0; index < 30; ++index)
        QVERIFY2(isCached(store, index), qPrintable(QString::number(index)));
    QVERIFY(!isCached(store, 32)); // far: 32 alone
    QVERIFY(!isCached(store, 15)); // far: 15 alone
    QVERIFY(!isCached(store, 14)); // just before: 0 to 14 in front of it
    for (int index = 0; index <= 15; ++index)
        QVERIFY2(isCached(store, index), qPrintable(QString::number(index)));
    QVERIFY(!isCached(store, 16));
}

void FileStoreCacheTest::farPositionRestartsTheCacheWithOneRecord()
{
    QTest::failOnWarning(QRegularExpression(".*"));
    makeFiles(60, 1);
    FileStore store(directory());
    QVERIFY(!isCached(store, 50));
    QVERIFY(isCached(store, 50));
    QVERIFY(!isCached(store, 0));
}

void FileStoreCacheTest::pagingListsOncePerFifteenEntries()
{
    constexpr int files = 600;
    makeFiles(files, 1);
    FileStore store(directory());
    DirectoryEvents counter({directory()}, IN_OPEN);
    qsizetype listings = 0;
    for (int index = 0; index < files; ++index) {
        QVERIFY(store.fileAt(index).exists());
        listings += listingsOf(counter);
    }
    QCOMPARE(listings, (files - 30) / 15);
    listings = 0;
    for (int index = files - 1; index >= 0; --index) {
        QVERIFY(store.fileAt(index).exists());
        listings += listingsOf(counter);
    }
    QCOMPARE(listings, (files - 30) / 15);
}

void FileStoreCacheTest::negativePositionsGiveAnEmptyRecord()
{
    makeFiles(40, 1);
    FileStore store(directory());
    for (const int index : {-1, -2, -30, INT_MIN})
        QVERIFY(store.fileAt(index).fileName().isEmpty());
    QVERIFY(isCached(store, 0));
}

void FileStoreCacheTest::positionsBeyondTheEndGiveAnEmptyRecord()
{
    makeFiles(40, 1);
    FileStore store(directory());
    for (const int index : {40, 41, 1000, INT_MAX})
        QVERIFY(store.fileAt(index).fileName().isEmpty());
    QCOMPARE(store.fileAt(39).fileName(), listing().at(39));
}

void FileStoreCacheTest::emptyDirectoryIsListedAnewEveryTime()
{
    FileStore store(directory());
    QVERIFY(store.fileAt(0).fileName().isEmpty());
    makeFile("late", 1);
    QCOMPARE(store.fileAt(0).fileName(), "late");
}

void FileStoreCacheTest::hitShowsTheCachedRecordUntilTheNextScan()
{
    makeFile("first", 1);
    FileStore store(directory());
    QVERIFY(QFile::rename(path("first"), path("renamed")));
    QCOMPARE(store.fileAt(0).fileName(), "first");
    scan(store);
    QCOMPARE(store.fileAt(0).fileName(), "renamed");
}

void FileStoreCacheTest::directoryThatHasShrunkMeanwhile()
{
    makeFiles(80, 1);
    FileStore store(directory());
    QVERIFY(store.fileAt(30).exists());
    QVERIFY(store.fileAt(45).exists()); // 30 to 59
    const auto names = listing();
    for (int index = 5; index < 80; ++index)
        QVERIFY(QFile::remove(path(names.at(index))));
    QVERIFY(store.fileAt(29).fileName().isEmpty());
    QVERIFY(store.fileAt(60).fileName().isEmpty());
    QCOMPARE(store.fileAt(4).fileName(), listing().at(4));
}

QTEST_GUILESS_MAIN(FileStoreCacheTest)
#include "FileStoreCacheTest.moc"
