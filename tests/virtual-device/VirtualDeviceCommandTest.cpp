// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/virtual-device/FuseTest.h"
#include "tests/virtual-device/Terminal.h"
#include "virtual-device/sandbox/DeviceFolder.h"
#include "virtual-device/screen/RegionMap.h"
#include "virtual-device/tree/Mounts.h"

#include <QDir>
#include <QFileInfo>
#include <QLibraryInfo>
#include <QProcess>
#include <QRegularExpression>
#include <QScopeGuard>
#include <QStandardPaths>
#include <QTcpServer>
#include <QTemporaryDir>
#include <QTest>

#include <sys/stat.h>

#include <csignal>
#include <memory>

using VirtualDevice::DeviceFolder;

namespace
{

constexpr int limit = 30'000; // ms

struct Outcome
{
    int status = -1;
    QString output;
    QString errors;
};

Outcome outcomeOf(const QString& program, const QStringList& arguments, const QByteArray& input = {})
{
    QProcess process;
    process.start(program, arguments);
    process.write(input);
    process.closeWriteChannel();
    if (!process.waitForFinished(limit) || process.exitStatus() != QProcess::NormalExit)
        return {};
    return {process.exitCode(), QString::fromLocal8Bit(process.readAllStandardOutput()),
            QString::fromLocal8Bit(process.readAllStandardError())};
}

Outcome virtualDevice(const QStringList& arguments, const QByteArray& input = {})
{
    return outcomeOf(VIRTUAL_DEVICE, arguments, input);
}

/// `virtual-device run` with a window, from its ready line to its end.
class RunningDevice
{
public:
    explicit RunningDevice(const QStringList& options = {})
    {
        process.start(VIRTUAL_DEVICE, QStringList{"run", "--program", WINDOW_PROGRAM} + options);
        while (!process.canReadLine() && process.waitForReadyRead(limit)) {
        }
        readyLine = QString::fromLocal8Bit(process.readLine()).trimmed();
    }

    void signal(int number) const { ::kill(static_cast<pid_t>(process.processId()), number); }

    QProcess process;
    QString readyLine;
};

/// A program for the device, in the shell's language.
class Script
{
public:
    explicit Script(const QString& text)
    {
        QFile file(path());
        if (!file.open(QIODevice::WriteOnly) || file.write("#!/bin/sh\n" + text.toLocal8Bit() + '\n') < 0 ||
            !file.setPermissions(QFile::ReadOwner | QFile::ExeOwner))
            qFatal("%s: %s", qPrintable(path()), qPrintable(file.errorString()));
    }

    [[nodiscard]] QString path() const { return folder.filePath("program"); }

private:
    QTemporaryDir folder;
};

/// Processes of the host whose command line holds `text`, this one's aside.
QStringList processesWith(const QString& text)
{
    QStringList found;
    const auto entries = QDir("/proc").entryList(QDir::Dirs | QDir::NoDotAndDotDot);
    for (const auto& pid : entries) {
        QFile file("/proc/" + pid + "/cmdline");
        if (pid.toLongLong() > 0 && file.open(QIODevice::ReadOnly) && file.readAll().contains(text.toLocal8Bit()))
            found.append(pid);
    }
    return found;
}

qint64 parentOf(qint64 pid)
{
    QFile file(QStringLiteral("/proc/%1/status").arg(pid));
    if (!file.open(QIODevice::ReadOnly))
        return 0;
    const QByteArray status = file.readAll();
    return status.mid(status.indexOf("\nPPid:") + 6).simplified().split(' ').value(0).toLongLong();
}

/// The process below `ancestor` whose whole command line is `commandLine`; 0: there is none.
qint64 descendant(qint64 ancestor, const QByteArray& commandLine)
{
    const auto candidates = processesWith(QString::fromLocal8Bit(commandLine.constData()));
    for (const auto& candidate : candidates) {
        QFile file("/proc/" + candidate + "/cmdline");
        if (!file.open(QIODevice::ReadOnly) || file.readAll() != commandLine)
            continue;
        for (qint64 pid = candidate.toLongLong(); pid > 1; pid = parentOf(pid)) {
            if (pid == ancestor)
                return candidate.toLongLong();
        }
    }
    return 0;
}

} // namespace

class VirtualDeviceCommandTest : public QObject
{
    Q_OBJECT

private slots:
    void init();
    void cleanup();
    void readyLineNamesTheScreenAndTheControlSocket();
    void onATerminalATableOfTheRegionsFollows();
    void terminalThatTakesNothingHoldsNobodyUp();
    void askedToEndItTakesEverythingDown_data();
    void askedToEndItTakesEverythingDown();
    void nextStartCleansUpAfterOneThatWasKilled_data();
    void nextStartCleansUpAfterOneThatWasKilled();
    void programThatIsKilledEndsItWithAReason();
    void programThatFailsIsExplainedByItsLastWords();
    void outputFileHoldsWhatTheProgramPrints();
    void outputFileThatCannotBeMadeIsReported();
    void sanitizerFindsItsOptionsAndItsSuppressions();
    void nameThatRunsIsRefused();
    void portIsTheOneAskedFor();
    void execPassesInputOutputAndStatus();
    void execSeesTheBuildAndTheSources();
    void execEndsWithItsCaller();
    void helpNeedsNoDevice_data();
    void helpNeedsNoDevice();
    void wrongUse_data();
    void wrongUse();
    void programThatDoesNotExistIsReported();
    void missingPackageIsNamed_data();
    void missingPackageIsNamed();
    void missingPluginIsNamedWithItsPackage();
    void missingFuseIsNamed();
    void closedFuseIsNamed();
    void forbiddenNamespacesAreNamed();

private:
    std::unique_ptr<QTemporaryDir> runtime;
};

void VirtualDeviceCommandTest::init()
{
    runtime = std::make_unique<QTemporaryDir>();
    qputenv("XDG_RUNTIME_DIR", runtime->path().toLocal8Bit());
}

/// Whatever a test did: no mount, no process and no file of its devices is left.
void VirtualDeviceCommandTest::cleanup()
{
    QVERIFY(VirtualDevice::mountedBelow(runtime->path()).isEmpty());
    QVERIFY(QDir(DeviceFolder::root()).isEmpty());
    QCOMPARE(processesWith(runtime->path()), QStringList());
    runtime.reset();
}

void VirtualDeviceCommandTest::readyLineNamesTheScreenAndTheControlSocket()
{
    REQUIRE_FUSE();
    RunningDevice device({"--name", "bench"});
    const QRegularExpression expected("\\Aready: VNC 127\\.0\\.0\\.1:\\d+, control (.+)\\z");
    const auto match = expected.match(device.readyLine);
    QVERIFY2(match.hasMatch(), qPrintable(device.readyLine));
    QCOMPARE(match.captured(1), DeviceFolder::controlSocket("bench"));
    QCOMPARE(DeviceFolder::running(), QStringList{"bench"});
    device.signal(SIGTERM);
    QVERIFY(device.process.waitForFinished(limit));
    QCOMPARE(device.process.readAll(), QByteArray()); // no terminal: one line and nothing more
}

void VirtualDeviceCommandTest::onATerminalATableOfTheRegionsFollows()
{
    REQUIRE_FUSE();
    TestSupport::Terminal terminal;
    QVERIFY(terminal.isOpen());
    QProcess process;
    process.setStandardOutputFile(terminal.name());
    process.start(VIRTUAL_DEVICE, {"run", "--program", WINDOW_PROGRAM, "--name", "bench"});
    QTRY_VERIFY_WITH_TIMEOUT(terminal.shown().count('\n') > 1, limit);
    QVERIFY2(terminal.shown().startsWith("ready: VNC 127.0.0.1:"), terminal.shown());
    for (const auto& region : VirtualDevice::RegionMap::names())
        QTRY_VERIFY_WITH_TIMEOUT(terminal.shown().contains(region.toUtf8() + ' '), limit);
    process.terminate();
    QVERIFY(process.waitForFinished(limit));
    QCOMPARE(process.exitCode(), 0);
}

/// The window stands, but nobody takes the line that says so: the device can be used and ended all the same.
void VirtualDeviceCommandTest::terminalThatTakesNothingHoldsNobodyUp()
{
    REQUIRE_FUSE();
    TestSupport::Terminal terminal;
    QVERIFY(terminal.isOpen());
    terminal.stop();
    QProcess process;
    process.setStandardOutputFile(terminal.name());
    process.start(VIRTUAL_DEVICE, {"run", "--program", WINDOW_PROGRAM, "--name", "bench"});
    const auto answers = [] {
        return virtualDevice({"ctl", "--device", "bench", "wait", "region", "trigger", "green"}).status == 0;
    };
    QVERIFY(QTest::qWaitFor(answers, limit));
    QCOMPARE(virtualDevice({"ctl", "--device", "bench", "get", "usb.hid"}).output, "true\n");
    process.terminate();
    QVERIFY(process.waitForFinished(limit));
    QCOMPARE(process.exitCode(), 0);
    QCOMPARE(terminal.shown(), QByteArray());
}

void VirtualDeviceCommandTest::askedToEndItTakesEverythingDown_data()
{
    QTest::addColumn<int>("number");
    QTest::addRow("SIGINT") << SIGINT;
    QTest::addRow("SIGTERM") << SIGTERM;
    QTest::addRow("SIGHUP") << SIGHUP;
}

void VirtualDeviceCommandTest::askedToEndItTakesEverythingDown()
{
    REQUIRE_FUSE();
    QFETCH(const int, number);
    RunningDevice device;
    QVERIFY(device.readyLine.startsWith("ready"));
    device.signal(number);
    QVERIFY(device.process.waitForFinished(limit));
    QCOMPARE(device.process.exitStatus(), QProcess::NormalExit);
    QCOMPARE(device.process.exitCode(), 0);
}

void VirtualDeviceCommandTest::nextStartCleansUpAfterOneThatWasKilled_data()
{
    QTest::addColumn<QString>("spelling");
    QTest::addRow("plain") << "%1";
    QTest::addRow("slash at the end") << "%1/";
    QTest::addRow("through a link") << "%1.link/inside";
}

void VirtualDeviceCommandTest::nextStartCleansUpAfterOneThatWasKilled()
{
    REQUIRE_FUSE();
    QFETCH(const QString, spelling);
    const QString inside = runtime->path() + "/inside";
    const QString link = runtime->path() + ".link";
    QCOMPARE(::mkdir(qPrintable(inside), 0700), 0);
    QVERIFY(QFile::link(runtime->path(), link));
    const auto restore = qScopeGuard([&] {
        qputenv("XDG_RUNTIME_DIR", runtime->path().toLocal8Bit());
        QFile::remove(link);
    });
    qputenv("XDG_RUNTIME_DIR", spelling.arg(runtime->path()).toLocal8Bit());
    RunningDevice killed({"--name", "killed"});
    QVERIFY(killed.readyLine.startsWith("ready"));
    QCOMPARE(VirtualDevice::mountedBelow(runtime->path()).size(), 2);
    killed.signal(SIGKILL);
    QVERIFY(killed.process.waitForFinished(limit));
    // The sandbox ends with its owner, without anybody's help.
    QTRY_COMPARE_WITH_TIMEOUT(processesWith(runtime->path()), QStringList(), limit);
    QVERIFY(QFileInfo::exists(DeviceFolder::root() + "/killed"));

    RunningDevice next({"--name", "next"});
    QVERIFY2(next.readyLine.startsWith("ready"), qPrintable(next.readyLine));
    QVERIFY(!QFileInfo::exists(DeviceFolder::root() + "/killed"));
    QCOMPARE(VirtualDevice::mountedBelow(runtime->path()).size(), 2);
    next.signal(SIGTERM);
    QVERIFY(next.process.waitForFinished(limit));
    QVERIFY(QDir(DeviceFolder::root()).isEmpty());
}

void VirtualDeviceCommandTest::programThatIsKilledEndsItWithAReason()
{
    REQUIRE_FUSE();
    RunningDevice device;
    QVERIFY(device.readyLine.startsWith("ready"));
    const qint64 program = descendant(device.process.processId(), QByteArray(WINDOW_PROGRAM) + '\0');
    QVERIFY(program > 0);
    QCOMPARE(::kill(static_cast<pid_t>(program), SIGKILL), 0);
    QVERIFY(device.process.waitForFinished(limit));
    QCOMPARE(device.process.exitCode(), 128 + SIGKILL);
    QVERIFY(device.process.readAllStandardError().endsWith("virtual-device: the program ended with status 137\n"));
}

void VirtualDeviceCommandTest::programThatFailsIsExplainedByItsLastWords()
{
    REQUIRE_FUSE();
    const Script script("for i in 1 2 3 4 5 6 7 8 9 10 11; do echo line $i >&2; done; exit 4");
    const auto outcome = virtualDevice({"run", "--program", script.path()});
    QCOMPARE(outcome.status, 4);
    QCOMPARE(outcome.output, QString());
    QCOMPARE(outcome.errors, "line 2\nline 3\nline 4\nline 5\nline 6\nline 7\nline 8\nline 9\nline 10\nline 11\n"
                             "virtual-device: the program ended with status 4\n");
}

void VirtualDeviceCommandTest::outputFileHoldsWhatTheProgramPrints()
{
    REQUIRE_FUSE();
    const Script script("echo out; echo error >&2; printf unfinished; exit 4");
    const QTemporaryDir folder;
    const QString file = folder.filePath("output");
    QCOMPARE(virtualDevice({"run", "--program", script.path(), "--output", file}).status, 4);
    QFile output(file);
    QVERIFY(output.open(QIODevice::ReadOnly));
    QCOMPARE(output.readAll(), "out\nerror\nunfinished\n");
}

void VirtualDeviceCommandTest::outputFileThatCannotBeMadeIsReported()
{
    const Script script("exit 0");
    const auto outcome = virtualDevice({"run", "--program", script.path(), "--output", "/nothing/output"});
    QCOMPARE(outcome.status, 1);
    QVERIFY2(outcome.errors.startsWith("virtual-device: /nothing/output: "), qPrintable(outcome.errors));
}

/// The program's surroundings hold nothing else of the host: what the options name is brought in, to be read only.
void VirtualDeviceCommandTest::sanitizerFindsItsOptionsAndItsSuppressions()
{
    REQUIRE_FUSE();
    const QTemporaryDir folder;
    QFile suppressions(folder.filePath("leaks"));
    QVERIFY(suppressions.open(QIODevice::WriteOnly));
    suppressions.write("leak:nothing");
    suppressions.close();
    const QByteArray before = qgetenv("LSAN_OPTIONS");
    qputenv("LSAN_OPTIONS", "suppressions=" + suppressions.fileName().toLocal8Bit() + ":print_suppressions=0");
    const Script script("echo \"$LSAN_OPTIONS\"; cat " + suppressions.fileName() + "; echo; ls " + folder.path() +
                        "; (echo >> " + suppressions.fileName() + ") 2>/dev/null && echo writable; exit 4");
    const auto outcome = virtualDevice({"run", "--program", script.path()});
    qputenv("LSAN_OPTIONS", before);
    QCOMPARE(outcome.status, 4);
    QCOMPARE(outcome.errors, "suppressions=" + suppressions.fileName() +
                                 ":print_suppressions=0\nleak:nothing\nleaks\n" +
                                 "virtual-device: the program ended with status 4\n");
}

void VirtualDeviceCommandTest::nameThatRunsIsRefused()
{
    REQUIRE_FUSE();
    RunningDevice device({"--name", "bench"});
    QVERIFY(device.readyLine.startsWith("ready"));
    const auto outcome = virtualDevice({"exec", "--name", "bench", "--", "true"});
    QCOMPARE(outcome.status, 1);
    QCOMPARE(outcome.errors, "virtual-device: a device named \"bench\" is running: choose another name with --name\n");
    QCOMPARE(virtualDevice({"exec", "--", "true"}).status, 0);
    device.signal(SIGTERM);
    QVERIFY(device.process.waitForFinished(limit));
}

void VirtualDeviceCommandTest::portIsTheOneAskedFor()
{
    REQUIRE_FUSE();
    // A free port, as good as certain a moment later.
    QTcpServer probe;
    QVERIFY(probe.listen(QHostAddress(QHostAddress::LocalHost)));
    const QString port = QString::number(probe.serverPort());
    probe.close();
    RunningDevice device({"--vnc-port", port});
    QVERIFY2(device.readyLine.startsWith("ready: VNC 127.0.0.1:" + port + ','), qPrintable(device.readyLine));
    device.signal(SIGTERM);
    QVERIFY(device.process.waitForFinished(limit));
}

void VirtualDeviceCommandTest::execPassesInputOutputAndStatus()
{
    REQUIRE_FUSE();
    const auto outcome = virtualDevice({"exec", "--", "sh", "-c", "cat; echo error >&2; exit 7"}, "input");
    QCOMPARE(outcome.status, 7);
    QCOMPARE(outcome.output, "input");
    QCOMPARE(outcome.errors, "error\n");
}

void VirtualDeviceCommandTest::execSeesTheBuildAndTheSources()
{
    REQUIRE_FUSE();
    const QString script = QStringLiteral("test -x %1 && test -f %2 && ! touch $(dirname %1)/x 2>/dev/null");
    QCOMPARE(virtualDevice({"exec", "--", "sh", "-c", script.arg(VIRTUAL_DEVICE, SOURCE_FILE)}).status, 0);
}

void VirtualDeviceCommandTest::execEndsWithItsCaller()
{
    REQUIRE_FUSE();
    QProcess process;
    process.start(VIRTUAL_DEVICE, {"exec", "--", "sh", "-c", "echo started; sleep 1000"});
    QVERIFY(process.waitForReadyRead(limit));
    ::kill(static_cast<pid_t>(process.processId()), SIGTERM);
    QVERIFY(process.waitForFinished(limit));
    QCOMPARE(process.exitCode(), 0);
}

void VirtualDeviceCommandTest::helpNeedsNoDevice_data()
{
    QTest::addColumn<QStringList>("arguments");
    QTest::addColumn<QString>("mention");
    QTest::addRow("all") << QStringList{"--help"} << "run";
    QTest::addRow("run") << QStringList{"run", "--help"} << "--vnc-port";
    QTest::addRow("exec") << QStringList{"exec", "--help"} << "$VIRTUAL_DEVICE_CONTROL";
    QTest::addRow("version") << QStringList{"--version"} << "virtual-device " IMMUNITYRIG_VERSION;
}

void VirtualDeviceCommandTest::helpNeedsNoDevice()
{
    QFETCH(const QStringList, arguments);
    QFETCH(const QString, mention);
    const auto outcome = virtualDevice(arguments);
    QCOMPARE(outcome.status, 0);
    QVERIFY2(outcome.output.contains(mention), qPrintable(outcome.output));
    QCOMPARE(outcome.errors, QString());
}

void VirtualDeviceCommandTest::wrongUse_data()
{
    QTest::addColumn<QStringList>("arguments");
    QTest::addRow("nothing") << QStringList{};
    QTest::addRow("unknown command") << QStringList{"fly"};
    QTest::addRow("unknown option") << QStringList{"run", "--fly"};
    QTest::addRow("argument of the program") << QStringList{"run", "argument"};
    QTest::addRow("port that is none") << QStringList{"run", "--vnc-port", "70000"};
    QTest::addRow("control that there is not") << QStringList{"run", "--set", "nothing=1"};
    QTest::addRow("control that is read only") << QStringList{"run", "--set", "led.power_latch=1"};
    QTest::addRow("value out of range") << QStringList{"exec", "--set", "trigger.period=-1", "--", "true"};
    QTest::addRow("setting without a value") << QStringList{"exec", "--set", "usb.hid", "--", "true"};
    QTest::addRow("name that is none") << QStringList{"run", "--name", "a/b"};
    QTest::addRow("no command") << QStringList{"exec"};
}

void VirtualDeviceCommandTest::wrongUse()
{
    QFETCH(const QStringList, arguments);
    const auto outcome = virtualDevice(arguments);
    QCOMPARE(outcome.status, 2);
    QCOMPARE(outcome.output, QString());
    QVERIFY(!outcome.errors.isEmpty());
}

void VirtualDeviceCommandTest::programThatDoesNotExistIsReported()
{
    const auto outcome = virtualDevice({"run", "--program", "/nothing"});
    QCOMPARE(outcome.status, 1);
    QCOMPARE(outcome.errors, "virtual-device: /nothing is no program: build it, or name one with --program\n");
}

void VirtualDeviceCommandTest::missingPackageIsNamed_data()
{
    QTest::addColumn<QStringList>("present");
    QTest::addColumn<QString>("missing");
    QTest::addRow("bwrap") << QStringList{} << "the program bwrap is missing: install the package bubblewrap";
    QTest::addRow("socat") << QStringList{"bwrap"} << "the program socat is missing: install the package socat";
    QTest::addRow("fusermount3") << QStringList{"bwrap", "socat"}
                                 << "the program fusermount3 is missing: install the package fuse3";
}

/// To an ordinary user: root does without fusermount3.
void VirtualDeviceCommandTest::missingPackageIsNamed()
{
    QFETCH(const QStringList, present);
    QFETCH(const QString, missing);
    const QTemporaryDir path;
    for (const auto& name : present)
        QVERIFY(QFile::link(QStandardPaths::findExecutable(name), path.filePath(name)));
    const auto outcome = outcomeOf("bwrap", {"--unshare-user", "--uid", "1000", "--dev-bind", "/", "/", "--setenv",
                                             "PATH", path.path(), VIRTUAL_DEVICE, "exec", "--", "true"});
    QCOMPARE(outcome.status, 1);
    QCOMPARE(outcome.errors, "virtual-device: " + missing + '\n');
}

void VirtualDeviceCommandTest::missingPluginIsNamedWithItsPackage()
{
    REQUIRE_FUSE();
    const QString folder = QLibraryInfo::path(QLibraryInfo::PluginsPath) + "/platforms";
    const QString plugin = folder + "/libqvnc.so";
    QVERIFY(QFile::exists(plugin));
    const auto outcome =
        outcomeOf("bwrap", {"--dev-bind", "/", "/", "--tmpfs", folder, VIRTUAL_DEVICE, "exec", "--", "true"});
    QCOMPARE(outcome.status, 1);
    QCOMPARE(outcome.errors, "virtual-device: Qt's VNC platform plugin " + plugin +
                                 " is missing: install the package qt6-qpa-plugins\n");
    // Where the system knows, it agrees.
    const auto owner = outcomeOf("dpkg-query", {"--search", plugin});
    if (owner.status == 0)
        QVERIFY2(owner.output.startsWith("qt6-qpa-plugins"), qPrintable(owner.output));
}

void VirtualDeviceCommandTest::missingFuseIsNamed()
{
    const auto outcome =
        outcomeOf("bwrap", {"--dev-bind", "/", "/", "--dev", "/dev", VIRTUAL_DEVICE, "exec", "--", "true"});
    QCOMPARE(outcome.status, 1);
    QCOMPARE(outcome.errors, "virtual-device: there is no usable /dev/fuse (No such file or directory): run \"modprobe "
                             "fuse\" as root, or give the container that device\n");
}

void VirtualDeviceCommandTest::closedFuseIsNamed()
{
    const auto outcome = outcomeOf("sh", {"-c",
                                          "exec bwrap --unshare-user --uid 1000 --dev-bind / / --dev /dev --perms "
                                          "0000 --file 9 /dev/fuse \"$0\" exec -- true 9</dev/null",
                                          VIRTUAL_DEVICE});
    QCOMPARE(outcome.status, 1);
    QCOMPARE(outcome.errors,
             "virtual-device: /dev/fuse is closed to this user: run \"chmod 0666 /dev/fuse\" as root\n");
}

void VirtualDeviceCommandTest::forbiddenNamespacesAreNamed()
{
    REQUIRE_FUSE();
    const auto outcome = outcomeOf(
        "bwrap", {"--unshare-user", "--disable-userns", "--dev-bind", "/", "/", VIRTUAL_DEVICE, "exec", "--", "true"});
    QCOMPARE(outcome.status, 1);
    QVERIFY2(outcome.errors.startsWith("virtual-device: this machine forbids user namespaces (bwrap: "),
             qPrintable(outcome.errors));
    // The switch for everybody and Debian's for ordinary users.
    QVERIFY(outcome.errors.contains("\"sysctl user.max_user_namespaces="));
    QVERIFY(outcome.errors.contains("\"sysctl kernel.unprivileged_userns_clone=1\""));
    QCOMPARE(outcome.errors.count('\n'), 1);
}

QTEST_GUILESS_MAIN(VirtualDeviceCommandTest)
#include "VirtualDeviceCommandTest.moc"
