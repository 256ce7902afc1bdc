// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "presentation/SdCardTest.h"

#include "presentation/WidgetUpdates.h"
#include "presentation/ui_SdCardTest.h"

#include <QFile>
#include <QTextStream>
#include <QTimer>

namespace Presentation
{

namespace
{

const QString testFileName = QStringLiteral("/mnt/data/testfile");
const QString testFileString = QStringLiteral("Vantor Tamberly");
const QString mmcFileName = QStringLiteral("/sys/block/mmcblk0");
const QString disconnectedStyleSheet = QStringLiteral("background-color: red;");
const QString connectedStyleSheet = QStringLiteral("background-color: green;");
constexpr int pollIntervalMs = 1000;
/// A line of the probe file that is longer differs, whatever comes behind: the text, a byte order mark before it, which
/// does not count, one byte more, and one for the end that `readLine` counts in. A disturbed card may show a file of
/// any size, all of it one line.
const qint64 longestProbe = testFileString.size() + 3 + 1 + 1;

} // namespace

struct SdCardTest::PrivateData
{
    Ui_SdCardTest ui{};
    QTimer timer;
    QFile testFile{testFileName};
    QFile mmcFile{mmcFileName};
    bool running = false;

    void showConnected(bool connected)
    {
        WidgetUpdates::showStyle(*ui.connectedLabel, connected ? connectedStyleSheet : disconnectedStyleSheet);
    }

    void writeProbe()
    {
        if (!testFile.open(QIODevice::WriteOnly))
            return;
        QTextStream(&testFile) << testFileString;
        testFile.close();
    }

    [[nodiscard]] bool readsProbe()
    {
        if (!testFile.open(QIODevice::ReadOnly))
            return false;
        const bool matches = QString::fromUtf8(testFile.readLine(longestProbe)) == testFileString;
        testFile.close();
        return matches;
    }
};

SdCardTest::SdCardTest(QWidget* parent) : QWidget(parent), d(std::make_unique<PrivateData>())
{
    d->ui.setupUi(this);
    d->timer.setSingleShot(true);
    connect(&d->timer, &QTimer::timeout, this, &SdCardTest::checkConnected);
    d->timer.start(pollIntervalMs);
}

SdCardTest::~SdCardTest() = default;

void SdCardTest::start()
{
    d->running = true;
    checkConnected();
}

void SdCardTest::stop()
{
    d->running = false;
    d->timer.stop();
}

void SdCardTest::checkConnected()
{
    if (!d->running)
        return;
    // The static call follows links: a link whose target is gone stands for no card and no file.
    if (QFile::exists(d->mmcFile.fileName())) {
        if (!QFile::exists(d->testFile.fileName()))
            d->writeProbe();
        d->showConnected(d->readsProbe());
    } else {
        d->showConnected(false);
    }
    d->timer.start(pollIntervalMs);
}

} // namespace Presentation
