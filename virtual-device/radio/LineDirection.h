// SPDX-FileCopyrightText: 2026 The ImmunityRig developers
// SPDX-License-Identifier: MIT

#pragma once

#include "virtual-device/device/ExactTimer.h"
#include "virtual-device/radio/LineDamage.h"

#include <QByteArray>
#include <QObject>
#include <QTimer>

#include <chrono>

namespace VirtualDevice
{

class Registry;

/// One direction of the radio's serial line: takes bytes at once and gives them on at the speed of the line (115200
/// baud, 11,520 bytes a second), damaged and delivered as the controls `<prefix>.drop`, `.insert`, `.flip`,
/// `.duplicate` (per 100,000 bytes), `.delivery` (natural, split, merge), `.burst` and `.burst_every` say at that
/// moment.
///
/// Memory is bounded: what does not fit into `capacity` is lost (`radio.bytes_lost`). Lives in the thread of
/// its owner, which must run an event loop.
class LineDirection : public QObject
{
    Q_OBJECT

public:
    static constexpr qsizetype capacity = 256 * 1024;

    /// `prefix` as in "radio.to_program"; `salt` makes the two directions of one seed differ.
    LineDirection(Registry& registry, const QString& prefix, quint32 salt, QObject* parent = nullptr);

    void setSeed(quint32 seed) { damage.setSeed(seed ^ salt); }
    void send(QByteArrayView bytes);
    /// Takes back what has not been delivered.
    void clear();

signals:
    void delivered(const QByteArray& bytes);

private:
    using Clock = std::chrono::steady_clock;

    [[nodiscard]] QString control(const char* suffix) const;
    [[nodiscard]] LineDamage::Rates rates() const;
    void controlChanged(const QString& name);
    void burst();
    void enqueue(const QByteArray& bytes);
    void release();
    [[nodiscard]] qsizetype ripe() const;
    void arm();
    void deliver(qsizetype count);

    Registry& registry;
    QString prefix;
    quint32 salt;
    LineDamage damage;
    QByteArray queue;
    Clock::time_point lineTime; ///< when the last byte that was released had passed
    ExactTimer releaseTimer;
    QTimer burstTimer;
};

} // namespace VirtualDevice
