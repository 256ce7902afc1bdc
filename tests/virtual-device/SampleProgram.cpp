// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/virtual-device/SampleProgram.h"

#include <QFile>
#include <QTest>

#include <signal.h>

namespace TestSupport
{

namespace
{

constexpr int limit = 20000;

QProcessEnvironment vncEnvironment()
{
    auto environment = QProcessEnvironment::systemEnvironment();
    environment.insert("QT_QPA_PLATFORM", "vnc:size=240x320:port=5900");
    return environment;
}

QString programPath()
{
    return qEnvironmentVariable("IMMUNITYRIG_BUILD") + "/tests/WindowSample";
}

} // namespace

SampleProgram::SampleProgram()
{
    relay.start("socat", {"UNIX-LISTEN:" + socketPath() + ",fork", "TCP4:127.0.0.1:5900"});
}

SampleProgram::~SampleProgram()
{
    stop();
    relay.terminate();
    relay.waitForFinished(limit);
}

bool SampleProgram::start()
{
    output.clear();
    program.setProcessEnvironment(vncEnvironment());
    program.start(programPath(), QStringList());
    return QTest::qWaitFor(
        [this] {
            output += program.readAllStandardOutput();
            return output.contains("ready") && QFile::exists(socketPath());
        },
        limit);
}

void SampleProgram::stop()
{
    if (program.state() == QProcess::NotRunning)
        return;
    thaw();
    program.kill();
    program.waitForFinished(limit);
}

void SampleProgram::freeze() const
{
    ::kill(static_cast<pid_t>(program.processId()), SIGSTOP);
}

void SampleProgram::thaw() const
{
    ::kill(static_cast<pid_t>(program.processId()), SIGCONT);
}

QStringList SampleProgram::keyEvents()
{
    output += program.readAllStandardOutput();
    QStringList events = QString::fromUtf8(output).split(u'\n', Qt::SkipEmptyParts);
    events.removeAll("ready");
    return events;
}

QStringList SampleProgram::geometry()
{
    QProcess once;
    once.setProcessEnvironment(vncEnvironment());
    once.start(programPath(), {"--geometry"});
    once.waitForFinished(limit);
    return QString::fromUtf8(once.readAllStandardOutput()).split(u'\n', Qt::SkipEmptyParts);
}

} // namespace TestSupport
