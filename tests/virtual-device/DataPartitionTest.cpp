// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/tree/DataPartition.h"

#include "tests/virtual-device/FuseTest.h"
#include "tests/virtual-device/MountFixture.h"

#include <QDir>
#include <QFile>
#include <QTemporaryDir>
#include <QTest>

#include <linux/fs.h>
#include <sys/stat.h>
#include <sys/statvfs.h>

#include <memory>

using TestSupport::MountFixture;
using TestSupport::RawFile;
using VirtualDevice::DataPartition;

class DataPartitionTest : public MountFixture
{
    Q_OBJECT

private slots:
    void init();
    void cleanup();
    void whatIsWrittenLiesInTheFolder();
    void whatLiesInTheFolderIsRead();
    void filesAreRenamedCutAndRemoved();
    void appendingGoesToTheEnd();
    void removedFileStaysReadableWhileOpen();
    void foldersAreMadeListedAndRemoved();
    void folderTakesNoRequestAndGoesOn();
    void linksAreLinks();
    void sizeOfThePartitionIsTheHosts();
    void readOnlyRefusesEveryChangeAndStillReads();
    void turningReadOnlyStopsAFileThatIsOpen();
    void fullRefusesGrowthAndStillReadsAndRemoves();
    void failureFailsEverything_data();
    void failureFailsEverything();
    void unmountClosesWhatIsStillOpen();
    void folderThatDoesNotExistIsReported();

private:
    [[nodiscard]] QString behind(const QString& path) const { return folder->filePath(path); }
    static void write(const QString& path, const QByteArray& content)
    {
        QFile file(path);
        QVERIFY(file.open(QIODevice::WriteOnly));
        QCOMPARE(file.write(content), content.size());
    }
    static QByteArray read(const QString& path)
    {
        QFile file(path);
        return file.open(QIODevice::ReadOnly) ? file.readAll() : QByteArray("cannot be opened");
    }

    std::unique_ptr<QTemporaryDir> folder;
    std::unique_ptr<DataPartition> partition;
};

void DataPartitionTest::init()
{
    REQUIRE_FUSE();
    folder = std::make_unique<QTemporaryDir>();
    makeMountPoint();
    partition = std::make_unique<DataPartition>(*registry);
    QCOMPARE(partition->mount(folder->path(), mountPoint->path()), std::nullopt);
}

void DataPartitionTest::cleanup()
{
    partition.reset();
    removeMountPoint();
    folder.reset();
}

void DataPartitionTest::whatIsWrittenLiesInTheFolder()
{
    write(at("testfile"), "Vantor Tamberly");
    QCOMPARE(read(behind("testfile")), "Vantor Tamberly");
    QCOMPARE(read(at("testfile")), "Vantor Tamberly");
}

void DataPartitionTest::whatLiesInTheFolderIsRead()
{
    QVERIFY(!QFile::exists(at("testfile")));
    write(behind("testfile"), "one");
    QCOMPARE(read(at("testfile")), "one");
    write(behind("testfile"), "another");
    QCOMPARE(read(at("testfile")), "another");
    QVERIFY(QFile::remove(behind("testfile")));
    QVERIFY(!QFile::exists(at("testfile")));
}

void DataPartitionTest::filesAreRenamedCutAndRemoved()
{
    write(at("a"), "0123456789");
    QVERIFY(QFile::rename(at("a"), at("b")));
    QVERIFY(QFile::resize(at("b"), 4));
    QCOMPARE(read(at("b")), "0123");
    QCOMPARE(QFileInfo(at("b")).size(), 4);
    QVERIFY(QFile::setPermissions(at("b"), QFile::ReadOwner));
    QVERIFY(QFile::remove(at("b")));
    QVERIFY(QDir(folder->path()).isEmpty());
}

void DataPartitionTest::appendingGoesToTheEnd()
{
    write(at("a"), "one");
    RawFile file(at("a"), O_WRONLY | O_APPEND);
    write(behind("a"), "longer");
    QCOMPARE(file.write("+"), 0);
    QCOMPARE(read(at("a")), "longer+");
}

void DataPartitionTest::removedFileStaysReadableWhileOpen()
{
    write(at("a"), "content");
    RawFile file(at("a"), O_RDWR);
    QVERIFY(QFile::remove(at("a")));
    QVERIFY(QDir(folder->path()).isEmpty());
    QCOMPARE(file.read(100), "content");
    QCOMPARE(file.write("more"), 0);
    QCOMPARE(::ftruncate(file.handle(), 2), 0);
    file.rewind();
    QCOMPARE(file.read(100), "co");
    QCOMPARE(::fsync(file.handle()), 0);
}

void DataPartitionTest::foldersAreMadeListedAndRemoved()
{
    QVERIFY(QDir(mountPoint->path()).mkpath("x/y"));
    for (int number = 0; number < 300; ++number)
        write(at("x/y/" + QString::number(number)), "");
    QCOMPARE(QDir(at("x/y")).entryList(QDir::Files).size(), 300);
    QVERIFY(QDir(at("x")).removeRecursively());
    QVERIFY(QDir(folder->path()).isEmpty());
}

void DataPartitionTest::folderTakesNoRequestAndGoesOn()
{
    QVERIFY(QDir(mountPoint->path()).mkdir("made"));
    const RawFile open(at("made"), O_RDONLY | O_DIRECTORY);
    QVERIFY(TestSupport::errorOfRequest(open, FS_IOC_GETFLAGS) > 0);
    QCOMPARE(::fsync(open.handle()), 0);
    QCOMPARE(::lseek(open.handle(), 0, SEEK_SET), 0);
    write(at("made/a"), "content");
    QCOMPARE(read(behind("made/a")), "content");
}

void DataPartitionTest::linksAreLinks()
{
    write(at("a"), "content");
    QVERIFY(QFile::link("a", at("symbolic")));
    QCOMPARE(QFile::symLinkTarget(at("symbolic")), at("a"));
    QCOMPARE(read(at("symbolic")), "content");
    QCOMPARE(::link(qPrintable(at("a")), qPrintable(at("hard"))), 0);
    QCOMPARE(read(at("hard")), "content");
}

void DataPartitionTest::sizeOfThePartitionIsTheHosts()
{
    struct statvfs served
    {
    };
    struct statvfs host
    {
    };
    QCOMPARE(::statvfs(qPrintable(mountPoint->path()), &served), 0);
    QCOMPARE(::statvfs(qPrintable(folder->path()), &host), 0);
    QCOMPARE(served.f_blocks, host.f_blocks);
    QVERIFY(served.f_bavail > 0);
}

void DataPartitionTest::readOnlyRefusesEveryChangeAndStillReads()
{
    write(at("a"), "content");
    set("sd.readonly", true);
    QCOMPARE(read(at("a")), "content");
    QCOMPARE(RawFile(at("a"), O_WRONLY).error(), EROFS);
    QCOMPARE(RawFile(at("new"), O_WRONLY | O_CREAT).error(), EROFS);
    const auto refused = [](int result) { return result == -1 && errno == EROFS; };
    QVERIFY(refused(::unlink(qPrintable(at("a")))));
    QVERIFY(refused(::mkdir(qPrintable(at("x")), 0700)));
    QVERIFY(refused(::rename(qPrintable(at("a")), qPrintable(at("b")))));
    QVERIFY(refused(::truncate(qPrintable(at("a")), 0)));
    QVERIFY(refused(::chmod(qPrintable(at("a")), 0600)));
    QVERIFY(refused(::access(qPrintable(at("a")), W_OK)));
    QCOMPARE(::access(qPrintable(at("a")), R_OK), 0);
    QCOMPARE(QDir(folder->path()).entryList(QDir::Files), QStringList{"a"});
    set("sd.readonly", false);
    write(at("new"), "x");
}

void DataPartitionTest::turningReadOnlyStopsAFileThatIsOpen()
{
    RawFile file(at("a"), O_RDWR | O_CREAT);
    QCOMPARE(file.write("one"), 0);
    set("sd.readonly", true);
    QCOMPARE(file.write("two"), EROFS);
    set("sd.readonly", false);
    QCOMPARE(file.write("two"), 0);
    QCOMPARE(read(behind("a")), "onetwo");
}

void DataPartitionTest::fullRefusesGrowthAndStillReadsAndRemoves()
{
    write(at("a"), "content");
    set("sd.full", true);
    QCOMPARE(RawFile(at("new"), O_WRONLY | O_CREAT).error(), ENOSPC);
    RawFile file(at("a"), O_RDWR);
    QCOMPARE(file.write("x"), ENOSPC);
    QCOMPARE(file.read(100), "content");
    struct statvfs status
    {
    };
    QCOMPARE(::statvfs(qPrintable(mountPoint->path()), &status), 0);
    QCOMPARE(status.f_bavail, 0U);
    QVERIFY(QFile::remove(at("a")));
}

void DataPartitionTest::failureFailsEverything_data()
{
    TestSupport::addErrnoRows();
}

void DataPartitionTest::failureFailsEverything()
{
    QFETCH(const QString, fault);
    QFETCH(const int, error);
    write(at("a"), "content");
    RawFile file(at("a"), O_RDWR);
    set("sd.fault", fault);
    file.read(100);
    QCOMPARE(file.error(), error);
    QCOMPARE(file.write("x"), error);
    QCOMPARE(RawFile(at("a"), O_RDONLY).error(), error);
    QVERIFY(!QFile::exists(at("a")));
    QVERIFY(QDir(mountPoint->path()).isEmpty());
    QVERIFY(QFileInfo(mountPoint->path()).isDir()); // the mount itself stays
    set("sd.fault", "none");
    QCOMPARE(read(at("a")), "content");
}

void DataPartitionTest::unmountClosesWhatIsStillOpen()
{
    const auto descriptors = [] { return QDir("/proc/self/fd").entryList(QDir::AllEntries | QDir::System).size(); };
    partition->unmount();
    const auto before = descriptors();
    QCOMPARE(partition->mount(folder->path(), mountPoint->path()), std::nullopt);
    write(at("a"), "content");
    {
        RawFile file(at("a"), O_RDWR);
        const RawFile open(mountPoint->path(), O_RDONLY | O_DIRECTORY);
        partition->unmount();
        file.read(100);
        QVERIFY(file.error() != 0);
    }
    QCOMPARE(descriptors(), before);
}

void DataPartitionTest::folderThatDoesNotExistIsReported()
{
    DataPartition other(*registry);
    QCOMPARE(other.mount(behind("missing"), mountPoint->path()), behind("missing") + ": No such file or directory");
}

QTEST_GUILESS_MAIN(DataPartitionTest)
#include "DataPartitionTest.moc"
