// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/audio/AudioWatcher.h"
#include "virtual-device/control/ControlServer.h"
#include "virtual-device/control/Monitor.h"
#include "virtual-device/dsp/DspModel.h"
#include "virtual-device/log/LogStore.h"
#include "virtual-device/radio/RadioModel.h"
#include "virtual-device/registry/Registry.h"
#include "virtual-device/sandbox/DeviceFolder.h"
#include "virtual-device/sandbox/Sandbox.h"
#include "virtual-device/sandbox/VncRelay.h"
#include "virtual-device/screen/RegionWatch.h"
#include "virtual-device/screen/Screen.h"
#include "virtual-device/screen/SignalLines.h"
#include "virtual-device/tree/DataPartition.h"
#include "virtual-device/tree/DeviceTree.h"

#include <QObject>
#include <QString>
#include <QStringList>

#include <optional>

namespace VirtualDevice
{

struct DeviceOptions
{
    QString name;        ///< empty: the first free "device-N"
    QString stateFolder; ///< kept after the end; empty: one that goes with the device
    quint16 vncPort = 0; ///< on 127.0.0.1; 0: one that is free
    QStringList command; ///< what runs in the sandbox
    /// A person's own command has the caller's terminal and environment and no screen; the program has a screen.
    bool isOwnCommand = false;
    QStringList readOnlyFolders; ///< of the host, seen in the sandbox at the same place
    QStringList settings;        ///< "NAME=VALUE" of controls, in force before the program starts
};

/// One whole virtual device: its controls, its files, its log and the sandbox in which the program runs.
///
/// Threads: lives in the main thread.
class Device : public QObject
{
    Q_OBJECT

public:
    explicit Device(DeviceOptions options, QObject* parent = nullptr);
    ~Device() override;

    /// Gives controls the values of "NAME=VALUE" words. Returns what is wrong with the first that is refused.
    [[nodiscard]] static std::optional<QString> apply(const QStringList& settings, Registry& registry);

    /// Makes the device and starts the program in it. Returns what went wrong; nothing is left then.
    [[nodiscard]] std::optional<QString> start();
    /// Asks the program to end; `ended` follows.
    void terminate() { sandbox.terminate(); }

    [[nodiscard]] Registry& registry() { return values; }
    [[nodiscard]] LogStore& log() { return logStore; }
    [[nodiscard]] DeviceTree& tree() { return deviceTree; }
    [[nodiscard]] RegionWatch& regions() { return regionWatch; }
    [[nodiscard]] Sandbox& program() { return sandbox; }
    [[nodiscard]] const DeviceFolder& folder() const { return deviceFolder; }
    /// Where a person's VNC viewer finds the screen: "127.0.0.1:PORT".
    [[nodiscard]] QString vncAddress() const { return relay.address(); }
    /// The Unix socket on which the program's VNC server can be reached, once it runs.
    [[nodiscard]] QString vncSocket() const;
    [[nodiscard]] QString controlSocket() const;
    [[nodiscard]] QString stateFolder() const;

signals:
    /// The program's window stands, and its first picture is here.
    void ready();
    /// The program ended with this exit status (128 + the signal's number when one ended it).
    void ended(int status);

private:
    [[nodiscard]] std::optional<QString> makeFiles();
    [[nodiscard]] std::optional<QString> startSandbox();
    [[nodiscard]] SandboxPlan plan() const;
    void addFiles(SandboxPlan& plan) const;
    void addModels(SandboxPlan& plan) const;
    void addScreen(SandboxPlan& plan) const;
    void addOwnCommand(SandboxPlan& plan) const;
    void watchForWindow();
    void watchModels();
    void tearDown();

    DeviceOptions options;
    DeviceFolder deviceFolder;
    Registry values;
    LogStore logStore;
    RadioModel radio;
    DspModel dsp;
    AudioWatcher audio;
    DeviceTree deviceTree;
    DataPartition dataPartition;
    VncRelay relay;
    Screen screen;
    RegionWatch regionWatch{screen};
    SignalLines signalLines{values, screen};
    Monitor monitor;
    ControlServer controlServer{ControlContext{values, logStore, screen, regionWatch, monitor}};
    Sandbox sandbox;
};

} // namespace VirtualDevice
