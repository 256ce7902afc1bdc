// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "virtual-device/device/Device.h"

#include "virtual-device/sandbox/StateFolder.h"

#include <QCoreApplication>
#include <QDir>
#include <QFileInfo>
#include <QImage>

namespace VirtualDevice
{

namespace
{

using Kind = SandboxBind::Kind;

/// Where the sandbox sees the folder of sockets that it shares with us.
const QString sharedFolder = QStringLiteral("/run/virtual-device");
const QString stalledControl = QStringLiteral("log.stalled");

bool isBlack(const QImage& picture)
{
    QImage empty(picture.size(), picture.format());
    empty.fill(Qt::black);
    return picture == empty;
}

/// Beside the programs of this build.
QString mixerPlugin()
{
    return QDir(QCoreApplication::applicationDirPath())
        .absoluteFilePath(QStringLiteral("../virtual-device/libMixerPlugin.so"));
}

} // namespace

Device::Device(DeviceOptions choices, QObject* parent)
    : QObject(parent),
      options(std::move(choices)),
      radio(values),
      dsp(values),
      audio(values),
      deviceTree(values),
      dataPartition(values)
{
    connect(&values, &Registry::changed, &logStore, [this](const QString& name, const QJsonValue& value) {
        if (name == stalledControl)
            logStore.setStalled(value.toBool());
    });
    // Direct: the pulse counts before the first byte that the program sends after it.
    connect(&deviceTree, &DeviceTree::resetLineWritten, &radio, &RadioModel::reset, Qt::DirectConnection);
    watchModels();
    connect(&sandbox, &Sandbox::ended, this, [this](int status) {
        tearDown();
        emit ended(status);
    });
}

Device::~Device()
{
    tearDown();
}

std::optional<QString> Device::start()
{
    DeviceFolder::cleanUp();
    auto problem = apply(options.settings, values);
    if (!problem)
        problem = deviceFolder.claim(options.name);
    if (!problem)
        problem = makeFiles();
    if (!problem)
        problem = startSandbox();
    if (problem)
        tearDown();
    return problem;
}

std::optional<QString> Device::apply(const QStringList& settings, Registry& registry)
{
    for (const auto& setting : settings) {
        const QString name = setting.section(u'=', 0, 0);
        const ControlSpec* control = Registry::find(name);
        const QJsonValue value = control ? Registry::parsed(*control, setting.section(u'=', 1)) : QJsonValue();
        if (auto problem = registry.set(name, value))
            return problem;
    }
    return std::nullopt;
}

std::optional<QString> Device::makeFiles()
{
    if (auto problem = prepareState(stateFolder()))
        return problem;
    for (const char* name : {"tree", "card", "shared"})
        QDir().mkpath(deviceFolder.path(QString::fromLatin1(name)));
    if (auto problem = deviceTree.mount(deviceFolder.path(QStringLiteral("tree"))))
        return problem;
    const QString card = deviceFolder.path(QStringLiteral("card"));
    if (auto problem = dataPartition.mount(stateFolder() + QStringLiteral("/mnt/data"), card))
        return problem;
    if (auto problem = dsp.open(deviceFolder.path(QStringLiteral("dsplink"))))
        return problem;
    const QString sound = stateFolder() + QStringLiteral("/etc/sounds/TestSound.wav");
    if (auto problem = audio.open(deviceFolder.path(QStringLiteral("sound")), sound))
        return problem;
    if (auto problem = logStore.open(deviceFolder.path(QStringLiteral("log"))))
        return problem;
    return controlServer.listen(controlSocket());
}

std::optional<QString> Device::startSandbox()
{
    if (options.isOwnCommand)
        return sandbox.start(plan(), Sandbox::Streams::Inherited);
    if (auto problem = relay.listen(options.vncPort, vncSocket()))
        return problem;
    auto problem = sandbox.start(plan(), Sandbox::Streams::Captured);
    if (!problem)
        watchForWindow();
    return problem;
}

SandboxPlan Device::plan() const
{
    SandboxPlan plan;
    plan.command = options.command;
    addFiles(plan);
    addModels(plan);
    for (const auto& folder : options.readOnlyFolders)
        plan.add(folder, folder, Kind::ReadOnly);
    if (options.isOwnCommand)
        addOwnCommand(plan);
    else
        addScreen(plan);
    return plan;
}

void Device::addFiles(SandboxPlan& plan) const
{
    const QString state = stateFolder();
    plan.add(deviceFolder.path(QStringLiteral("tree/sys")), QStringLiteral("/sys"), Kind::Writable);
    plan.add(deviceFolder.path(QStringLiteral("tree/rtc")), QStringLiteral("/dev/rtc"), Kind::Writable);
    plan.add(deviceFolder.path(QStringLiteral("log")), QStringLiteral("/dev/log"), Kind::Writable);
    plan.add(state + QStringLiteral("/mnt"), QStringLiteral("/mnt"), Kind::Writable);
    plan.add(deviceFolder.path(QStringLiteral("card")), QStringLiteral("/mnt/data"), Kind::Writable);
    plan.add(state + QStringLiteral("/etc/sounds"), QStringLiteral("/etc/sounds"), Kind::Writable);
    plan.binds.append({state + QStringLiteral("/dsp.out"), QStringLiteral("/dsp.out"), Kind::ReadOnly, true});
}

/// What is missing when the surroundings are built is missing for the program's whole run.
void Device::addModels(SandboxPlan& plan) const
{
    if (values.text(QStringLiteral("radio.presence")) == u"present" && !radio.devicePath().isEmpty())
        plan.add(radio.devicePath(), QStringLiteral("/dev/ttyS1"), Kind::Device);
    if (values.text(QStringLiteral("dsp.presence")) != u"missing")
        plan.add(deviceFolder.path(QStringLiteral("dsplink")), QStringLiteral("/dev/dsplink"), Kind::Writable);
    audio.contribute(plan, mixerPlugin());
}

void Device::addScreen(SandboxPlan& plan) const
{
    plan.add(deviceFolder.path(QStringLiteral("shared")), sharedFolder, Kind::Writable);
    plan.vncSocket = sharedFolder + QStringLiteral("/vnc");
    plan.environment.insert(QStringLiteral("QT_QPA_PLATFORM"), QStringLiteral("vnc:size=240x320"));
}

void Device::addOwnCommand(SandboxPlan& plan) const
{
    plan.inheritsEnvironment = true;
    if (!qEnvironmentVariableIsSet("QT_QPA_PLATFORM"))
        plan.environment.insert(QStringLiteral("QT_QPA_PLATFORM"), QStringLiteral("offscreen"));
    const QString control = QStringLiteral("/run/control");
    plan.environment.insert(QStringLiteral("VIRTUAL_DEVICE_CONTROL"), control);
    plan.add(controlSocket(), control, Kind::Writable);
}

/// The program paints its window after the server has shown an empty screen, which is black.
void Device::watchForWindow()
{
    screen.open(vncSocket());
    auto* waiting = new QObject(this);
    connect(&screen, &Screen::updated, waiting, [this, waiting] {
        if (isBlack(screen.picture()))
            return;
        waiting->deleteLater();
        disconnect(&screen, nullptr, waiting, nullptr);
        emit ready();
    });
}

/// What the models see goes to whoever listens on the control socket.
void Device::watchModels()
{
    const auto raise = [this](const char* model, const QString& what) {
        monitor.raise(QLatin1String(model), QStringLiteral("violation"), {{QStringLiteral("what"), what}});
    };
    connect(&radio, &RadioModel::violated, &monitor, [raise](const QString& what) { raise("radio", what); });
    connect(&dsp, &DspModel::violated, &monitor, [raise](const QString& what) { raise("dsp", what); });
}

/// In the opposite order: nobody may use a file system when it goes. When the name is free, nothing may stand in the
/// folder that this device would still remove: it may be the next one's.
void Device::tearDown()
{
    sandbox.kill();
    audio.close();
    dsp.close();
    logStore.close();
    dataPartition.unmount();
    deviceTree.unmount();
    controlServer.stopListening();
    deviceFolder.release();
}

QString Device::vncSocket() const
{
    return deviceFolder.path(QStringLiteral("shared/vnc"));
}

QString Device::controlSocket() const
{
    return DeviceFolder::controlSocket(deviceFolder.name());
}

QString Device::stateFolder() const
{
    return options.stateFolder.isEmpty() ? deviceFolder.path(QStringLiteral("state"))
                                         : QFileInfo(options.stateFolder).absoluteFilePath();
}

} // namespace VirtualDevice
