// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include <QJsonValue>
#include <QObject>
#include <QString>
#include <QTimer>

#include <chrono>
#include <functional>
#include <optional>

namespace VirtualDevice
{

class LogStore;
class RegionWatch;
class Registry;

/// One condition that somebody waits for. It listens to what can make it true instead of looking again and again, and
/// a state that held only for a moment counts. Ends once, with one of its two signals, and deletes itself.
///
/// Threads: lives in the thread that makes it.
class PendingWait : public QObject
{
    Q_OBJECT

public:
    explicit PendingWait(QObject* parent);

    // One of these, before start().
    void forRegion(RegionWatch& regions, const QString& region, const QString& colour);
    void forControl(Registry& registry, const QString& name, const QJsonValue& wanted);
    /// A line that contains `text` and has a number greater than `after`.
    void forLog(LogStore& log, const QString& text, qint64 after);

    /// A condition that holds already comes true at once, also within no time at all.
    void start(std::chrono::milliseconds within);

signals:
    void cameTrue(const QJsonValue& seen);
    /// `present` is what there is instead: the colour, the control's value, null for a log line.
    void timedOut(const QJsonValue& present);

private:
    void finish(const QJsonValue& seen);

    QTimer timer;
    std::function<QJsonValue()> present;
    std::optional<QJsonValue> outcome;
    bool isStarted = false;
    bool isOver = false;
};

} // namespace VirtualDevice
