// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/FuelGuageTest.h"

#include "presentation/WidgetUpdates.h"
#include "presentation/ui_FuelGuageTest.h"

#include <QFile>
#include <QTimer>

#include <optional>

namespace Presentation
{

namespace
{

const QString voltageFilename = QStringLiteral("sys/class/power_supply/ds2780-battery.0/voltage_now");
const QString currentFilename = QStringLiteral("sys/class/power_supply/ds2780-battery.0/current_now");
constexpr int pollIntervalMs = 1000;
/// Far more than the kernel ever gives, a page. A line that is longer still is no number, whatever it begins with.
constexpr qint64 longestLine = 1 << 20;
constexpr double microvoltsPerVolt = 1'000'000;
constexpr double microamperesPerMilliampere = 1000;

/// The first line's number, 0 where it is none; nothing when the file does not open.
std::optional<int> reading(QFile& file)
{
    if (!file.open(QIODevice::ReadOnly))
        return std::nullopt;
    const QByteArray line = file.readLine(longestLine + 1);
    file.close();
    return line.size() < longestLine ? QString::fromLatin1(line).toInt() : 0;
}

} // namespace

struct FuelGuageTest::PrivateData
{
    Ui_FuelGuageTest ui{};
    QTimer timer;
    QFile voltageFile{voltageFilename};
    QFile currentFile{currentFilename};
    bool running = false;
};

FuelGuageTest::FuelGuageTest(QWidget* parent) : QWidget(parent), d(std::make_unique<PrivateData>())
{
    d->ui.setupUi(this);
    d->timer.setSingleShot(true);
    connect(&d->timer, &QTimer::timeout, this, &FuelGuageTest::checkGauge);
}

FuelGuageTest::~FuelGuageTest() = default;

void FuelGuageTest::start()
{
    d->running = true;
    checkGauge();
}

void FuelGuageTest::stop()
{
    d->running = false;
    d->timer.stop();
}

void FuelGuageTest::checkGauge()
{
    if (!d->running)
        return;
    if (const auto microvolts = reading(d->voltageFile))
        WidgetUpdates::showNumber(*d->ui.voltageSpinBox, *microvolts / microvoltsPerVolt);
    else
        qDebug("Error opening voltage file ");
    if (const auto microamperes = reading(d->currentFile))
        WidgetUpdates::showNumber(*d->ui.currentSpinBox, *microamperes / microamperesPerMilliampere);
    else
        qDebug("Error opening current file ");
    d->timer.start(pollIntervalMs);
}

} // namespace Presentation
