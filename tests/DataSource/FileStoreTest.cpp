// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "DataSource/src/FileStore.h"

#include "tests/DataSource/FileStoreFixture.h"

#include <QSignalSpy>
#include <QTest>
#include <QThread>
#include <QThreadPool>

#include <dirent.h>
#include <sys/stat.h>
#include <unistd.h>

#include <atomic>
#include <semaphore>
#include <thread>

using DataSource::AbstractFileStore;
using DataSource::FileStore;
using TestSupport::FileStoreFixture;
using TestSupport::loggedTexts;
using TestSupport::PoolHold;
using TestSupport::Space;
using TestSupport::SpaceCalls;

namespace
{

QString warning(int line, const QString& text)
{
    return QStringLiteral("DataSource/src/FileStore.cpp, %1, %2").arg(line).arg(text);
}

const QString noInformation = QStringLiteral("Unable to obtain file system information");

std::atomic<bool> holdsNext = false;
std::binary_semaphore held(0);
std::binary_semaphore letGo(0);

/// Keeps the next scan where it reads the directory; what reads it on the test's own thread, or later, goes on.
class ScanHold
{
public:
    ScanHold() { holdsNext = true; }
    ~ScanHold() { letGo.release(); }
    ScanHold(const ScanHold&) = delete;
    ScanHold& operator=(const ScanHold&) = delete;

    /// Returns when the scan is there.
    void await() { held.acquire(); }
};

} // namespace

extern "C" dirent64* readdir64(DIR* directory)
{
    using Function = dirent64* (*)(DIR*);
    static const auto real = reinterpret_cast<Function>(TestSupport::nextSymbol("readdir64"));
    static const auto ownThread = std::this_thread::get_id();
    if (std::this_thread::get_id() != ownThread && holdsNext.exchange(false)) {
        held.release();
        letGo.acquire();
    }
    return real(directory);
}

/// Counting, space, and the rules of who may run when; deletion and paging have programs of their own.
class FileStoreTest : public FileStoreFixture
{
    Q_OBJECT

private slots:
    void signalsAndSlotsAreDeclared();
    void newStoreOnAMissingDirectoryCreatesIt();
    void directoriesOfEverySizeAreCounted_data();
    void directoriesOfEverySizeAreCounted();
    void scanEndsInTheThreadOfTheStore();
    void countsAreZeroWhileAScanRuns();
    void everyFileBelowTheCountIsFound_data();
    void everyFileBelowTheCountIsFound();
    void onlyVisibleFilesCount();
    void linksAreFollowedForTheSizeAndBrokenOnesAreNotFiles();
    void namesBeyondAsciiAndWithLineBreaksAreFiles();
    void secondScanIsRefused();
    void deletionDuringAScanIsRefused();
    void scanDuringADeletionIsRefused();
    void secondDeletionIsRefused();
    void stoppedScanReportsNothing();
    void stoppedScanStoresWhatItHasCounted();
    void stoppedScanFillsTheCacheAnew();
    void scanAfterAStoppedOneReportsOnceAndCountsAll();
    void scanWaitsForTheEndOfAStoppedOne();
    void deletionAfterAStoppedScanHappensAfterIt();
    void deletionWaitsForTheEndOfAStoppedScan();
    void stopWithoutAScanDoesNothing();
    void createFileNamesAFileAndCreatesNothing();
    void spaceIsTheFileSystems();
    void spaceIsCountedInBlocksWithTheSuperusersReserve();
    void vanishedDirectoryHasNoSpaceAndNoWarning();
    void refusedSpaceIsLogged();
    void unreadableDirectoryIsEmpty();
    void fileInPlaceOfTheDirectoryIsAnEmptyStore();
    void directoryThatCannotBeMadeIsAnEmptyStore();
};

/// While it is set, threads other than the test's own wait before they list a directory: a slow card.
static std::atomic<bool> listingsAreSlow = false;
static std::atomic<int> waitingListings = 0;
static const std::thread::id testThread = std::this_thread::get_id();

extern "C" DIR* opendir(const char* path)
{
    static const auto real = reinterpret_cast<DIR* (*)(const char*)>(TestSupport::nextSymbol("opendir"));
    if (std::this_thread::get_id() != testThread) {
        ++waitingListings;
        while (listingsAreSlow)
            ::usleep(1000);
        --waitingListings;
    }
    return real(path);
}

void FileStoreTest::signalsAndSlotsAreDeclared()
{
    const QMetaObject& meta = AbstractFileStore::staticMetaObject;
    QStringList names;
    for (int index = meta.methodOffset(); index < meta.methodCount(); ++index)
        names.append(meta.method(index).methodSignature());
    QCOMPARE(names, (QStringList{"scanComplete()", "deleteProgress(int)", "deleteComplete()", "stopScanning()"}));
    QVERIFY(FileStore::staticMetaObject.indexOfSlot("scanningDone()") >= 0);
    QVERIFY(FileStore::staticMetaObject.indexOfSlot("deletingDone()") >= 0);
}

void FileStoreTest::newStoreOnAMissingDirectoryCreatesIt()
{
    const QString path = root() + "/a/b/c";
    FileStore store(path);
    QVERIFY(QFileInfo(path).isDir());
    QCOMPARE(store.count(), 0);
    QCOMPARE(store.bytesUsed(), 0);
    QVERIFY(!store.isScanning());
    QVERIFY(!store.isDeleting());
    scan(store);
    QCOMPARE(store.count(), 0);
}

void FileStoreTest::directoriesOfEverySizeAreCounted_data()
{
    QTest::addColumn<int>("files");
    for (const int files : {0, 1, 3, 29, 30, 31, 45, 10000})
        QTest::addRow("%d", files) << files;
}

void FileStoreTest::directoriesOfEverySizeAreCounted()
{
    QFETCH(const int, files);
    makeFiles(files, 3);
    FileStore store(directory());
    QCOMPARE(store.count(), 0);
    QCOMPARE(store.bytesUsed(), 0);
    scan(store);
    QCOMPARE(store.count(), files);
    QCOMPARE(store.bytesUsed(), 3LL * files);
    QVERIFY(!store.isScanning());
}

void FileStoreTest::scanEndsInTheThreadOfTheStore()
{
    makeFiles(3, 1);
    FileStore store(directory());
    QThread* thread = nullptr;
    bool wasScanning = true;
    connect(
        &store, &AbstractFileStore::scanComplete, this,
        [&] {
            thread = QThread::currentThread();
            wasScanning = store.isScanning();
        },
        Qt::DirectConnection);
    scan(store);
    QCOMPARE(thread, store.thread());
    QVERIFY(!wasScanning);
}

void FileStoreTest::countsAreZeroWhileAScanRuns()
{
    makeFiles(5, 3);
    FileStore store(directory());
    scan(store);
    QCOMPARE(store.count(), 5);
    QSignalSpy complete(&store, &AbstractFileStore::scanComplete);
    listingsAreSlow = true;
    store.rescan();
    const bool isUnderWay = QTest::qWaitFor([] { return waitingListings > 0; }, 20000);
    const int count = store.count();
    const qint64 bytes = store.bytesUsed();
    listingsAreSlow = false;
    QVERIFY(isUnderWay);
    QCOMPARE(count, 0);
    QCOMPARE(bytes, 0);
    QTRY_COMPARE(complete.count(), 1);
    QCOMPARE(store.count(), 5);
    QCOMPARE(store.bytesUsed(), 15);
}

void FileStoreTest::everyFileBelowTheCountIsFound_data()
{
    directoriesOfEverySizeAreCounted_data();
}

void FileStoreTest::everyFileBelowTheCountIsFound()
{
    QFETCH(const int, files);
    makeFiles(files, 1);
    FileStore store(directory());
    const QStringList expected = listing();
    QCOMPARE(expected.size(), files);
    for (int index = 0; index < files; ++index)
        QCOMPARE(store.fileAt(index).fileName(), expected.at(index));
    // Far back, every step over the range's begin walks nearly the whole listing: a part of the way is enough.
    for (int index = files - 1; index >= std::max(0, files - 600); --index)
        QCOMPARE(store.fileAt(index).fileName(), expected.at(index));
}

void FileStoreTest::onlyVisibleFilesCount()
{
    makeFile("visible", 10);
    makeFile(".hidden", 100);
    QVERIFY(QDir(directory()).mkdir("subdirectory"));
    makeFile("subdirectory/inner", 1000);
    QCOMPARE(::mkfifo(qPrintable(path("pipe")), 0600), 0);
    FileStore store(directory());
    scan(store);
    QCOMPARE(store.count(), 1);
    QCOMPARE(store.bytesUsed(), 10);
}

void FileStoreTest::linksAreFollowedForTheSizeAndBrokenOnesAreNotFiles()
{
    makeFile("../outside", 12);
    QVERIFY(QFile::link(root() + "/outside", path("link")));
    QVERIFY(QFile::link(root() + "/nowhere", path("broken")));
    FileStore store(directory());
    scan(store);
    QCOMPARE(store.count(), 1);
    QCOMPARE(store.bytesUsed(), 12);
}

void FileStoreTest::namesBeyondAsciiAndWithLineBreaksAreFiles()
{
    for (const auto& name : oddNames())
        makeFile(name, 2);
    FileStore store(directory());
    scan(store);
    QCOMPARE(store.count(), oddNames().size());
    QStringList found;
    for (int index = 0; index < store.count(); ++index)
        found.append(store.fileAt(index).fileName());
    std::sort(found.begin(), found.end());
    auto expected = oddNames();
    std::sort(expected.begin(), expected.end());
    QCOMPARE(found, expected);
}

void FileStoreTest::secondScanIsRefused()
{
    makeFiles(5, 1);
    FileStore store(directory());
    QSignalSpy complete(&store, &AbstractFileStore::scanComplete);
    store.rescan();
    store.rescan();
    QVERIFY(store.isScanning());
    QCOMPARE(loggedTexts(log()),
             QStringList{warning(474, "Attempting to start a new scan while a scan is in progress.")});
    QTRY_COMPARE(complete.count(), 1);
    settle();
    QCOMPARE(complete.count(), 1);
    QCOMPARE(store.count(), 5);
}

void FileStoreTest::deletionDuringAScanIsRefused()
{
    makeFiles(5, 1);
    FileStore store(directory());
    QSignalSpy deleted(&store, &AbstractFileStore::deleteComplete);
    QSignalSpy complete(&store, &AbstractFileStore::scanComplete);
    store.rescan();
    store.deleteFile(0);
    QVERIFY(!store.isDeleting());
    QCOMPARE(loggedTexts(log()), QStringList{warning(314, "Attempting to delete a file while a scan is in progress.")});
    QTRY_COMPARE(complete.count(), 1);
    settle();
    QCOMPARE(deleted.count(), 0);
    QCOMPARE(listing().size(), 5);
    QCOMPARE(store.count(), 5);
}

void FileStoreTest::scanDuringADeletionIsRefused()
{
    makeFiles(5, 1);
    FileStore store(directory());
    QSignalSpy deleted(&store, &AbstractFileStore::deleteComplete);
    QSignalSpy complete(&store, &AbstractFileStore::scanComplete);
    store.deleteFile(0);
    QVERIFY(store.isDeleting());
    store.rescan();
    QVERIFY(!store.isScanning());
    QCOMPARE(loggedTexts(log()),
             QStringList{warning(479, "Attempting to start a scan while a deletion is in progress.")});
    QTRY_COMPARE(deleted.count(), 1);
    settle();
    QCOMPARE(complete.count(), 0);
    QVERIFY(!store.isDeleting());
}

void FileStoreTest::secondDeletionIsRefused()
{
    makeFiles(5, 1);
    FileStore store(directory());
    QSignalSpy deleted(&store, &AbstractFileStore::deleteComplete);
    store.deleteFile(0);
    store.deleteFile(1);
    QCOMPARE(loggedTexts(log()),
             QStringList{warning(309, "Attempting to delete a file while a deletion is in progress.")});
    QTRY_COMPARE(deleted.count(), 1);
    settle();
    QCOMPARE(deleted.count(), 1);
    QCOMPARE(listing().size(), 4);
}

void FileStoreTest::stoppedScanReportsNothing()
{
    makeFiles(100, 1);
    FileStore store(directory());
    QSignalSpy complete(&store, &AbstractFileStore::scanComplete);
    store.rescan();
    store.stopScanning();
    QVERIFY(!store.isScanning());
    settle();
    QCOMPARE(complete.count(), 0);
}

void FileStoreTest::stoppedScanStoresWhatItHasCounted()
{
    constexpr int files = 10000;
    makeFiles(files, 1);
    FileStore store(directory());
    // When the scan gets to run is the scheduler's business: stop it a little later each time until it was under way.
    int counted = 0;
    for (int attempt = 0; attempt < 2000 && (counted == 0 || counted == files); ++attempt) {
        store.rescan();
        ::usleep(static_cast<useconds_t>(attempt * 20));
        store.stopScanning();
        settle();
        counted = store.count();
        QCOMPARE(store.bytesUsed(), counted);
    }
    QVERIFY(counted > 0);
    QVERIFY(counted < files);
}

void FileStoreTest::stoppedScanFillsTheCacheAnew()
{
    makeFiles(1, 1);
    FileStore store(directory());
    QVERIFY(QFile::rename(path("file 0"), path("renamed")));
    QCOMPARE(store.fileAt(0).fileName(), "file 0");
    {
        const PoolHold hold;
        store.rescan();
        store.stopScanning();
    }
    settle();
    QCOMPARE(store.fileAt(0).fileName(), "renamed");
}

void FileStoreTest::scanAfterAStoppedOneReportsOnceAndCountsAll()
{
    constexpr int files = 2000;
    makeFiles(files, 1);
    FileStore store(directory());
    QSignalSpy complete(&store, &AbstractFileStore::scanComplete);
    for (int round = 1; round <= 20; ++round) {
        store.rescan();
        store.stopScanning();
        store.rescan();
        QVERIFY(store.isScanning());
        QTRY_COMPARE(complete.count(), round);
        QCOMPARE(store.count(), files);
        settle();
        QCOMPARE(complete.count(), round);
    }
    QCOMPARE(loggedTexts(log()), QStringList());
}

/// Else its counts could be overwritten by those of the stopped one.
void FileStoreTest::scanWaitsForTheEndOfAStoppedOne()
{
    makeFiles(50, 1);
    FileStore store(directory());
    const QSignalSpy complete(&store, &AbstractFileStore::scanComplete);
    {
        ScanHold hold;
        store.rescan();
        hold.await();
        store.stopScanning();
        store.rescan();
        QTest::qWait(100);
        QCOMPARE(complete.count(), 0);
    }
    QTRY_COMPARE(complete.count(), 1);
    QCOMPARE(store.count(), 50);
}

void FileStoreTest::deletionAfterAStoppedScanHappensAfterIt()
{
    makeFiles(50, 1);
    FileStore store(directory());
    scan(store);
    QSignalSpy deleted(&store, &AbstractFileStore::deleteComplete);
    {
        const PoolHold hold;
        store.rescan();
        store.stopScanning();
        store.deleteFile(0);
    }
    QTRY_COMPARE(deleted.count(), 1);
    QCOMPARE(listing().size(), 49);
    // The stopped scan has seen nothing, and the deletion found nothing to subtract from.
    QCOMPARE(store.count(), 0);
    QCOMPARE(store.bytesUsed(), 0);
}

void FileStoreTest::deletionWaitsForTheEndOfAStoppedScan()
{
    makeFiles(50, 1);
    FileStore store(directory());
    const QSignalSpy deleted(&store, &AbstractFileStore::deleteComplete);
    {
        ScanHold hold;
        store.rescan();
        hold.await();
        store.stopScanning();
        store.deleteFile(0);
        QTest::qWait(100);
        QCOMPARE(listing().size(), 50);
    }
    QTRY_COMPARE(deleted.count(), 1);
    QCOMPARE(listing().size(), 49);
}

void FileStoreTest::stopWithoutAScanDoesNothing()
{
    makeFiles(2, 1);
    FileStore store(directory());
    store.stopScanning();
    scan(store);
    store.stopScanning();
    QCOMPARE(store.count(), 2);
    QCOMPARE(loggedTexts(log()), QStringList());
}

void FileStoreTest::createFileNamesAFileAndCreatesNothing()
{
    FileStore store(directory());
    const QFileInfo file = store.createFile("new one");
    QCOMPARE(file.absoluteFilePath(), path("new one"));
    QVERIFY(!file.exists());
}

void FileStoreTest::spaceIsTheFileSystems()
{
    const FileStore store(directory());
    checkThatSpaceIsTheFileSystems([&] { return Space::of(store); });
}

void FileStoreTest::spaceIsCountedInBlocksWithTheSuperusersReserve()
{
    const FileStore store(directory());
    checkThatSpaceIsCountedInBlocksWithTheSuperusersReserve([&] { return Space::of(store); });
}

void FileStoreTest::vanishedDirectoryHasNoSpaceAndNoWarning()
{
    FileStore store(directory());
    QVERIFY(QDir(directory()).removeRecursively());
    QCOMPARE(store.bytesFree(), 0);
    QCOMPARE(store.bytesCapacity(), 0);
    QCOMPARE(loggedTexts(log()), QStringList());
    scan(store);
    QCOMPARE(store.count(), 0);
}

void FileStoreTest::refusedSpaceIsLogged()
{
    FileStore store(directory());
    SpaceCalls::failing = 1;
    QCOMPARE(store.bytesFree(), 0);
    QCOMPARE(loggedTexts(log()), QStringList{warning(429, noInformation)});
    SpaceCalls::failing = 1;
    QCOMPARE(store.bytesCapacity(), 0);
    QCOMPARE(loggedTexts(log()), QStringList{warning(457, noInformation)});
    QVERIFY(store.bytesCapacity() > 0);
}

void FileStoreTest::unreadableDirectoryIsEmpty()
{
    makeFiles(4, 1);
    QVERIFY(QFile::setPermissions(directory(), QFileDevice::Permissions()));
    FileStore store(directory());
    scan(store);
    QCOMPARE(store.count(), 0);
    QVERIFY(!store.fileAt(0).exists());
    store.deleteFile(0);
    QVERIFY(!store.isDeleting());
    QCOMPARE(loggedTexts(log()), QStringList{warning(347, "Attempting to delete a file that does not exist")});
    QVERIFY(QFile::setPermissions(directory(), QFile::ReadOwner | QFile::WriteOwner | QFile::ExeOwner));
    QCOMPARE(listing().size(), 4);
}

void FileStoreTest::fileInPlaceOfTheDirectoryIsAnEmptyStore()
{
    makeFile("plain", 5);
    FileStore store(path("plain"));
    scan(store);
    QCOMPARE(store.count(), 0);
    QVERIFY(store.fileAt(0).fileName().isEmpty());
    QCOMPARE(store.bytesFree(), 0);
    QCOMPARE(store.bytesCapacity(), 0);
    store.deleteFile(0);
    QCOMPARE(loggedTexts(log()), QStringList{warning(347, "Attempting to delete a file that does not exist")});
    QCOMPARE(QFileInfo(path("plain")).size(), 5);
}

void FileStoreTest::directoryThatCannotBeMadeIsAnEmptyStore()
{
    makeFile("plain", 5);
    FileStore store(path("plain") + "/below");
    scan(store);
    QCOMPARE(store.count(), 0);
    QCOMPARE(store.bytesFree(), 0);
    QCOMPARE(loggedTexts(log()), QStringList());
}

QTEST_GUILESS_MAIN(FileStoreTest)
#include "FileStoreTest.moc"
