// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "tests/support/ProgramProcess.h"
#include "virtual-device/control/ControlClient.h"

#include <QImage>
#include <QJsonObject>
#include <QJsonValue>
#include <QProcess>
#include <QString>
#include <QStringList>
#include <QTemporaryDir>

#include <chrono>
#include <optional>

/// A step that the rest of a test function stands on. The device that it speaks to is called `device`.
#define REQUIRE(step) QVERIFY2(step, qPrintable(device.error() + '\n' + device.output()))

namespace TestSupport
{

/// A virtual device with the program on it, as a test drives it: `virtual-device run` of $IMMUNITYRIG_BUILD, under a
/// name of its own, so that many may run at once. Ends with the object.
///
/// A test that itself runs inside `virtual-device exec` calls `attach()` instead of `start()`.
///
/// Everything that can fail returns false, and `error()` says why:
///
///     DeviceUnderTest device;
///     REQUIRE(device.start());
///     REQUIRE(device.set("usb.hid", false));
///     REQUIRE(device.waitRegion("usb-device", "red"));
///
/// Threads: the test's own, which runs its event loop while it waits. Needs an application object.
class DeviceUnderTest
{
public:
    static constexpr std::chrono::seconds usual{20};
    static constexpr std::chrono::seconds startLimit{60};

    DeviceUnderTest();
    ~DeviceUnderTest();
    DeviceUnderTest(const DeviceUnderTest&) = delete;
    DeviceUnderTest& operator=(const DeviceUnderTest&) = delete;

    /// Further arguments of `virtual-device run`. Returns when the window stands, and false when it does not in time.
    [[nodiscard]] bool start(const QStringList& arguments = {}, std::chrono::milliseconds limit = startLimit);
    /// The first half of `start`: returns when the device can be spoken to, with or without a window.
    [[nodiscard]] bool begin(const QStringList& arguments = {});
    /// The other half.
    [[nodiscard]] bool waitReady(std::chrono::milliseconds limit = startLimit);
    /// Speaks to the device in whose `virtual-device exec` the test runs ($VIRTUAL_DEVICE_CONTROL).
    [[nodiscard]] bool attach();
    /// As Ctrl-C does; kills what does not end.
    void stop();

    /// Types as in the control table: a number, true or false, a text.
    [[nodiscard]] bool set(const QString& control, const QJsonValue& value);
    /// Undefined when it fails.
    [[nodiscard]] QJsonValue get(const QString& control);

    // Keys as in `VirtualDevice::KeyTable`. A pressed key stays down; a tap is a press and a release.
    [[nodiscard]] bool press(const QString& key);
    [[nodiscard]] bool release(const QString& key);
    [[nodiscard]] bool tap(const QString& key);
    /// Presses until the key's label is green, and releases until it is white: the program has done all that the key
    /// stands for.
    [[nodiscard]] bool strike(const QString& key, const QString& region);
    [[nodiscard]] bool hold(const QString& key, std::chrono::milliseconds duration);

    // Regions as in `VirtualDevice::RegionMap`; colours: green, red, white, other, none.
    [[nodiscard]] bool waitRegion(const QString& region, const QString& colour,
                                  std::chrono::milliseconds limit = usual);
    [[nodiscard]] bool waitControl(const QString& control, const QJsonValue& value,
                                   std::chrono::milliseconds limit = usual);
    /// A line that contains the text, among those that came after the mark (0: since the device's start).
    [[nodiscard]] bool waitLog(const QString& text, std::chrono::milliseconds limit = usual, qint64 after = 0);

    /// Empty when it fails.
    [[nodiscard]] QString regionColour(const QString& region);
    /// The number of the newest log line, for `waitLog` and `logTexts`.
    [[nodiscard]] qint64 logMark();
    [[nodiscard]] QStringList logTexts(qint64 after = 0);
    /// As the control socket gives them: number, priority, identity, text.
    [[nodiscard]] QList<QJsonObject> logLines(qint64 after = 0);
    /// Null when it fails.
    [[nodiscard]] QImage screenshot();

    /// From now on the device's events are kept; what came before the device's end stays readable after it.
    [[nodiscard]] bool follow();
    void forgetEvents() { kept.clear(); }
    [[nodiscard]] const QList<QJsonObject>& events() const { return kept; }
    /// The regions that have turned this colour since. Those that wait for a signal every second do so by themselves on
    /// a machine that stands still for a moment, and count only where they are what it is `about`.
    [[nodiscard]] QStringList regionsThatTurned(const QString& colour, const QString& about = {}) const;

    /// Where the files of the device are that the program finds in its root folder.
    [[nodiscard]] QString stateFile(const QString& path) const { return scratch.filePath("state/" + path); }
    /// What the program itself has printed, both streams.
    [[nodiscard]] QString programOutput() const;
    [[nodiscard]] bool waitOutput(const QString& text, std::chrono::milliseconds limit = usual) const;
    /// The program's own process in the device's sandbox.
    [[nodiscard]] std::optional<ProgramProcess> program() const;

    /// Any other request; `error()` is set when it is refused.
    VirtualDevice::ControlReply call(const QString& method, const QJsonObject& params = {});
    [[nodiscard]] VirtualDevice::ControlClient& client() { return connection; }

    [[nodiscard]] QString name() const { return deviceName; }
    [[nodiscard]] QString controlSocket() const { return socketPath; }
    /// The line that begins with "ready".
    [[nodiscard]] QString readyLine() const { return ready; }
    [[nodiscard]] QProcess& process() { return runner; }
    [[nodiscard]] QString error() const { return problem; }
    /// What `virtual-device run` has written so far, both streams.
    [[nodiscard]] QString output() const { return QString::fromUtf8(written); }

private:
    [[nodiscard]] bool fail(const QString& text);
    [[nodiscard]] bool connectTo(const QString& path);
    [[nodiscard]] bool waitFor(const QJsonObject& condition, std::chrono::milliseconds limit);

    QString deviceName;
    QString socketPath;
    QString ready;
    QString problem;
    QByteArray written;
    QList<QJsonObject> kept;
    QTemporaryDir scratch;
    QProcess runner;
    VirtualDevice::ControlClient connection;
};

} // namespace TestSupport
