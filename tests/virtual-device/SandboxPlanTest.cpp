// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/sandbox/SandboxPlan.h"

#include <QRegularExpression>
#include <QTest>

#include <algorithm>

using VirtualDevice::bubblewrapArguments;
using VirtualDevice::SandboxBind;
using VirtualDevice::SandboxPlan;

namespace
{

/// Where `words` stand next to each other in the arguments; -1: nowhere.
qsizetype position(const QStringList& arguments, const QStringList& words)
{
    const auto found = std::search(arguments.begin(), arguments.end(), words.begin(), words.end());
    return found == arguments.end() ? -1 : found - arguments.begin();
}

QStringList argumentsFor(const SandboxPlan& plan)
{
    return bubblewrapArguments(plan, 9);
}

} // namespace

class SandboxPlanTest : public QObject
{
    Q_OBJECT

private slots:
    void programIsAnOrdinaryUserWithoutNetworkInTheRootFolder();
    void bindsKeepTheirKindAndOrder();
    void bindThatMayBeMissingIsTried();
    void programGetsAFixedEnvironmentAndNothingElse();
    void planWinsOverTheFixedEnvironment();
    void ownCommandInheritsTheEnvironment();
    void filesThatSanitizerOptionsNameAreBroughtIn_data();
    void filesThatSanitizerOptionsNameAreBroughtIn();
    void commandRunsAsItIsWithoutAScreen();
    void screenIsRelayedBesideTheUnchangedCommand();
};

void SandboxPlanTest::programIsAnOrdinaryUserWithoutNetworkInTheRootFolder()
{
    const auto arguments = argumentsFor({});
    for (const auto& words : {QStringList{"--die-with-parent"},
                              {"--unshare-user"},
                              {"--uid", "1000"},
                              {"--gid", "1000"},
                              {"--unshare-pid"},
                              {"--unshare-net"},
                              {"--chdir", "/"},
                              {"--json-status-fd", "9"},
                              {"--tmpfs", "/tmp"},
                              {"--dev", "/dev"}})
        QVERIFY2(position(arguments, words) >= 0, qPrintable(words.join(' ')));
}

void SandboxPlanTest::bindsKeepTheirKindAndOrder()
{
    SandboxPlan plan;
    plan.add("/a", "/mnt", SandboxBind::Kind::Writable);
    plan.add("/b", "/mnt/data", SandboxBind::Kind::ReadOnly);
    plan.add("/c", "/dev/ttyS1", SandboxBind::Kind::Device);
    const QStringList expected{"--bind",    "/a",         "/mnt", "--ro-bind", "/b",
                               "/mnt/data", "--dev-bind", "/c",   "/dev/ttyS1"};
    QVERIFY(position(argumentsFor(plan), expected) >= 0);
}

void SandboxPlanTest::bindThatMayBeMissingIsTried()
{
    SandboxPlan plan;
    plan.binds.append({"/a", "/dsp.out", SandboxBind::Kind::ReadOnly, true});
    QVERIFY(position(argumentsFor(plan), {"--ro-bind-try", "/a", "/dsp.out"}) >= 0);
}

void SandboxPlanTest::programGetsAFixedEnvironmentAndNothingElse()
{
    const auto arguments = argumentsFor({});
    const auto cleared = position(arguments, {"--clearenv"});
    QVERIFY(cleared >= 0);
    for (const auto& words : {QStringList{"--setenv", "LC_ALL", "C.UTF-8"},
                              {"--setenv", "TZ", "UTC"},
                              {"--setenv", "XDG_RUNTIME_DIR", "/run/user"}})
        QVERIFY2(position(arguments, words) > cleared, qPrintable(words.join(' ')));
    QVERIFY(position(arguments, {"--perms", "0700", "--dir", "/run/user"}) >= 0);
    QVERIFY(!arguments.contains("QT_LOGGING_RULES"));
}

void SandboxPlanTest::planWinsOverTheFixedEnvironment()
{
    SandboxPlan plan;
    plan.environment = {{"TZ", "America/New_York"}, {"SDL_AUDIODRIVER", "disk"}};
    const auto arguments = argumentsFor(plan);
    QVERIFY(position(arguments, {"--setenv", "TZ", "America/New_York"}) >= 0);
    QVERIFY(position(arguments, {"--setenv", "SDL_AUDIODRIVER", "disk"}) >= 0);
    QCOMPARE(arguments.count("TZ"), 1);
}

void SandboxPlanTest::ownCommandInheritsTheEnvironment()
{
    SandboxPlan plan;
    plan.inheritsEnvironment = true;
    QVERIFY(!argumentsFor(plan).contains("--clearenv"));
}

void SandboxPlanTest::filesThatSanitizerOptionsNameAreBroughtIn_data()
{
    QTest::addColumn<QByteArray>("options");
    QTest::addColumn<QStringList>("files");
    QTest::addRow("one among others") << QByteArray("a=1:suppressions=/a/leaks:b=2") << QStringList{"/a/leaks"};
    QTest::addRow("blanks between") << QByteArray("a=1 suppressions=/a/leaks b=2") << QStringList{"/a/leaks"};
    QTest::addRow("quoted") << QByteArray("suppressions=\"/a b/leaks\":b=2") << QStringList{"/a b/leaks"};
    QTest::addRow("single quotes") << QByteArray("b=2,suppressions='/a:b/leaks'") << QStringList{"/a:b/leaks"};
    QTest::addRow("relative") << QByteArray("suppressions=leaks") << QStringList{};
    QTest::addRow("empty") << QByteArray("suppressions=:b=2") << QStringList{};
    QTest::addRow("another option's end") << QByteArray("print_suppressions=/a/leaks") << QStringList{};
}

/// Before the device's own binds, so that no option can cover what the device serves.
void SandboxPlanTest::filesThatSanitizerOptionsNameAreBroughtIn()
{
    QFETCH(const QByteArray, options);
    QFETCH(const QStringList, files);
    SandboxPlan plan;
    plan.add("/state", "/mnt", SandboxBind::Kind::Writable);
    const auto without = [] {
        for (const auto* const name : {"ASAN_OPTIONS", "LSAN_OPTIONS", "TSAN_OPTIONS", "UBSAN_OPTIONS"})
            qunsetenv(name);
    };
    for (const auto* const name : {"ASAN_OPTIONS", "LSAN_OPTIONS", "TSAN_OPTIONS", "UBSAN_OPTIONS"}) {
        without();
        qputenv(name, options);
        const auto arguments = argumentsFor(plan);
        for (const auto& file : files) {
            const auto bind = position(arguments, {"--ro-bind-try", file, file});
            QVERIFY(bind >= 0 && bind < position(arguments, {"--bind", "/state", "/mnt"}));
        }
        QVERIFY(position(arguments, {"--setenv", name, options}) >= 0);
        const auto binds = arguments.filter(QRegularExpression("\\A[^=]*leaks\\z"));
        QCOMPARE(binds.size(), 2 * files.size());
    }
    without();
}

void SandboxPlanTest::commandRunsAsItIsWithoutAScreen()
{
    SandboxPlan plan;
    plan.command = {"/opt/program", "argument"};
    QCOMPARE(argumentsFor(plan).last(3), (QStringList{"--", "/opt/program", "argument"}));
}

void SandboxPlanTest::screenIsRelayedBesideTheUnchangedCommand()
{
    SandboxPlan plan;
    plan.command = {"/opt/program"};
    plan.vncSocket = "/run/virtual-device/vnc";
    const auto arguments = argumentsFor(plan);
    QCOMPARE(arguments.last(2), (QStringList{"/run/virtual-device/vnc", "/opt/program"}));
    QVERIFY(position(arguments, {"--", "/bin/sh", "-c"}) >= 0);
}

QTEST_GUILESS_MAIN(SandboxPlanTest)
#include "SandboxPlanTest.moc"
