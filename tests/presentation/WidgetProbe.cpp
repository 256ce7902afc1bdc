// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#include "tests/presentation/WidgetProbe.h"

#include <QCoreApplication>
#include <QDir>
#include <QEvent>
#include <QFile>
#include <QFileInfo>
#include <QTest>

#include <algorithm>

namespace TestSupport
{

namespace
{

constexpr qint64 endlessSize = 8 << 20;

} // namespace

TimerProbe::TimerProbe()
{
    QCoreApplication::instance()->installEventFilter(this);
}

std::vector<QTimer*> TimerProbe::timers() const
{
    std::vector<QTimer*> all;
    for (const auto& entry : seen) {
        if (!entry.timer.isNull())
            all.push_back(entry.timer);
    }
    return all;
}

int TimerProbe::firings(const QTimer* timer) const
{
    const auto entry = std::find_if(seen.begin(), seen.end(), [=](const Seen& one) { return one.timer == timer; });
    return entry == seen.end() ? 0 : entry->firings;
}

QTimer* TimerProbe::waitForTimer() const
{
    const bool fired = QTest::qWaitFor([this] { return !timers().empty(); }, 20'000);
    return fired ? timers().front() : nullptr;
}

bool TimerProbe::eventFilter(QObject* receiver, QEvent* event)
{
    auto* const timer = event->type() == QEvent::Timer ? qobject_cast<QTimer*>(receiver) : nullptr;
    if (timer == nullptr || timer->parent() != nullptr)
        return false;
    const auto entry = std::find_if(seen.begin(), seen.end(), [=](const Seen& one) { return one.timer == timer; });
    if (entry == seen.end())
        seen.push_back({timer, 1});
    else
        ++entry->firings;
    return false;
}

PaintCounter::PaintCounter(QWidget& widget)
{
    widget.installEventFilter(this);
    for (auto* const part : widget.findChildren<QWidget*>())
        part->installEventFilter(this);
}

bool PaintCounter::eventFilter(QObject* /*receiver*/, QEvent* event)
{
    if (event->type() == QEvent::Paint)
        ++paints;
    return false;
}

void paintWhatIsUnderWay(QWidget& widget)
{
    const PaintCounter counter(widget);
    int before = 0;
    do {
        before = counter.paints;
        QCoreApplication::processEvents();
    } while (counter.paints != before);
}

QColor paintedColour(QWidget& widget)
{
    return widget.grab().toImage().pixelColor(2, 2);
}

void writeFile(const QString& path, const QByteArray& content)
{
    QDir().mkpath(QFileInfo(path).path());
    QFile file(path);
    if (!file.open(QIODevice::WriteOnly) || file.write(content) != content.size())
        qFatal("cannot write %s", qPrintable(path));
}

QByteArray readFile(const QString& path)
{
    QFile file(path);
    return file.open(QIODevice::ReadOnly) ? file.readAll() : QByteArray("(no file)");
}

qint64 bytesRead()
{
    QFile counters(QStringLiteral("/proc/self/io"));
    if (!counters.open(QIODevice::ReadOnly))
        qFatal("no counters");
    return counters.readLine().split(' ').last().trimmed().toLongLong(); // "rchar: N"
}

void writeEndlessLine(const QString& path, const QByteArray& begin)
{
    writeFile(path, begin);
    if (!QFile::resize(path, endlessSize))
        qFatal("cannot enlarge %s", qPrintable(path));
}

void removePath(const QString& path)
{
    const QFileInfo info(path);
    if (info.isDir() && !info.isSymLink())
        QDir(path).removeRecursively();
    else
        QFile::remove(path);
}

} // namespace TestSupport
