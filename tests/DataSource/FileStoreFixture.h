// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "DataSource/src/AbstractFileStore.h"
#include "tests/support/LoggedTexts.h"

#include <QDir>
#include <QObject>
#include <QTemporaryDir>

#include <sys/statvfs.h>

#include <functional>
#include <memory>
#include <optional>

namespace TestSupport
{

/// Keeps every thread of the global pool busy, so that what is started meanwhile waits until the hold goes.
/// One at a time.
class PoolHold
{
public:
    PoolHold();
    ~PoolHold();
    PoolHold(const PoolHold&) = delete;
    PoolHold& operator=(const PoolHold&) = delete;
};

/// The C library's own version of a function that a test program replaces.
void* nextSymbol(const char* name);

/// What the programs with this fixture see of `statvfs`.
struct SpaceCalls
{
    /// While it is above 0, the calls fail: a file system on a dying card.
    static inline int failing = 0;
    /// The answer in place of the truth.
    static inline std::optional<struct statvfs> claimed;
};

/// What a store says of its file system, in bytes.
struct Space
{
    qint64 capacity;
    qint64 free;

    template <typename Store> static Space of(const Store& store) { return {store.bytesCapacity(), store.bytesFree()}; }
};

/// A fresh directory for every test function, and what the tests of the stores do with it.
class FileStoreFixture : public QObject
{
    Q_OBJECT

protected:
    /// The directory that holds the store's directory.
    [[nodiscard]] QString root() const { return temporary->path(); }
    /// The store's directory.
    [[nodiscard]] QString directory() const { return root() + "/store"; }
    [[nodiscard]] QString path(const QString& name) const { return directory() + "/" + name; }
    [[nodiscard]] LogCapture& log() { return *capture; }

    void makeFile(const QString& name, qint64 size) const;
    void makeFiles(int count, qint64 sizeEach) const;
    /// Names of the files in the file system's own order.
    [[nodiscard]] QStringList listing() const;
    /// Position of a file in that order.
    [[nodiscard]] unsigned int positionOf(const QString& name) const;
    [[nodiscard]] static QStringList oddNames();

    /// Both for a store on `directory()`.
    void checkThatSpaceIsTheFileSystems(const std::function<Space()>& space) const;
    static void checkThatSpaceIsCountedInBlocksWithTheSuperusersReserve(const std::function<Space()>& space);

    /// Scans and waits for the end of it.
    static void scan(DataSource::AbstractFileStore& store);
    /// Waits for all tasks on the pool and delivers what they have posted.
    static void settle();

private slots:
    void init();
    void cleanup();

private:
    std::unique_ptr<QTemporaryDir> temporary;
    std::unique_ptr<LogCapture> capture;
};

} // namespace TestSupport
