// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "DataSource/src/AbstractFileStore.h"
#include "tests/support/LoggedTexts.h"

#include <QDir>
#include <QObject>
#include <QTemporaryDir>

#include <memory>

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
