// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/UsbDeviceTest.h"

#include "presentation/WidgetUpdates.h"
#include "presentation/ui_UsbDeviceTest.h"

#include <QFile>
#include <QTimer>

namespace Presentation
{

namespace
{

const QString deviceFileName = QStringLiteral("sys/bus/usb/devices/1-1.4");
const QString disconnectedStyleSheet = QStringLiteral("background-color: red;");
const QString connectedStyleSheet = QStringLiteral("background-color: green;");
constexpr int pollIntervalMs = 1000;

} // namespace

struct UsbDeviceTest::PrivateData
{
    Ui_UsbDeviceTest ui{};
    QTimer timer;
    QFile deviceFile{deviceFileName};
    bool running = false;
};

UsbDeviceTest::UsbDeviceTest(QWidget* parent) : QWidget(parent), d(std::make_unique<PrivateData>())
{
    d->ui.setupUi(this);
    d->timer.setSingleShot(true);
    connect(&d->timer, &QTimer::timeout, this, &UsbDeviceTest::checkConnect);
}

UsbDeviceTest::~UsbDeviceTest() = default;

void UsbDeviceTest::start()
{
    d->running = true;
    checkConnect();
}

void UsbDeviceTest::stop()
{
    d->running = false;
    d->timer.stop();
}

void UsbDeviceTest::checkConnect()
{
    if (!d->running)
        return;
    // The kernel's entry is a link: the static call follows it, and says no when its device is gone.
    const bool connected = QFile::exists(d->deviceFile.fileName());
    WidgetUpdates::showStyle(*d->ui.connectLabel, connected ? connectedStyleSheet : disconnectedStyleSheet);
    d->timer.start(pollIntervalMs);
}

} // namespace Presentation
