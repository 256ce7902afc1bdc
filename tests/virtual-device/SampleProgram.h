// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QProcess>
#include <QString>
#include <QTemporaryDir>

#include <memory>

namespace TestSupport
{

/// The sample window under Qt's VNC server, which a Unix socket leads to as on the device.
class SampleProgram
{
public:
    SampleProgram();
    ~SampleProgram();
    SampleProgram(const SampleProgram&) = delete;
    SampleProgram& operator=(const SampleProgram&) = delete;

    [[nodiscard]] bool start();
    void stop();
    /// Stops it from running, and lets it go on.
    void freeze() const;
    void thaw() const;

    [[nodiscard]] QString socketPath() const { return folder.filePath("vnc"); }
    /// "press CODE" and "release CODE", one for each key event that reached the window.
    [[nodiscard]] QStringList keyEvents();
    /// The place of each named widget, as the program tells it: "NAME X Y WIDTH HEIGHT".
    [[nodiscard]] static QStringList geometry();

private:
    QTemporaryDir folder;
    QProcess program;
    QProcess relay;
    QByteArray output;
};

} // namespace TestSupport
