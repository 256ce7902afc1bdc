// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/sandbox/DeviceFolder.h"

#include "virtual-device/tree/Mounts.h"

#include <QDir>
#include <QFile>
#include <QScopeGuard>
#include <QTemporaryDir>
#include <QTest>

#include <fcntl.h>
#include <linux/fs.h>
#include <sys/ioctl.h>
#include <sys/stat.h>
#include <unistd.h>

using VirtualDevice::DeviceFolder;

class DeviceFolderTest : public QObject
{
    Q_OBJECT

private slots:
    void init();
    void cleanup();
    void folderLiesInTheRuntimeFolderForItsOwnerAlone();
    void runtimeFolderOfSomebodyElseIsNotUsed();
    void unnamedDevicesTakeTheFirstFreeNumber();
    void nameThatIsTakenIsRefused();
    void lockThatCannotBeMadeIsNotTakenForARunningDevice_data();
    void lockThatCannotBeMadeIsNotTakenForARunningDevice();
    void whereEveryNumberIsTakenNothingIsTouched();
    void nameCanBeTakenAgainAfterRelease();
    void names_data();
    void names();
    void runningDevicesAreThoseThatHoldTheirName();
    void cleanUpRemovesWhatAKilledDeviceLeft();
    void cleanUpLeavesRunningDevicesAlone();
    void claimReplacesWhatAKilledDeviceLeft();
    void whatCannotBeRemovedIsKeptForTheNextCleanUp();
    void controlSocketBelongsToTheName();
    void rootIsTheSameHoweverTheRuntimeFolderIsSpelt_data();
    void rootIsTheSameHoweverTheRuntimeFolderIsSpelt();
    void mountIsFoundHoweverItsFolderIsSpelt();
};

namespace
{

QTemporaryDir* runtime = nullptr;

/// What stands there after kill -9: the folder and a lock file that nobody holds.
void leaveBehind(const QString& name)
{
    QDir().mkpath(DeviceFolder::root() + '/' + name + "/state/mnt");
    QFile lock(DeviceFolder::root() + '/' + name + ".lock");
    QVERIFY(lock.open(QIODevice::WriteOnly));
}

/// Whether the folder can be made one that root, too, can neither empty nor remove, or back.
bool makeImmutable(const QByteArray& folder, bool isWanted)
{
    const int descriptor = ::open(folder.constData(), O_RDONLY | O_CLOEXEC);
    int flags = 0;
    bool isDone = ::ioctl(descriptor, FS_IOC_GETFLAGS, &flags) == 0;
    flags = isWanted ? flags | FS_IMMUTABLE_FL : flags & ~FS_IMMUTABLE_FL;
    isDone = isDone && ::ioctl(descriptor, FS_IOC_SETFLAGS, &flags) == 0;
    ::close(descriptor);
    return isDone;
}

} // namespace

void DeviceFolderTest::init()
{
    runtime = new QTemporaryDir;
    qputenv("XDG_RUNTIME_DIR", runtime->path().toLocal8Bit());
    // Made private, as claiming a name does.
    QCOMPARE(::mkdir(qPrintable(DeviceFolder::root()), 0700), 0);
}

void DeviceFolderTest::cleanup()
{
    delete runtime;
    runtime = nullptr;
}

void DeviceFolderTest::folderLiesInTheRuntimeFolderForItsOwnerAlone()
{
    DeviceFolder folder;
    QCOMPARE(folder.claim("bench"), std::nullopt);
    QCOMPARE(folder.name(), "bench");
    QCOMPARE(folder.path(), runtime->path() + "/virtual-device/bench");
    QCOMPARE(folder.path("log"), folder.path() + "/log");
    struct stat status
    {
    };
    QCOMPARE(::stat(qPrintable(folder.path()), &status), 0);
    QCOMPARE(status.st_mode & 0777, 0700U);
}

void DeviceFolderTest::runtimeFolderOfSomebodyElseIsNotUsed()
{
    const QString fallback = QString("/tmp/virtual-device-%1").arg(::geteuid());
    QCOMPARE(::chmod(qPrintable(runtime->path()), 0755), 0);
    QCOMPARE(DeviceFolder::root(), fallback);
    qunsetenv("XDG_RUNTIME_DIR");
    QCOMPARE(DeviceFolder::root(), fallback);
}

void DeviceFolderTest::unnamedDevicesTakeTheFirstFreeNumber()
{
    DeviceFolder first;
    DeviceFolder second;
    DeviceFolder third;
    QCOMPARE(first.claim({}), std::nullopt);
    QCOMPARE(second.claim({}), std::nullopt);
    QCOMPARE(first.name(), "device-1");
    QCOMPARE(second.name(), "device-2");
    first.release();
    QCOMPARE(third.claim({}), std::nullopt);
    QCOMPARE(third.name(), "device-1");
}

void DeviceFolderTest::nameThatIsTakenIsRefused()
{
    DeviceFolder first;
    DeviceFolder second;
    QCOMPARE(first.claim("bench"), std::nullopt);
    QCOMPARE(second.claim("bench"), QString("a device named \"bench\" is running: choose another name with --name"));
    QVERIFY(QDir(first.path()).exists());
}

void DeviceFolderTest::lockThatCannotBeMadeIsNotTakenForARunningDevice_data()
{
    QTest::addColumn<QString>("asked");
    QTest::addColumn<QString>("lock");
    QTest::addRow("named") << "bench"
                           << "bench.lock";
    QTest::addRow("unnamed") << ""
                             << "device-1.lock";
}

void DeviceFolderTest::lockThatCannotBeMadeIsNotTakenForARunningDevice()
{
    QFETCH(const QString, asked);
    QFETCH(const QString, lock);
    const QString path = DeviceFolder::root() + '/' + lock;
    QVERIFY(QFile::link("/nowhere", path)); // a link is never followed
    DeviceFolder folder;
    QCOMPARE(folder.claim(asked), path + ": cannot be made: Too many levels of symbolic links");
}

/// The folders belong to whoever holds the locks.
void DeviceFolderTest::whereEveryNumberIsTakenNothingIsTouched()
{
    DeviceFolder first;
    QCOMPARE(first.claim({}), std::nullopt);
    const QByteArray held = first.path().toLocal8Bit() + ".lock";
    for (int number = 2; number <= 1000; ++number)
        QCOMPARE(::link(held.constData(), qPrintable(DeviceFolder::root() + QString("/device-%1.lock").arg(number))),
                 0);
    const QString last = DeviceFolder::root() + "/device-1000/state";
    QVERIFY(QDir().mkpath(last));
    DeviceFolder another;
    QCOMPARE(another.claim({}), QString("1000 devices are running: end one, or choose a name with --name"));
    QVERIFY(QDir(last).exists());
}

void DeviceFolderTest::nameCanBeTakenAgainAfterRelease()
{
    DeviceFolder first;
    QCOMPARE(first.claim("bench"), std::nullopt);
    first.release();
    QVERIFY(QDir(DeviceFolder::root()).isEmpty());
    DeviceFolder second;
    QCOMPARE(second.claim("bench"), std::nullopt);
}

void DeviceFolderTest::names_data()
{
    QTest::addColumn<QString>("name");
    QTest::addColumn<bool>("isName");
    QTest::addRow("letters") << "bench" << true;
    QTest::addRow("all kinds") << "Bench_2-b" << true;
    QTest::addRow("longest") << QString(24, 'x') << true;
    QTest::addRow("too long") << QString(25, 'x') << false;
    QTest::addRow("empty") << "" << false;
    QTest::addRow("way out") << ".." << false;
    QTest::addRow("slash") << "a/b" << false;
    QTest::addRow("option") << "-a" << false;
    QTest::addRow("line end") << "a\n" << false;
}

void DeviceFolderTest::names()
{
    QFETCH(const QString, name);
    QTEST(DeviceFolder::isName(name), "isName");
}

void DeviceFolderTest::runningDevicesAreThoseThatHoldTheirName()
{
    leaveBehind("killed");
    QVERIFY(DeviceFolder::running().isEmpty());
    DeviceFolder folder;
    QCOMPARE(folder.claim("bench"), std::nullopt);
    QCOMPARE(DeviceFolder::running(), QStringList{"bench"});
    folder.release();
    QVERIFY(DeviceFolder::running().isEmpty());
}

void DeviceFolderTest::cleanUpRemovesWhatAKilledDeviceLeft()
{
    leaveBehind("killed");
    QCOMPARE(DeviceFolder::cleanUp(), QStringList{"killed"});
    QVERIFY(QDir(DeviceFolder::root()).isEmpty());
}

void DeviceFolderTest::cleanUpLeavesRunningDevicesAlone()
{
    DeviceFolder folder;
    QCOMPARE(folder.claim("bench"), std::nullopt);
    QVERIFY(DeviceFolder::cleanUp().isEmpty());
    QVERIFY(QDir(folder.path()).exists());
}

void DeviceFolderTest::claimReplacesWhatAKilledDeviceLeft()
{
    leaveBehind("bench");
    DeviceFolder folder;
    QCOMPARE(folder.claim("bench"), std::nullopt);
    QVERIFY(QDir(folder.path()).isEmpty());
}

/// An unnamed device takes the next name then.
void DeviceFolderTest::whatCannotBeRemovedIsKeptForTheNextCleanUp()
{
    leaveBehind("device-1");
    const QByteArray held = DeviceFolder::root().toLocal8Bit() + "/device-1/state/mnt";
    if (!makeImmutable(held, true))
        QSKIP("this user cannot keep itself from removing a folder here");
    const auto release = qScopeGuard([&] { (void)makeImmutable(held, false); });
    QCOMPARE(DeviceFolder::cleanUp(), QStringList());
    QVERIFY(QFile::exists(DeviceFolder::root() + "/device-1.lock"));
    DeviceFolder unnamed;
    QCOMPARE(unnamed.claim({}), std::nullopt);
    QCOMPARE(unnamed.name(), "device-2");
    DeviceFolder named;
    QCOMPARE(named.claim("device-1"), DeviceFolder::root() + "/device-1: cannot make the device's folder: File exists");
    named.release();
    QVERIFY(makeImmutable(held, false));
    QCOMPARE(DeviceFolder::cleanUp(), QStringList{"device-1"});
}

void DeviceFolderTest::rootIsTheSameHoweverTheRuntimeFolderIsSpelt_data()
{
    QTest::addColumn<QString>("spelling");
    QTest::addRow("slash at the end") << "%1/";
    QTest::addRow("slashes") << "%1///";
    QTest::addRow("dots") << "%1/virtual-device/..";
    QTest::addRow("link") << "%1.link";
    QTest::addRow("link with a slash") << "%1.link/";
}

/// The mount table knows one spelling alone.
void DeviceFolderTest::rootIsTheSameHoweverTheRuntimeFolderIsSpelt()
{
    QFETCH(const QString, spelling);
    const QString link = runtime->path() + ".link";
    QVERIFY(QFile::link(runtime->path(), link));
    const auto remove = qScopeGuard([&] { QFile::remove(link); });
    qputenv("XDG_RUNTIME_DIR", spelling.arg(runtime->path()).toLocal8Bit());
    QCOMPARE(DeviceFolder::root(), runtime->path() + "/virtual-device");
}

void DeviceFolderTest::mountIsFoundHoweverItsFolderIsSpelt()
{
    QCOMPARE(VirtualDevice::mountedBelow("/proc").last(), "/proc");
    for (const auto* const spelling : {"//proc/", "/proc/.", "/proc/self/../../proc", "/proc/self/root/proc"})
        QCOMPARE(VirtualDevice::mountedBelow(spelling), VirtualDevice::mountedBelow("/proc"));
    QCOMPARE(VirtualDevice::mountedBelow("/pro"), QStringList());
}

void DeviceFolderTest::controlSocketBelongsToTheName()
{
    QCOMPARE(DeviceFolder::controlSocket("bench"), runtime->path() + "/virtual-device/bench/control");
}

QTEST_GUILESS_MAIN(DeviceFolderTest)
#include "DeviceFolderTest.moc"
