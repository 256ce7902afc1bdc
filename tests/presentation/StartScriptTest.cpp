// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include <QProcess>
#include <QTemporaryDir>
#include <QTest>

/// The script that starts the program on the device. A program that prints its surroundings takes the program's place.
class StartScriptTest : public QObject
{
    Q_OBJECT

    QTemporaryDir folder;
    QProcessEnvironment environment;

    [[nodiscard]] QByteArrayList printed(const QStringList& arguments = {}) const
    {
        QProcess script;
        script.setProcessEnvironment(environment);
        script.start(QStringLiteral(START_SCRIPT), arguments);
        if (!script.waitForFinished() || script.exitCode() != 7)
            return {};
        return script.readAllStandardOutput().split('\n');
    }

private slots:
    void initTestCase()
    {
        QFile program(folder.filePath(QStringLiteral("immunityrig")));
        QVERIFY(program.open(QIODevice::WriteOnly));
        program.write("#!/bin/sh\nenv\necho \"folder=$(pwd) arguments=$*\"\nexit 7\n");
        QVERIFY(program.setPermissions(QFile::ReadOwner | QFile::ExeOwner));
    }

    void init()
    {
        environment.clear();
        environment.insert(QStringLiteral("PATH"), folder.path() + QStringLiteral(":/usr/bin:/bin"));
    }

    void startsInTheRootFolderWithItsArgumentsAndEndsAsTheProgramDoes()
    {
        QVERIFY(
            printed({QStringLiteral("-platform"), QStringLiteral("vnc")}).contains("folder=/ arguments=-platform vnc"));
    }

    void showsTheWindowOnTheFramebufferWithoutAPointer()
    {
        const auto lines = printed();
        QVERIFY(lines.contains("QT_QPA_PLATFORM=linuxfb"));
        QVERIFY(lines.contains("QT_QPA_FB_HIDECURSOR=1"));
    }

    void readsTheKeysFromTheirEventDeviceAndLetsNoneEndTheRun()
    {
        const auto lines = printed();
        QVERIFY(lines.contains("QT_QPA_FB_NO_LIBINPUT=1"));
        QVERIFY(lines.contains("QT_QPA_EVDEV_KEYBOARD_PARAMETERS=disable-zap"));
    }

    void leavesWhatIsSetAlready()
    {
        environment.insert(QStringLiteral("QT_QPA_PLATFORM"), QStringLiteral("linuxfb:fb=/dev/fb1"));
        environment.insert(QStringLiteral("QT_QPA_EVDEV_KEYBOARD_PARAMETERS"), QStringLiteral("/dev/input/event3"));
        const auto lines = printed();
        QVERIFY(lines.contains("QT_QPA_PLATFORM=linuxfb:fb=/dev/fb1"));
        QVERIFY(lines.contains("QT_QPA_EVDEV_KEYBOARD_PARAMETERS=/dev/input/event3"));
    }
};

QTEST_GUILESS_MAIN(StartScriptTest)
#include "StartScriptTest.moc"
