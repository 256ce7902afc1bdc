// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/DataSource/FileStoreFixture.h"

#include <QDirIterator>
#include <QSignalSpy>
#include <QTest>
#include <QThreadPool>

#include <dlfcn.h>

#include <condition_variable>
#include <mutex>

extern "C" int statvfs(const char* path, struct statvfs* status) noexcept
{
    using Function = int (*)(const char*, struct statvfs*);
    static const auto real = reinterpret_cast<Function>(TestSupport::nextSymbol("statvfs"));
    if (TestSupport::SpaceCalls::failing > 0) {
        --TestSupport::SpaceCalls::failing;
        errno = EIO;
        return -1;
    }
    const int result = real(path, status);
    if (TestSupport::SpaceCalls::claimed)
        *status = *TestSupport::SpaceCalls::claimed;
    return result;
}

namespace TestSupport
{

namespace
{

/// Without captures, which the pool would hand over out of the thread sanitizer's sight.
struct Gate
{
    std::mutex mutex;
    std::condition_variable changed;
    int running = 0;
    bool isOpen = false;
};

Gate& gate()
{
    static Gate instance;
    return instance;
}

void waitAtTheGate()
{
    std::unique_lock lock(gate().mutex);
    ++gate().running;
    gate().changed.notify_all();
    gate().changed.wait(lock, [] { return gate().isOpen; });
    --gate().running;
    gate().changed.notify_all();
}

} // namespace

PoolHold::PoolHold()
{
    auto* const pool = QThreadPool::globalInstance();
    const int threads = pool->maxThreadCount();
    std::unique_lock lock(gate().mutex);
    gate().isOpen = false;
    for (int held = 0; held < threads; ++held)
        pool->start(waitAtTheGate);
    gate().changed.wait(lock, [&] { return gate().running == threads; });
}

PoolHold::~PoolHold()
{
    std::unique_lock lock(gate().mutex);
    gate().isOpen = true;
    gate().changed.notify_all();
    gate().changed.wait(lock, [] { return gate().running == 0; });
}

void* nextSymbol(const char* name)
{
    return ::dlsym(RTLD_NEXT, name);
}

void FileStoreFixture::makeFile(const QString& name, qint64 size) const
{
    QFile file(path(name));
    QVERIFY2(file.open(QIODevice::WriteOnly), qPrintable(file.errorString()));
    QVERIFY(file.resize(size));
}

void FileStoreFixture::makeFiles(int count, qint64 sizeEach) const
{
    for (int index = 0; index < count; ++index)
        makeFile(QStringLiteral("file %1").arg(index), sizeEach);
}

QStringList FileStoreFixture::listing() const
{
    QStringList names;
    QDirIterator iterator(directory(), QDir::Files);
    while (iterator.hasNext())
        names.append(iterator.nextFileInfo().fileName());
    return names;
}

unsigned int FileStoreFixture::positionOf(const QString& name) const
{
    return static_cast<unsigned int>(listing().indexOf(name));
}

QStringList FileStoreFixture::oddNames()
{
    return {QStringLiteral("m\u00fcsik \u20ac \U0001F600"), "two\nlines", " ", "%s%n", "-rf", "a\\b", "quo\"te", "?"};
}

void FileStoreFixture::checkThatSpaceIsTheFileSystems(const std::function<Space()>& space) const
{
    struct statvfs status
    {
    };
    QCOMPARE(::statvfs(qPrintable(directory()), &status), 0);
    const Space before = space();
    QCOMPARE(before.capacity, static_cast<qint64>(status.f_bsize * status.f_blocks));
    QVERIFY(before.capacity > 0);
    QFile file(path("used"));
    QVERIFY(file.open(QIODevice::WriteOnly));
    QCOMPARE(file.write(QByteArray(1 << 20, 'x')), 1 << 20);
    file.close();
    QVERIFY(before.free - space().free >= 1 << 20);
}

void FileStoreFixture::checkThatSpaceIsCountedInBlocksWithTheSuperusersReserve(const std::function<Space()>& space)
{
    struct statvfs card
    {
    };
    card.f_bsize = 4096;
    card.f_frsize = 512;
    card.f_blocks = 3'000'000'000;
    card.f_bfree = 2'000'000'000;
    card.f_bavail = 1'000'000'000;
    SpaceCalls::claimed = card;
    const Space claimed = space();
    SpaceCalls::claimed.reset();
    QCOMPARE(claimed.capacity, 12'288'000'000'000);
    QCOMPARE(claimed.free, 8'192'000'000'000);
}

void FileStoreFixture::scan(DataSource::AbstractFileStore& store)
{
    QSignalSpy complete(&store, &DataSource::AbstractFileStore::scanComplete);
    store.rescan();
    QTRY_COMPARE_WITH_TIMEOUT(complete.count(), 1, 60000);
}

void FileStoreFixture::settle()
{
    QThreadPool::globalInstance()->waitForDone();
    QCoreApplication::processEvents();
    QCoreApplication::processEvents();
}

void FileStoreFixture::init()
{
    temporary = std::make_unique<QTemporaryDir>();
    QVERIFY(QDir().mkpath(directory()));
    capture = std::make_unique<LogCapture>();
}

void FileStoreFixture::cleanup()
{
    settle();
    capture.reset();
    temporary.reset();
}

} // namespace TestSupport
