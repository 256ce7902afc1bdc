// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/RtcTest.h"

#include "presentation/WidgetUpdates.h"
#include "presentation/ui_RtcTest.h"

#include <QFile>
#include <QTimer>

#include <linux/rtc.h>
#include <sys/ioctl.h>

namespace Presentation
{

namespace
{

const QString rtcFileName = QStringLiteral("/dev/rtc");
const QString failStyleSheet = QStringLiteral("background-color: red");
constexpr int pollIntervalMs = 1000;

/// A disturbed clock may hold any number: the sum wraps around and then is no valid date.
int sum(int value, int offset)
{
    return static_cast<int>(static_cast<unsigned>(value) + static_cast<unsigned>(offset));
}

QDateTime dateTimeOf(const rtc_time& time)
{
    const QDate date(sum(time.tm_year, 1900), sum(time.tm_mon, 1), time.tm_mday);
    // UTC has every hour of every day; in a zone with daylight saving time the clock would stand still for one.
    return {date, QTime(time.tm_hour, time.tm_min, time.tm_sec), Qt::UTC};
}

} // namespace

struct RtcTest::PrivateData
{
    Ui_RtcTest ui{};
    QTimer timer;
    QFile rtcFile{rtcFileName};
    bool running = false;
};

RtcTest::RtcTest(QWidget* parent) : QWidget(parent), d(std::make_unique<PrivateData>())
{
    d->ui.setupUi(this);
    d->timer.setSingleShot(true);
    connect(&d->timer, &QTimer::timeout, this, &RtcTest::updateTime);
}

RtcTest::~RtcTest() = default;

void RtcTest::start()
{
    d->running = true;
    updateTime();
}

void RtcTest::stop()
{
    d->running = false;
    d->timer.stop();
}

void RtcTest::updateTime()
{
    if (!d->running)
        return;
    // Without "existing only" a missing clock would be created as an ordinary file.
    if (!d->rtcFile.open(QIODevice::ReadWrite | QIODevice::ExistingOnly))
        qDebug("Unable to open RTC ");
    rtc_time time{};
    if (::ioctl(d->rtcFile.handle(), RTC_RD_TIME, &time) != 0) {
        qDebug("Unable to read from RTC ");
        WidgetUpdates::showStyle(*d->ui.dateTimeEdit, failStyleSheet);
    }
    WidgetUpdates::showDateTime(*d->ui.dateTimeEdit, dateTimeOf(time));
    d->rtcFile.close();
    d->timer.start(pollIntervalMs);
}

} // namespace Presentation
