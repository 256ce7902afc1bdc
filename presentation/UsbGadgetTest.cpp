// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/UsbGadgetTest.h"

#include "presentation/WidgetUpdates.h"
#include "presentation/ui_UsbGadgetTest.h"

#include <QFile>
#include <QTimer>

namespace Presentation
{

namespace
{

const QString deviceFileName = QStringLiteral("/sys/devices/platform/musb_hdrc/mode");
const QString connectedText = QStringLiteral("b_peripheral");
const QString disconnectedStyleSheet = QStringLiteral("background-color: red;");
const QString connectedStyleSheet = QStringLiteral("background-color: green;");
constexpr int pollIntervalMs = 1000;
/// A longer line is another mode, however it goes on: the text, the character that is dropped, one more, and one
/// for the end that `readLine` counts in.
const qint64 longestMode = connectedText.size() + 1 + 1 + 1;

/// What the file holds now, without its last character, the line end; empty when the file is closed or unreadable.
QString currentMode(QFile& file)
{
    if (!file.isOpen() || !file.seek(0))
        return {};
    QString line = QString::fromLatin1(file.readLine(longestMode));
    line.chop(1);
    return line;
}

} // namespace

struct UsbGadgetTest::PrivateData
{
    Ui_UsbGadgetTest ui{};
    QTimer timer;
    QFile deviceFile{deviceFileName};
    bool running = false;
};

UsbGadgetTest::UsbGadgetTest(QWidget* parent) : QWidget(parent), d(std::make_unique<PrivateData>())
{
    d->ui.setupUi(this);
    d->timer.setSingleShot(true);
    connect(&d->timer, &QTimer::timeout, this, &UsbGadgetTest::checkConnect);
    if (!d->deviceFile.open(QIODevice::ReadOnly))
        qDebug("Cannot open file ");
}

UsbGadgetTest::~UsbGadgetTest() = default;

void UsbGadgetTest::start()
{
    d->running = true;
    checkConnect();
}

void UsbGadgetTest::stop()
{
    d->running = false;
    d->timer.stop();
}

void UsbGadgetTest::checkConnect()
{
    if (!d->running)
        return;
    const bool connected = currentMode(d->deviceFile) == connectedText;
    WidgetUpdates::showStyle(*d->ui.connectLabel, connected ? connectedStyleSheet : disconnectedStyleSheet);
    d->timer.start(pollIntervalMs);
}

} // namespace Presentation
