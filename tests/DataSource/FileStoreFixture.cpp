// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/DataSource/FileStoreFixture.h"

#include <QDirIterator>
#include <QSignalSpy>
#include <QTest>
#include <QThreadPool>

#include <dlfcn.h>

namespace TestSupport
{

PoolHold::PoolHold()
{
    auto* const pool = QThreadPool::globalInstance();
    const auto running = std::make_shared<QSemaphore>();
    for (; held < pool->maxThreadCount(); ++held)
        pool->start([running, waiting = gate] {
            running->release();
            waiting->acquire();
        });
    running->acquire(held);
}

PoolHold::~PoolHold()
{
    gate->release(held);
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
