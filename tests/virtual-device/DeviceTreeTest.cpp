// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/tree/DeviceTree.h"

#include "tests/virtual-device/FuseTest.h"
#include "tests/virtual-device/MountFixture.h"

#include <QDir>
#include <QFile>
#include <QScopeGuard>
#include <QTest>

#include <linux/fs.h>
#include <linux/rtc.h>
#include <sys/ioctl.h>
#include <sys/resource.h>
#include <sys/stat.h>

#include <atomic>
#include <memory>
#include <thread>
#include <tuple>
#include <utility>
#include <vector>

using TestSupport::MountFixture;
using TestSupport::RawFile;
using VirtualDevice::DeviceTree;

namespace
{

const QString voltage = QStringLiteral("sys/class/power_supply/ds2780-battery.0/voltage_now");
const QString current = QStringLiteral("sys/class/power_supply/ds2780-battery.0/current_now");
const QString mode = QStringLiteral("sys/devices/platform/musb_hdrc/mode");
const QString hid = QStringLiteral("sys/bus/usb/devices/1-1.4");
const QString card = QStringLiteral("sys/block/mmcblk0");
const QString latch = QStringLiteral("sys/class/leds/power_latch/brightness");
const QString resetLine = QStringLiteral("sys/class/misc/msp430/reset");

/// Read until the file says that it ends: as for the kernel's, its size says nothing.
QByteArray contentOf(const QString& path)
{
    constexpr qsizetype piece = 65'536;
    RawFile file(path, O_RDONLY);
    QByteArray content;
    for (QByteArray more = file.read(piece); !more.isEmpty(); more = file.read(piece))
        content += more;
    return content;
}

} // namespace

class DeviceTreeTest : public MountFixture
{
    Q_OBJECT

private slots:
    void init();
    void cleanup();
    void gaugeHoldsTheValueAndALineEnd_data();
    void gaugeHoldsTheValueAndALineEnd();
    void rewoundFileReadsTheValueOfNow();
    void readingThatGoesOnStaysInItsValue();
    void modeFollowsTheHost();
    void entriesVanishAndReturn_data();
    void entriesVanishAndReturn();
    void linkStaysBehindWhenItsDeviceHasGone_data();
    void linkStaysBehindWhenItsDeviceHasGone();
    void fileFailsWithTheChosenErrno_data();
    void fileFailsWithTheChosenErrno();
    void linkFailsWithTheChosenErrno_data();
    void linkFailsWithTheChosenErrno();
    void fileThatVanishedWhileOpenSaysNoDevice();
    void oddContents_data();
    void oddContents();
    void powerLatchKeepsWhatWasWrittenAndWhen();
    void everyWriteToThePowerLatchCounts();
    void powerLatchRefusesWhatIsNoNumber();
    void resetLinePulsesOnOne();
    void resetLineRefusesEverythingElseAndCannotBeRead();
    void resetLineThatVanishedDoesNotExist();
    void measurementsCannotBeWritten();
    void nothingCanBeMadeOrRemoved();
    void foldersListWhatIsThere();
    void folderTakesNoRequestAndGoesOn_data();
    void folderTakesNoRequestAndGoesOn();
    void clockRunsOnFromWhatItWasSetTo();
    void clockStandsStillWhenStopped();
    void clockStartsAtTheHostsTime();
    void clockShowsItselfInItsControl();
    void clockFailsWithTheChosenErrno_data();
    void clockFailsWithTheChosenErrno();
    void clockThatIsGoneCannotBeOpenedOrAsked();
    void clockAnswersNonsense();
    void clockKnowsNoOtherRequest();
    void valuesMayChangeWhileManyRead();
    void unmountLeavesNothingAndFailsOpenFiles();
    void mountPointThatDoesNotExistIsReported();
    void mountWithFewDescriptorsEndsOrIsReported();
    void readingARequestThatIsGoneDoesNotBlock();

private:
    [[nodiscard]] int readClock(rtc_time& time) const;

    std::unique_ptr<DeviceTree> tree;
};

void DeviceTreeTest::init()
{
    REQUIRE_FUSE();
    makeMountPoint();
    tree = std::make_unique<DeviceTree>(*registry);
    QCOMPARE(tree->mount(mountPoint->path()), std::nullopt);
}

void DeviceTreeTest::cleanup()
{
    tree.reset();
    removeMountPoint();
}

void DeviceTreeTest::gaugeHoldsTheValueAndALineEnd_data()
{
    QTest::addColumn<int>("value");
    QTest::addColumn<QByteArray>("content");
    QTest::addRow("discharging") << -123456 << QByteArray("-123456\n");
    QTest::addRow("nothing") << 0 << QByteArray("0\n");
    QTest::addRow("largest") << 2147483647 << QByteArray("2147483647\n");
}

void DeviceTreeTest::gaugeHoldsTheValueAndALineEnd()
{
    QFETCH(const int, value);
    set("battery.voltage", value);
    set("battery.current", value);
    QTEST(contentOf(at(voltage)), "content");
    QTEST(contentOf(at(current)), "content");
}

void DeviceTreeTest::rewoundFileReadsTheValueOfNow()
{
    RawFile file(at(voltage), O_RDONLY);
    QCOMPARE(file.read(100), "4100000\n");
    QCOMPARE(file.read(100), QByteArray());
    set("battery.voltage", 5);
    file.rewind();
    QCOMPARE(file.read(100), "5\n");
}

void DeviceTreeTest::readingThatGoesOnStaysInItsValue()
{
    RawFile file(at(voltage), O_RDONLY);
    QCOMPARE(file.read(3), "410");
    set("battery.voltage", 77777777);
    QCOMPARE(file.read(100), "0000\n");
}

void DeviceTreeTest::modeFollowsTheHost()
{
    QFile file(at(mode));
    QVERIFY(file.open(QIODevice::ReadOnly));
    QCOMPARE(file.readLine(), "b_peripheral\n");
    set("usb.gadget", false);
    QVERIFY(file.seek(0));
    QCOMPARE(file.readLine(), "b_idle\n");
    set("usb.gadget", true);
    QVERIFY(file.seek(0));
    QCOMPARE(file.readLine(), "b_peripheral\n");
}

void DeviceTreeTest::entriesVanishAndReturn_data()
{
    QTest::addColumn<QString>("path");
    QTest::addColumn<QString>("control");
    QTest::addRow("HID device") << hid << "usb.hid";
    QTest::addRow("SD card") << card << "sd.present";
}

void DeviceTreeTest::entriesVanishAndReturn()
{
    QFETCH(const QString, path);
    QFETCH(const QString, control);
    for (int round = 0; round < 3; ++round) {
        QVERIFY(QFile::exists(at(path)));
        set(control, false);
        QVERIFY(!QFile::exists(at(path)));
        QVERIFY(!QFileInfo(at(path)).isSymLink());
        set(control, true);
    }
    QVERIFY(QFileInfo(at(path)).isDir());
}

void DeviceTreeTest::linkStaysBehindWhenItsDeviceHasGone_data()
{
    QTest::addColumn<QString>("path");
    QTest::addColumn<QString>("control");
    QTest::addRow("HID device") << hid << "usb.hid_fault";
    QTest::addRow("SD card") << card << "sd.block_fault";
}

void DeviceTreeTest::linkStaysBehindWhenItsDeviceHasGone()
{
    QFETCH(const QString, path);
    QFETCH(const QString, control);
    set(control, "dangling");
    QVERIFY(QFileInfo(at(path)).isSymLink());
    QVERIFY(!QFile::exists(at(path)));
    set(control, "none");
    QVERIFY(QFile::exists(at(path)));
}

void DeviceTreeTest::fileFailsWithTheChosenErrno_data()
{
    QTest::addColumn<QString>("path");
    QTest::addColumn<QString>("control");
    QTest::addColumn<QString>("fault");
    QTest::addColumn<int>("flags");
    QTest::addColumn<int>("openError");
    QTest::addColumn<int>("useError");
    const QList<std::tuple<QString, QString, int>> files{{voltage, "battery.voltage_fault", O_RDONLY},
                                                         {current, "battery.current_fault", O_RDONLY},
                                                         {mode, "usb.gadget_fault", O_RDONLY},
                                                         {latch, "led.fault", O_WRONLY | O_TRUNC},
                                                         {resetLine, "reset_line.fault", O_WRONLY}};
    for (const auto& [path, control, flags] : files) {
        QTest::addRow("%s EIO", qPrintable(control)) << path << control << "EIO" << flags << 0 << EIO;
        QTest::addRow("%s ENODATA", qPrintable(control)) << path << control << "ENODATA" << flags << 0 << ENODATA;
        QTest::addRow("%s ENOENT", qPrintable(control)) << path << control << "ENOENT" << flags << ENOENT << 0;
        QTest::addRow("%s EACCES", qPrintable(control)) << path << control << "EACCES" << flags << EACCES << 0;
    }
}

void DeviceTreeTest::fileFailsWithTheChosenErrno()
{
    QFETCH(const QString, path);
    QFETCH(const QString, control);
    QFETCH(const QString, fault);
    QFETCH(const int, flags);
    const auto use = [&](RawFile& file) {
        if ((flags & O_ACCMODE) == O_RDONLY)
            file.read(100);
        else
            file.write("1");
        return file.error();
    };
    set(control, fault);
    {
        RawFile file(at(path), flags);
        QTEST(file.error(), "openError");
        if (file.handle() >= 0)
            QTEST(use(file), "useError");
    }
    QCOMPARE(QFile::exists(at(path)), fault != "ENOENT");
    set(control, "none");
    RawFile again(at(path), flags);
    QCOMPARE(again.error(), 0);
    QCOMPARE(use(again), 0);
}

void DeviceTreeTest::linkFailsWithTheChosenErrno_data()
{
    TestSupport::addErrnoRows();
}

void DeviceTreeTest::linkFailsWithTheChosenErrno()
{
    QFETCH(const QString, fault);
    for (const auto& [path, control] : {std::pair(hid, "usb.hid_fault"), std::pair(card, "sd.block_fault")}) {
        set(control, fault);
        const RawFile file(at(path), O_RDONLY);
        QTEST(file.error(), "error");
        QVERIFY(!QFile::exists(at(path)));
        set(control, "none");
        QVERIFY(QFile::exists(at(path)));
    }
}

void DeviceTreeTest::fileThatVanishedWhileOpenSaysNoDevice()
{
    RawFile file(at(mode), O_RDONLY);
    set("usb.gadget_fault", "ENOENT");
    QCOMPARE(file.read(100), QByteArray());
    QCOMPARE(file.error(), ENODEV);
    set("usb.gadget_fault", "none");
    QCOMPARE(file.read(100), "b_peripheral\n");
}

void DeviceTreeTest::oddContents_data()
{
    QTest::addColumn<QString>("content");
    QTest::addColumn<QByteArray>("expected");
    QByteArray everyByte;
    for (int value = 0; value < 256; ++value)
        everyByte.append(static_cast<char>(value));
    QTest::addRow("empty") << "empty" << QByteArray();
    QTest::addRow("binary") << "binary" << everyByte;
    QTest::addRow("huge") << "huge" << QByteArray(1 << 20, '7');
    QTest::addRow("no line end") << "no-newline" << QByteArray("b_peripheral");
    QTest::addRow("normal") << "normal" << QByteArray("b_peripheral\n");
}

void DeviceTreeTest::oddContents()
{
    QFETCH(const QString, content);
    QFETCH(QByteArray, expected);
    set("usb.gadget_content", content);
    QVERIFY(contentOf(at(mode)) == expected);
    set("battery.voltage_content", content);
    set("battery.current_content", content);
    expected.replace("b_peripheral", "4100000");
    QVERIFY(contentOf(at(voltage)) == expected);
    expected.replace("4100000", "-123456");
    QVERIFY(contentOf(at(current)) == expected);
}

void DeviceTreeTest::powerLatchKeepsWhatWasWrittenAndWhen()
{
    std::vector<std::pair<int, QDateTime>> writes;
    connect(tree.get(), &DeviceTree::powerLatchWritten, this,
            [&](int brightness, const QDateTime& written) { writes.emplace_back(brightness, written); });
    const QDateTime before = QDateTime::currentDateTimeUtc();
    QFile file(at(latch));
    QVERIFY(file.open(QIODevice::WriteOnly));
    QCOMPARE(file.write("1"), 1);
    file.close();
    const QDateTime after = QDateTime::currentDateTimeUtc();
    QCOMPARE(registry->integer("led.power_latch"), 1);
    QTRY_COMPARE_WITH_TIMEOUT(writes.size(), 1U, 20000);
    const auto [brightness, time] = writes.front();
    QCOMPARE(brightness, 1);
    QVERIFY(time >= before && time <= after);
    QCOMPARE(registry->text("led.written"), time.toString(Qt::ISODateWithMs));
    QCOMPARE(contentOf(at(latch)), "1\n");
}

void DeviceTreeTest::everyWriteToThePowerLatchCounts()
{
    for (int count = 1; count <= 3; ++count) {
        RawFile file(at(latch), O_WRONLY | O_TRUNC);
        QCOMPARE(file.write("1"), 0);
        QCOMPARE(registry->integer("led.writes"), count);
    }
}

void DeviceTreeTest::powerLatchRefusesWhatIsNoNumber()
{
    RawFile file(at(latch), O_WRONLY);
    QCOMPARE(file.write("on"), EINVAL);
    QCOMPARE(registry->integer("led.writes"), 0);
    QCOMPARE(file.write("1000\n"), 0);
    QCOMPARE(registry->integer("led.power_latch"), 255);
}

void DeviceTreeTest::resetLinePulsesOnOne()
{
    int pulses = 0;
    connect(tree.get(), &DeviceTree::resetLineWritten, this, [&] { ++pulses; });
    const QDateTime before = QDateTime::currentDateTimeUtc();
    for (const char* text : {"1", "1\n"}) {
        RawFile file(at(resetLine), O_WRONLY);
        QCOMPARE(file.write(text), 0);
    }
    QCOMPARE(registry->integer("reset_line.writes"), 2);
    const auto time = QDateTime::fromString(registry->text("reset_line.written"), Qt::ISODateWithMs);
    QVERIFY(time >= before && time <= QDateTime::currentDateTimeUtc());
    QTRY_COMPARE_WITH_TIMEOUT(pulses, 2, 20000);
}

void DeviceTreeTest::resetLineRefusesEverythingElseAndCannotBeRead()
{
    RawFile file(at(resetLine), O_RDWR);
    QCOMPARE(file.write("0"), EINVAL);
    file.read(1);
    QCOMPARE(file.error(), EIO);
    QCOMPARE(registry->integer("reset_line.writes"), 0);
}

void DeviceTreeTest::resetLineThatVanishedDoesNotExist()
{
    set("reset_line.fault", "ENOENT");
    QVERIFY(!QFile::exists(at(resetLine)));
    set("reset_line.fault", "EACCES");
    QVERIFY(QFile::exists(at(resetLine)));
}

void DeviceTreeTest::measurementsCannotBeWritten()
{
    for (const auto& path : {voltage, current, mode})
        QCOMPARE(RawFile(at(path), O_WRONLY).error(), EACCES);
}

void DeviceTreeTest::nothingCanBeMadeOrRemoved()
{
    QCOMPARE(RawFile(at("sys/new"), O_WRONLY | O_CREAT).error(), EACCES);
    QCOMPARE(RawFile(at("null"), O_RDWR | O_CREAT).error(), EACCES);
    QVERIFY(!QDir().mkdir(at("sys/folder")));
    QVERIFY(!QFile::remove(at(latch)));
    QVERIFY(!QFile::rename(at(latch), at("sys/other")));
    QVERIFY(QFile::exists(at(latch)));
}

void DeviceTreeTest::foldersListWhatIsThere()
{
    const auto names = [&](const QString& path) {
        return QDir(at(path)).entryList(QDir::AllEntries | QDir::System | QDir::NoDotAndDotDot, QDir::Name);
    };
    QCOMPARE(names({}), (QStringList{"rtc", "sys"}));
    QCOMPARE(names("sys"), (QStringList{"block", "bus", "class", "devices"}));
    QCOMPARE(names("sys/class/power_supply/ds2780-battery.0"), (QStringList{"current_now", "voltage_now"}));
    QCOMPARE(names("sys/bus/usb/devices"), QStringList{"1-1.4"});
    set("usb.hid", false);
    QVERIFY(names("sys/bus/usb/devices").isEmpty());
}

void DeviceTreeTest::folderTakesNoRequestAndGoesOn_data()
{
    QTest::addColumn<QString>("folder");
    QTest::addRow("root of the mount") << "";
    QTest::addRow("folder between") << "sys/class";
    QTest::addRow("device behind a link") << hid;
}

/// What tools such as lsattr, or a terminal's library, ask of any descriptor.
void DeviceTreeTest::folderTakesNoRequestAndGoesOn()
{
    QFETCH(const QString, folder);
    const RawFile open(at(folder), O_RDONLY | O_DIRECTORY);
    QCOMPARE(open.error(), 0);
    for (const unsigned long request : {FS_IOC_GETFLAGS, FS_IOC_FSGETXATTR, RTC_RD_TIME})
        QCOMPARE(TestSupport::errorOfRequest(open, request), ENOTTY);
    QCOMPARE(::fsync(open.handle()), 0);
    QCOMPARE(::lseek(open.handle(), 0, SEEK_SET), 0);
    QCOMPARE(contentOf(at(voltage)), "4100000\n");
}

int DeviceTreeTest::readClock(rtc_time& time) const
{
    const RawFile clock(at("rtc"), O_RDWR);
    return ::ioctl(clock.handle(), RTC_RD_TIME, &time) == 0 ? 0 : errno;
}

void DeviceTreeTest::clockRunsOnFromWhatItWasSetTo()
{
    const QDateTime start(QDate(2011, 3, 7), QTime(15, 4, 5), Qt::UTC);
    set("rtc.time", start.toSecsSinceEpoch());
    rtc_time time{};
    QCOMPARE(readClock(time), 0);
    QCOMPARE(time.tm_year, 111);
    QCOMPARE(time.tm_mon, 2);
    QCOMPARE(time.tm_mday, 7);
    QCOMPARE(time.tm_hour, 15);
    QCOMPARE(time.tm_min, 4);
    QCOMPARE(time.tm_wday, 1);
    QCOMPARE(time.tm_yday, 65);
    QVERIFY(time.tm_sec >= 5);
    const int first = time.tm_sec;
    QVERIFY(QTest::qWaitFor([&] { return readClock(time) == 0 && time.tm_sec != first; }, 20000));
}

void DeviceTreeTest::clockStandsStillWhenStopped()
{
    set("rtc.running", false);
    set("rtc.time", 1'000'000'000);
    rtc_time first{};
    QCOMPARE(readClock(first), 0);
    QTest::qWait(1100); // a running clock would have gone on for certain
    rtc_time second{};
    QCOMPARE(readClock(second), 0);
    QCOMPARE(second.tm_sec, first.tm_sec);
    QCOMPARE(first.tm_sec, 40);
    set("rtc.running", true);
    QVERIFY(QTest::qWaitFor([&] { return readClock(second) == 0 && second.tm_sec >= 42; }, 20000));
}

void DeviceTreeTest::clockStartsAtTheHostsTime()
{
    const QDateTime before = QDateTime::currentDateTimeUtc();
    rtc_time time{};
    QCOMPARE(readClock(time), 0);
    const QDateTime shown(QDate(time.tm_year + 1900, time.tm_mon + 1, time.tm_mday),
                          QTime(time.tm_hour, time.tm_min, time.tm_sec), Qt::UTC);
    QVERIFY(shown >= before.addSecs(-1) && shown <= QDateTime::currentDateTimeUtc());
}

void DeviceTreeTest::clockShowsItselfInItsControl()
{
    set("rtc.time", 1'000'000'000);
    QTRY_VERIFY_WITH_TIMEOUT(registry->integer("rtc.time") >= 1'000'000'001, 20000);
    QVERIFY(registry->integer("rtc.time") < 1'000'000'100);
}

void DeviceTreeTest::clockFailsWithTheChosenErrno_data()
{
    QTest::addColumn<QString>("fault");
    QTest::addColumn<int>("error");
    QTest::addRow("EIO") << "EIO" << EIO;
    QTest::addRow("ENODATA") << "ENODATA" << ENODATA;
    QTest::addRow("EINVAL") << "EINVAL" << EINVAL;
}

void DeviceTreeTest::clockFailsWithTheChosenErrno()
{
    QFETCH(const QString, fault);
    set("rtc.fault", fault);
    rtc_time time{};
    QTEST(readClock(time), "error");
    QCOMPARE(time.tm_mday, 0);
    set("rtc.fault", "none");
    QCOMPARE(readClock(time), 0);
}

void DeviceTreeTest::clockThatIsGoneCannotBeOpenedOrAsked()
{
    const RawFile open(at("rtc"), O_RDWR);
    set("rtc.fault", "ENOENT");
    QCOMPARE(RawFile(at("rtc"), O_RDWR).error(), ENOENT);
    rtc_time time{};
    QCOMPARE(::ioctl(open.handle(), RTC_RD_TIME, &time), -1);
    QCOMPARE(errno, ENODEV);
    set("rtc.fault", "EACCES");
    QCOMPARE(RawFile(at("rtc"), O_RDWR).error(), EACCES);
}

void DeviceTreeTest::clockAnswersNonsense()
{
    set("rtc.fault", "garbage");
    rtc_time time{};
    QCOMPARE(readClock(time), 0);
    QVERIFY(!QDate::isValid(time.tm_year + 1900, time.tm_mon + 1, time.tm_mday));
    QVERIFY(!QTime::isValid(time.tm_hour, time.tm_min, time.tm_sec));
}

void DeviceTreeTest::clockKnowsNoOtherRequest()
{
    RawFile clock(at("rtc"), O_RDWR);
    rtc_wkalrm alarm{};
    QCOMPARE(::ioctl(clock.handle(), RTC_WKALM_RD, &alarm), -1);
    QCOMPARE(errno, ENOTTY);
    clock.read(8);
    QCOMPARE(clock.error(), EINVAL);
}

void DeviceTreeTest::valuesMayChangeWhileManyRead()
{
    constexpr int readers = 4;
    constexpr int rounds = 300;
    std::atomic<int> wrong = 0;
    std::vector<std::thread> threads;
    set("battery.voltage", 1111);
    for (int reader = 0; reader < readers; ++reader)
        threads.emplace_back([&] {
            for (int round = 0; round < rounds; ++round) {
                const QByteArray text = contentOf(at(voltage));
                bool isNumber = false;
                const int value = text.trimmed().toInt(&isNumber);
                if (!isNumber || !text.endsWith('\n') || value % 1111 != 0)
                    ++wrong;
            }
        });
    for (int round = 0; round < rounds; ++round)
        set("battery.voltage", 1111 * (round % 100 + 1));
    for (auto& thread : threads)
        thread.join();
    QCOMPARE(wrong.load(), 0);
}

void DeviceTreeTest::unmountLeavesNothingAndFailsOpenFiles()
{
    RawFile file(at(voltage), O_RDONLY);
    QCOMPARE(file.read(100), "4100000\n");
    tree->unmount();
    QVERIFY(VirtualDevice::mountedBelow(mountPoint->path()).isEmpty());
    QVERIFY(QDir(mountPoint->path()).isEmpty());
    file.rewind();
    file.read(100);
    QVERIFY(file.error() != 0);
}

void DeviceTreeTest::mountPointThatDoesNotExistIsReported()
{
    DeviceTree other(*registry);
    const auto problem = other.mount(at("missing"));
    QVERIFY(problem.has_value());
    QVERIFY2(problem->startsWith(at("missing") + ": cannot be mounted: "), qPrintable(*problem));
}

/// Whichever of the mount's descriptors is the one too many.
void DeviceTreeTest::mountWithFewDescriptorsEndsOrIsReported()
{
    tree->unmount();
    rlimit usual{};
    QCOMPARE(::getrlimit(RLIMIT_NOFILE, &usual), 0);
    const auto restore = qScopeGuard([&] { ::setrlimit(RLIMIT_NOFILE, &usual); });
    const int firstFree = ::dup(STDERR_FILENO);
    ::close(firstFree);
    int mounted = 0;
    for (rlim_t spare = 0; spare < 6; ++spare) {
        const rlimit few{static_cast<rlim_t>(firstFree) + spare, usual.rlim_max};
        QCOMPARE(::setrlimit(RLIMIT_NOFILE, &few), 0);
        const auto problem = tree->mount(mountPoint->path());
        mounted += problem ? 0 : 1;
        QVERIFY2(!problem || problem->startsWith(mountPoint->path() + ": cannot be mounted: "), qPrintable(*problem));
        tree->unmount();
    }
    QVERIFY(mounted > 0);
    QVERIFY(mounted < 6);
}

/// A client that is killed takes its request back, also between the news of it and the reading.
void DeviceTreeTest::readingARequestThatIsGoneDoesNotBlock()
{
    int found = 0;
    const auto descriptors = QDir("/proc/self/fd").entryList(QDir::AllEntries | QDir::System | QDir::NoDotAndDotDot);
    for (const auto& descriptor : descriptors) {
        if (QFile::symLinkTarget("/proc/self/fd/" + descriptor) != u"/dev/fuse")
            continue;
        ++found;
        QVERIFY((::fcntl(descriptor.toInt(), F_GETFL) & O_NONBLOCK) != 0);
    }
    QCOMPARE(found, 1);
}

QTEST_GUILESS_MAIN(DeviceTreeTest)
#include "DeviceTreeTest.moc"
