// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/sandbox/SandboxPlan.h"

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
