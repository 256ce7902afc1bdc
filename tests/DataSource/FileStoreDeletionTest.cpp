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
#include <mutex>
#include <thread>

using DataSource::AbstractFileStore;
using DataSource::FileStore;
using TestSupport::FileStoreFixture;
using TestSupport::loggedTexts;
using TestSupport::PoolHold;

namespace
{

constexpr qint64 mebibyte = 1024 * 1024;

QString warning(int line, const QString& text)
{
    return QStringLiteral("DataSource/src/FileStore.cpp, %1, %2").arg(line).arg(text);
}

QList<int> percentages(const QSignalSpy& spy)
{
    QList<int> values;
    for (const auto& arguments : spy)
        values.append(arguments.at(0).toInt());
    return values;
}

/// A function that the store's task calls again and again, of which one call may be held up.
class HeldCall
{
public:
    void holdUp(int call)
    {
        calls = 0;
        heldUp = call;
    }
    void release() { heldUp = none; }
    [[nodiscard]] bool isWaiting() const { return waiting; }
    [[nodiscard]] int count() const { return calls; }

    void called()
    {
        if (std::this_thread::get_id() == testThread)
            return;
        const int call = ++calls;
        waiting = call == heldUp;
        while (call == heldUp)
            ::usleep(1000);
        waiting = false;
    }

private:
    static constexpr int none = -1;
    const std::thread::id testThread = std::this_thread::get_id();
    std::atomic<int> calls = 0;
    std::atomic<int> heldUp = none;
    std::atomic<bool> waiting = false;
};

HeldCall listingStep;
HeldCall shrinkStep;

} // namespace

/// Qt's, on this platform.
extern "C" struct dirent64* readdir64(DIR* stream)
{
    static const auto real = reinterpret_cast<struct dirent64* (*)(DIR*)>(TestSupport::nextSymbol("readdir64"));
    listingStep.called();
    return real(stream);
}

extern "C" int ftruncate(int file, off_t length) noexcept
{
    static const auto real = reinterpret_cast<int (*)(int, off_t)>(TestSupport::nextSymbol("ftruncate"));
    shrinkStep.called();
    return real(file, length);
}

/// Nothing but the chosen entry of the store's directory may ever change.
class FileStoreDeletionTest : public FileStoreFixture
{
    Q_OBJECT

private slots:
    void largeFileReportsProgressAndThenCompletion();
    void progressOfSizes_data();
    void progressOfSizes();
    void fileIsShrunkFromItsEnd();
    void progressComesFromThePoolAndTheEndFromTheStoresThread();
    void emptyFileReportsNoProgress();
    void countAndBytesDropAtOnce();
    void deletionBeforeTheFirstScanLeavesTheCountAtZero();
    void cacheIsFilledAnewAfterwards();
    void indexAtTheCountIsLogged();
    void hugeIndexIsLogged();
    void anyIndexOfAnEmptyDirectory();
    void oddNamesAreDeletedAndNothingElse();
    void symbolicLinkIsRemovedAndItsTargetUntouched();
    void fileWithAnotherNameElsewhereKeepsItsContentThere();
    void fileThatVanishedMeanwhile();
    void fileReplacedByALinkMeanwhile();
    void fileReplacedByADirectoryMeanwhile();
    void fileReplacedByAPipeMeanwhile();
    void directoryThatVanishedMeanwhile();
    void readOnlyFileIsRemoved();
    void readOnlyDirectoryKeepsTheEntry();
    void destructionInTheMiddleOfAScanStopsIt();
    void destructionInTheMiddleOfADeletionLetsItEndUnheard();
    void destructionDuringAScan();
    void destructionDuringADeletion();
    void destructionBeforeTheTaskStarts();

private:
    /// Deletes and waits for the end; `meanwhile` happens between the request and the work.
    template <typename Meanwhile> void remove(FileStore& store, const QString& name, Meanwhile meanwhile);
    void remove(FileStore& store, const QString& name)
    {
        remove(store, name, [] {});
    }
};

template <typename Meanwhile>
void FileStoreDeletionTest::remove(FileStore& store, const QString& name, Meanwhile meanwhile)
{
    QSignalSpy complete(&store, &AbstractFileStore::deleteComplete);
    {
        const PoolHold hold;
        store.deleteFile(positionOf(name));
        QVERIFY(store.isDeleting());
        meanwhile();
    }
    QTRY_COMPARE(complete.count(), 1);
    QVERIFY(!store.isDeleting());
}

void FileStoreDeletionTest::largeFileReportsProgressAndThenCompletion()
{
    makeFile("large", 25 * mebibyte);
    FileStore store(directory());
    QStringList events;
    connect(&store, &AbstractFileStore::deleteProgress, this,
            [&](qint32 percent) { events.append(QString::number(percent)); });
    connect(&store, &AbstractFileStore::deleteComplete, this, [&] { events.append("complete"); });
    store.deleteFile(0);
    QTRY_COMPARE(events, (QStringList{"0", "40", "80", "complete"}));
    QVERIFY(!QFile::exists(path("large")));
}

void FileStoreDeletionTest::progressOfSizes_data()
{
    QTest::addColumn<qint64>("size");
    QTest::addColumn<QList<int>>("percent");
    QTest::addRow("one byte") << qint64(1) << QList<int>{0};
    QTest::addRow("one step") << 10 * mebibyte << QList<int>{0};
    QTest::addRow("one step and a byte") << 10 * mebibyte + 1 << QList<int>{0, 99};
    QTest::addRow("30 MiB") << 30 * mebibyte << QList<int>{0, 34, 67};
    QTest::addRow("beyond 32 bits") << 400000 * mebibyte << QList<int>();
}

void FileStoreDeletionTest::progressOfSizes()
{
    QFETCH(const qint64, size);
    QFETCH(const QList<int>, percent);
    makeFile("file", size);
    FileStore store(directory());
    QSignalSpy progress(&store, &AbstractFileStore::deleteProgress);
    remove(store, "file");
    auto found = percentages(progress);
    if (percent.isEmpty()) {
        QCOMPARE(found.size(), (size + 10 * mebibyte - 1) / (10 * mebibyte));
        QCOMPARE(found.first(), 0);
        QCOMPARE(found.last(), 99);
        QVERIFY(std::is_sorted(found.begin(), found.end()));
    } else {
        QCOMPARE(found, percent);
    }
}

void FileStoreDeletionTest::fileIsShrunkFromItsEnd()
{
    makeFile("large", 25 * mebibyte);
    FileStore store(directory());
    QList<qint64> sizes;
    // On the deleting thread itself, right after each step.
    connect(
        &store, &AbstractFileStore::deleteProgress, this,
        [&](qint32) { sizes.append(QFileInfo(path("large")).size()); }, Qt::DirectConnection);
    remove(store, "large");
    QCOMPARE(sizes, (QList<qint64>{25 * mebibyte, 15 * mebibyte, 5 * mebibyte}));
}

void FileStoreDeletionTest::progressComesFromThePoolAndTheEndFromTheStoresThread()
{
    makeFile("small", 1);
    FileStore store(directory());
    QThread* progressThread = nullptr;
    QThread* endThread = nullptr;
    bool wasDeleting = true;
    connect(
        &store, &AbstractFileStore::deleteProgress, this, [&](qint32) { progressThread = QThread::currentThread(); },
        Qt::DirectConnection);
    connect(
        &store, &AbstractFileStore::deleteComplete, this,
        [&] {
            endThread = QThread::currentThread();
            wasDeleting = store.isDeleting();
        },
        Qt::DirectConnection);
    remove(store, "small");
    QVERIFY(progressThread != nullptr && progressThread != store.thread());
    QCOMPARE(endThread, store.thread());
    QVERIFY(!wasDeleting);
}

void FileStoreDeletionTest::emptyFileReportsNoProgress()
{
    makeFile("empty", 0);
    FileStore store(directory());
    QSignalSpy progress(&store, &AbstractFileStore::deleteProgress);
    remove(store, "empty");
    QCOMPARE(progress.count(), 0);
    QVERIFY(!QFile::exists(path("empty")));
}

void FileStoreDeletionTest::countAndBytesDropAtOnce()
{
    makeFile("large", 25 * mebibyte);
    makeFile("small", 7);
    FileStore store(directory());
    scan(store);
    QList<std::pair<int, qint64>> seen;
    connect(
        &store, &AbstractFileStore::deleteProgress, this,
        [&](qint32) {
            seen.append({store.count(), store.bytesUsed()});
        },
        Qt::DirectConnection);
    remove(store, "large");
    QCOMPARE(seen, (QList<std::pair<int, qint64>>{{1, 7}, {1, 7}, {1, 7}}));
    QCOMPARE(store.count(), 1);
    QCOMPARE(store.bytesUsed(), 7);
}

void FileStoreDeletionTest::deletionBeforeTheFirstScanLeavesTheCountAtZero()
{
    makeFiles(3, 5);
    FileStore store(directory());
    remove(store, "file 1");
    QCOMPARE(store.count(), 0);
    QCOMPARE(store.bytesUsed(), 0);
    scan(store);
    QCOMPARE(store.count(), 2);
}

void FileStoreDeletionTest::cacheIsFilledAnewAfterwards()
{
    makeFiles(3, 5);
    FileStore store(directory());
    const QString first = store.fileAt(0).fileName();
    remove(store, first);
    QCOMPARE(store.fileAt(0).fileName(), listing().at(0));
    QVERIFY(store.fileAt(0).fileName() != first);
}

void FileStoreDeletionTest::indexAtTheCountIsLogged()
{
    makeFiles(3, 5);
    FileStore store(directory());
    scan(store);
    store.deleteFile(static_cast<unsigned int>(store.count()));
    QVERIFY(!store.isDeleting());
    QCOMPARE(loggedTexts(log()),
             QStringList{
                 warning(333, "Attempting to delete a file index larger than the number of files in the directory")});
    QCOMPARE(listing().size(), 3);
    QCOMPARE(store.count(), 3);
}

void FileStoreDeletionTest::hugeIndexIsLogged()
{
    makeFiles(3, 5);
    FileStore store(directory());
    store.deleteFile(0xFFFFFFFF);
    QCOMPARE(loggedTexts(log()),
             QStringList{
                 warning(333, "Attempting to delete a file index larger than the number of files in the directory")});
}

void FileStoreDeletionTest::anyIndexOfAnEmptyDirectory()
{
    FileStore store(directory());
    store.deleteFile(0);
    store.deleteFile(1);
    QCOMPARE(loggedTexts(log()),
             (QStringList{warning(347, "Attempting to delete a file that does not exist"),
                          warning(333, "Attempting to delete a file index larger than the number of files in the "
                                       "directory")}));
    QVERIFY(!store.isDeleting());
}

void FileStoreDeletionTest::oddNamesAreDeletedAndNothingElse()
{
    for (const auto& name : oddNames())
        makeFile(name, 3);
    FileStore store(directory());
    QStringList left = oddNames();
    while (!left.isEmpty()) {
        remove(store, left.takeFirst());
        auto found = listing();
        std::sort(found.begin(), found.end());
        auto expected = left;
        std::sort(expected.begin(), expected.end());
        QCOMPARE(found, expected);
    }
}

void FileStoreDeletionTest::symbolicLinkIsRemovedAndItsTargetUntouched()
{
    makeFile("../outside", 25 * mebibyte);
    QVERIFY(QFile::link(root() + "/outside", path("link")));
    FileStore store(directory());
    scan(store);
    QSignalSpy progress(&store, &AbstractFileStore::deleteProgress);
    remove(store, "link");
    QCOMPARE(QFileInfo(root() + "/outside").size(), 25 * mebibyte);
    QVERIFY(!QFileInfo(path("link")).isSymLink());
    QCOMPARE(percentages(progress), (QList<int>{0, 40, 80}));
    QCOMPARE(store.bytesUsed(), 0);
}

void FileStoreDeletionTest::fileWithAnotherNameElsewhereKeepsItsContentThere()
{
    makeFile("shared", 25 * mebibyte);
    QCOMPARE(::link(qPrintable(path("shared")), qPrintable(root() + "/outside")), 0);
    FileStore store(directory());
    QSignalSpy progress(&store, &AbstractFileStore::deleteProgress);
    remove(store, "shared");
    QCOMPARE(percentages(progress), (QList<int>{0, 40, 80}));
    QVERIFY(!QFile::exists(path("shared")));
    QCOMPARE(QFileInfo(root() + "/outside").size(), 25 * mebibyte);
}

void FileStoreDeletionTest::fileThatVanishedMeanwhile()
{
    makeFiles(3, 5);
    FileStore store(directory());
    scan(store);
    remove(store, "file 1", [this] { QVERIFY(QFile::remove(path("file 1"))); });
    QCOMPARE(listing().size(), 2);
    QCOMPARE(store.count(), 2);
    QCOMPARE(loggedTexts(log()), QStringList());
}

void FileStoreDeletionTest::fileReplacedByALinkMeanwhile()
{
    makeFile("../outside", 25 * mebibyte);
    makeFile("file", 11 * mebibyte);
    FileStore store(directory());
    remove(store, "file", [this] {
        QVERIFY(QFile::remove(path("file")));
        QVERIFY(QFile::link(root() + "/outside", path("file")));
    });
    QCOMPARE(QFileInfo(root() + "/outside").size(), 25 * mebibyte);
    QVERIFY(!QFileInfo(path("file")).isSymLink());
}

void FileStoreDeletionTest::fileReplacedByADirectoryMeanwhile()
{
    makeFile("file", 5);
    FileStore store(directory());
    remove(store, "file", [this] {
        QVERIFY(QFile::remove(path("file")));
        QVERIFY(QDir(directory()).mkpath("file/inner"));
    });
    QVERIFY(QFileInfo(path("file/inner")).isDir());
}

void FileStoreDeletionTest::fileReplacedByAPipeMeanwhile()
{
    makeFile("file", 5);
    FileStore store(directory());
    remove(store, "file", [this] {
        QVERIFY(QFile::remove(path("file")));
        QCOMPARE(::mkfifo(qPrintable(path("file")), 0600), 0);
    });
    QVERIFY(!QFile::exists(path("file")));
}

void FileStoreDeletionTest::directoryThatVanishedMeanwhile()
{
    makeFiles(2, 5);
    FileStore store(directory());
    remove(store, "file 0", [this] { QVERIFY(QDir(directory()).removeRecursively()); });
    QVERIFY(!store.fileAt(0).exists());
}

void FileStoreDeletionTest::readOnlyFileIsRemoved()
{
    makeFile("file", 11 * mebibyte);
    QVERIFY(QFile::setPermissions(path("file"), QFile::ReadOwner));
    FileStore store(directory());
    remove(store, "file");
    QVERIFY(!QFile::exists(path("file")));
}

void FileStoreDeletionTest::readOnlyDirectoryKeepsTheEntry()
{
    makeFile("file", 5);
    QVERIFY(QFile::setPermissions(directory(), QFile::ReadOwner | QFile::ExeOwner));
    FileStore store(directory());
    remove(store, "file");
    QVERIFY(QFile::exists(path("file")));
    QVERIFY(QFile::setPermissions(directory(), QFile::ReadOwner | QFile::WriteOwner | QFile::ExeOwner));
}

void FileStoreDeletionTest::destructionInTheMiddleOfAScanStopsIt()
{
    constexpr int files = 3000;
    makeFiles(files, 1);
    auto store = std::make_unique<FileStore>(directory());
    listingStep.holdUp(files / 2);
    store->rescan();
    QTRY_VERIFY(listingStep.isWaiting());
    store.reset();
    QVERIFY(listingStep.isWaiting());
    listingStep.release();
    settle();
    QVERIFY(listingStep.count() < files);
    QCOMPARE(listing().size(), files);
}

void FileStoreDeletionTest::destructionInTheMiddleOfADeletionLetsItEndUnheard()
{
    makeFile("large", 1000 * mebibyte); // a hundred steps
    auto store = std::make_unique<FileStore>(directory());
    std::atomic<int> reports = 0;
    connect(
        store.get(), &AbstractFileStore::deleteProgress, store.get(), [&](qint32) { ++reports; }, Qt::DirectConnection);
    shrinkStep.holdUp(50);
    store->deleteFile(0);
    QTRY_VERIFY(shrinkStep.isWaiting());
    QCOMPARE(reports.load(), 49);
    store.reset();
    QVERIFY(shrinkStep.isWaiting());
    shrinkStep.release();
    settle();
    QCOMPARE(shrinkStep.count(), 100);
    QCOMPARE(reports.load(), 49);
    QVERIFY(!QFile::exists(path("large")));
}

void FileStoreDeletionTest::destructionDuringAScan()
{
    makeFiles(3000, 1);
    for (int round = 0; round < 50; ++round) {
        auto store = std::make_unique<FileStore>(directory());
        store->rescan();
        ::usleep(static_cast<useconds_t>(round * 100));
        store.reset();
    }
    settle();
    QCOMPARE(listing().size(), 3000);
}

void FileStoreDeletionTest::destructionDuringADeletion()
{
    for (int round = 0; round < 50; ++round) {
        makeFile("large", 3000 * mebibyte);
        auto store = std::make_unique<FileStore>(directory());
        std::atomic<int> reports = 0;
        connect(
            store.get(), &AbstractFileStore::deleteProgress, store.get(), [&](qint32) { ++reports; },
            Qt::DirectConnection);
        store->deleteFile(0);
        ::usleep(static_cast<useconds_t>(round * 20));
        store.reset();
        const int atTheEnd = reports;
        settle();
        QCOMPARE(reports.load(), atTheEnd);
        QVERIFY(!QFile::exists(path("large")));
    }
}

void FileStoreDeletionTest::destructionBeforeTheTaskStarts()
{
    makeFiles(3, 1);
    {
        const PoolHold hold;
        FileStore scanned(directory());
        scanned.rescan();
        FileStore deleted(directory());
        deleted.deleteFile(0);
    }
    settle();
    QCOMPARE(listing().size(), 2);
}

QTEST_GUILESS_MAIN(FileStoreDeletionTest)
#include "FileStoreDeletionTest.moc"
